#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuesses;
using tvxtest::GuessRow;
using tvxtest::kIso;
using tvxtest::kNoIso;

TEST(GuessMandrivaTurboLumen, MasteredMedia) {
  const GuessRow rows[] = {
      // Mandriva: a VERSION file always means an isolinux configuration.
      {"mdv2006-64", "mandriva-64", GUESS_VERSION_MANDRIVA_2006, kIso, "2006"},
      {"mdv2006-32", "mandriva", GUESS_VERSION_MANDRIVA_2006, kIso, "2006"},
      {"mdk101", "mandrake", 0, kIso},
      {"mdv-noyear", "mandriva-64", 0, kIso},
      // No architecture: not recognised, but the release is already written.
      {"mdv2006-ppc", nullptr, GUESS_VERSION_MANDRIVA_2006, kIso, "2006"},
      {"other", nullptr},
      // Mandriva: volume identifier.
      {"vol2010-32", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso},
      {"vol2010-64", "mandriva-64", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kIso},
      // Before 2010 the identifier alone gives no class.
      {"vol2009", "mandriva", 0, kNoIso},
      // The class from the identifier, the architecture from product.id.
      {"vol2010-ppc", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso},
      {"vol2010-ppc-only", nullptr},
      // Settled by the identifier: product.id is not read.
      {"vol2010-noversion-pid", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso},
      // Mandriva: product.id.
      {"pid2008.0", "mandriva", GUESS_VERSION_MANDRIVA_2008_0, kIso, "2008.0"},
      {"pid2007.1", "mandriva-64", GUESS_VERSION_MANDRIVA_2007, kNoIso, "2007.1"},
      {"pid2009.1", "mandriva", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, kNoIso, "2009.1"},
      {"pid2006.0", "mandriva", 0, kNoIso, "2006.0"},
      {"pid-noversion", "mandriva-64", 0, kNoIso},
      {"pid-lastfield", "mandriva", 0, kNoIso},
      // Unknown architecture: not recognised, the version text stays.
      {"pid-ppc", nullptr, 0, false, "2008.0"},
      {"pid-noarch", nullptr},
      {"pid-othervendor", nullptr},
      // TurboLinux: the first word of README.
      {"turbo8", "turbolinux"},
      {"turbo-caps", nullptr},
      // Lumen: package directories.
      {"lumen-64", "tarvex-lumen-64"},
      {"lumen-arm", "arm-tarvex-lumen-64"},
      {"lumen-both", nullptr},
      {"lumen-nomarker", nullptr},
  };
  ExpectGuesses("mandriva", rows);
}

}  // namespace
