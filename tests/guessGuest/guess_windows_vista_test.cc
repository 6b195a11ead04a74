// Image-based Windows setup media, recognised end to end through Guess_Guest
// on images mastered by scripts/media/windows.sh.
#include "guessGuest/media_table.h"

namespace {

struct Case {
  const char *image;
  const char *guestOS;  // null: not recognised (Guess_Guest returns 1)
  uint32_t version;
  const char *editions;  // the whole list, or the first name of a fixed list of `count` names
  int count = -1;        // -1: `editions` is the whole list
  const char *displayName = "";
  const char *language = "en-US";
  const char *languages = "en-US?";
};

TEST(GuessWindowsVista, MasteredMedia) {
  const Case cases[] = {
      // Vista, 7 and Server 2008: the build branch decides the release; the
      // first branch rule that holds wins.
      {"vista-x86", "winVista", 0, "Windows Vista BUSINESS?Windows Vista ULTIMATE?"},
      // An unknown branch falls back on the catalogue names.
      {"vista-by-catalogue", "winVista-64", 0, "Windows Vista HOMEPREMIUM?"},
      {"win7-by-catalogue", "windows7", 0, "Windows 7 PROFESSIONAL?"},
      {"server2008-x64", "longhorn-64", 0, ""},
      {"win7-x64", "windows7-64", 0, "Windows 7 ULTIMATE?", -1, "", "en-US", "de-DE?en-US?"},
      {"win7-x86", "windows7", 0, "", -1, "", "de-DE", "de-DE?"},
      {"server2008r2", "windows7srv-64", 0, ""},
      // 8 and Server 2012.
      {"win8-x64", "windows8-64", 0, "Windows 8 Pro?Windows 8?"},
      {"win8-enterprise", "windows8-64", GUESS_VERSION_WINDOWS_8_ENTERPRISE,
       "Windows 8 Enterprise?"},
      // Evaluation media keep the catalogue's names.
      {"win8-trial", "windows8", GUESS_VERSION_WINDOWS_8_TRIAL, "Windows 8 ENTERPRISEEVAL?"},
      {"server2012", "windows8srv-64", 0, "Windows Server 2012 SERVERSTANDARDCORE", 4},
      {"server2012-trial", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL,
       "Windows Server 2012 SERVERSTANDARDEVAL?"},
      // 8.1 and Server 2012 R2.
      {"win81-x64", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro?Windows 8.1?",
       -1, "Windows 8.1 x64"},
      {"win81-pro-n", "windows8", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro_N?", -1,
       "Windows 8.1"},
      {"win81-enterprise", "windows8-64", GUESS_VERSION_WINDOWS_81_ENTERPRISE,
       "Windows 8.1 Enterprise?", -1, "Windows 8.1 x64"},
      {"win81-trial", "windows8-64", GUESS_VERSION_WINDOWS_81_TRIAL, "Windows 8.1 ENTERPRISEEVAL?",
       -1, "Windows 8.1 x64"},
      // An ei.cfg that holds no word at all counts as one without the words.
      {"win81-ei-empty", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN,
       "Windows 8.1 Pro?Windows 8.1?", -1, "Windows 8.1 x64"},
      // Not recognised without BuildArch, yet the editions and the display
      // name are already written.
      {"win81-no-arch", nullptr, 0, "Windows 8.1 Pro?Windows 8.1?", -1, "Windows 8.1", "en-US", ""},
      {"server2012r2", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
       "Windows Server 2012 R2 SERVERSTANDARDCORE", 4, "Windows Server 2012 R2"},
      // product.ini alone makes a server medium.
      {"server2012r2-trial", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL, "", -1,
       "Windows Server 2012 R2"},
      {"hyperv2012r2", "winHyperV", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
       "Hyper-V Server 2012 R2 SERVERHYPERCORE?"},
      // 10: the release line and ei.cfg choose the list.
      {"win10-x64", "windows9-64", 0, "Windows 10 Pro", 4},
      // Media for China add one Home edition.
      {"win10-zh", "windows9-64", 0, "Windows 10 Pro", 5, "", "zh-CN", "zh-CN?"},
      {"win10-n", "windows9-64", 0, "Windows 10 Pro_N", 3},
      {"win10-skype", "windows9-64", 0, "Windows 10 Pro", 4},
      {"win10-enterprise", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
       "Windows 10 Enterprise?"},
      {"win10-ltsb2015", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
       "Windows 10 Enterprise_2015_LTSB?"},
      {"win10-pro-ei", "windows9-64", GUESS_VERSION_WINDOWS_10_PLAIN, "Windows 10 Pro", 4},
      {"win10-esd-x86", "windows9", GUESS_VERSION_WINDOWS_10_ESD, "Windows 10 Pro", 4},
      // The ESD class is not given on Arm.
      {"win10-esd-arm64", "arm-windows9-64", 0, "Windows 10 Pro", 4},
      {"win10-winbranch", "windows9", 0, "Windows 10 Pro", 4},
      {"win10-rs3", "windows9-64", 0, "Windows 10 Home", 7},
      {"win10-rs3-ei", "windows9-64", 0, "Windows 10 Education", 6},
      {"win10-rs4-ei", "windows9-64", 0, "Windows 10 Education", 10},
      {"win10-rs5", "windows9-64", 0, "Windows 10 Home", 11},
      {"win10-rs5-ltsc", "windows9-64", 0, "Windows 10 Enterprise_LTSC_2019?"},
      // A forced server flag keeps the Windows 10 identifier.
      {"win10-fbl", "windows9-64", 0, "Windows Server 2012 R2 SERVERSTANDARDCORE", 4},
      // Later servers and 11.
      {"server2016", "windows9srv-64", 0, "Windows Server 2016 SERVERSTANDARDCORE", 4},
      {"server2016-essentials", "windows9srv-64", 0, "Windows Server 2016 SERVERSOLUTION", 3},
      {"hyperv2016", "winHyperV", 0, "Hyper-V Server 2016 SERVERHYPERCORE?"},
      {"server2016-tp5", "windows9srv-64", 0,
       "Windows Server 2016 Technical Preview 5 SERVERSTANDARDCORE", 4},
      {"server1709", "windows9srv-64", 0, "Windows Server 2016 SERVERSTANDARDACORE", 2},
      {"server2019", "windows2019srv-64", 0, "Windows Server 2019 SERVERSTANDARDCORE", 4},
      {"server2019-ei", "windows2019srv-64", 0, "Windows Server SERVERSTANDARDACORE", 2},
      {"server2022", "windows2019srvNext-64", 0, "Windows Server 2022 SERVERSTANDARDCORE", 4},
      {"win11", "windows11-64", 0, "", -1, "", "en-US", "de-DE?en-US?"},
      {"win11-arm64", "arm-windows11-64", 0, ""},
      {"winmain-server", "longhorn-64", 0, ""},
      {"unknown-branch-server", "longhorn", 0, ""},
      {"winmain-client", nullptr, 0, "", -1, "", "en-US", ""},
      // lang.ini: the highest number wins (the first on a tie); anything the
      // walk cannot read leaves "en-US" or the best tag seen so far.
      {"lang-tie", "windows7-64", 0, "", -1, "", "fr-FR", "fr-FR?en-GB?it-IT?"},
      {"lang-not-a-number", "windows7-64", 0, "", -1, "", "de-DE", ""},
      {"lang-truncated", "windows7-64", 0, "", -1, "", "en-US", ""},
      {"lang-long-tag", "windows7-64", 0, "", -1, "", "sr-Latn-RS-x-test-private-use-tag-too-long",
       "sr-Latn-RS-x-test-private-use-tag-too-long?"},
      {"lang-missing", nullptr, 0, "", -1, "", "en-US", ""},
      // A broken idwbinfo.txt takes the recogniser as far as its readable
      // entries go: BuildArch's value runs on to the end of the only line.
      {"idwb-one-line", "windows9", 0, "Windows 10 Pro", 4},
  };
  for (const Case &c : cases) {
    std::string image = std::string("windows/") + c.image;
    tvxtest::ExpectGuess({image.c_str(), c.guestOS, c.version},
                         {c.language, nullptr, c.languages, c.editions, c.displayName, c.count});
  }
}

TEST(GuessWindowsVista, HugeListIsCutToItsField) {
  GuessResult r;
  ASSERT_EQ(Guess_Guest(tvxtest::MediaPath("windows/lang-huge").c_str(), nullptr, &r), 0);
  EXPECT_STREQ(r.guestOS, "windows7-64");
  EXPECT_STREQ(r.language, "en-US");  // the last line carries the highest number
  EXPECT_EQ(std::strlen(r.languages), sizeof r.languages - 1);
  EXPECT_EQ(std::string(r.languages).substr(0, 12), "aa-X1?aa-X2?");
}

}  // namespace
