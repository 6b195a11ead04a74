// The answer files of each Windows family, made from the project's own
// templates under data/windows and read back through XPath and INI reads.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "support/unattend_xml.h"
#include "support/log_capture.h"
#include "tvx_autoinstall.h"
#include "tvx_autoinstall_windows.h"
#include "tvx_ini.h"

namespace {

using tvxtest::UnattendXml;

constexpr char kFn[] = "AutoInstall_PrepareAnswerFileEx: ";
constexpr char kScript[] = "%TEMP%\\unattend.cmd";
constexpr char kPowerPlan[] = "powercfg -setactive 8c5e7fda-e8bf-4a96-9a85-a6e23a8c635c";
constexpr char kPasswordAge[] = "net accounts /MAXPWAGE:UNLIMITED";
constexpr char kNoAutoLogon[] =
    "reg add \"HKLM\\SOFTWARE\\Microsoft\\Windows NT\\CurrentVersion\\Winlogon\" /v "
    "AutoAdminLogon /t REG_SZ /d 0 /f";
constexpr char kHelpSticker[] =
    "reg.exe add HKLM\\Software\\Policies\\Microsoft\\Windows\\EdgeUI /v DisableHelpSticker /t "
    "REG_DWORD /d 1";
constexpr char kKeyElement[] = TVXTEST_PE_SETUP "/urn:UserData/urn:ProductKey";
constexpr char kKeyValue[] = TVXTEST_PE_SETUP "/urn:UserData/urn:ProductKey/urn:Key";
constexpr char kImageSource[] = TVXTEST_PE_SETUP "/urn:ImageInstall/urn:OSImage/urn:InstallFrom";

std::string Template(const char *name) { return tvxtest::SourceDir() + "/data/windows/" + name; }

// The answers of one preparation; tests change what they are about.
struct Answers {
  std::string sif = Template("winnt.sif");
  std::string xml = Template("autounattend.xml");
  std::string storePwd = Template("storePwd.ini");  // empty: no storePwd.ini
  const char *productKey = "AAAAA-BBBBB-CCCCC-DDDDD-EEEEE";
  const char *fullName = "Jo & <Ann> O'Neil J\xC3\xBCrgen";
  const char *password = "p&ss<w>rd'";
  const char *guestOS = "windows9-64";
  GuessVersion version = GUESS_VERSION_WINDOWS_10_PLAIN;
  const char *language = nullptr;
  const char *imageName = "Windows 10 Pro";
  Bool autoLogon = TRUE;
  Bool keepPartitions = FALSE;
};

class WindowsAnswers : public ::testing::Test {
 protected:
  void SetUp() override {
    if (const char *tz = std::getenv("TZ")) oldTz_ = tz;
    setenv("TZ", "Europe/Berlin", 1);
  }
  void TearDown() override { oldTz_ ? setenv("TZ", oldTz_->c_str(), 1) : unsetenv("TZ"); }

  Bool Prepare(const Answers &a) {
    return AutoInstall_PrepareAnswerFileEx(
        a.sif.c_str(), a.xml.c_str(), a.storePwd.empty() ? nullptr : a.storePwd.c_str(),
        a.productKey, a.fullName, a.password, a.guestOS, a.version, dir_.Path().c_str(),
        a.language, a.imageName, a.autoLogon, a.keepPartitions);
  }
  std::string Sif(const char *section, const char *key) { return Ini("winnt.sif", section, key); }
  std::string Ini(const char *file, const char *section, const char *key) {
    char buf[1024] = "<absent>";
    EXPECT_TRUE(IniUtil_GetIniFileString(dir_.Join(file).c_str(), section, key, buf, sizeof buf));
    return buf;
  }
  std::string XmlPath() { return dir_.Join("autoun~0.xml"); }
  std::vector<std::string> Commands(const UnattendXml &xml) {
    std::vector<std::string> all = xml.Texts(TVXTEST_FIRST_LOGON "/urn:CommandLine");
    if (!all.empty()) all.erase(all.begin());  // the template's own command
    return all;
  }

