// Image-based Windows setup media, recognised end to end through Guess_Guest
// on images mastered by scripts/media/windows.sh.
#include "guessGuest/media_table.h"

namespace {

std::string Image(const std::string &name) { return tvxtest::MediaPath("windows/" + name); }

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

template <size_t N>
void ExpectMedia(const Case (&cases)[N]) {
  for (const Case &c : cases) {
    std::string image = std::string("windows/") + c.image;
    tvxtest::ExpectGuess({image.c_str(), c.guestOS, c.version},
                         {c.language, nullptr, c.languages, c.editions, c.displayName});
  }
}

// The build branch decides the release; the first branch rule that holds wins.
TEST(GuessWindowsVista, VistaSevenAndServer2008) {
  const Case cases[] = {
      {"vista-x86", "winVista", 0, "Windows Vista BUSINESS?Windows Vista ULTIMATE?"},
      // An unknown branch falls back on the catalogue names.
      {"vista-by-catalogue", "winVista-64", 0, "Windows Vista HOMEPREMIUM?"},
      {"win7-by-catalogue", "windows7", 0, "Windows 7 PROFESSIONAL?"},
      {"server2008-x64", "longhorn-64", 0, ""},
      {"win7-x64", "windows7-64", 0, "Windows 7 ULTIMATE?", "", "en-US", "de-DE?en-US?"},
      {"win7-x86", "windows7", 0, "", "", "de-DE", "de-DE?"},
      {"server2008r2", "windows7srv-64", 0, ""}};
  ExpectMedia(cases);
}

TEST(GuessWindowsVista, EightAndServer2012) {
  const Case cases[] = {
      {"win8-x64", "windows8-64", 0, "Windows 8 Pro?Windows 8?"},
      {"win8-enterprise", "windows8-64", GUESS_VERSION_WINDOWS_8_ENTERPRISE,
       "Windows 8 Enterprise?"},
      // Evaluation media keep the catalogue's names.
      {"win8-trial", "windows8", GUESS_VERSION_WINDOWS_8_TRIAL, "Windows 8 ENTERPRISEEVAL?"},
      {"server2012", "windows8srv-64", 0, kServer2012},
      {"server2012-trial", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL,
       "Windows Server 2012 SERVERSTANDARDEVAL?"}};
  ExpectMedia(cases);
}

TEST(GuessWindowsVista, EightOneAndServer2012R2) {
  const Case cases[] = {
      {"win81-x64", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro?Windows 8.1?",
       "Windows 8.1 x64"},
      {"win81-pro-n", "windows8", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro_N?",
       "Windows 8.1"},
      {"win81-enterprise", "windows8-64", GUESS_VERSION_WINDOWS_81_ENTERPRISE,
       "Windows 8.1 Enterprise?", "Windows 8.1 x64"},
      {"win81-enterprise-n", "windows8", GUESS_VERSION_WINDOWS_81_ENTERPRISE,
       "Windows 8.1 Enterprise_N?", "Windows 8.1"},
      {"win81-trial", "windows8-64", GUESS_VERSION_WINDOWS_81_TRIAL, "Windows 8.1 ENTERPRISEEVAL?",
       "Windows 8.1 x64"},
      // An ei.cfg that holds no word at all counts as one without the words.
      {"win81-ei-empty", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN,
       "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1 x64"},
      {"win81-ei-binary", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN,
       "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1 x64"},
      // Not recognised without BuildArch, yet the editions and the display
      // name are already written.
      {"win81-no-arch", nullptr, 0, "Windows 8.1 Pro?Windows 8.1?", "Windows 8.1", "en-US", ""},
      {"server2012r2", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN, kServer2012R2,
       "Windows Server 2012 R2"},
      // product.ini alone makes a server medium.
      {"server2012r2-trial", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL, "",
       "Windows Server 2012 R2"},
      {"server2012r2-volume", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
       kServer2012R2, "Windows Server 2012 R2"},
      {"hyperv2012r2", "winHyperV", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
       "Hyper-V Server 2012 R2 SERVERHYPERCORE?"}};
  ExpectMedia(cases);
}

TEST(GuessWindowsVista, Ten) {
  const Case cases[] = {
      {"win10-x64", "windows9-64", 0, kRetail},
      {"win10-zh", "windows9-64", 0,
       "Windows 10 Pro?Windows 10 Home?Windows 10 Home_China?Windows 10 Education?"
       "Windows 10 Home_Single_Language?",
       "", "zh-CN", "zh-CN?"},
      {"win10-n", "windows9-64", 0, "Windows 10 Pro_N?Windows 10 Home_N?Windows 10 Education_N?"},
      {"win10-skype", "windows9-64", 0, kRetail},
      {"win10-enterprise", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
       "Windows 10 Enterprise?"},
      {"win10-ltsb2015", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
       "Windows 10 Enterprise_2015_LTSB?"},
      {"win10-ltsb2016-n", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
       "Windows 10 Enterprise_N_2016_LTSB?"},
      {"win10-pro-ei", "windows9-64", GUESS_VERSION_WINDOWS_10_PLAIN, kRetail},
      {"win10-esd-x86", "windows9", GUESS_VERSION_WINDOWS_10_ESD, kRetail},
      // The ESD class is not given on Arm.
      {"win10-esd-arm64", "arm-windows9-64", 0, kRetail},
      {"win10-winbranch", "windows9", 0, kRetail},
      {"win10-rs3", "windows9-64", 0,
       "Windows 10 Home?Windows 10 Home_N?Windows 10 Home_Single_Language?"
       "Windows 10 Education?Windows 10 Education_N?Windows 10 Pro?Windows 10 Pro_N?"},
      {"win10-rs3-ei", "windows9-64", 0,
       "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?"
       "Windows 10 Enterprise_N?Windows 10 Pro?Windows 10 Pro_N?"},
      {"win10-rs4-ei", "windows9-64", 0, kEducation10},
      {"win10-rs5", "windows9-64", 0, kHome11},
      {"win10-rs5-ltsc", "windows9-64", 0, "Windows 10 Enterprise_LTSC_2019?"},
      {"win10-rs5-education", "windows9-64", 0,
       "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?"
       "Windows 10 Enterprise_N?Windows 10 Enterprise_for_Virtual_Desktops?Windows 10 Pro?"
       "Windows 10 Pro_N?Windows 10 Pro_Education?Windows 10 Pro_Education_N?"
       "Windows 10 Pro_for_Workstations?Windows 10 Pro_N_for_Workstations?"},
      {"win10-19h1", "windows9-64", 0, kHome11},
      {"win10-vb-ei", "windows9-64", 0, kEducation10},
      // A forced server flag keeps the Windows 10 identifier.
      {"win10-fbl", "windows9-64", 0, kServer2012R2}};
  ExpectMedia(cases);
}

TEST(GuessWindowsVista, ServersAndEleven) {
  const Case cases[] = {
      {"server2016", "windows9srv-64", 0, kServer2016},
      {"server2016-essentials", "windows9srv-64", 0,
       "Windows Server 2016 SERVERSOLUTION?Windows Server 2016 SERVERSTORAGESTANDARD?"
       "Windows Server 2016 SERVERSTORAGEWORKGROUP?"},
      {"hyperv2016", "winHyperV", 0, "Hyper-V Server 2016 SERVERHYPERCORE?"},
      {"server2016-tp5", "windows9srv-64", 0,
       "Windows Server 2016 Technical Preview 5 SERVERSTANDARDCORE?"
       "Windows Server 2016 Technical Preview 5 SERVERSTANDARD?"
       "Windows Server 2016 Technical Preview 5 SERVERDATACENTERCORE?"
       "Windows Server 2016 Technical Preview 5 SERVERDATACENTER?"},
      {"server2016-tp5-solution", "windows9srv-64", 0,
       "Windows Server 2016 Technical Preview 5 SERVERSOLUTION?"},
      {"server1709", "windows9srv-64", 0,
       "Windows Server 2016 SERVERSTANDARDACORE?Windows Server 2016 SERVERDATACENTERACORE?"},
      {"server2019", "windows2019srv-64", 0, kServer2019},
      {"server2019-ei", "windows2019srv-64", 0, kServerSemiAnnual},
      {"server2004", "windows2019srv-64", 0, kServerSemiAnnual},
      {"server2022", "windows2019srvNext-64", 0,
       "Windows Server 2022 SERVERSTANDARDCORE?Windows Server 2022 SERVERSTANDARD?"
       "Windows Server 2022 SERVERDATACENTERCORE?Windows Server 2022 SERVERDATACENTER?"},
      {"win11", "windows11-64", 0, "", "", "en-US", "de-DE?en-US?"},
      {"win11-arm64", "arm-windows11-64", 0, ""},
      {"win11-x86", "windows11-64", 0, ""},
      {"winmain-server", "longhorn-64", 0, ""},
      {"unknown-branch-server", "longhorn", 0, ""},
      {"winmain-client", nullptr, 0, "", "", "en-US", ""}};
  ExpectMedia(cases);
}

// lang.ini: the highest number wins (the first on a tie); anything the walk
// cannot read leaves "en-US" or the best tag seen so far.
TEST(GuessWindowsVista, Languages) {
  const Case cases[] = {
      {"lang-tie", "windows7-64", 0, "", "", "fr-FR", "fr-FR?en-GB?it-IT?"},
      {"lang-not-a-number", "windows7-64", 0, "", "", "de-DE", ""},
      {"lang-lf-only", "windows7-64", 0, "", "", "en-US", ""},
      {"lang-truncated", "windows7-64", 0, "", "", "en-US", ""},
      {"lang-long-tag", "windows7-64", 0, "", "", "sr-Latn-RS-x-test-private-use-tag-too-long",
       "sr-Latn-RS-x-test-private-use-tag-too-long?"},
      {"lang-missing", nullptr, 0, "", "", "en-US", ""}};
  ExpectMedia(cases);
}

// Broken idwbinfo.txt files end as "not recognised", or as far as the
// entries that can still be read take the recogniser.
TEST(GuessWindowsVista, BrokenBuildInfo) {
  const Case cases[] = {{"idwb-empty", nullptr, 0, "", "", "en-US", ""},
                        {"idwb-binary", nullptr, 0, "", "", "en-US", ""},
                        // BuildArch's value runs on to the end of the only line.
                        {"idwb-one-line", "windows9", 0, kRetail}};
  ExpectMedia(cases);
}

TEST(GuessWindowsVista, HugeListIsCutToItsField) {
  GuessResult r;
  ASSERT_EQ(Guess_Guest(Image("lang-huge").c_str(), nullptr, &r), 0);
  EXPECT_STREQ(r.guestOS, "windows7-64");
  EXPECT_STREQ(r.language, "en-US");  // the last line carries the highest number
  EXPECT_EQ(std::strlen(r.languages), sizeof r.languages - 1);
  EXPECT_EQ(std::string(r.languages).substr(0, 12), "aa-X1?aa-X2?");
}

TEST(GuessWindowsVista, OverwritesAFilledResultItRecognises) {
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
