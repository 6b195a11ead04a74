#include "platform/timeutil.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

namespace {

// Sets TZ for one scope and restores the previous value.
class ScopedTz {
 public:
  explicit ScopedTz(const char *value) : had_(std::getenv("TZ") != nullptr) {
    if (had_) old_ = std::getenv("TZ");
    value != nullptr ? setenv("TZ", value, 1) : unsetenv("TZ");
  }
  ~ScopedTz() { had_ ? setenv("TZ", old_.c_str(), 1) : unsetenv("TZ"); }

 private:
  bool had_;
  std::string old_;
};

struct ZoneCase {
  const char *tz;
  const char *windowsName;  // null: no Windows zone
  int index;
};

const ZoneCase kZones[] = {
    {"Europe/Berlin", "W. Europe Standard Time", 110},
    // Forms of $TZ: a leading colon, a path into a zoneinfo tree, an alias.
    {":Europe/London", "GMT Standard Time", 85},
    {"/usr/share/zoneinfo/America/New_York", "Eastern Standard Time", 35},
    {":/usr/share/zoneinfo/posix/Asia/Kolkata", "India Standard Time", 190},
    {"US/Pacific", "Pacific Standard Time", 4},
    // A Windows zone newer than the numbered list: name, but no number.
    {"America/Argentina/Buenos_Aires", "Argentina Standard Time", -1},
};

TEST(TimeUtil, HostZoneFromTz) {
  for (const ZoneCase &c : kZones) {
    ScopedTz tz(c.tz);
    char *name = nullptr;
    int index = TimeUtil_GetLocalWindowsTimeZoneIndexAndName(&name);
    EXPECT_EQ(index, c.index) << c.tz;
    ASSERT_NE(name, nullptr) << c.tz;
    EXPECT_STREQ(name, c.windowsName) << c.tz;
    std::free(name);
    EXPECT_EQ(TimeUtil_GetLocalWindowsTimeZoneIndexAndName(nullptr), c.index) << c.tz;
  }
}

TEST(TimeUtil, UnknownZoneIdsHaveNoWindowsZone) {
  for (const char *id : {"Mars/Olympus_Mons", "", "Europe/Berlin/../../etc"}) {
    char *name = reinterpret_cast<char *>(1);
    EXPECT_EQ(TimeUtil_WindowsZoneForId(id, &name), -1) << id;
    EXPECT_EQ(name, nullptr) << id;
  }
  EXPECT_EQ(TimeUtil_WindowsZoneForId(nullptr, nullptr), -1);
  EXPECT_EQ(TimeUtil_WindowsZoneIndex(nullptr), -1);
}

}  // namespace
