// Red Hat family media, recognised end to end through Guess_Guest on images
// mastered by scripts/media/redhat.sh.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "support/log_capture.h"

namespace {

std::string Image(const std::string &name) {
  return tvxtest::MediaDir() + "/redhat/" + name + ".iso";
}

struct Case {
  const char *image;
  const char *guestOS;  // null: not recognised (Guess_Guest returns 1)
  uint32_t version = GUESS_VERSION_UNKNOWN;
  bool noIsolinuxConfig = false;
};

void PrintTo(const Case &c, std::ostream *os) { *os << c.image; }

class RedHatMedia : public testing::TestWithParam<Case> {};

TEST_P(RedHatMedia, RecognisedThroughTheSequence) {
  const Case &c = GetParam();
  GuessResult r;
  std::memset(&r, 0x5A, sizeof r);
  ASSERT_EQ(Guess_Guest(Image(c.image).c_str(), nullptr, &r), c.guestOS != nullptr ? 0 : 1);
  EXPECT_STREQ(r.guestOS, c.guestOS);
  EXPECT_EQ(r.guestOSOverride, nullptr);
  EXPECT_EQ(r.version, c.version) << Guess_GetSubString(static_cast<GuessVersion>(r.version));
  EXPECT_EQ(r.noIsolinuxConfig != 0, c.guestOS != nullptr && c.noIsolinuxConfig);
  EXPECT_STREQ(r.versionText, "");
  // The Windows recogniser ran third and did not know the medium.
  EXPECT_STREQ(r.language, "en-US");
  EXPECT_STREQ(r.languageShort, "en-US");
  EXPECT_STREQ(r.languages, "");
  EXPECT_STREQ(r.editions, "");
  EXPECT_STREQ(r.displayName, "");
}

INSTANTIATE_TEST_SUITE_P(
    EnterpriseLinux, RedHatMedia,
    testing::Values(
        Case{"rhel3-x86", "rhel3"}, Case{"rhel3-x64", "rhel3-64"}, Case{"rhel4-x64", "rhel4-64"},
        Case{"rhel4-x86", "rhel4"}, Case{"rhel5-server-x64", "rhel5-64"},
        Case{"rhel5-client-x86", "rhel5"}, Case{"rhel6-x64", "rhel6-64"},
        Case{"rhel6-x86", "rhel6"},
        Case{"rhel7-server-name", "rhel7-64", GUESS_VERSION_RHEL_SERVER},
        Case{"rhel7-workstation-name", "rhel7-64", GUESS_VERSION_RHEL_WORKSTATION},
        Case{"rhel7-client-name", "rhel7-64", GUESS_VERSION_RHEL_CLIENT},
        // Workstation wins over Server, Server over Client.
        Case{"rhel7-server-workstation", "rhel7-64", GUESS_VERSION_RHEL_WORKSTATION},
        Case{"rhel7-client", "rhel7-64", GUESS_VERSION_RHEL_CLIENT},
        Case{"rhel7-server", "rhel7", GUESS_VERSION_RHEL_SERVER},
        Case{"rhel7-no-treeinfo", nullptr}, Case{"rhel7-treeinfo-empty", nullptr},
        // Without .discinfo the boot configuration tells RHEL 7; the CentOS
        // key generation still gives the class.
        Case{"rhel7-boot-x64", "rhel7-64", GUESS_VERSION_CENTOS_7_MINIMAL},
        Case{"rhel7-boot-x86", "rhel7"}, Case{"rhel7-boot-noarch", nullptr},
        // RHEL 8 has one identifier whatever the architecture line says.
        Case{"rhel8-x64", "rhel8-64"}, Case{"rhel8-x86", "rhel8-64"},
        Case{"rhel21", "rhel2", 0, true}, Case{"rhel3-notes", nullptr},
        Case{"redhat9", "redhat", GUESS_VERSION_CENTOS_3}, Case{"notes-blank", nullptr}));

INSTANTIATE_TEST_SUITE_P(
    CentOS, RedHatMedia,
    testing::Values(
        Case{"centos3-x86", "centos", GUESS_VERSION_CENTOS_3},
        Case{"centos4-x64", "centos-64", GUESS_VERSION_CENTOS_4},
        // The key comes before the release-name rows.
        Case{"centos5-rhel-name", "centos-64", GUESS_VERSION_CENTOS_5},
        Case{"centos6-x86", "centos6", GUESS_VERSION_CENTOS_6},
        Case{"centos6-x64", "centos6-64", GUESS_VERSION_CENTOS_6},
        Case{"centos7", "centos7-64", GUESS_VERSION_CENTOS_7},
        Case{"centos7-last-perl", "centos7-64", GUESS_VERSION_CENTOS_7},
        Case{"centos7-minimal", "centos7-64", GUESS_VERSION_CENTOS_7_MINIMAL},
        Case{"centos7-x86", nullptr},
        Case{"centos8", "centos8-64", GUESS_VERSION_CENTOS_8},
        Case{"centos8-stream", "centos8-64", GUESS_VERSION_CENTOS_8_STREAM},
        Case{"centos8-x86", nullptr}, Case{"centos8-aarch64", nullptr},
        Case{"centos-no-key", "centos-64"}));

INSTANTIATE_TEST_SUITE_P(
    OracleAndAsianux, RedHatMedia,
    testing::Values(Case{"asianux3", "asianux3-64"}, Case{"asianux3-sp", "asianux3"},
                    Case{"asianux4", "asianux4-64"}, Case{"asianux7", "asianux7-64"},
                    Case{"asianux7-live-named", "asianux7-64", GUESS_VERSION_ASIANUX_7_LIVE},
                    Case{"asianux7-live", "asianux7-64", GUESS_VERSION_ASIANUX_7_LIVE},
                    Case{"oracle4", "oraclelinux"}, Case{"oracle5", "oraclelinux-64"},
                    Case{"oracle6", "oraclelinux6"}, Case{"oracle7", "oraclelinux7-64"},
                    // No fall-back on the older Oracle rows.
                    Case{"oracle7-x86", nullptr}, Case{"oracle8", "oraclelinux8-64"}));

INSTANTIATE_TEST_SUITE_P(
    Fedora, RedHatMedia,
    testing::Values(Case{"fedora-core6", "Fedora"}, Case{"fedora7", "Fedora-64"},
                    Case{"fedora8", "Fedora", GUESS_VERSION_FEDORA_8},
                    Case{"fedora12", "Fedora-64", GUESS_VERSION_FEDORA_9_TO_12},
                    Case{"fedora13", "Fedora-64", GUESS_VERSION_FEDORA_13},
                    Case{"fedora16", "Fedora-64", GUESS_VERSION_FEDORA_14_TO_16},
                    Case{"fedora17", "Fedora-64", GUESS_VERSION_FEDORA_17},
                    Case{"fedora18", "Fedora-64", GUESS_VERSION_FEDORA_18},
                    Case{"fedora20", "Fedora-64", GUESS_VERSION_FEDORA_19_TO_20},
                    Case{"fedora21", "Fedora-64", GUESS_VERSION_FEDORA_21},
                    Case{"fedora-server24", "Fedora-64", GUESS_VERSION_FEDORA_22_TO_28},
                    Case{"fedora28", "Fedora-64", GUESS_VERSION_FEDORA_22_TO_28},
                    Case{"fedora29", "Fedora-64", GUESS_VERSION_FEDORA_29_OR_HIGHER},
                    Case{"fedora35-aarch64", "arm-Fedora-64", GUESS_VERSION_FEDORA_29_OR_HIGHER,
                         true},
                    // The number would stand past the end of the name.
                    Case{"fedora-bare", "Fedora-64"},
                    Case{"fedora-live-x64", "Fedora-64", GUESS_VERSION_FEDORA_LIVE},
                    Case{"fedora-live-aa64", "arm-Fedora-64", GUESS_VERSION_FEDORA_LIVE, true},
                    Case{"fedora-live", "Fedora", GUESS_VERSION_FEDORA_LIVE}));

// Media this recogniser does not know, and broken marker files: never more
// than "not recognised". .discinfo lines are compared as they stand, so a
// CR LF file names no known architecture.
INSTANTIATE_TEST_SUITE_P(
    Unknown, RedHatMedia,
    testing::Values(Case{"ppc64", nullptr}, Case{"unknown-release", nullptr},
                    Case{"discinfo-empty", nullptr}, Case{"discinfo-binary", nullptr},
                    Case{"discinfo-one-line", nullptr}, Case{"discinfo-crlf", nullptr},
                    Case{"discinfo-two-lines", nullptr},
                    Case{"discinfo-huge", "centos8-64", GUESS_VERSION_CENTOS_8_STREAM}));

// Run by itself, the recogniser answers for a result that is already filled
// and writes its three fields only when it recognises the medium.
TEST(RedHatContract, AnswersForAFilledResult) {
  struct Row {
    const char *image;
    bool recognised;
  };
  const Row rows[] = {{"ppc64", false}, {"rhel7-no-treeinfo", false}, {"centos7", true}};
  for (const Row &row : rows) {
    SCOPED_TRACE(row.image);
    GuessMedium medium{};
    ASSERT_TRUE(tvx::guess::OpenMedium(Image(row.image).c_str(), &medium));
    GuessResult before;
    std::memset(&before, 0x5A, sizeof before);
    before.guestOS = "winXPPro";
    before.guestOSOverride = nullptr;
    before.noIsolinuxConfig = TRUE;
    tvx::guess::CopyField(before.versionText, "SP3");
    GuessResult r;
    std::memcpy(&r, &before, sizeof r);
    EXPECT_TRUE(Guess_RedHat(&medium, &r));
    if (!row.recognised) {
      EXPECT_EQ(std::memcmp(&r, &before, sizeof r), 0) << "result changed";
    } else {
      EXPECT_STREQ(r.guestOS, "centos7-64");
      EXPECT_EQ(r.version, GUESS_VERSION_CENTOS_7);
      EXPECT_FALSE(r.noIsolinuxConfig);
      EXPECT_STREQ(r.versionText, "SP3");
      EXPECT_EQ(std::memcmp(r.language, before.language, sizeof r.language), 0);
    }
    GuessResult empty{};
    EXPECT_EQ(Guess_RedHat(&medium, &empty) != 0, row.recognised);
    tvx::guess::CloseMedium(&medium);
  }
}

}  // namespace
