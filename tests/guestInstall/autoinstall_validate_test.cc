// Validation of typed answers per family and text kind, with their messages.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>

#include "lib/guestInstall/autoinstall_internal.h"
#include "tvx_autoinstall.h"

using namespace tvx::autoinstall;

namespace {

GuessResult Guess(const char *guestOS) {
  GuessResult g;
  std::memset(&g, 0, sizeof g);
  g.guestOS = guestOS;
  return g;
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
      {"linux", "rhel8-64", "say \"hi\"", kName, AUTOINSTALL_TEXT_BAD_LINUX_NAME, kLinuxNameMsg},
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

TEST(AutoInstallValidateDeathTest, UnknownFamilyStops) {
  GuessResult g = Guess("rhel8-64");
  EXPECT_DEATH(AutoInstall_ValidateName("Linux", &g, "x", nullptr),
               "NOT_REACHED lib/guestInstall/autoinstall:[0-9]+");
}

}  // namespace
