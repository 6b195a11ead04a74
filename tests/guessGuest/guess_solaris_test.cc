#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuess;
using tvxtest::GuessRow;

TEST(GuessSolaris, RootEntries) {
  const GuessRow rows[] = {
      {"solaris/sol10", "solaris10", 0, false, "", "solaris10-64"},
      {"solaris/sol10-upper", "solaris10", 0, false, "", "solaris10-64"},
      {"solaris/sol9", "solaris9"},
      {"solaris/sol8", "solaris8"},
      {"solaris/sol27", "solaris7"},
      {"solaris/sol11", "solaris11-64"},
      // The first entry (Copyright) defers to .image_info, which refuses:
      // Solaris_9 further down is never reached.
      {"solaris/sol11-other", nullptr},
      {"solaris/sol11-binary", nullptr},
      {"solaris/sol-none", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessSolaris, OverrideIsTheOsKey) {
  GuessResult r;
  ASSERT_EQ(Guess_Guest(tvxtest::MediaPath("solaris/sol10").c_str(), nullptr, &r), 0);
  EXPECT_STREQ(Guess_GetOsKey(&r), "solaris10-64");
}

}  // namespace
