// The guest-OS table: every guest-OS identifier the library emits or reads,
// with a numeric id and family predicates. Ids lie in the ranges of the
// tools-image family table (Windows before 2000 20483-20486, Windows
// 20487-20513, Linux 20517-20535/20539-20550/20603-20632, FreeBSD
// 20551-20565, Solaris 20566-20571, Mac OS X 20572-20589, NetWare
// 20592-20594, hypervisors 20595-20602); Arm guests and guests newer than
// that table have ids outside every range, so the table gives them no image.
// Windows generations: "Ten" is Windows 10 and Server 2016/2019, "Eleven" is
// Windows 11 and Server 2022; winHyperV counts as a Windows 8 server.
#pragma once

#include "tvx_base.h"

#include <cstddef>
#include <cstdint>

typedef uint32_t GuestOSID;
#define GUESTOS_ID_UNKNOWN ((GuestOSID)0xFFFFFFFFu)

// GuestOS_GetOSIDByName maps an identifier ("windows9-64") to its id, compared
// without regard to case; GUESTOS_ID_UNKNOWN when the table lacks it.
GuestOSID GuestOS_GetOSIDByName(const char *name);
// GuestOS_GetNameByOSID returns the identifier text (constant) or null.
const char *GuestOS_GetNameByOSID(GuestOSID id);

// Predicates are FALSE for GUESTOS_ID_UNKNOWN.
Bool GuestOS_Is64Bit(GuestOSID id);
Bool GuestOS_IsWin(GuestOSID id);
Bool GuestOS_IsWin9x(GuestOSID id);
Bool GuestOS_IsWinNT4(GuestOSID id);
Bool GuestOS_IsWin2k(GuestOSID id);
Bool GuestOS_IsWin2kOrHigher(GuestOSID id);
Bool GuestOS_IsWinVista(GuestOSID id);
Bool GuestOS_IsWinVistaOrHigher(GuestOSID id);
Bool GuestOS_IsWinEightClient(GuestOSID id);
Bool GuestOS_IsWinEightServer(GuestOSID id);
Bool GuestOS_IsWinTenClient(GuestOSID id);
Bool GuestOS_IsWinTenServer(GuestOSID id);
Bool GuestOS_IsWinElevenClient(GuestOSID id);
Bool GuestOS_IsWinElevenServer(GuestOSID id);
Bool GuestOS_IsLinux(GuestOSID id);
// GuestOS_IsLinuxPreGlibc25: Linux releases whose C library predates glibc
// 2.5 (RHEL 2 to 4, SLES 9, SUSE Linux, Debian 4 ...).
Bool GuestOS_IsLinuxPreGlibc25(GuestOSID id);
Bool GuestOS_IsSolaris(GuestOSID id);
Bool GuestOS_IsNetware(GuestOSID id);
Bool GuestOS_IsDarwin(GuestOSID id);
Bool GuestOS_IsDarwin15OrHigher(GuestOSID id);
Bool GuestOS_IsFreeBSD(GuestOSID id);
// GuestOS_IsOrka: the hypervisor guests ("zelcore", "zelcore5" ...).
Bool GuestOS_IsOrka(GuestOSID id);

// The rows, for walking the whole table: GuestOS_TableId gives the id of row
// `index` (GUESTOS_ID_UNKNOWN past the end).
size_t GuestOS_TableSize(void);
GuestOSID GuestOS_TableId(size_t index);
