// Unattended-install internals shared by the configuration, validation and
// answer-file code. Not exported.
#pragma once

#include <string>

#include "tvx_autoinstall.h"

// The source path that NOT_REACHED names for this part of the library.
#define AUTOINSTALL_SOURCE_PATH "lib/guestInstall/autoinstall"

namespace tvx::autoinstall {

// AutoInstallIniValueProblem checks a user's text bound for an INI answer
// file under `key` against what the INI writer can carry: it must not hold
// a line end or other control character (it would add a key or a section),
// a double quote (it would end the quoted value) or a semicolon (a reader
// cuts the value there), and must fit the writer's line without clipping.
// Returns "" when the text is fine, else the reason, e.g. "holds a line
// feed". Every INI value that comes from a user goes through it first.
std::string AutoInstallIniValueProblem(const char *key, const char *value);

// AutoInstallGetLinuxKind classifies a Linux guest-OS identifier by its
// (case-sensitive) prefix; NULL and unknown identifiers give
// AUTOINSTALL_LINUX_NONE.
AutoInstallLinuxKind AutoInstallGetLinuxKind(const char *guestOS);

// AutoInstallValidateText dispatches to the Windows or Linux text rules by
// `family` ("windows" or "linux", exactly); any other family stops the
// process.
AutoInstallTextError AutoInstallValidateText(const char *family, const GuessResult *guess,
                                             const char *text, AutoInstallTextKind kind,
                                             char **out_message);

// AutoInstallSetMessage stores the localised text of `idFmt` through
// out_message when the slot is given.
void AutoInstallSetMessage(char **out_message, const char *idFmt);

// The per-family answer limits behind AutoInstall_GetInstallConfigInfo.
struct InstallGuestRow {
  const char *guestOSPrefix;  // NULL ends a family's rows; "*" is the default
  const char *versionPrefix;  // "*" matches every version text
  Bool guestFlags[2];
  uint32_t nameMaxLength;
  uint32_t guestValue;
  const ReservedName *reservedNames;
};

struct InstallFamilyRow {
  const char *key;  // NULL ends the table
  uint32_t shortNameMaxLength;
  uint32_t passwordMaxLength;
  Bool familyFlags[4];
  const ReservedName *reservedShortNames;
  const InstallGuestRow *guests;
};

extern const InstallFamilyRow installConfigTable[];

}  // namespace tvx::autoinstall
