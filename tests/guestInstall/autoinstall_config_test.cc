// Support queries, answer limits and the validation of typed answers per
// guest family, with their messages.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>

#include "lib/guestInstall/autoinstall_internal.h"
#include "tvx_autoinstall.h"

using namespace tvx::autoinstall;

namespace {

GuessResult Guess(const char *guestOS, uint32_t version = GUESS_VERSION_UNKNOWN,
                  const char *versionText = "") {
  GuessResult g;
  std::memset(&g, 0, sizeof g);
  g.guestOS = guestOS;
  g.version = version;
  std::strncpy(g.versionText, versionText, sizeof g.versionText - 1);
  return g;
}

// The rows themselves are constants; what can go wrong is picking the row.
TEST(AutoInstallConfig, RowPerFamilyAndGeneration) {
  const struct {
    const char *family, *guestOS, *versionText;
    uint32_t nameMax, shortNameMax;
  } cases[] = {
      {"windows", "winXPPro", "5.1", 50, 0},   {"windows", "windows7-64", "", 20, 0},
      {"windows", "windows9-64", "10.0", 20, 0}, {"windows", "winNT", "", 50, 0},
      {"linux", "winXPPro", "", 52, 32},
  };
  for (const auto &c : cases) {
    GuessResult g = Guess(c.guestOS, GUESS_VERSION_UNKNOWN, c.versionText);
    AutoInstallConfigInfo info;
    ASSERT_TRUE(AutoInstall_GetInstallConfigInfo(c.family, &g, &info)) << c.guestOS;
    EXPECT_EQ(c.nameMax, info.nameMaxLength) << c.guestOS;
    EXPECT_EQ(c.shortNameMax, info.shortNameMaxLength) << c.guestOS;
  }
}

TEST(AutoInstallConfig, RefusalsLeaveInfoUntouched) {
  GuessResult g = Guess("winXPPro"), none = Guess(nullptr);
  AutoInstallConfigInfo info, before;
  std::memset(&info, 0x5A, sizeof info);
  before = info;
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo("Windows", &g, &info));  // family is exact
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo("windows", &none, &info));
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo("windows", &g, nullptr));
  EXPECT_EQ(0, std::memcmp(&before, &info, sizeof info));
}

