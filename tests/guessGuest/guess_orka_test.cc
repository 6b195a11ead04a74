#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuess;
using tvxtest::GuessRow;

TEST(GuessOrka, PackagesXml) {
  const GuessRow rows[] = {
      {"orka/orka41", "zelcore"},
      {"orka/orka35", nullptr},
      {"orka/orka-caseless", "zelcore"},
      {"orka/orka-vfirst", "zelcore"},
      // The walk stops once both texts are known; before that a later
      // element replaces an earlier one.
      {"orka/orka-stop-early", nullptr},
      {"orka/orka-replaced", nullptr},
      // Only the first product element counts.
      {"orka/orka-2nd-prod", nullptr},
      {"orka/orka-emptyname", nullptr},
      {"orka/orka-cdata", nullptr},
      {"orka/orka-noproduct", nullptr},
      {"orka/orka-wrongroot", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

// Entities are never substituted and nothing outside the medium is read.
TEST(GuessOrka, HostileXml) {
  const GuessRow rows[] = {
      {"orka/orka-entity", nullptr}, {"orka/orka-external", nullptr},
      {"orka/orka-laughs", nullptr}, {"orka/orka-truncated", nullptr},
      {"orka/orka-binary", nullptr}, {"orka/orka-empty", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessOrkai, BootMenuTitle) {
  const GuessRow rows[] = {
      {"orka/orkai65", "zelcore65"},
      {"orka/hyperlet", "zelcore"},
      {"orka/orkai5", "zelcore5"},
      {"orka/orkai60", "zelcore6"},
      {"orka/skyvault60", "zelcore6"},
      {"orka/skyvault67", "zelcore65"},
      {"orka/orkai-lower", nullptr},
      {"orka/orkai70", "zelcore7"},
      {"orka/orkai70-x64", "zelcore7"},
      {"orka/orkai70-both", "zelcore7"},
      // An Arm-only 7.0 medium is not for this identifier.
      {"orka/orkai70-arm", nullptr},
      {"orka/orkai80", nullptr},
      {"orka/orkai-crlf", "zelcore65"},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

}  // namespace
