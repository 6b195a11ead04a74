// The guest-OS table. Numeric ids start at 0x5000 and are grouped so that
// the tools-image family table can name each family by id ranges:
//   20483-20486 Windows before 2000     20487-20513 Windows 2000 to 10/2022
//   20517-20535, 20539-20550, 20603-20632 Linux
//   20551-20565 FreeBSD   20566-20571 Solaris   20572-20589 Mac OS X
//   20592-20594 NetWare   20595-20602 hypervisors (no tools image)
// The family ranges were full before the newest guests arrived: Arm guests
// (for which the x86 tools images are of no use) sit in the gaps between
// ranges, and newer x86 guests from 20633 on; both get their image from the
// signed image map rather than from the built-in family table.
#include "platform/guestos.h"

#include "platform/ascii.h"

namespace {

enum class Family { kWindows, kLinux, kSolaris, kNetware, kDarwin, kFreeBSD, kOrka };

// Windows generations in release order, so "or higher" is a comparison.
enum class WinGen { kNone, k9x, kNT4, k2000, kXP, k2003, kVista, k7, k8, k10, k11 };

enum Flags : unsigned {
  kNone = 0,
  k64 = 1u << 0,
  kServer = 1u << 1,
  kPreGlibc25 = 1u << 2,  // Linux whose C library predates glibc 2.5
};

struct GuestOSRow {
  const char *name;
  GuestOSID id;
  Family family;
  WinGen win;
  unsigned flags;
  int darwinMajor;  // Mac OS X: the Darwin release (10 for 10.6, 15 for 10.11)
};

constexpr Family W = Family::kWindows, L = Family::kLinux, S = Family::kSolaris,
                 N = Family::kNetware, D = Family::kDarwin, F = Family::kFreeBSD,
                 O = Family::kOrka;
constexpr WinGen X = WinGen::kNone;
constexpr unsigned P = kPreGlibc25;

constexpr GuestOSRow kGuestOS[] = {
    // Windows before 2000.
    {"win95", 20483, W, WinGen::k9x, kNone, 0},
    {"win98", 20484, W, WinGen::k9x, kNone, 0},
    {"winMe", 20485, W, WinGen::k9x, kNone, 0},
    {"winNT", 20486, W, WinGen::kNT4, kNone, 0},
    // Windows 2000 to Windows 10 and Server 2022.
    {"win2000Pro", 20487, W, WinGen::k2000, kNone, 0},
    {"win2000Serv", 20488, W, WinGen::k2000, kServer, 0},
    {"win2000AdvServ", 20489, W, WinGen::k2000, kServer, 0},
    {"winXPHome", 20490, W, WinGen::kXP, kNone, 0},
    {"winXPPro", 20491, W, WinGen::kXP, kNone, 0},
    {"winXPPro-64", 20492, W, WinGen::kXP, k64, 0},
    {"winNetWeb", 20493, W, WinGen::k2003, kServer, 0},
    {"winNetStandard", 20494, W, WinGen::k2003, kServer, 0},
    {"winNetStandard-64", 20495, W, WinGen::k2003, kServer | k64, 0},
    {"winNetEnterprise", 20496, W, WinGen::k2003, kServer, 0},
    {"winNetEnterprise-64", 20497, W, WinGen::k2003, kServer | k64, 0},
    {"winNetBusiness", 20498, W, WinGen::k2003, kServer, 0},
    {"winVista", 20499, W, WinGen::kVista, kNone, 0},
    {"winVista-64", 20500, W, WinGen::kVista, k64, 0},
    {"longhorn", 20501, W, WinGen::kVista, kServer, 0},
    {"longhorn-64", 20502, W, WinGen::kVista, kServer | k64, 0},
    {"windows7", 20503, W, WinGen::k7, kNone, 0},
    {"windows7-64", 20504, W, WinGen::k7, k64, 0},
    {"windows7srv-64", 20505, W, WinGen::k7, kServer | k64, 0},
    {"windows8", 20506, W, WinGen::k8, kNone, 0},
    {"windows8-64", 20507, W, WinGen::k8, k64, 0},
    {"windows8srv-64", 20508, W, WinGen::k8, kServer | k64, 0},
    {"windows9", 20509, W, WinGen::k10, kNone, 0},
    {"windows9-64", 20510, W, WinGen::k10, k64, 0},
    {"windows9srv-64", 20511, W, WinGen::k10, kServer | k64, 0},
    {"windows2019srv-64", 20512, W, WinGen::k10, kServer | k64, 0},
    {"windows2019srvNext-64", 20513, W, WinGen::k11, kServer | k64, 0},
    // Windows without a built-in tools image.
    {"windows11-64", 20514, W, WinGen::k11, k64, 0},
    {"arm-windows9-64", 20515, W, WinGen::k10, k64, 0},
    {"arm-windows11-64", 20516, W, WinGen::k11, k64, 0},
    // Linux.
    {"rhel2", 20517, L, X, P, 0},
    {"redhat", 20518, L, X, P, 0},
    {"rhel3", 20519, L, X, P, 0},
    {"rhel3-64", 20520, L, X, P | k64, 0},
    {"rhel4", 20521, L, X, P, 0},
    {"rhel4-64", 20522, L, X, P | k64, 0},
    {"rhel5", 20523, L, X, kNone, 0},
    {"rhel5-64", 20524, L, X, k64, 0},
    {"rhel6", 20525, L, X, kNone, 0},
    {"rhel6-64", 20526, L, X, k64, 0},
    {"rhel7", 20527, L, X, kNone, 0},
    {"rhel7-64", 20528, L, X, k64, 0},
    {"centos", 20529, L, X, kNone, 0},
    {"centos-64", 20530, L, X, k64, 0},
    {"centos6", 20531, L, X, kNone, 0},
    {"centos6-64", 20532, L, X, k64, 0},
    {"centos7-64", 20533, L, X, k64, 0},
    {"oraclelinux", 20534, L, X, kNone, 0},
    {"oraclelinux-64", 20535, L, X, k64, 0},
    {"arm-ubuntu-64", 20536, L, X, k64, 0},  // Arm Linux: no built-in image
    {"arm-debian10-64", 20537, L, X, k64, 0},
    {"arm-debian11-64", 20538, L, X, k64, 0},
    {"oraclelinux6", 20539, L, X, kNone, 0},
    {"oraclelinux6-64", 20540, L, X, k64, 0},
    {"oraclelinux7-64", 20541, L, X, k64, 0},
    {"asianux3", 20542, L, X, kNone, 0},
    {"asianux3-64", 20543, L, X, k64, 0},
    {"asianux4", 20544, L, X, kNone, 0},
    {"asianux4-64", 20545, L, X, k64, 0},
    {"Fedora", 20546, L, X, kNone, 0},
    {"Fedora-64", 20547, L, X, k64, 0},
    {"debian4", 20548, L, X, P, 0},
    {"debian4-64", 20549, L, X, P | k64, 0},
    {"debian5", 20550, L, X, kNone, 0},
    // FreeBSD.
    {"freeBSD", 20551, F, X, kNone, 0},
    {"freeBSD-64", 20552, F, X, k64, 0},
    {"freeBSD11", 20553, F, X, kNone, 0},
    {"freeBSD11-64", 20554, F, X, k64, 0},
    {"freeBSD12", 20555, F, X, kNone, 0},
    {"freeBSD12-64", 20556, F, X, k64, 0},
    {"freeBSD13", 20557, F, X, kNone, 0},
    {"freeBSD13-64", 20558, F, X, k64, 0},
    {"freeBSD14-64", 20559, F, X, k64, 0},
    // Solaris.
    {"solaris7", 20566, S, X, kNone, 0},
    {"solaris8", 20567, S, X, kNone, 0},
    {"solaris9", 20568, S, X, kNone, 0},
    {"solaris10", 20569, S, X, kNone, 0},
    {"solaris10-64", 20570, S, X, k64, 0},
    {"solaris11-64", 20571, S, X, k64, 0},
    // Mac OS X, by Darwin release.
    {"darwin", 20572, D, X, kNone, 9},
    {"darwin-64", 20573, D, X, k64, 9},
    {"darwin10", 20574, D, X, kNone, 10},
    {"darwin10-64", 20575, D, X, k64, 10},
    {"darwin11", 20576, D, X, kNone, 11},
    {"darwin11-64", 20577, D, X, k64, 11},
    {"darwin12-64", 20578, D, X, k64, 12},
    {"darwin13-64", 20579, D, X, k64, 13},
    {"darwin14-64", 20580, D, X, k64, 14},
    {"darwin15-64", 20581, D, X, k64, 15},
    {"darwin16-64", 20582, D, X, k64, 16},
    {"darwin17-64", 20583, D, X, k64, 17},
    {"darwin18-64", 20584, D, X, k64, 18},
    {"darwin19-64", 20585, D, X, k64, 19},
    {"darwin20-64", 20586, D, X, k64, 20},
    {"darwin21-64", 20587, D, X, k64, 21},
    {"darwin22-64", 20588, D, X, k64, 22},
    {"darwin23-64", 20589, D, X, k64, 23},
    // Arm FreeBSD: no built-in image.
    {"arm-freeBSD13-64", 20590, F, X, k64, 0},
    {"arm-freeBSD14-64", 20591, F, X, k64, 0},
    // NetWare.
    {"netware5", 20592, N, X, kNone, 0},
    {"netware6", 20593, N, X, kNone, 0},
    // Hypervisors: no tools image.
    {"zelcore", 20595, O, X, k64, 0},
    {"zelcore5", 20596, O, X, k64, 0},
    {"zelcore6", 20597, O, X, k64, 0},
    {"zelcore65", 20598, O, X, k64, 0},
    {"zelcore7", 20599, O, X, k64, 0},
    {"winHyperV", 20600, W, WinGen::k8, kServer | k64, 0},
    // More Linux.
    {"debian5-64", 20603, L, X, k64, 0},
    {"debian6", 20604, L, X, kNone, 0},
    {"debian6-64", 20605, L, X, k64, 0},
    {"debian7", 20606, L, X, kNone, 0},
    {"debian7-64", 20607, L, X, k64, 0},
    {"debian8", 20608, L, X, kNone, 0},
    {"debian8-64", 20609, L, X, k64, 0},
    {"debian9", 20610, L, X, kNone, 0},
    {"debian9-64", 20611, L, X, k64, 0},
    {"ubuntu", 20612, L, X, kNone, 0},
    {"ubuntu-64", 20613, L, X, k64, 0},
    {"suse", 20614, L, X, P, 0},
    {"suse-64", 20615, L, X, P | k64, 0},
    {"opensuse", 20616, L, X, kNone, 0},
    {"opensuse-64", 20617, L, X, k64, 0},
    {"sles", 20618, L, X, P, 0},
    {"sles-64", 20619, L, X, P | k64, 0},
    {"sles10", 20620, L, X, kNone, 0},
    {"sles10-64", 20621, L, X, k64, 0},
    {"sles11", 20622, L, X, kNone, 0},
    {"sles11-64", 20623, L, X, k64, 0},
    {"sles12", 20624, L, X, kNone, 0},
    {"sles12-64", 20625, L, X, k64, 0},
    {"nld9", 20626, L, X, P, 0},
    {"sjds", 20627, L, X, P, 0},
    {"mandrake", 20628, L, X, P, 0},
    {"mandriva", 20629, L, X, kNone, 0},
    {"mandriva-64", 20630, L, X, k64, 0},
    {"turbolinux", 20631, L, X, P, 0},
    {"tarvex-lumen-64", 20632, L, X, k64, 0},
    // Newer guests, after the built-in family ranges.
    {"rhel8-64", 20633, L, X, k64, 0},
    {"centos8-64", 20634, L, X, k64, 0},
    {"oraclelinux8-64", 20635, L, X, k64, 0},
    {"asianux7-64", 20636, L, X, k64, 0},
    {"debian10", 20637, L, X, kNone, 0},
    {"debian10-64", 20638, L, X, k64, 0},
    {"debian11", 20639, L, X, kNone, 0},
    {"debian11-64", 20640, L, X, k64, 0},
    {"sles15-64", 20641, L, X, k64, 0},
    {"arm-Fedora-64", 20642, L, X, k64, 0},
    {"arm-tarvex-lumen-64", 20643, L, X, k64, 0},
};

const GuestOSRow *Find(GuestOSID id) {
  for (const auto &row : kGuestOS) {
    if (row.id == id) return &row;
  }
  return nullptr;
}

bool Is(GuestOSID id, bool (*test)(const GuestOSRow &)) {
  const GuestOSRow *row = Find(id);
  return row != nullptr && test(*row);
}

bool IsWinGen(GuestOSID id, WinGen gen, int server) {
  const GuestOSRow *row = Find(id);
  if (row == nullptr || row->family != Family::kWindows || row->win != gen) return false;
  return server < 0 || ((row->flags & kServer) != 0) == (server != 0);
}

}  // namespace

