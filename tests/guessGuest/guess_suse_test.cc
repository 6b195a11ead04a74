#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuesses;
using tvxtest::GuessRow;
using tvxtest::kIso;
using tvxtest::kNoIso;

TEST(GuessSUSE, MasteredMedia) {
  const GuessRow rows[] = {
      // The content file.
      {"sles10sp2", "sles10-64", GUESS_VERSION_SLES_10_SP2_OR_LOWER, kIso},
      {"sles10sp3", "sles10-64", 0, kIso},
      // A missing minor number counts as service pack 2 or lower.
      {"sled10", "sles10", GUESS_VERSION_SLED_10_SP2_OR_LOWER, kIso},
      {"sled10sp3", "sles10", GUESS_VERSION_SLED_ALL, kIso},
      {"sled11sp1", "sles11", GUESS_VERSION_SLED_ALL, kIso},
      {"sles9", "sles-64", 0, kIso},
      {"sles-tarvex", "sles11-64", 0, kIso},
      {"suselinux", "suse", 0, kIso},
      {"nld9", "nld9", 0, kNoIso},
      {"sjds", "sjds", 0, kNoIso},
      {"unknown", nullptr},
      // The first PRODUCT/NAME and the first architecture word win.
      {"first-product", "sles10", GUESS_VERSION_SLES_10_SP2_OR_LOWER, kNoIso},
      {"first-arch", "opensuse", GUESS_VERSION_OPENSUSE_12, kNoIso},
      // "content" is preferred even when it names no known product.
      {"content-wins", nullptr},
      // openSUSE classes.
      {"opensuse111", "opensuse-64", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kIso},
      {"opensuse113", "opensuse", 0, kIso},
      {"opensuse121", "opensuse-64", GUESS_VERSION_OPENSUSE_12, kIso},
      {"opensuse131", "opensuse-64", GUESS_VERSION_OPENSUSE_13_1, kIso},
      {"opensuse-nover", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      {"noproduct131", "opensuse", GUESS_VERSION_OPENSUSE_13_1, kIso},
      {"opensuse132", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kIso},
      {"leap421", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kIso},
      // REPOID lines.
      {"sled12", "sles12-64", GUESS_VERSION_SLED_ALL, kIso},
      // PRODUCT and VERSION lines around an SLE 12 REPOID change nothing.
      {"sled12-mixed", "sles12-64", GUESS_VERSION_SLED_ALL, kNoIso},
      {"sles12-s390", "sles12", 0, kNoIso},
      // An unknown product falls back to the identifier of a 13.2 REPOID.
      {"unknown-repo132", "sles12-64", 0, kNoIso},
      // The products file.
      {"p-sled11-64", "sles11-64", GUESS_VERSION_SLED_ALL, kIso},
      {"p-sles10-32", "sles10", 0, kIso},
      {"p-sles9", "sles", 0, kNoIso},
      {"p-suse-64", "suse-64", 0, kIso},
      {"p-suse", "suse", 0, kNoIso},
      {"p-nld9", "nld9", 0, kNoIso},
      {"p-sjds", "sjds", 0, kNoIso},
      {"p-leap15-64", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kIso},
      {"p-leap15-32", "opensuse", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kNoIso},
      {"p-tumbleweed", "opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, kNoIso},
      {"p-sles15", "sles15-64", 0, kNoIso},
      {"p-unknown", nullptr},
      {"p-short", nullptr},
      // Root marker and damaged files.
      {"disk-marker", "suse", 0, kNoIso},
      {"no-marker", nullptr},
      // No PRODUCT line at all reads as openSUSE of an unknown release.
      {"bad-empty", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      // A bare PRODUCT key keeps an empty product name, which no row knows.
      {"bad-keys-only", nullptr},
      // The carriage returns stay in the values: "x86_64\r" is not x86_64.
      {"bad-crlf", "sles10", GUESS_VERSION_SLES_10_SP2_OR_LOWER, kNoIso},
      {"bad-version", "opensuse", GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, kNoIso},
      {"bad-huge", "sles", 0, kNoIso},
  };
  ExpectGuesses("suse", rows);
}

}  // namespace
