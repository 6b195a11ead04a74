// The guest-OS table: every guest-OS identifier the library emits or reads,
// with a numeric id and family predicates.
#pragma once

#include "tvx_base.h"

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
Bool GuestOS_IsWinElevenServer(GuestOSID id);
Bool GuestOS_IsLinux(GuestOSID id);
Bool GuestOS_IsLinuxPreGlibc25(GuestOSID id);
Bool GuestOS_IsSolaris(GuestOSID id);
Bool GuestOS_IsNetware(GuestOSID id);
Bool GuestOS_IsDarwin(GuestOSID id);
Bool GuestOS_IsDarwin15OrHigher(GuestOSID id);
Bool GuestOS_IsFreeBSD(GuestOSID id);
Bool GuestOS_IsOrka(GuestOSID id);