GuestOSID GuestOS_GetOSIDByName(const char *name) {
  if (name == nullptr) return GUESTOS_ID_UNKNOWN;
  for (const auto &row : kGuestOS) {
    if (tvx::ascii::Equal(row.name, name)) return row.id;
  }
  return GUESTOS_ID_UNKNOWN;
}

const char *GuestOS_GetNameByOSID(GuestOSID id) {
  const GuestOSRow *row = Find(id);
  return row != nullptr ? row->name : nullptr;
}

size_t GuestOS_TableSize(void) { return sizeof kGuestOS / sizeof kGuestOS[0]; }

GuestOSID GuestOS_TableId(size_t index) {
  return index < GuestOS_TableSize() ? kGuestOS[index].id : GUESTOS_ID_UNKNOWN;
}

Bool GuestOS_Is64Bit(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return (r.flags & k64) != 0; });
}
Bool GuestOS_IsWin(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kWindows; });
}
Bool GuestOS_IsWin9x(GuestOSID id) { return IsWinGen(id, WinGen::k9x, -1); }
Bool GuestOS_IsWinNT4(GuestOSID id) { return IsWinGen(id, WinGen::kNT4, -1); }
Bool GuestOS_IsWin2k(GuestOSID id) { return IsWinGen(id, WinGen::k2000, -1); }
Bool GuestOS_IsWin2kOrHigher(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.win >= WinGen::k2000; });
}
Bool GuestOS_IsWinVista(GuestOSID id) { return IsWinGen(id, WinGen::kVista, -1); }
Bool GuestOS_IsWinVistaOrHigher(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.win >= WinGen::kVista; });
}
Bool GuestOS_IsWinEightClient(GuestOSID id) { return IsWinGen(id, WinGen::k8, 0); }
Bool GuestOS_IsWinEightServer(GuestOSID id) { return IsWinGen(id, WinGen::k8, 1); }
Bool GuestOS_IsWinTenClient(GuestOSID id) { return IsWinGen(id, WinGen::k10, 0); }
Bool GuestOS_IsWinTenServer(GuestOSID id) { return IsWinGen(id, WinGen::k10, 1); }
Bool GuestOS_IsWinElevenClient(GuestOSID id) { return IsWinGen(id, WinGen::k11, 0); }
Bool GuestOS_IsWinElevenServer(GuestOSID id) { return IsWinGen(id, WinGen::k11, 1); }
Bool GuestOS_IsLinux(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kLinux; });
}
Bool GuestOS_IsLinuxPreGlibc25(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) {
    return r.family == Family::kLinux && (r.flags & kPreGlibc25) != 0;
  });
}
Bool GuestOS_IsSolaris(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kSolaris; });
}
Bool GuestOS_IsNetware(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kNetware; });
}
Bool GuestOS_IsDarwin(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kDarwin; });
}
Bool GuestOS_IsDarwin15OrHigher(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) {
    return r.family == Family::kDarwin && r.darwinMajor >= 15;
  });
}
Bool GuestOS_IsFreeBSD(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kFreeBSD; });
}
Bool GuestOS_IsOrka(GuestOSID id) {
  return Is(id, [](const GuestOSRow &r) { return r.family == Family::kOrka; });
}