  tvxtest::TempDir dir_;
  std::optional<std::string> oldTz_;
};

enum class KeyOutcome { kRemoved, kKept, kSet, kEmpty };

struct Family {
  const char *label;
  const char *guestOS;
  GuessVersion version;
  const char *imageName;
  const char *productKey;
  const char *firstCommand;
  bool amd64;
  KeyOutcome key;
  bool imageSourceRemoved;
  bool helpSticker;
};

const Family kFamilies[] = {
    {"XP", "winXPPro", GUESS_VERSION_UNKNOWN, "Windows XP Professional", "K", kScript, false,
     KeyOutcome::kRemoved, false, false},
    {"Vista", "winVista", GUESS_VERSION_UNKNOWN, "Windows Vista ULTIMATE", "K", kScript, false,
     KeyOutcome::kKept, false, false},
    {"8.1 trial", "windows8-64", GUESS_VERSION_WINDOWS_81_TRIAL, "Windows 8.1 Enterprise", "K",
     kScript, true, KeyOutcome::kEmpty, false, true},
    {"8.1 plain", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro", "K", kScript,
     true, KeyOutcome::kSet, true, true},
    {"8.1 plain, no key", "windows8-64", GUESS_VERSION_WINDOWS_81_PLAIN, "Windows 8.1 Pro", "",
     kScript, true, KeyOutcome::kEmpty, false, true},
    {"2012 R2", "windows8srv-64", GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN,
     "Windows Server 2012 R2 SERVERSTANDARD", "K", "%TEMP%\\unattend.cmd noInstallTools", true,
     KeyOutcome::kSet, false, false},
    {"10 enterprise", "windows9-64", GUESS_VERSION_WINDOWS_10_ENTERPRISE,
     "Windows 10 Enterprise", "K", kScript, true, KeyOutcome::kRemoved, false, false},
    {"10 plain", "windows9-64", GUESS_VERSION_WINDOWS_10_PLAIN, "Windows 10 Pro", "K", kScript,
     true, KeyOutcome::kSet, false, false},
    {"10 plain, no key", "windows9-64", GUESS_VERSION_WINDOWS_10_PLAIN, "Windows 10 Pro", nullptr,
     kScript, true, KeyOutcome::kEmpty, false, false},
    {"Server 2016", "windows9srv-64", GUESS_VERSION_UNKNOWN, "Windows Server 2016 SERVERSTANDARD",
     "K", "%TEMP%\\unattend.cmd noautoreboot", true, KeyOutcome::kSet, false, false},
    {"Server 2022", "windows2019srvNext-64", GUESS_VERSION_UNKNOWN,
     "Windows Server 2022 SERVERSTANDARDCORE", "K", "%TEMP%\\unattend.cmd noautoreboot", true,
     KeyOutcome::kSet, false, false},
};

TEST_F(WindowsAnswers, EachFamilyGetsItsAnswerFiles) {
  for (const Family &f : kFamilies) {
    SCOPED_TRACE(f.label);
    Answers a;
    a.guestOS = f.guestOS;
    a.version = f.version;
    a.imageName = f.imageName;
    a.productKey = f.productKey;
    a.language = "";
    ASSERT_TRUE(Prepare(a));
    ASSERT_TRUE(tvxtest::XmllintAccepts(XmlPath()));
    UnattendXml xml(XmlPath());

    std::vector<std::string> commands{f.firstCommand, kPowerPlan, kPasswordAge};
    if (f.helpSticker) commands.push_back(kHelpSticker);
    EXPECT_EQ(Commands(xml), commands);
    // Without a language, XP gets its own name for the default.
    EXPECT_EQ(xml.Text(TVXTEST_PE_INTL "/urn:UILanguage"),
              std::string(f.label) == "XP" ? "English" : "en-US");
    EXPECT_EQ(xml.Count("//urn:component[@processorArchitecture='amd64']"), f.amd64 ? 6u : 0u);
    switch (f.key) {
      case KeyOutcome::kRemoved: EXPECT_EQ(xml.Count(kKeyElement), 0u); break;
      case KeyOutcome::kKept: EXPECT_EQ(xml.Text(kKeyValue), ""); break;
      case KeyOutcome::kSet: EXPECT_EQ(xml.Text(kKeyValue), f.productKey); break;
      case KeyOutcome::kEmpty: EXPECT_EQ(xml.Text(kKeyValue), ""); break;
    }
    EXPECT_EQ(xml.Count(kImageSource), f.imageSourceRemoved ? 0u : 1u);
    if (!f.imageSourceRemoved) {
      EXPECT_EQ(xml.Text(kImageSource + std::string("/urn:MetaData/urn:Value")), f.imageName);
    }
    // Both generations always get their file.
    EXPECT_EQ(Sif("UserData", "ProductKey"), f.productKey == nullptr || *f.productKey == '\0'
                                                 ? "<absent>"
                                                 : f.productKey);
  }
}

TEST_F(WindowsAnswers, UserAnswersArriveEscapedAndIntact) {
  Answers a;
  a.language = "de-DE";
  ASSERT_TRUE(Prepare(a));
  ASSERT_TRUE(tvxtest::XmllintAccepts(XmlPath()));
  UnattendXml xml(XmlPath());
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Username"), a.fullName);
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:UserAccounts/urn:LocalAccounts/urn:LocalAccount/urn:Name"),
            a.fullName);
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Password/urn:Value"), a.password);
  EXPECT_EQ(xml.Text(TVXTEST_OOBE
                     "/urn:UserAccounts/urn:LocalAccounts/urn:LocalAccount/urn:Password/urn:Value"),
            a.password);
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Enabled"), "true");
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:TimeZone"), "W. Europe Standard Time");
  for (const char *locale : {"InputLocale", "SystemLocale", "UILanguage", "UserLocale"}) {
    EXPECT_EQ(xml.Text(TVXTEST_PE_INTL "/urn:" + std::string(locale)), "de-DE") << locale;
  }
  // The whole disk: the sized partition goes, the rest becomes partition 1.
  const std::string partitions =
      TVXTEST_PE_SETUP "/urn:DiskConfiguration/urn:Disk/urn:CreatePartitions/urn:CreatePartition";
  EXPECT_EQ(xml.Count(partitions), 1u);
  EXPECT_EQ(xml.Count(partitions + "[urn:Size]"), 0u);
  EXPECT_EQ(xml.Text(partitions + "/urn:Order"), "1");
  EXPECT_EQ(xml.Text(TVXTEST_PE_SETUP "/urn:ImageInstall/urn:OSImage/urn:InstallTo/urn:PartitionID"),
            "1");