TEST(AutoInstallSupport, PerFamily) {
  const struct {
    const char *guestOS;
    uint32_t version;
    Bool supported;
  } cases[] = {
      // One accepted and one refused row per rule; the refused-version lists
      // themselves are constants.
      {nullptr, GUESS_VERSION_CENTOS_7, FALSE},
      {"redhat", GUESS_VERSION_UNKNOWN, FALSE},  // the bare name is exact
      {"rhel8-64", GUESS_VERSION_UNKNOWN, TRUE},
      {"centos7-64", GUESS_VERSION_CENTOS_7_MINIMAL, FALSE},
      {"RHEL8-64", GUESS_VERSION_UNKNOWN, FALSE},  // Linux prefixes are case-sensitive
      {"ubuntu-64", GUESS_VERSION_UNKNOWN, FALSE},
      {"ubuntu", GUESS_VERSION_UBUNTU_710_OR_HIGHER, TRUE},
      {"sles10", GUESS_VERSION_UNKNOWN, TRUE},
      {"sles12-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, FALSE},
      {"mandriva", GUESS_VERSION_MANDRIVA_2008_0, FALSE},  // never offered
      {"debian10-64", GUESS_VERSION_UNKNOWN, FALSE},
      {"winXPPro", GUESS_VERSION_UNKNOWN, TRUE},
      {"windows9-64", GUESS_VERSION_WINDOWS_10_TRIAL, TRUE},
      {"windows9-64", GUESS_VERSION_WINDOWS_10_ESD, FALSE},
      {"win2000Pro", GUESS_VERSION_UNKNOWN, FALSE},
  };
  for (const auto &c : cases) {
    GuessResult g = Guess(c.guestOS, c.version);
    EXPECT_EQ(c.supported, AutoInstall_IsSupportedGuest(&g))
        << (c.guestOS ? c.guestOS : "(null)") << " version " << c.version;
  }
}

enum Kind { kPassword, kShortName, kName };

AutoInstallTextError Validate(const char *family, const GuessResult *g, const char *text, Kind k,
                              char **msg) {
  switch (k) {
    case kPassword:
      return AutoInstall_ValidatePassword(family, g, text, msg);
    case kShortName:
      return AutoInstall_ValidateShortName(family, g, text, msg);
    case kName:
      return AutoInstall_ValidateName(family, g, text, msg);
  }
  return AUTOINSTALL_TEXT_OK;
}

const char kLinuxNameMsg[] =
    "The full name does not allow the following characters: ':\"\\,'\nEnter a new value.";
const char kPasswordMsg[] =
    "The password must not contain the characters ']]>' in a row.\nEnter a new value.";
const char kGecosMsg[] =
    "The full name must not contain the characters ']]>' in a row.\nEnter a new value.";
const char kLinuxUserMsg[] =
    "The user name must consist only of lowercase US English characters, numbers 0 to 9 and "
    "dashes.\nEnter a new value.";
const char kUbuntuUserMsg[] =
    "The user name must start with a lowercase US English character.\nEnter a new value.";
const char kWindowsNameMsg[] =
    "The name must not contain the following characters:\n'/\\[]\":;|<>+=,?*'\n"
    "Enter a new value.";

TEST(AutoInstallValidate, TextsPerFamilyAndKind) {
  const struct {
    const char *family, *guestOS, *text;
    Kind kind;
    AutoInstallTextError error;
    const char *message;  // null: the slot stays untouched
  } cases[] = {
      {"linux", "rhel8-64", "9lives", kShortName, AUTOINSTALL_TEXT_OK, nullptr},
      {"linux", "rhel8-64", "Bob", kShortName, AUTOINSTALL_TEXT_BAD_LINUX_USERNAME, kLinuxUserMsg},
      {"linux", "ubuntu-64", "9lives", kShortName, AUTOINSTALL_TEXT_BAD_UBUNTU_USERNAME,
       kUbuntuUserMsg},
      {"linux", "ubuntu-64", "", kShortName, AUTOINSTALL_TEXT_BAD_UBUNTU_USERNAME,
       kUbuntuUserMsg},
      {"linux", "ubuntu-64", "bob-2", kShortName, AUTOINSTALL_TEXT_OK, nullptr},
      {"linux", "ubuntu-64", "bOb", kShortName, AUTOINSTALL_TEXT_BAD_LINUX_USERNAME,
       kLinuxUserMsg},
      {"linux", "rhel8-64", "Doe, John", kName, AUTOINSTALL_TEXT_BAD_LINUX_NAME, kLinuxNameMsg},
      {"linux", "rhel8-64", "x]]>y", kName, AUTOINSTALL_TEXT_BAD_GECOS_SUBSTRING, kGecosMsg},
      {"linux", "rhel8-64", "x]]>y,", kName, AUTOINSTALL_TEXT_BAD_LINUX_NAME, kLinuxNameMsg},
      {"linux", "rhel8-64", "Jane O'Doe", kName, AUTOINSTALL_TEXT_OK, nullptr},
      {"linux", "rhel8-64", "p]]>w", kPassword, AUTOINSTALL_TEXT_BAD_PASSWORD_SUBSTRING,
       kPasswordMsg},
      {"linux", "rhel8-64", "a:b,c\\\"", kPassword, AUTOINSTALL_TEXT_OK, nullptr},
      {"windows", "winXPPro", "Doe, John", kName, AUTOINSTALL_TEXT_BAD_WINDOWS_NAME,
       kWindowsNameMsg},
      {"windows", "winXPPro", "Doe, John", kPassword, AUTOINSTALL_TEXT_OK, nullptr},
      {"windows", "winXPPro", "Bob", kShortName, AUTOINSTALL_TEXT_OK, nullptr},
      {"windows", "windows9-64", "J.-Doe_(x)!@#$%^&'~`{}", kName, AUTOINSTALL_TEXT_OK, nullptr},
  };
  for (const auto &c : cases) {
    GuessResult g = Guess(c.guestOS);
    char *msg = nullptr;
    EXPECT_EQ(c.error, Validate(c.family, &g, c.text, c.kind, &msg))
        << c.family << " " << c.kind << " '" << c.text << "'";
    EXPECT_EQ(c.message != nullptr, msg != nullptr) << c.text;
    if (c.message != nullptr && msg != nullptr) {
      EXPECT_STREQ(c.message, msg) << c.text;
    }
    std::free(msg);
    // Without a slot the verdict is the same.
    EXPECT_EQ(c.error, Validate(c.family, &g, c.text, c.kind, nullptr)) << c.text;
  }
}

}  // namespace
