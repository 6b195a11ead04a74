/*
 * tvx_guess.h -- guest-OS recognition of install media.
 *
 * Guess_Guest opens a DVD/CD image (UDF, else ISO 9660), runs the recogniser
 * sequence and fills a caller-owned GuessResult. The medium-access calls and
 * every recogniser are exported too, so a host can probe a medium with the
 * same rules. Conventions: tvx_base.h. Recognition logs nothing.
 *
 * Identifier texts in a GuessResult (guestOS, guestOSOverride) are constants
 * of the library: never free them. A result holds no resources; it may be
 * copied byte for byte and compared later with Guess_IsEqual.
 */
#ifndef TVX_GUESS_H
#define TVX_GUESS_H

#include "tvx_base.h"
#include "tvx_iso9660.h"
#include "tvx_udf.h"

TVX_BEGIN_DECLS

/* GuessVersion: the finer class of a recognised release. SUB_NAMES[v] names v. */
typedef enum GuessVersion {
  GUESS_VERSION_UNKNOWN = 0,
  GUESS_VERSION_UBUNTU_SERVER_1404 = 1,
  GUESS_VERSION_UBUNTU_SERVER_140402 = 2,
  GUESS_VERSION_UBUNTU_SERVER_1410 = 3,
  GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER = 4,
  GUESS_VERSION_UBUNTU_SERVER_804_OR_LOWER = 5,
  GUESS_VERSION_UBUNTU_SERVER_810_OR_HIGHER = 6,
  GUESS_VERSION_UBUNTU_1404 = 7,
  GUESS_VERSION_UBUNTU_1410 = 8,
  GUESS_VERSION_UBUNTU_1504_TO_2004 = 9,
  GUESS_VERSION_UBUNTU_2010_OR_HIGHER = 10,
  GUESS_VERSION_UBUNTU_704_OR_LOWER = 11,
  GUESS_VERSION_UBUNTU_710_OR_HIGHER = 12,
  GUESS_VERSION_MANDRIVA_2006 = 13,
  GUESS_VERSION_MANDRIVA_2007 = 14,
  GUESS_VERSION_MANDRIVA_2008_0 = 15,
  GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER = 16,
  GUESS_VERSION_FEDORA_8 = 17,
  GUESS_VERSION_FEDORA_9_TO_12 = 18,
  GUESS_VERSION_FEDORA_13 = 19,
  GUESS_VERSION_FEDORA_14_TO_16 = 20,
  GUESS_VERSION_FEDORA_17 = 21,
  GUESS_VERSION_FEDORA_18 = 22,
  GUESS_VERSION_FEDORA_19_TO_20 = 23,
  GUESS_VERSION_FEDORA_21 = 24,
  GUESS_VERSION_FEDORA_22_TO_28 = 25,
  GUESS_VERSION_FEDORA_29_OR_HIGHER = 26,
  GUESS_VERSION_FEDORA_LIVE = 27,
  GUESS_VERSION_OPENSUSE_11_2_OR_LOWER = 28,
  GUESS_VERSION_OPENSUSE_12 = 29,
  GUESS_VERSION_OPENSUSE_13_1 = 30,
  GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER = 31,
  GUESS_VERSION_SLES_10_SP2_OR_LOWER = 32,
  GUESS_VERSION_SLED_10_SP2_OR_LOWER = 33,
  GUESS_VERSION_SLED_ALL = 34,
  GUESS_VERSION_CENTOS_3 = 35,
  GUESS_VERSION_CENTOS_4 = 36,
  GUESS_VERSION_CENTOS_5 = 37,
  GUESS_VERSION_CENTOS_6 = 38,
  GUESS_VERSION_CENTOS_7 = 39,
  GUESS_VERSION_CENTOS_7_MINIMAL = 40,
  GUESS_VERSION_CENTOS_8 = 41,
  GUESS_VERSION_CENTOS_8_STREAM = 42,
  GUESS_VERSION_WINDOWS_8_ENTERPRISE = 43,
  GUESS_VERSION_WINDOWS_8_TRIAL = 44,
  GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL = 45,
  GUESS_VERSION_WINDOWS_81_PLAIN = 46,
  GUESS_VERSION_WINDOWS_81_TRIAL = 47,
  GUESS_VERSION_WINDOWS_81_ENTERPRISE = 48,
  GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN = 49,
  GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL = 50,
  GUESS_VERSION_WINDOWS_10_PLAIN = 51,
  GUESS_VERSION_WINDOWS_10_ENTERPRISE = 52,
  GUESS_VERSION_WINDOWS_10_TRIAL = 53,
  GUESS_VERSION_WINDOWS_10_ESD = 54,
  GUESS_VERSION_RHEL_SERVER = 55,
  GUESS_VERSION_RHEL_CLIENT = 56,
  GUESS_VERSION_RHEL_WORKSTATION = 57,
  GUESS_VERSION_ASIANUX_7_LIVE = 58,
  GUESS_VERSION_DUMMY_LAST = 59
} GuessVersion;

/* SUB_NAMES: the 60 names of GuessVersion in value order (no terminator). */
TVX_EXPORT extern const char *SUB_NAMES[60];

typedef struct GuessResult {
  const char *guestOS;         /* recognised identifier, or NULL; constant */
  const char *guestOSOverride; /* identifier Guess_GetOsKey prefers, or NULL */
  uint32_t version;            /* a GuessVersion */
  Bool noIsolinuxConfig;       /* Linux media without an isolinux configuration */
  char versionText[32];
  char language[1024];
  char languageShort[32];
  char languages[1024];        /* UI language tags, each followed by "?" */
  char editions[512];          /* edition names, each followed by "?" */
  char displayName[64];        /* when not empty, shown instead of name + version */
} GuessResult;

