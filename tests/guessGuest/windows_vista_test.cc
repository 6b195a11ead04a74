// Image-based Windows setup media, recognised end to end through Guess_Guest
// on images mastered by scripts/media/windows.sh.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "support/log_capture.h"

namespace {

std::string Image(const std::string &name) {
  return tvxtest::MediaDir() + "/windows/" + name + ".iso";
}

constexpr const char kServer2012[] =
    "Windows Server 2012 SERVERSTANDARDCORE?Windows Server 2012 SERVERSTANDARD?"
    "Windows Server 2012 SERVERDATACENTERCORE?Windows Server 2012 SERVERDATACENTER?";
constexpr const char kServer2012R2[] =
    "Windows Server 2012 R2 SERVERSTANDARDCORE?Windows Server 2012 R2 SERVERSTANDARD?"
    "Windows Server 2012 R2 SERVERDATACENTERCORE?Windows Server 2012 R2 SERVERDATACENTER?";
constexpr const char kServer2016[] =
    "Windows Server 2016 SERVERSTANDARDCORE?Windows Server 2016 SERVERSTANDARD?"
    "Windows Server 2016 SERVERDATACENTERCORE?Windows Server 2016 SERVERDATACENTER?";
constexpr const char kServer2019[] =
    "Windows Server 2019 SERVERSTANDARDCORE?Windows Server 2019 SERVERSTANDARD?"
    "Windows Server 2019 SERVERDATACENTERCORE?Windows Server 2019 SERVERDATACENTER?";
constexpr const char kServerSemiAnnual[] =
    "Windows Server SERVERSTANDARDACORE?Windows Server SERVERDATACENTERACORE?";
constexpr const char kRetail[] =
    "Windows 10 Pro?Windows 10 Home?Windows 10 Education?Windows 10 Home_Single_Language?";
constexpr const char kHome11[] =
    "Windows 10 Home?Windows 10 Home_N?Windows 10 Home_Single_Language?Windows 10 Education?"
    "Windows 10 Education_N?Windows 10 Pro?Windows 10 Pro_N?Windows 10 Pro_Education?"
    "Windows 10 Pro_Education_N?Windows 10 Pro_for_Workstations?"
    "Windows 10 Pro_N_for_Workstations?";
constexpr const char kEducation10[] =
    "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?Windows 10 Enterprise_N?"
    "Windows 10 Pro?Windows 10 Pro_N?Windows 10 Pro_Education?Windows 10 Pro_Education_N?"
    "Windows 10 Pro_for_Workstations?Windows 10 Pro_N_for_Workstations?";

struct Case {
  const char *image;
  const char *guestOS;  // null: not recognised (Guess_Guest returns 1)
  uint32_t version;
  const char *editions;
  const char *displayName = "";
  const char *language = "en-US";
  const char *languages = "en-US?";
};

void PrintTo(const Case &c, std::ostream *os) { *os << c.image; }

class WindowsMedia : public testing::TestWithParam<Case> {};

TEST_P(WindowsMedia, RecognisedThroughTheSequence) {
  const Case &c = GetParam();
  GuessResult r;
  std::memset(&r, 0x5A, sizeof r);
  ASSERT_EQ(Guess_Guest(Image(c.image).c_str(), nullptr, &r), c.guestOS != nullptr ? 0 : 1);
  EXPECT_STREQ(r.guestOS, c.guestOS);
  EXPECT_EQ(r.guestOSOverride, nullptr);
  EXPECT_EQ(r.version, c.version) << Guess_GetSubString(static_cast<GuessVersion>(r.version));
  EXPECT_FALSE(r.noIsolinuxConfig);
  EXPECT_STREQ(r.versionText, "");
  EXPECT_STREQ(r.editions, c.editions);
  EXPECT_STREQ(r.displayName, c.displayName);
  EXPECT_STREQ(r.language, c.language);
  EXPECT_EQ(std::string(r.languageShort), std::string(c.language).substr(0, 31));
  EXPECT_STREQ(r.languages, c.languages);
}

// The build branch decides the release; the first branch rule that holds wins.
INSTANTIATE_TEST_SUITE_P(
    VistaSevenAndServer2008, WindowsMedia,
    testing::Values(
        Case{"vista-x86", "winVista", 0, "Windows Vista BUSINESS?Windows Vista ULTIMATE?"},
        // An unknown branch falls back on the catalogue names.
        Case{"vista-by-catalogue", "winVista-64", 0, "Windows Vista HOMEPREMIUM?"},
        Case{"win7-by-catalogue", "windows7", 0, "Windows 7 PROFESSIONAL?"},
        Case{"server2008-x64", "longhorn-64", 0, ""},
        Case{"win7-x64", "windows7-64", 0, "Windows 7 ULTIMATE?", "", "en-US", "de-DE?en-US?"},
        Case{"win7-x86", "windows7", 0, "", "", "de-DE", "de-DE?"},
        Case{"server2008r2", "windows7srv-64", 0, ""}));

INSTANTIATE_TEST_SUITE_P(
    EightAndServer2012, WindowsMedia,
    testing::Values(
        Case{"win8-x64", "windows8-64", 0, "Windows 8 Pro?Windows 8?"},
        Case{"win8-enterprise", "windows8-64", GUESS_VERSION_WINDOWS_8_ENTERPRISE,
             "Windows 8 Enterprise?"},
        // Evaluation media keep the catalogue's names.
        Case{"win8-trial", "windows8", GUESS_VERSION_WINDOWS_8_TRIAL, "Windows 8 ENTERPRISEEVAL?"},
        Case{"server2012", "windows8srv-64", 0, kServer2012},
        Case{"server2012-trial", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL,
             "Windows Server 2012 SERVERSTANDARDEVAL?"}));

INSTANTIATE_TEST_SUITE_P(
    EightOneAndServer2012R2, WindowsMedia,
    testing::Values(
        Case{"win81-x64", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN,
             "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1 x64"},
        Case{"win81-pro-n", "windows8", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro_N?",
             "Windows 8.1"},
        Case{"win81-enterprise", "windows8-64", GUESS_VERSION_WINDOWS_81_ENTERPRISE,
             "Windows 8.1 Enterprise?", "Windows 8.1 x64"},
        Case{"win81-enterprise-n", "windows8", GUESS_VERSION_WINDOWS_81_ENTERPRISE,
             "Windows 8.1 Enterprise_N?", "Windows 8.1"},
        Case{"win81-trial", "windows8-64", GUESS_VERSION_WINDOWS_81_TRIAL,
             "Windows 8.1 ENTERPRISEEVAL?", "Windows 8.1 x64"},
        // An ei.cfg that holds no word at all counts as one without the words.
        Case{"win81-ei-empty", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN,
             "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1 x64"},
        Case{"win81-ei-binary", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN,
             "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1 x64"},
        // Not recognised without BuildArch, yet the editions and the display
        // name are already written.
        Case{"win81-no-arch", nullptr, 0, "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1", "en-US",
             ""},
        Case{"server2012r2", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
             kServer2012R2, "Windows Server 2012 R2"},
        // product.ini alone makes a server medium.
        Case{"server2012r2-trial", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL, "",
             "Windows Server 2012 R2"},
        Case{"server2012r2-volume", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
             kServer2012R2, "Windows Server 2012 R2"},
        Case{"hyperv2012r2", "winHyperV", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
             "Hyper-V Server 2012 R2 SERVERHYPERCORE?"}));

INSTANTIATE_TEST_SUITE_P(
    Ten, WindowsMedia,
    testing::Values(
        Case{"win10-x64", "windows9-64", 0, kRetail},
        Case{"win10-zh", "windows9-64", 0,
             "Windows 10 Pro?Windows 10 Home?Windows 10 Home_China?Windows 10 Education?"
             "Windows 10 Home_Single_Language?",
             "", "zh-CN", "zh-CN?"},
        Case{"win10-n", "windows9-64", 0,
             "Windows 10 Pro_N?Windows 10 Home_N?Windows 10 Education_N?"},
        Case{"win10-skype", "windows9-64", 0, kRetail},
        Case{"win10-enterprise", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
             "Windows 10 Enterprise?"},
        Case{"win10-ltsb2015", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
             "Windows 10 Enterprise_2015_LTSB?"},
        Case{"win10-ltsb2016-n", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
             "Windows 10 Enterprise_N_2016_LTSB?"},
        Case{"win10-pro-ei", "windows9-64", GUESS_VERSION_WINDOWS_10_PLAIN, kRetail},
        Case{"win10-esd-x86", "windows9", GUESS_VERSION_WINDOWS_10_ESD, kRetail},
        // The ESD class is not given on Arm.
        Case{"win10-esd-arm64", "arm-windows9-64", 0, kRetail},
        Case{"win10-winbranch", "windows9", 0, kRetail},
        Case{"win10-rs3", "windows9-64", 0,
             "Windows 10 Home?Windows 10 Home_N?Windows 10 Home_Single_Language?"
             "Windows 10 Education?Windows 10 Education_N?Windows 10 Pro?Windows 10 Pro_N?"},
        Case{"win10-rs3-ei", "windows9-64", 0,
             "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?"
             "Windows 10 Enterprise_N?Windows 10 Pro?Windows 10 Pro_N?"},
        Case{"win10-rs4-ei", "windows9-64", 0, kEducation10},
        Case{"win10-rs5", "windows9-64", 0, kHome11},
        Case{"win10-rs5-ltsc", "windows9-64", 0, "Windows 10 Enterprise_LTSC_2019?"},
        Case{"win10-rs5-education", "windows9-64", 0,
             "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?"
             "Windows 10 Enterprise_N?Windows 10 Enterprise_for_Virtual_Desktops?Windows 10 Pro?"
             "Windows 10 Pro_N?Windows 10 Pro_Education?Windows 10 Pro_Education_N?"
             "Windows 10 Pro_for_Workstations?Windows 10 Pro_N_for_Workstations?"},
        Case{"win10-19h1", "windows9-64", 0, kHome11},
        Case{"win10-vb-ei", "windows9-64", 0, kEducation10},
        // A forced server flag keeps the Windows 10 identifier.
        Case{"win10-fbl", "windows9-64", 0, kServer2012R2}));

INSTANTIATE_TEST_SUITE_P(
    ServersAndEleven, WindowsMedia,
    testing::Values(
        Case{"server2016", "windows9srv-64", 0, kServer2016},
        Case{"server2016-essentials", "windows9srv-64", 0,
             "Windows Server 2016 SERVERSOLUTION?Windows Server 2016 SERVERSTORAGESTANDARD?"
             "Windows Server 2016 SERVERSTORAGEWORKGROUP?"},
        Case{"hyperv2016", "winHyperV", 0, "Hyper-V Server 2016 SERVERHYPERCORE?"},
        Case{"server2016-tp5", "windows9srv-64", 0,
             "Windows Server 2016 Technical Preview 5 SERVERSTANDARDCORE?"
             "Windows Server 2016 Technical Preview 5 SERVERSTANDARD?"
             "Windows Server 2016 Technical Preview 5 SERVERDATACENTERCORE?"
             "Windows Server 2016 Technical Preview 5 SERVERDATACENTER?"},
        Case{"server2016-tp5-solution", "windows9srv-64", 0,
             "Windows Server 2016 Technical Preview 5 SERVERSOLUTION?"},
        Case{"server1709", "windows9srv-64", 0,
             "Windows Server 2016 SERVERSTANDARDACORE?Windows Server 2016 SERVERDATACENTERACORE?"},
        Case{"server2019", "windows2019srv-64", 0, kServer2019},
        Case{"server2019-ei", "windows2019srv-64", 0, kServerSemiAnnual},
        Case{"server2004", "windows2019srv-64", 0, kServerSemiAnnual},
        Case{"server2022", "windows2019srvNext-64", 0,
             "Windows Server 2022 SERVERSTANDARDCORE?Windows Server 2022 SERVERSTANDARD?"
             "Windows Server 2022 SERVERDATACENTERCORE?Windows Server 2022 SERVERDATACENTER?"},
        Case{"win11", "windows11-64", 0, "", "", "en-US", "de-DE?en-US?"},
        Case{"win11-arm64", "arm-windows11-64", 0, ""},
        Case{"win11-x86", "windows11-64", 0, ""},
        Case{"winmain-server", "longhorn-64", 0, ""},
        Case{"unknown-branch-server", "longhorn", 0, ""},
        Case{"winmain-client", nullptr, 0, "", "", "en-US", ""}));

// lang.ini: the highest number wins (the first on a tie); anything the walk
// cannot read leaves "en-US" or the best tag seen so far.
INSTANTIATE_TEST_SUITE_P(
    Languages, WindowsMedia,
    testing::Values(
        Case{"lang-tie", "windows7-64", 0, "", "", "fr-FR", "fr-FR?en-GB?it-IT?"},
        Case{"lang-not-a-number", "windows7-64", 0, "", "", "de-DE", ""},
        Case{"lang-lf-only", "windows7-64", 0, "", "", "en-US", ""},
        Case{"lang-truncated", "windows7-64", 0, "", "", "en-US", ""},
        Case{"lang-long-tag", "windows7-64", 0, "", "",
             "sr-Latn-RS-x-test-private-use-tag-too-long",
             "sr-Latn-RS-x-test-private-use-tag-too-long?"},
        Case{"lang-missing", nullptr, 0, "", "", "en-US", ""}));

// Broken idwbinfo.txt files end as "not recognised", or as far as the
// entries that can still be read take the recogniser.
INSTANTIATE_TEST_SUITE_P(
    BrokenBuildInfo, WindowsMedia,
    testing::Values(Case{"idwb-empty", nullptr, 0, "", "", "en-US", ""},
                    Case{"idwb-binary", nullptr, 0, "", "", "en-US", ""},
                    // BuildArch's value runs on to the end of the only line.
                    Case{"idwb-one-line", "windows9", 0, kRetail}));

TEST(WindowsVistaLanguages, HugeListIsCutToItsField) {
  GuessResult r;
  ASSERT_EQ(Guess_Guest(Image("lang-huge").c_str(), nullptr, &r), 0);
  EXPECT_STREQ(r.guestOS, "windows7-64");
  EXPECT_STREQ(r.language, "en-US");  // the last line carries the highest number
  EXPECT_EQ(std::strlen(r.languages), sizeof r.languages - 1);
  EXPECT_EQ(std::string(r.languages).substr(0, 12), "aa-X1?aa-X2?");
}

// Called by itself on a result another recogniser filled, the recogniser
// keeps the result but for the language fields.
TEST(WindowsVistaContract, KeepsAFilledResultItDoesNotRecognise) {
  struct Row {
    const char *image;
    const char *displayName;  // written even though nothing is recognised
  };
  const Row rows[] = {{"lang-missing", ""}, {"winmain-client", ""}, {"win81-no-arch", "Windows 8.1"}};
  for (const Row &row : rows) {
    SCOPED_TRACE(row.image);
    GuessMedium medium{};
    ASSERT_TRUE(tvx::guess::OpenMedium(Image(row.image).c_str(), &medium));
    GuessResult before{};
    before.guestOS = "winXPPro";
    before.version = GUESS_VERSION_UNKNOWN;
    tvx::guess::CopyField(before.language, "German");
    tvx::guess::CopyField(before.languageShort, "German");
    GuessResult r = before;
    EXPECT_TRUE(Guess_WindowsVistaAndNewer(&medium, &r));
    EXPECT_STREQ(r.guestOS, "winXPPro");
    EXPECT_STREQ(r.language, "en-US");
    EXPECT_STREQ(r.languageShort, "en-US");
    EXPECT_STREQ(r.displayName, row.displayName);

    GuessResult empty{};
    EXPECT_FALSE(Guess_WindowsVistaAndNewer(&medium, &empty));
    tvx::guess::CloseMedium(&medium);
  }
}

TEST(WindowsVistaContract, OverwritesAFilledResultItRecognises) {
  GuessMedium medium{};
  ASSERT_TRUE(tvx::guess::OpenMedium(Image("server2019").c_str(), &medium));
  GuessResult r{};
  r.guestOS = "winXPPro";
  tvx::guess::CopyField(r.versionText, "SP2");
  EXPECT_TRUE(Guess_WindowsVistaAndNewer(&medium, &r));
  EXPECT_STREQ(r.guestOS, "windows2019srv-64");
  EXPECT_STREQ(r.versionText, "SP2");  // not a field of this family
  EXPECT_STREQ(r.editions, kServer2019);
  tvx::guess::CloseMedium(&medium);
}

}  // namespace
