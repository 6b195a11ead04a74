// Whether a recognised guest can be installed unattended, and the limits on
// the answers the user types for it.
#include <cstring>

#include "lib/guestInstall/autoinstall_internal.h"
#include "platform/guestos.h"
#include "platform/str.h"

namespace tvx::autoinstall {
namespace {

// The localised names of the administrator account share the stem
// "administra"; the rest are the guest accounts of the localised releases.
constexpr ReservedName kLinuxShortNames[] = {{"root", 0}, {nullptr, 0}};
constexpr ReservedName kWindowsNames[] = {
    {"administra", 1}, {"amministratore", 0}, {"guest", 0}, {"guests", 0},
    {"gast", 0},       {"invitado", 0},       {nullptr, 0}};
constexpr ReservedName kWindowsVistaNames[] = {{"administra", 1},
                                               {"amministratore", 0},
                                               {"guest", 0},
                                               {"guests", 0},
                                               {nullptr, 0}};

// "+vista" stands for every guest that the guest-OS table counts as Vista or
// newer, since those identifiers share no common prefix.
constexpr const char *kVistaOrHigher = "+vista";

constexpr InstallGuestRow kWindowsGuests[] = {
    {"*", "*", {0, 0}, 50, 0, kWindowsNames},
    {"winnet", "*", {1, 0}, 50, 0, kWindowsNames},
    {"win2000", "*", {1, 1}, 50, 0, kWindowsNames},
    {"winxp", "*", {1, 1}, 50, 0, kWindowsNames},
    {kVistaOrHigher, "*", {1, 1}, 20, 0, kWindowsVistaNames},
    {nullptr, nullptr, {0, 0}, 0, 0, nullptr},
};

constexpr InstallGuestRow kLinuxGuests[] = {
    {"*", "*", {0, 0}, 52, 0, nullptr},
    {nullptr, nullptr, {0, 0}, 0, 0, nullptr},
};

bool RowMatches(const InstallGuestRow &row, const GuessResult *guess) {
  if (StrUtil_CaselessStartsWith(guess->guestOS, row.guestOSPrefix) &&
      (std::strcmp(row.versionPrefix, "*") == 0 ||
       StrUtil_CaselessStartsWith(guess->versionText, row.versionPrefix))) {
    return true;
  }
  return std::strcmp(row.guestOSPrefix, kVistaOrHigher) == 0 &&
         GuestOS_IsWinVistaOrHigher(GuestOS_GetOSIDByName(guess->guestOS));
}

void SetGuestFields(AutoInstallConfigInfo *info, const InstallGuestRow &row) {
  info->guestFlags[0] = row.guestFlags[0];
  info->guestFlags[1] = row.guestFlags[1];
  info->nameMaxLength = row.nameMaxLength;
  info->guestValue = row.guestValue;
  info->reservedNames = row.reservedNames;
}

}  // namespace

const InstallFamilyRow installConfigTable[] = {
    {"windows", 0, 127, {1, 0, 0, 0}, nullptr, kWindowsGuests},
    {"linux", 32, 127, {0, 1, 1, 1}, kLinuxShortNames, kLinuxGuests},
    {nullptr, 0, 0, {0, 0, 0, 0}, nullptr, nullptr},
};

}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

extern "C" {

TVX_EXPORT Bool AutoInstall_IsSupportedGuest(const GuessResult *guess) {
  if (guess == nullptr || guess->guestOS == nullptr) return FALSE;
  if (AutoInstallIsSupportedWindowsGuest(guess)) return TRUE;
  return AutoInstallIsSupportedLinuxGuest(guess);
}

TVX_EXPORT Bool AutoInstall_GetInstallConfigInfo(const char *family, const GuessResult *guess,
                                                 AutoInstallConfigInfo *out_info) {
  if (family == nullptr || guess == nullptr || out_info == nullptr || guess->guestOS == nullptr) {
    return FALSE;
  }
  const InstallFamilyRow *fam = installConfigTable;
  while (fam->key != nullptr && std::strcmp(fam->key, family) != 0) ++fam;
  if (fam->key == nullptr) return FALSE;

  out_info->reservedShortNames = fam->reservedShortNames;
  out_info->shortNameMaxLength = fam->shortNameMaxLength;
  out_info->passwordMaxLength = fam->passwordMaxLength;
  for (int i = 0; i < 4; ++i) out_info->familyFlags[i] = fam->familyFlags[i];
  SetGuestFields(out_info, fam->guests[0]);
  // The default row's "*" is compared literally, like any other prefix: it
  // only serves as the fallback set above.
  for (const InstallGuestRow *row = fam->guests; row->guestOSPrefix != nullptr; ++row) {
    if (RowMatches(*row, guess)) {
      SetGuestFields(out_info, *row);
      break;
    }
  }
  return TRUE;
}

}  // extern "C"
