// Display names of Windows images: prefix, edition key and modifier interplay.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "platform/msg.h"
#include "support/log_capture.h"
#include "tvx_autoinstall.h"

namespace {

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
      {"Windows Server 2008 R2 SERVERDATACENTERAVCORE",
       "Windows Server 2008 R2 Datacenter Core without Hyper-V"},
      // A key followed by an unknown rest still names the edition.
      {"Windows 7 ULTIMATEXYZ", "Windows 7 Ultimate"},
      // Unchanged: no edition key, no space, prefix that is not exact.
      {"Windows 7 ultimate", "Windows 7 ultimate"},
      {"Windows 7 CUSTOM", "Windows 7 CUSTOM"},
      {"ULTIMATE", "ULTIMATE"},
      {"", ""},
      {"Windows Longhorn ", "Windows Longhorn "},
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

// Every part of the display name comes from the catalogue of the current
// locale (the refusal messages are looked up the same way).
TEST(WindowsPrettyName, LocalisedParts) {
  tvxtest::TempDir dir;
  std::string path = dir.Join("de.txt");
  tvxtest::WriteFileOrDie(path,
                          "msg.autoinstall.winpfx_2k8 = \"Windows Server 2008 (de)\"\n"
                          "msg.autoinstall.winsrv_standard = \" Standardversion\"\n"
                          "msg.autoinstall.winsfx_core = \" Kern\"\n"
                          "msg.autoinstall.prettyFormat = \"%s:%s:%s\"\n");
  ASSERT_TRUE(Msg_LoadCatalogue("de", path.c_str()));
  Msg_SetLocale("de");
  char *pretty = AutoInstall_GetPrettyWindowsName("Windows Longhorn SERVERSTANDARDCORE");
  Msg_SetLocale("");
  EXPECT_STREQ("Windows Server 2008 (de): Standardversion: Kern", pretty);
  std::free(pretty);
}

}  // namespace