  // winnt.sif holds the same answers, quoted, in windows-1252, and the zone's index.
  EXPECT_EQ(Sif("UserData", "FullName"), "Jo & <Ann> O'Neil J\xFCrgen");
  EXPECT_EQ(Sif("GuiUnattended", "AdminPassword"), a.password);
  EXPECT_EQ(Sif("GuiUnattended", "AutoLogon"), "Yes");
  EXPECT_EQ(Sif("GuiUnattended", "AutoLogonCount"), "1");
  EXPECT_EQ(Sif("GuiUnattended", "TimeZone"), "110");
  EXPECT_EQ(Ini("storePwd.ini", "Autologon", "Enabled"), "1");
}

TEST_F(WindowsAnswers, OptionsChangeLogonAndDisk) {
  Answers a;
  a.autoLogon = FALSE;
  a.keepPartitions = TRUE;
  ASSERT_TRUE(Prepare(a));
  UnattendXml xml(XmlPath());
  EXPECT_EQ(Commands(xml),
            (std::vector<std::string>{kScript, kPowerPlan, kPasswordAge, kNoAutoLogon}));
  EXPECT_EQ(xml.Count(TVXTEST_PE_SETUP "//urn:CreatePartition[urn:Size]"), 1u);
  EXPECT_EQ(xml.Text(TVXTEST_PE_SETUP "/urn:ImageInstall/urn:OSImage/urn:InstallTo/urn:PartitionID"),
            "2");
  EXPECT_EQ(Ini("storePwd.ini", "Autologon", "Enabled"), "0");
}

TEST_F(WindowsAnswers, WithoutPasswordNoLogonSettingsAreWritten) {
  Answers a;
  a.password = "";
  a.fullName = nullptr;
  a.autoLogon = FALSE;
  ASSERT_TRUE(Prepare(a));
  UnattendXml xml(XmlPath());
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Enabled"), "false");
  EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Username"), "Tarvex User");
  EXPECT_EQ(Commands(xml), (std::vector<std::string>{kScript, kPowerPlan, kPasswordAge}));
  EXPECT_EQ(Sif("GuiUnattended", "AutoLogon"), "<absent>");
  EXPECT_EQ(Sif("GuiUnattended", "AutoLogonCount"), "<absent>");
  // The template's own value stays.
  EXPECT_EQ(Ini("storePwd.ini", "Autologon", "Enabled"), "1");
}

