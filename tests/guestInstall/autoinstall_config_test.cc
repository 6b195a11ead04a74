// Support queries and answer limits per guest family.
#include <gtest/gtest.h>

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
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo("solaris", &g, &info));
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo(nullptr, &g, &info));
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo("windows", &none, &info));
  EXPECT_FALSE(AutoInstall_GetInstallConfigInfo("windows", nullptr, &info));
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
      {"ubuntu", GUESS_VERSION_UBUNTU_704_OR_LOWER, FALSE},
      {"ubuntu", GUESS_VERSION_UBUNTU_710_OR_HIGHER, TRUE},
      {"sles10", GUESS_VERSION_UNKNOWN, TRUE},
      {"sles10-64", GUESS_VERSION_SLES_10_SP2_OR_LOWER, FALSE},
      {"sles12-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, FALSE},
      {"mandriva", GUESS_VERSION_MANDRIVA_2008_0, FALSE},  // never offered
      {"debian10-64", GUESS_VERSION_UNKNOWN, FALSE},
      {"winXPPro", GUESS_VERSION_UNKNOWN, TRUE},
      {"windows9-64", GUESS_VERSION_WINDOWS_10_TRIAL, TRUE},
      {"windows9-64", GUESS_VERSION_WINDOWS_10_ESD, FALSE},
      {"windows2019srv-64", GUESS_VERSION_UNKNOWN, TRUE},
      {"win2000Pro", GUESS_VERSION_UNKNOWN, FALSE},
  };
  for (const auto &c : cases) {
    GuessResult g = Guess(c.guestOS, c.version);
    EXPECT_EQ(c.supported, AutoInstall_IsSupportedGuest(&g))
        << (c.guestOS ? c.guestOS : "(null)") << " version " << c.version;
  }
}

TEST(AutoInstallLinuxKind, Prefixes) {
  const struct {
    const char *guestOS;
    AutoInstallLinuxKind kind;
  } cases[] = {
      {"rhel7-64", AUTOINSTALL_LINUX_REDHAT},   {"sles10-64", AUTOINSTALL_LINUX_SLES10},
      {"sles11", AUTOINSTALL_LINUX_SUSE},       {"ubuntu-64", AUTOINSTALL_LINUX_UBUNTU},
      {"mandriva", AUTOINSTALL_LINUX_MANDRIVA}, {"sles15-64", AUTOINSTALL_LINUX_NONE},
      {"Ubuntu", AUTOINSTALL_LINUX_NONE},       {nullptr, AUTOINSTALL_LINUX_NONE},
  };
  for (const auto &c : cases) {
    EXPECT_EQ(c.kind, AutoInstallGetLinuxKind(c.guestOS)) << (c.guestOS ? c.guestOS : "(null)");
  }
}

}  // namespace
