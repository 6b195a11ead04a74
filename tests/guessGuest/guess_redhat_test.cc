// Red Hat family media, recognised end to end through Guess_Guest on images
// mastered by scripts/media/redhat.sh.
#include "guessGuest/media_table.h"

namespace {

using tvxtest::ExpectGuesses;
using tvxtest::GuessRow;

TEST(GuessRedHat, MasteredMedia) {
  const GuessRow rows[] = {
      // Red Hat Enterprise Linux.
      {"rhel3-x86", "rhel3"},
      {"rhel3-x64", "rhel3-64"},
      {"rhel5-client-x86", "rhel5"},
      {"rhel7-server-name", "rhel7-64", GUESS_VERSION_RHEL_SERVER},
      {"rhel7-workstation-name", "rhel7-64", GUESS_VERSION_RHEL_WORKSTATION},
      {"rhel7-client-name", "rhel7-64", GUESS_VERSION_RHEL_CLIENT},
      // Workstation wins over Server, Server over Client.
      {"rhel7-server-workstation", "rhel7-64", GUESS_VERSION_RHEL_WORKSTATION},
      {"rhel7-client", "rhel7-64", GUESS_VERSION_RHEL_CLIENT},
      {"rhel7-server", "rhel7", GUESS_VERSION_RHEL_SERVER},
      {"rhel7-no-treeinfo", nullptr},
      {"rhel7-treeinfo-empty", nullptr},
      // Without .discinfo the boot configuration tells RHEL 7; the CentOS
      // key generation still gives the class.
      {"rhel7-boot-x64", "rhel7-64", GUESS_VERSION_CENTOS_7_MINIMAL},
      {"rhel7-boot-x86", "rhel7"},
      {"rhel7-boot-noarch", nullptr},
      // RHEL 8 has one identifier whatever the architecture line says.
      {"rhel8-x86", "rhel8-64"},
      {"rhel21", "rhel2", 0, true},
      {"rhel3-notes", nullptr},
      {"redhat9", "redhat", GUESS_VERSION_CENTOS_3},
      {"notes-blank", nullptr},
      // CentOS.
      {"centos3-x86", "centos", GUESS_VERSION_CENTOS_3},
      // The key comes before the release-name rows.
      {"centos5-rhel-name", "centos-64", GUESS_VERSION_CENTOS_5},
      {"centos6-x86", "centos6", GUESS_VERSION_CENTOS_6},
      {"centos7", "centos7-64", GUESS_VERSION_CENTOS_7},
      {"centos7-minimal", "centos7-64", GUESS_VERSION_CENTOS_7_MINIMAL},
      {"centos7-x86", nullptr},
      {"centos8", "centos8-64", GUESS_VERSION_CENTOS_8},
      {"centos8-stream", "centos8-64", GUESS_VERSION_CENTOS_8_STREAM},
      {"centos8-x86", nullptr},
      {"centos8-aarch64", nullptr},
      {"centos-no-key", "centos-64"},
      // Oracle Linux and Asianux.
      {"asianux3-sp", "asianux3"},
      {"asianux7", "asianux7-64"},
      {"asianux7-live-named", "asianux7-64", GUESS_VERSION_ASIANUX_7_LIVE},
      {"asianux7-live", "asianux7-64", GUESS_VERSION_ASIANUX_7_LIVE},
      {"oracle7", "oraclelinux7-64"},
      // No fall-back on the older Oracle rows.
      {"oracle7-x86", nullptr},
      // Fedora.
      {"fedora-core6", "Fedora"},
      {"fedora7", "Fedora-64"},
      {"fedora8", "Fedora", GUESS_VERSION_FEDORA_8},
      {"fedora12", "Fedora-64", GUESS_VERSION_FEDORA_9_TO_12},
      {"fedora13", "Fedora-64", GUESS_VERSION_FEDORA_13},
      {"fedora16", "Fedora-64", GUESS_VERSION_FEDORA_14_TO_16},
      {"fedora17", "Fedora-64", GUESS_VERSION_FEDORA_17},
      {"fedora18", "Fedora-64", GUESS_VERSION_FEDORA_18},
      {"fedora20", "Fedora-64", GUESS_VERSION_FEDORA_19_TO_20},
      {"fedora21", "Fedora-64", GUESS_VERSION_FEDORA_21},
      {"fedora-server24", "Fedora-64", GUESS_VERSION_FEDORA_22_TO_28},
      {"fedora28", "Fedora-64", GUESS_VERSION_FEDORA_22_TO_28},
      {"fedora29", "Fedora-64", GUESS_VERSION_FEDORA_29_OR_HIGHER},
      {"fedora35-aarch64", "arm-Fedora-64", GUESS_VERSION_FEDORA_29_OR_HIGHER, true},
      // The number would stand past the end of the name.
      {"fedora-bare", "Fedora-64"},
      {"fedora-live-x64", "Fedora-64", GUESS_VERSION_FEDORA_LIVE},
      {"fedora-live-aa64", "arm-Fedora-64", GUESS_VERSION_FEDORA_LIVE, true},
      {"fedora-live", "Fedora", GUESS_VERSION_FEDORA_LIVE},
      // Media this recogniser does not know, and broken marker files: never more
      // than "not recognised".
      {"ppc64", nullptr},
      {"unknown-release", nullptr},
      {"discinfo-two-lines", nullptr},
      {"discinfo-huge", "centos8-64", GUESS_VERSION_CENTOS_8_STREAM}};
  ExpectGuesses("redhat", rows);
}

}  // namespace
