#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuess;
using tvxtest::GuessRow;
using tvxtest::kIso;
using tvxtest::kNoIso;

TEST(GuessMandriva, VersionFile) {
  const GuessRow rows[] = {
      // A VERSION file always means an isolinux configuration.
      {"mandriva/mdv2006-64", "mandriva-64", GUESS_VERSION_MANDRIVA_2006, kIso, "2006"},
      {"mandriva/mdv2006-32", "mandriva", GUESS_VERSION_MANDRIVA_2006, kIso, "2006"},
      {"mandriva/mdk101", "mandrake", 0, kIso},
      {"mandriva/mdk-any", "mandrake", 0, kIso},
      {"mandriva/mdv-noyear", "mandriva-64", 0, kIso},
      // No architecture: not recognised, but the release is already written.
      {"mandriva/mdv2006-ppc", nullptr, GUESS_VERSION_MANDRIVA_2006, kIso, "2006"},
      {"mandriva/other", nullptr},
      {"mandriva/bad-empty", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessMandriva, VolumeIdentifier) {
  const GuessRow rows[] = {
      {"mandriva/vol2010-32", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso},
      {"mandriva/vol2010-64", "mandriva-64", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kIso},
      {"mandriva/vol2010-32iso", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kIso},
      // Before 2010 the identifier alone gives no class.
      {"mandriva/vol2009", "mandriva", 0, kNoIso},
      // The class from the identifier, the architecture from product.id.
      {"mandriva/vol2010-ppc", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso},
      {"mandriva/vol2010-ppc-only", nullptr},
      // Settled by the identifier: product.id is not read.
      {"mandriva/vol2010-noversion-pid", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER,
       kNoIso},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessMandriva, ProductId) {
  const GuessRow rows[] = {
      {"mandriva/pid2008.0", "mandriva", GUESS_VERSION_MANDRIVA_2008_0, kIso, "2008.0"},
      {"mandriva/pid2007.1", "mandriva-64", GUESS_VERSION_MANDRIVA_2007, kNoIso, "2007.1"},
      {"mandriva/pid2009.1", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso, "2009.1"},
      {"mandriva/pid2006.0", "mandriva", 0, kNoIso, "2006.0"},
      {"mandriva/pid-noversion", "mandriva-64", 0, kNoIso},
      {"mandriva/pid-lastfield", "mandriva", 0, kNoIso},
      // Unknown architecture: not recognised, the version text stays.
      {"mandriva/pid-ppc", nullptr, 0, false, "2008.0"},
      {"mandriva/pid-noarch", nullptr},
      {"mandriva/pid-othervendor", nullptr},
      {"mandriva/pid-binary", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessTurboLinux, ReadmeFirstWord) {
  const GuessRow rows[] = {
      {"mandriva/turbo8", "turbolinux"},
      {"mandriva/turbo-caps", nullptr},
      {"mandriva/turbo-late", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

TEST(GuessLumen, PackageDirectories) {
  const GuessRow rows[] = {
      {"mandriva/lumen-64", "tarvex-lumen-64"}, {"mandriva/lumen-arm", "arm-tarvex-lumen-64"},
      {"mandriva/lumen-both", nullptr},         {"mandriva/lumen-none", nullptr},
      {"mandriva/lumen-nomarker", nullptr},
  };
  for (const GuessRow &row : rows) ExpectGuess(row);
}

}  // namespace
