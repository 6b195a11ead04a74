#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuesses;
using tvxtest::GuessRow;

TEST(GuessOrka, MasteredMedia) {
  const GuessRow rows[] = {
      // Orka: packages.xml.
      {"orka41", "zelcore"},
      {"orka35", nullptr},
      {"orka-caseless", "zelcore"},
      // The walk stops once both texts are known; before that a later
      // element replaces an earlier one.
      {"orka-stop-early", nullptr},
      {"orka-replaced", nullptr},
      // Only the first product element counts.
      {"orka-2nd-prod", nullptr},
      {"orka-emptyname", nullptr},
      {"orka-cdata", nullptr},
      {"orka-noproduct", nullptr},
      {"orka-wrongroot", nullptr},
      // Orka, hostile packages.xml: entities are never substituted and nothing outside the
      // medium is read.
      {"orka-entity", nullptr},
      {"orka-external", nullptr},
      {"orka-laughs", nullptr},
      {"orka-truncated", nullptr},
      // Orka installer: the boot menu title.
      {"orkai65", "zelcore65"},
      {"hyperlet", "zelcore"},
      {"orkai60", "zelcore6"},
      {"orkai-lower", nullptr},
      {"orkai70", "zelcore7"},
      {"orkai70-both", "zelcore7"},
      // An Arm-only 7.0 medium is not for this identifier.
      {"orkai70-arm", nullptr},
      {"orkai80", nullptr},
  };
  ExpectGuesses("orka", rows);
}

}  // namespace
