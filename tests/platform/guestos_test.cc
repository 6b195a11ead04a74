#include "platform/guestos.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

namespace {

// Names and ids map one to one both ways, names without case (the
// recognisers' names are checked against the table on every mastered medium),
// and a row is 64-bit exactly when its name ends in "-64".
TEST(GuestOS, EveryRowRoundTripsAndNamesIgnoreCase) {
  std::set<GuestOSID> ids;
  for (size_t i = 0; i < GuestOS_TableSize(); i++) {
    GuestOSID id = GuestOS_TableId(i);
    const char *name = GuestOS_GetNameByOSID(id);
    ASSERT_NE(name, nullptr) << "row " << i;
    EXPECT_EQ(GuestOS_GetOSIDByName(name), id) << name;
    EXPECT_TRUE(ids.insert(id).second) << "duplicate id in row " << i;
    if (GuestOS_IsOrka(id) || std::string(name) == "winHyperV") continue;  // 64-bit only, no suffix
    EXPECT_EQ(GuestOS_Is64Bit(id) != 0, std::string(name).ends_with("-64")) << name;
  }
  EXPECT_EQ(GuestOS_GetOSIDByName("WINXPPRO"), GuestOS_GetOSIDByName("winXPPro"));
  EXPECT_EQ(GuestOS_GetOSIDByName("winXP"), GUESTOS_ID_UNKNOWN);  // a prefix is no name
  EXPECT_EQ(GuestOS_GetOSIDByName(""), GUESTOS_ID_UNKNOWN);
  EXPECT_EQ(GuestOS_GetOSIDByName(nullptr), GUESTOS_ID_UNKNOWN);
  EXPECT_EQ(GuestOS_GetNameByOSID(GUESTOS_ID_UNKNOWN), nullptr);
}

enum Pred {
  k64 = 1 << 0, kWin = 1 << 1, k9x = 1 << 2, kNT4 = 1 << 3, k2k = 1 << 4, k2kUp = 1 << 5,
  kVista = 1 << 6, kVistaUp = 1 << 7, k8C = 1 << 8, k8S = 1 << 9, k10C = 1 << 10,
  k10S = 1 << 11, k11C = 1 << 12, k11S = 1 << 13, kLin = 1 << 14, kOldLibc = 1 << 15,
  kSol = 1 << 16, kNw = 1 << 17, kMac = 1 << 18, kMac15 = 1 << 19, kBsd = 1 << 20,
  kOrka = 1 << 21,
};

unsigned Predicates(GuestOSID id) {
  Bool (*const fns[])(GuestOSID) = {
      GuestOS_Is64Bit, GuestOS_IsWin, GuestOS_IsWin9x, GuestOS_IsWinNT4, GuestOS_IsWin2k,
      GuestOS_IsWin2kOrHigher, GuestOS_IsWinVista, GuestOS_IsWinVistaOrHigher,
      GuestOS_IsWinEightClient, GuestOS_IsWinEightServer, GuestOS_IsWinTenClient,
      GuestOS_IsWinTenServer, GuestOS_IsWinElevenClient, GuestOS_IsWinElevenServer,
      GuestOS_IsLinux, GuestOS_IsLinuxPreGlibc25, GuestOS_IsSolaris, GuestOS_IsNetware,
      GuestOS_IsDarwin, GuestOS_IsDarwin15OrHigher, GuestOS_IsFreeBSD, GuestOS_IsOrka,
  };
  unsigned bits = 0;
  for (size_t i = 0; i < sizeof fns / sizeof fns[0]; i++) {
    if (fns[i](id)) bits |= 1u << i;
  }
  return bits;
}

TEST(GuestOS, PredicatesFollowTheFamilies) {
  struct Case {
    const char *name;
    unsigned want;
  } cases[] = {
      {"win95", kWin | k9x},
      {"winNT", kWin | kNT4},
      {"win2000AdvServ", kWin | k2k | k2kUp},
      {"winXPPro-64", kWin | k2kUp | k64},
      {"winVista", kWin | k2kUp | kVista | kVistaUp},
      {"windows7", kWin | k2kUp | kVistaUp},
      {"windows8-64", kWin | k2kUp | kVistaUp | k8C | k64},
      {"windows8srv-64", kWin | k2kUp | kVistaUp | k8S | k64},
      {"windows9", kWin | k2kUp | kVistaUp | k10C},
      {"windows9srv-64", kWin | k2kUp | kVistaUp | k10S | k64},
      {"windows2019srvNext-64", kWin | k2kUp | kVistaUp | k11S | k64},
      {"windows11-64", kWin | k2kUp | kVistaUp | k11C | k64},
      {"rhel4", kLin | kOldLibc},
      {"rhel5-64", kLin | k64},
      {"solaris11-64", kSol | k64},
      {"netware6", kNw},
      {"darwin11-64", kMac | k64},
      {"darwin15-64", kMac | kMac15 | k64},
      {"arm-freeBSD14-64", kBsd | k64},
      {"zelcore65", kOrka | k64},
  };
  for (const auto &c : cases) {
    GuestOSID id = GuestOS_GetOSIDByName(c.name);
    ASSERT_NE(id, GUESTOS_ID_UNKNOWN) << c.name;
    EXPECT_EQ(Predicates(id), c.want) << c.name;
  }
  EXPECT_EQ(Predicates(GUESTOS_ID_UNKNOWN), 0u);
  EXPECT_EQ(Predicates(20480), 0u);
}

}  // namespace
