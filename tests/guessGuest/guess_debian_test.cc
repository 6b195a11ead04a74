#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuesses;
using tvxtest::GuessRow;
using tvxtest::kIso;
using tvxtest::kNoIso;

TEST(GuessDebian, MasteredMedia) {
  const GuessRow rows[] = {
      // Debian release and architecture.
      {"deb4-i386", "debian4", 0, kIso},
      // Arm before 10 has no Debian identifier of its own.
      {"deb9-arm64", "arm-ubuntu-64", 0, kNoIso},
      {"deb10-arm64", "arm-debian10-64", 0, kNoIso},
      {"deb11-amd64", "debian11-64", 0, kIso},
      {"deb11-noisolinux", "debian11", 0, kNoIso},
      {"deb12-amd64", nullptr},
      {"deb10-noarch", nullptr},
      // Ubuntu desktop classes.
      {"ubu-704", "ubuntu", GUESS_VERSION_UBUNTU_704_OR_LOWER, kIso, "7.04"},
      {"ubu-710", "ubuntu", GUESS_VERSION_UBUNTU_710_OR_HIGHER, kIso, "7.10"},
      {"kubu-804", "ubuntu-64", GUESS_VERSION_UBUNTU_710_OR_HIGHER, kIso, "8.04"},
      {"ubu-1404", "ubuntu-64", GUESS_VERSION_UBUNTU_1404, kIso, "14.04"},
      {"ubu-140402", "ubuntu-64", GUESS_VERSION_UBUNTU_1404, kIso, "14.04.2"},
      {"ubu-1410", "ubuntu-64", GUESS_VERSION_UBUNTU_1410, kIso, "14.10"},
      {"ubu-1504", "ubuntu", GUESS_VERSION_UBUNTU_1504_TO_2004, kIso, "15.04"},
      {"ubu-2004", "ubuntu-64", GUESS_VERSION_UBUNTU_1504_TO_2004, kIso, "20.04.1"},
      {"ubu-2004-noiso", "ubuntu-64", GUESS_VERSION_UBUNTU_1504_TO_2004, kNoIso, "20.04.1"},
      // From 20.10 on the isolinux probe is overruled.
      {"ubu-2010", "ubuntu-64", GUESS_VERSION_UBUNTU_2010_OR_HIGHER, kIso, "20.10"},
      {"ubu-2204-arm", "arm-ubuntu-64", GUESS_VERSION_UBUNTU_2010_OR_HIGHER, kIso, "22.04.3"},
      // One word: no version word, so no class beyond the first and no text.
      {"ubu-oneword", "ubuntu-64", GUESS_VERSION_UBUNTU_704_OR_LOWER, kNoIso, ""},
      // Not recognised, but the version text is already written.
      {"ubu-noarch", nullptr, 0, false, "18.04.5"},
      // Ubuntu server classes.
      {"srv-804", "ubuntu", GUESS_VERSION_UBUNTU_SERVER_804_OR_LOWER, kIso, "Server 8.04.4"},
      {"srv-810", "ubuntu-64", GUESS_VERSION_UBUNTU_SERVER_810_OR_HIGHER, kIso, "Server 8.10"},
      {"srv-1404", "ubuntu-64", GUESS_VERSION_UBUNTU_SERVER_1404, kIso, "Server 14.04.1"},
      {"srv-140402", "ubuntu-64", GUESS_VERSION_UBUNTU_SERVER_140402, kIso, "Server 14.04.2"},
      {"srv-1410", "ubuntu-64", GUESS_VERSION_UBUNTU_SERVER_1410, kIso, "Server 14.10"},
      {"srv-1604", "ubuntu-64", GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER, kIso, "Server 16.04.7"},
      // Damaged info files.
      {"bad-empty", nullptr},
      // The text ends at its first NUL byte: no architecture word is left.
      {"bad-nul-early", nullptr},
      // The CR LF only touches the last word.
      {"bad-crlf", "ubuntu-64", GUESS_VERSION_UBUNTU_1504_TO_2004, kIso, "20.04.1"},
      // Cut to 31 characters.
      {"bad-longword", "ubuntu-64", GUESS_VERSION_UBUNTU_1404, kNoIso,
       "14.04.0000000000000000000000000"},
      {"bad-huge", "ubuntu-64", GUESS_VERSION_UBUNTU_1504_TO_2004, kNoIso, "20.04"},
  };
  ExpectGuesses("debian", rows);
}

}  // namespace
