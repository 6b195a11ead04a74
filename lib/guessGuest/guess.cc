// The recognition driver: opens an install image, runs the recognisers in
// their fixed order until one claims the medium, and the small operations
// that read a GuessResult afterwards.
#include <cstdlib>
#include <cstring>

#include "lib/guessGuest/guess_internal.h"
#include "platform/msg.h"
#include "platform/str.h"
#include "platform/util.h"

extern "C" {
// Entry n names GuessVersion n. Writable data: hosts have always been able
// to take the table's address as a plain `const char *[]`.
TVX_EXPORT const char *SUB_NAMES[60] = {
    "GUESS_VERSION_UNKNOWN",
    "GUESS_VERSION_UBUNTU_SERVER_1404",
    "GUESS_VERSION_UBUNTU_SERVER_140402",
    "GUESS_VERSION_UBUNTU_SERVER_1410",
    "GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER",
    "GUESS_VERSION_UBUNTU_SERVER_804_OR_LOWER",
    "GUESS_VERSION_UBUNTU_SERVER_810_OR_HIGHER",
    "GUESS_VERSION_UBUNTU_1404",
    "GUESS_VERSION_UBUNTU_1410",
    "GUESS_VERSION_UBUNTU_1504_TO_2004",
    "GUESS_VERSION_UBUNTU_2010_OR_HIGHER",
    "GUESS_VERSION_UBUNTU_704_OR_LOWER",
    "GUESS_VERSION_UBUNTU_710_OR_HIGHER",
    "GUESS_VERSION_MANDRIVA_2006",
    "GUESS_VERSION_MANDRIVA_2007",
    "GUESS_VERSION_MANDRIVA_2008_0",
    "GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER",
    "GUESS_VERSION_FEDORA_8",
    "GUESS_VERSION_FEDORA_9_TO_12",
    "GUESS_VERSION_FEDORA_13",
    "GUESS_VERSION_FEDORA_14_TO_16",
    "GUESS_VERSION_FEDORA_17",
    "GUESS_VERSION_FEDORA_18",
    "GUESS_VERSION_FEDORA_19_TO_20",
    "GUESS_VERSION_FEDORA_21",
    "GUESS_VERSION_FEDORA_22_TO_28",
    "GUESS_VERSION_FEDORA_29_OR_HIGHER",
    "GUESS_VERSION_FEDORA_LIVE",
    "GUESS_VERSION_OPENSUSE_11_2_OR_LOWER",
    "GUESS_VERSION_OPENSUSE_12",
    "GUESS_VERSION_OPENSUSE_13_1",
    "GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER",
    "GUESS_VERSION_SLES_10_SP2_OR_LOWER",
    "GUESS_VERSION_SLED_10_SP2_OR_LOWER",
    "GUESS_VERSION_SLED_ALL",
    "GUESS_VERSION_CENTOS_3",
    "GUESS_VERSION_CENTOS_4",
    "GUESS_VERSION_CENTOS_5",
    "GUESS_VERSION_CENTOS_6",
    "GUESS_VERSION_CENTOS_7",
    "GUESS_VERSION_CENTOS_7_MINIMAL",
    "GUESS_VERSION_CENTOS_8",
    "GUESS_VERSION_CENTOS_8_STREAM",
    "GUESS_VERSION_WINDOWS_8_ENTERPRISE",
    "GUESS_VERSION_WINDOWS_8_TRIAL",
    "GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL",
    "GUESS_VERSION_WINDOWS_81_PLAIN",
    "GUESS_VERSION_WINDOWS_81_TRIAL",
    "GUESS_VERSION_WINDOWS_81_ENTERPRISE",
    "GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN",
    "GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL",
    "GUESS_VERSION_WINDOWS_10_PLAIN",
    "GUESS_VERSION_WINDOWS_10_ENTERPRISE",
    "GUESS_VERSION_WINDOWS_10_TRIAL",
    "GUESS_VERSION_WINDOWS_10_ESD",
    "GUESS_VERSION_RHEL_SERVER",
    "GUESS_VERSION_RHEL_CLIENT",
    "GUESS_VERSION_RHEL_WORKSTATION",
    "GUESS_VERSION_ASIANUX_7_LIVE",
    "GUESS_VERSION_DUMMY_LAST",
};
}  // extern "C"

static_assert(sizeof SUB_NAMES / sizeof SUB_NAMES[0] == GUESS_VERSION_DUMMY_LAST + 1,
              "SUB_NAMES must name every GuessVersion");

namespace {

using Recogniser = Bool (*)(GuessMedium *, GuessResult *);

// The order matters: a medium can satisfy more than one recogniser's tests
// (a Windows medium's first-stage files, a distribution whose media borrow
// another's layout), and the first claim wins. The full sequence is
//    1 Guess_WindowsNT              8 Guess_TurboLinux
//    2 Guess_WindowsLegacy          9 Guess_Solaris
//    3 Guess_WindowsVistaAndNewer  10 Guess_NetWare
//    4 Guess_RedHat                11 Guess_FreeBSD
//    5 Guess_Mandriva              12 Guess_Orka
//    6 Guess_Debian                13 Guess_Orkai
//    7 Guess_SUSE                  14 Guess_Lumen
// One row per recogniser, in that order. Guess_MacOS is never run here:
// hosts call it on media of their own.
constexpr Recogniser kSequence[] = {
    Guess_WindowsNT,
    Guess_WindowsLegacy,
    nullptr,
};

bool StrEqualOrBothNull(const char *a, const char *b) {
  if (a == nullptr || b == nullptr) return a == b;
  return std::strcmp(a, b) == 0;
}

template <size_t N>
bool FieldEqual(const char (&a)[N], const char (&b)[N]) {
  return std::strncmp(a, b, N) == 0;
}

}  // namespace