TEST_F(WindowsAnswers, WinntSifUsesTheLanguagesCodePage) {
  struct Case {
    const char *language;
    const char *name;      // UTF-8
    const char *password;  // UTF-8
    const char *sifName;   // bytes expected in winnt.sif
    const char *sifPassword;
    const char *log = "";
  };
  const Case cases[] = {
      {"Japanese", "\xE5\xB1\xB1\xE7\x94\xB0", "\xE6\x97\xA5\xE6\x9C\xAC", "\x8E\x52\x93\x63",
       "\x93\xFA\x96\x7B"},
      {"Russian", "\xD0\x98\xD0\xB2\xD0\xB0\xD0\xBD", "pw", "\xC8\xE2\xE0\xED", "pw"},
      // Names are matched exactly: a lower-case language gets the Western default.
      {"japanese", "J\xC3\xBCrgen", "\xE2\x82\xAC", "J\xFCrgen", "\x80"},
      // What the code page cannot hold is written as UTF-8.
      {"Russian", "\xE5\xB1\xB1\xE7\x94\xB0", "pw", "\xE5\xB1\xB1\xE7\x94\xB0", "pw",
       "Failed to perform conversion from UTF-8 to windows-1251\n"},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.language);
    Answers a;
    a.language = c.language;
    a.fullName = c.name;
    a.password = c.password;
    tvxtest::LogCapture log;
    ASSERT_TRUE(Prepare(a));
    EXPECT_EQ(log.All(), *c.log == '\0' ? "" : kFn + std::string(c.log));
    EXPECT_EQ(Sif("UserData", "FullName"), c.sifName);
    EXPECT_EQ(Sif("GuiUnattended", "AdminPassword"), c.sifPassword);
    // The XML always gets UTF-8.
    UnattendXml xml(XmlPath());
    EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Username"), c.name);
    EXPECT_EQ(xml.Text(TVXTEST_OOBE "/urn:AutoLogon/urn:Password/urn:Value"), c.password);
  }
}

