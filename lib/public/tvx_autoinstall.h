/*
 * tvx_autoinstall.h -- unattended installation: whether a recognised guest
 * can be installed unattended, the limits on the answers a user types, and
 * the validation of those answers.
 *
 * Conventions: tvx_base.h. In addition:
 *  1. The GuessResult passed in is the one Guess_Guest filled; it is only
 *     read.
 *  2. The pointers stored in an AutoInstallConfigInfo refer to constant
 *     tables of the library: never free them.
 *  3. Validators store the localised message of a refused text through their
 *     optional `out_message` slot (malloc'd, the caller frees it); on success
 *     the slot is left untouched.
 *  4. A validator's `family` is "windows" or "linux" (exactly); any other
 *     value is a programming error and stops the process.
 */
#ifndef TVX_AUTOINSTALL_H
#define TVX_AUTOINSTALL_H

#include "tvx_base.h"
#include "tvx_guess.h"

TVX_BEGIN_DECLS

/* AutoInstallTextKind: what a validated text is. */
typedef enum AutoInstallTextKind {
  AUTOINSTALL_TEXT_PASSWORD = 0,
  AUTOINSTALL_TEXT_SHORT_NAME = 1, /* the account's login name */
  AUTOINSTALL_TEXT_NAME = 2        /* the full name; on Windows the account name */
} AutoInstallTextKind;

/* AutoInstallTextError: the result of every validator. */
typedef enum AutoInstallTextError {
  AUTOINSTALL_TEXT_OK = 0,
  AUTOINSTALL_TEXT_BAD_LINUX_NAME = 1,
  AUTOINSTALL_TEXT_BAD_WINDOWS_NAME = 2,
  AUTOINSTALL_TEXT_BAD_PASSWORD_SUBSTRING = 3,
  AUTOINSTALL_TEXT_BAD_GECOS_SUBSTRING = 4,
  AUTOINSTALL_TEXT_BAD_LINUX_USERNAME = 5,
  AUTOINSTALL_TEXT_BAD_UBUNTU_USERNAME = 6
} AutoInstallTextError;

/* AutoInstallLinuxKind: the classes of Linux guest-OS identifiers. The values
 * index the Linux answer-file table, so they never change. */
typedef enum AutoInstallLinuxKind {
  AUTOINSTALL_LINUX_NONE = 0,
  AUTOINSTALL_LINUX_REDHAT = 1,
  AUTOINSTALL_LINUX_UBUNTU = 2,
  AUTOINSTALL_LINUX_SUSE = 3,
  AUTOINSTALL_LINUX_SLES10 = 4,
  AUTOINSTALL_LINUX_MANDRIVA = 5
} AutoInstallLinuxKind;

/* ReservedName: an account name the guest keeps for itself. With isStem set,
 * every name that begins with `name` is meant (localised variants). A list
 * ends with an entry whose name is NULL. */
typedef struct ReservedName {
  const char *name;
  int32_t isStem;
} ReservedName;

/* AutoInstallConfigInfo: the limits and reserved names for one guest. The
 * library fills it and never reads it back; the flags and guestValue are for
 * the host's own use. */
typedef struct AutoInstallConfigInfo {
  const ReservedName *reservedShortNames; /* or NULL */
  const ReservedName *reservedNames;      /* or NULL */
  uint32_t shortNameMaxLength;            /* 0: the family has no short name */
  uint32_t nameMaxLength;
  uint32_t guestValue;
  uint32_t passwordMaxLength;
  Bool familyFlags[4];
  Bool guestFlags[2];
} AutoInstallConfigInfo;

/* AutoInstall_IsSupportedGuest: TRUE when unattended install is offered for
 * the recognised guest (FALSE when guess->guestOS is NULL). */
TVX_EXPORT Bool AutoInstall_IsSupportedGuest(const GuessResult *guess);

/* AutoInstall_GetInstallConfigInfo fills `out_info` with the limits of
 * `family` ("windows" or "linux", compared exactly) for the guess. FALSE, with
 * out_info untouched, when an argument or guess->guestOS is NULL or the family
 * is unknown. */
TVX_EXPORT Bool AutoInstall_GetInstallConfigInfo(const char *family, const GuessResult *guess,
                                                 AutoInstallConfigInfo *out_info);

/* The three validators of typed answers. out_message is optional. */
TVX_EXPORT AutoInstallTextError AutoInstall_ValidatePassword(const char *family,
                                                             const GuessResult *guess,
                                                             const char *text,
                                                             char **out_message);
TVX_EXPORT AutoInstallTextError AutoInstall_ValidateShortName(const char *family,
                                                              const GuessResult *guess,
                                                              const char *text,
                                                              char **out_message);
TVX_EXPORT AutoInstallTextError AutoInstall_ValidateName(const char *family,
                                                         const GuessResult *guess,
                                                         const char *text,
                                                         char **out_message);

/* AutoInstallIsSupportedLinuxGuest: the Linux support rule alone. */
TVX_EXPORT Bool AutoInstallIsSupportedLinuxGuest(const GuessResult *guess);

/* AutoInstallValidateLinuxText: the Linux text rules for `kind` (an
 * AutoInstallTextKind; other values are accepted). Bytes only, no length
 * check. out_message is optional. */
TVX_EXPORT AutoInstallTextError AutoInstallValidateLinuxText(const GuessResult *guess,
                                                             const char *text, int kind,
                                                             char **out_message);

/* ---- Windows guests ---- */

/* AutoInstall_GetPrettyWindowsName turns the raw name of a Windows image
 * ("Windows 10 ENTERPRISEN": base name, a space, the edition key) into a
 * localised display name ("Windows 10 Enterprise N"). A name without a space
 * or without a known edition comes back unchanged. Returns a malloc'd text,
 * or NULL when rawName is NULL. */
TVX_EXPORT char *AutoInstall_GetPrettyWindowsName(const char *rawName);

/* AutoInstallIsSupportedWindowsGuest: TRUE when unattended install is offered
 * for the recognised Windows medium. */
TVX_EXPORT Bool AutoInstallIsSupportedWindowsGuest(const GuessResult *guess);

/* AutoInstallValidateWindowsText: only AUTOINSTALL_TEXT_NAME is checked (the
 * account name); `guess` is not read and may be NULL. out_message is
 * optional. */
TVX_EXPORT AutoInstallTextError AutoInstallValidateWindowsText(const GuessResult *guess,
                                                               const char *text, int kind,
                                                               char **out_message);

TVX_END_DECLS

#endif /* TVX_AUTOINSTALL_H */
