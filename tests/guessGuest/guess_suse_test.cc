#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuess;
using tvxtest::GuessRow;
using tvxtest::kIso;
using tvxtest::kNoIso;

TEST(GuessSUSE, ContentFile) {
  const GuessRow rows[] = {
      {"suse/sles10sp2", "sles10-64", GUESS_VERSION_SLES_10_SP2_OR_LOWER, kIso},
      {"suse/sles10sp3", "sles10-64", 0, kIso},
      // A missing minor number counts as service pack 2 or lower.
      {"suse/sled10", "sles10", GUESS_VERSION_SLED_10_SP2_OR_LOWER, kIso},
      {"suse/sled10sp3", "sles10", GUESS_VERSION_SLED_ALL, kIso},
      {"suse/sled11sp1", "sles11", GUESS_VERSION_SLED_ALL, kIso},
      {"suse/sles11", "sles11-64", 0, kIso},
      {"suse/sles9", "sles-64", 0, kIso},
      {"suse/sles-tarvex", "sles11-64", 0, kIso},
      {"suse/suselinux", "suse", 0, kIso},
      {"suse/nld9", "nld9", 0, kNoIso},
      {"suse/sjds", "sjds", 0, kNoIso},
      {"suse/unknown", nullptr},
      // The first PRODUCT/NAME and the first architecture word win.
      {"suse/first-product", "sles10", GUESS_VERSION_SLES_10_SP2_OR_LOWER, kNoIso},
      {"suse/first-arch", "opensuse", GUESS_VERSION_OPENSUSE_12, kNoIso},
      // "content" is preferred even when it names no known product.
      {"suse/content-wins", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessSUSE, OpenSuseClasses) {
  const GuessRow rows[] = {
      {"suse/opensuse111", "opensuse-64", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kIso},
      {"suse/opensuse113", "opensuse", 0, kIso},
      {"suse/opensuse121", "opensuse-64", GUESS_VERSION_OPENSUSE_12, kIso},
      {"suse/opensuse131", "opensuse-64", GUESS_VERSION_OPENSUSE_13_1, kIso},
      {"suse/opensuse-nover", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      {"suse/noproduct131", "opensuse", GUESS_VERSION_OPENSUSE_13_1, kIso},
      {"suse/opensuse132", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kIso},
      {"suse/leap421", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kIso},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessSUSE, RepoIdLines) {
  const GuessRow rows[] = {
      {"suse/sled12", "sles12-64", GUESS_VERSION_SLED_ALL, kIso},
      // PRODUCT and VERSION lines around an SLE 12 REPOID change nothing.
      {"suse/sled12-mixed", "sles12-64", GUESS_VERSION_SLED_ALL, kNoIso},
      {"suse/sles12-s390", "sles12", 0, kNoIso},
      // An unknown product falls back to the identifier of a 13.2 REPOID.
      {"suse/unknown-repo132", "sles12-64", 0, kNoIso},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessSUSE, ProductsFile) {
  const GuessRow rows[] = {
      {"suse/p-sled11-64", "sles11-64", GUESS_VERSION_SLED_ALL, kIso},
      {"suse/p-sles10-32", "sles10", 0, kIso},
      {"suse/p-sles12-64", "sles12-64", 0, kIso},
      {"suse/p-sles9", "sles", 0, kNoIso},
      {"suse/p-suse-64", "suse-64", 0, kIso},
      {"suse/p-suse", "suse", 0, kNoIso},
      {"suse/p-nld9", "nld9", 0, kNoIso},
      {"suse/p-sjds", "sjds", 0, kNoIso},
      {"suse/p-leap15-64", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kIso},
      {"suse/p-leap15-32", "opensuse", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kNoIso},
      {"suse/p-tumbleweed", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kNoIso},
      {"suse/p-sles15", "sles15-64", 0, kNoIso},
      {"suse/p-unknown", nullptr},
      {"suse/p-short", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessSUSE, RootMarkerAndDamagedFiles) {
  const GuessRow rows[] = {
      {"suse/disk-marker", "suse", 0, kNoIso},
      {"suse/no-marker", nullptr},
      // No PRODUCT line at all reads as openSUSE of an unknown release.
      {"suse/bad-empty", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      // A bare PRODUCT key keeps an empty product name, which no row knows.
      {"suse/bad-keys-only", nullptr},
      // The text ends at its leading NUL byte.
      {"suse/bad-binary", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      // The carriage returns stay in the values: "x86_64\r" is not x86_64.
      {"suse/bad-crlf", "sles10", GUESS_VERSION_SLES_10_SP2_OR_LOWER, kNoIso},
      {"suse/bad-version", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      {"suse/bad-huge", "sles", 0, kNoIso},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

}  // namespace