// Failures: the first failing step logs its line and ends the call; what was
// copied before stays.
TEST_F(WindowsAnswers, FailuresLogTheirStepAndStop) {
  const std::string out = dir_.Path();
  tvxtest::TempDir templates;
  const std::string brokenSif = templates.Join("broken.sif");
  tvxtest::WriteFileOrDie(brokenSif, "[UserData]\nFullName=x\n[Broken\n");
  const std::string brokenIni = brokenSif + ".ini";
  tvxtest::WriteFileOrDie(brokenIni, "[Autologon\n");
  const std::string brokenXml = brokenSif + ".xml";
  tvxtest::WriteFileOrDie(brokenXml, "<unattend><settings></unattend>\n");
  const std::string missing = templates.Join("missing.sif");
  const std::string sif = out + "/winnt.sif";
  const std::string xml = out + "/autoun~0.xml";
  const std::string ini = out + "/storePwd.ini";

  struct Case {
    const char *label;
    std::function<void(Answers &)> change;
    std::string log;
    std::vector<std::string> files;  // left in the output directory
  };
  const Case cases[] = {
      {"no guest", [&](Answers &a) { a.guestOS = nullptr; },
       "GuestOS_IsWin failed for guestID (null)\n", {}},
      {"sif template missing", [&](Answers &a) { a.sif = missing; },
       "File_Copy from=\"" + missing + "\" to=\"" + sif + "\"\n", {}},
      {"xml template missing", [&](Answers &a) { a.xml = missing; },
       "File_Copy from=\"" + missing + "\" to=\"" + xml + "\"\n", {"winnt.sif"}},
      {"storePwd template missing", [&](Answers &a) { a.storePwd = missing; },
       "File_Copy from=\"" + missing + "\" to=\"" + ini + "\"\n",
       {"autoun~0.xml", "winnt.sif"}},
      // The message names the text as the user gave it, not its conversion.
      {"full name not written",
       [&](Answers &a) {
         a.sif = brokenSif, a.productKey = nullptr;
         a.language = "Russian", a.fullName = "\xD0\x98";
       },
       "IniUtil_WriteIniFileString unattendFilePath=\"" + sif + "\", FullName=\"\xD0\x98\"\n",
       {"autoun~0.xml", "storePwd.ini", "winnt.sif"}},
      // This one message has no line end.
      {"logon setting not written", [&](Answers &a) { a.storePwd = brokenIni; },
       "IniUtil_WriteIniFileString storePwdIniPath=\"" + ini + "\"",
       {"autoun~0.xml", "storePwd.ini", "winnt.sif"}},
      {"xml unparsable", [&](Answers &a) { a.xml = brokenXml; },
       "AutoInstallEditUnattendXml failed for \"" + xml + "\"\n",
       {"autoun~0.xml", "storePwd.ini", "winnt.sif"}},
      // Texts that could add a key or a section to winnt.sif, or come back
      // cut or clipped, are refused before any file is made.
      {"password with a line end", [&](Answers &a) { a.password = "pw\rAutoLogon=Yes"; },
       "AdminPassword holds a carriage return\n", {}},
      {"name with a quote", [&](Answers &a) { a.fullName = "Bob\"X"; },
       "FullName holds a double quote (\")\n", {}},
      {"key with a line feed", [&](Answers &a) { a.productKey = "K\nX=1"; },
       "ProductKey holds a line feed\n", {}},
      {"password with a semicolon", [&](Answers &a) { a.password = "a;b"; },
       "AdminPassword holds a semicolon (;), which ends the value when it is read\n", {}},
      {"name with a control byte", [&](Answers &a) { a.fullName = "tab\tname"; },
       "FullName holds the control character 0x09\n", {}},
      {"name too long for its line",
       [&](Answers &a) {
         static const std::string kLong(1010, 'n');
         a.fullName = kLong.c_str();
       },
       "FullName is longer than 1008 bytes\n", {}},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.label);
    std::filesystem::remove_all(out);
    std::filesystem::create_directory(out);
    Answers a;
    c.change(a);
    tvxtest::LogCapture log;
    EXPECT_FALSE(Prepare(a));
    EXPECT_EQ(log.Lines(), std::vector<std::string>{kFn + c.log});
    std::vector<std::string> files;
    for (const auto &e : std::filesystem::directory_iterator(out)) {
      files.push_back(e.path().filename().string());
    }
    std::sort(files.begin(), files.end());
    EXPECT_EQ(files, c.files);
  }
}

// Display names of Windows images: prefix, edition key and modifier interplay.
TEST(WindowsPrettyName, KeysAndModifiers) {
  const struct {
    const char *raw, *pretty;
  } cases[] = {
      {"Windows 7 ULTIMATE", "Windows 7 Ultimate"},
      {"Windows Longhorn SERVERSTANDARD", "Windows Server 2008 Standard"},
      {"Windows 10 ENTERPRISEN", "Windows 10 Enterprise N"},
      // "SERVERSTANDARDA" finds CORE; the later "SERVERSTANDARD" finds no
      // modifier for "ACORE" and keeps it.
      {"Windows Server 2008 R2 SERVERSTANDARDACORE", "Windows Server 2008 R2 Standard Core"},
      // A key followed by an unknown rest still names the edition.
      {"Windows 7 ULTIMATEXYZ", "Windows 7 Ultimate"},
      // Unchanged: no edition key, no space, prefix that is not exact.
      {"Windows 7 ultimate", "Windows 7 ultimate"},
      {"ULTIMATE", "ULTIMATE"},
      {"windows longhorn SERVERWEB", "windows longhorn Web Edition"},
  };
  for (const auto &c : cases) {
    char *pretty = AutoInstall_GetPrettyWindowsName(c.raw);
    ASSERT_NE(nullptr, pretty) << c.raw;
    EXPECT_STREQ(c.pretty, pretty) << c.raw;
    std::free(pretty);
  }
  EXPECT_EQ(nullptr, AutoInstall_GetPrettyWindowsName(nullptr));
}

}  // namespace
