#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuesses;
using tvxtest::GuessRow;

TEST(GuessSolaris, RootEntries) {
  const GuessRow rows[] = {
      {"sol10", "solaris10", 0, false, "", "solaris10-64"},
      {"sol10-upper", "solaris10", 0, false, "", "solaris10-64"},
      {"sol9", "solaris9"},
      {"sol11", "solaris11-64"},
      // The first entry (Copyright) defers to .image_info, which refuses:
      // Solaris_9 further down is never reached.
      {"sol11-other", nullptr},
      {"sol-none", nullptr},
  };
  ExpectGuesses("solaris", rows);
}

}  // namespace