namespace tvx::guess {

Bool OpenMedium(const char *path, GuessMedium *medium) {
  std::memset(medium, 0, sizeof *medium);
  if (path == nullptr) return FALSE;
  // Windows Vista-and-newer media carry an ISO 9660 tree that holds only a
  // notice; their content is on the UDF side, so UDF is asked first and an
  // image that holds both is read as UDF alone.
  medium->kind = GUESS_MEDIUM_ISO9660;
  medium->udfVolume = UDF_Open(path);
  if (medium->udfVolume != nullptr) {
    medium->kind = GUESS_MEDIUM_UDF;
  } else {
    uint32_t formats = 0;
    (void)Iso9660_ListFormats(path, &formats);
    if (Iso9660_Open(path, formats, &medium->isoImage) != ISO9660_OK) {
      medium->isoImage = nullptr;
      medium->kind = GUESS_MEDIUM_NONE;
      return FALSE;
    }
  }
  medium->path = UtilSafeStrdup0(path);
  return TRUE;
}

void CloseMedium(GuessMedium *medium) {
  std::free(medium->path);
  if (medium->kind == GUESS_MEDIUM_ISO9660 && medium->isoImage != nullptr) {
    Iso9660_Close(medium->isoImage);
  } else if (medium->kind == GUESS_MEDIUM_UDF && medium->udfVolume != nullptr) {
    UDF_Close(medium->udfVolume);
  }
  std::memset(medium, 0, sizeof *medium);
}

}  // namespace tvx::guess

extern "C" {

TVX_EXPORT int Guess_Guest(const char *path, void *reserved, GuessResult *result) {
  (void)reserved;
  if (result == nullptr) return 2;
  std::memset(result, 0, sizeof *result);
  GuessMedium medium;
  if (!tvx::guess::OpenMedium(path, &medium)) return 2;
  bool recognised = false;
  try {
    for (const Recogniser *r = kSequence; *r != nullptr && !recognised; ++r) {
      recognised = (*r)(&medium, result);
    }
  } catch (...) {
    // Only allocation failure can get here; the medium counts as unknown,
    // and must still be closed.
    recognised = false;
  }
  tvx::guess::CloseMedium(&medium);
  return recognised ? 0 : 1;
}

TVX_EXPORT Bool Guess_IsEqual(const GuessResult *a, const GuessResult *b) {
  if (a == nullptr || b == nullptr) return a == b ? TRUE : FALSE;
  bool equal = StrEqualOrBothNull(a->guestOS, b->guestOS) &&
               StrEqualOrBothNull(a->guestOSOverride, b->guestOSOverride) &&
               a->version == b->version && a->noIsolinuxConfig == b->noIsolinuxConfig &&
               FieldEqual(a->versionText, b->versionText) &&
               FieldEqual(a->language, b->language) &&
               FieldEqual(a->languages, b->languages) && FieldEqual(a->editions, b->editions);
  // languageShort repeats language, and displayName is presentation: two
  // results that differ only there describe the same medium.
  return equal ? TRUE : FALSE;
}

TVX_EXPORT const char *Guess_GetOsKey(const GuessResult *result) {
  if (result == nullptr) return nullptr;
  return result->guestOSOverride != nullptr ? result->guestOSOverride : result->guestOS;
}

TVX_EXPORT const char *Guess_GetSubString(GuessVersion value) { return SUB_NAMES[value]; }

TVX_EXPORT char *Guess_GetVersionString(const char *name, const GuessResult *result) {
  const char *base = name != nullptr ? name : "";
  if (result == nullptr) return UtilSafeStrdup0(base);
  if (result->displayName[0] != '\0') return UtilSafeStrdup0(result->displayName);
  if (result->versionText[0] != '\0') {
    return Str_SafeAsprintf(nullptr, "%s %s", base, result->versionText);
  }
  const char *msgId = nullptr;
  switch (result->version) {
    case GUESS_VERSION_UBUNTU_SERVER_1410:
    case GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER:
    case GUESS_VERSION_UBUNTU_SERVER_804_OR_LOWER:
    case GUESS_VERSION_UBUNTU_SERVER_810_OR_HIGHER:
      msgId = "@&!*@*@(msg.guessGuest.ubuntuServer)Server";
      break;
    case GUESS_VERSION_SLED_10_SP2_OR_LOWER:
    case GUESS_VERSION_SLED_ALL:
      msgId = "@&!*@*@(msg.guessGuest.sledDesktop)Desktop";
      break;
    default:
      return UtilSafeStrdup0(base);
  }
  tvx::guess::Text suffix;
  try {
    suffix.reset(Msg_GetString(msgId));
  } catch (...) {  // allocation failure: show the plain name
    return UtilSafeStrdup0(base);
  }
  if (suffix == nullptr || suffix.get()[0] == '\0') return UtilSafeStrdup0(base);
  return Str_SafeAsprintf(nullptr, "%s %s", base, suffix.get());
}

}  // extern "C"