typedef enum GuessMediumKind {
  GUESS_MEDIUM_NONE = 0,
  GUESS_MEDIUM_ISO9660 = 1,
  GUESS_MEDIUM_UDF = 2
} GuessMediumKind;

/* GuessMedium: an opened install image (built by Guess_Guest). */
typedef struct GuessMedium {
  uint32_t kind; /* a GuessMediumKind */
  char *path;
  Iso9660Image *isoImage;
  UDFVolume *udfVolume;
} GuessMedium;

/* GuessDir: one open directory of a medium (Guess_OpenDir / Guess_CloseDir). */
typedef struct GuessDir {
  Iso9660Dir *isoDir;
  Iso9660DirEntry isoEntry;
  UDFDir *udfDir;
  char *path;
} GuessDir;

typedef enum GuessElfArch {
  GUESS_ELF_ARCH_UNKNOWN = 0,
  GUESS_ELF_ARCH_X86 = 1,
  GUESS_ELF_ARCH_X86_64 = 2,
  GUESS_ELF_ARCH_ARM64 = 3
} GuessElfArch;

/* ---- Medium access. Paths are relative to the medium's root, "/" between
 * components. Directory paths and file names are tried as given, then upper-
 * cased, then lower-cased. ---- */

/* Guess_OpenDir returns a new directory, or NULL when no case variant opens. */
TVX_EXPORT GuessDir *Guess_OpenDir(GuessMedium *medium, const char *path);
/* Guess_ReadDir returns the next entry's name (owned by the directory, valid
 * until the next call), or NULL at the end or on a read failure. */
TVX_EXPORT const char *Guess_ReadDir(GuessMedium *medium, GuessDir *dir);
TVX_EXPORT Bool Guess_RewindDir(GuessMedium *medium, GuessDir *dir);
/* Guess_CloseDir: TRUE when closed and freed; FALSE for NULL arguments or when
 * the reader refuses (the directory then stays allocated). */
TVX_EXPORT Bool Guess_CloseDir(GuessMedium *medium, GuessDir *dir);
/* Guess_ReadFile returns the whole file `name` of `dir` with a NUL byte behind
 * it (malloc'd), or NULL; *out_size (optional) gets the length without NUL. */
TVX_EXPORT char *Guess_ReadFile(GuessMedium *medium, GuessDir *dir, const char *name,
                                uint64_t *out_size);
/* Guess_ReadFileName: Guess_ReadFile for a path that names its directory
 * ("I386/TXTSETUP.SIF"; a bare name reads from the root). */
TVX_EXPORT char *Guess_ReadFileName(GuessMedium *medium, const char *path, uint64_t *out_size);
TVX_EXPORT Bool Guess_FileExists(GuessMedium *medium, const char *dirPath, const char *name);
/* Guess_FileExistsWithPrefix: some entry's name starts with `prefix`,
 * letter case ignored. */
TVX_EXPORT Bool Guess_FileExistsWithPrefix(GuessMedium *medium, const char *dirPath,
                                           const char *prefix);
/* Guess_ELF_Arch classifies an ELF header by its e_machine low byte. */
TVX_EXPORT GuessElfArch Guess_ELF_Arch(const void *buffer, size_t length);

/* ---- Driver and result ---- */

/* Guess_Guest recognises the image at `path`. `reserved` is not read (pass
 * NULL). Returns 0 recognised, 1 opened but not recognised, 2 the image opens
 * neither as UDF nor as ISO 9660. `result` is cleared first. */
TVX_EXPORT int Guess_Guest(const char *path, void *reserved, GuessResult *result);
TVX_EXPORT Bool Guess_IsEqual(const GuessResult *a, const GuessResult *b);
/* Guess_GetOsKey: guestOSOverride when set, else guestOS (constant, may be NULL). */
TVX_EXPORT const char *Guess_GetOsKey(const GuessResult *result);
/* Guess_GetSubString: SUB_NAMES[value]; value must be 0..59. */
TVX_EXPORT const char *Guess_GetSubString(GuessVersion value);
/* Guess_GetVersionString: the text to show for the release (malloc'd). */
TVX_EXPORT char *Guess_GetVersionString(const char *name, const GuessResult *result);

/* GuessParseKeyValue reads the "key = value" entry that begins at `text`.
 * `out_key` is optional. Both outputs are malloc'd. TRUE when a non-empty
 * value was found. */
TVX_EXPORT Bool GuessParseKeyValue(const char *text, char **out_key, char **out_value);

/* ---- Recognisers: TRUE when recognised (result written), else whether
 * result->guestOS was already set (some return FALSE outright). ---- */
TVX_EXPORT Bool Guess_WindowsNT(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_WindowsLegacy(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_WindowsVistaAndNewer(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_RedHat(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_Mandriva(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_Debian(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_SUSE(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_TurboLinux(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_Solaris(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_NetWare(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_FreeBSD(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_Orka(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_Orkai(GuessMedium *medium, GuessResult *result);
TVX_EXPORT Bool Guess_Lumen(GuessMedium *medium, GuessResult *result);
/* Guess_MacOS is not in Guess_Guest's sequence; hosts call it themselves. */
TVX_EXPORT Bool Guess_MacOS(GuessMedium *medium, GuessResult *result);

TVX_END_DECLS

#endif /* TVX_GUESS_H */
