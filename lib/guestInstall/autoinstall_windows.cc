// Answer files of an unattended Windows installation. Both generations of
// Windows setup get their file whatever the guest, since the floppy builder
// decides later which ones the guest sees: winnt.sif (INI, in the legacy
// code page of the installation language) and the unattend XML (UTF-8).
#include <cstdlib>
#include <cstring>

#include "lib/guestInstall/autoinstall_windows_xml.h"
#include "platform/file.h"
#include "platform/guestos.h"
#include "platform/log.h"
#include "platform/unique.h"
#include "platform/timeutil.h"
#include "platform/unicode.h"
#include "platform/util.h"
#include "tvx_autoinstall_windows.h"
#include "tvx_ini.h"

namespace {

constexpr char kFn[] = "AutoInstall_PrepareAnswerFileEx";

struct LanguageEncoding {
  const char *language;
  StringEncoding encoding;
};

// Languages whose setup reads a double-byte or Cyrillic code page; every
// other language reads the Western one.
constexpr LanguageEncoding windowsLanguageEncodings[] = {
    {"Japanese", STRING_ENCODING_WINDOWS_932},
    {"Russian", STRING_ENCODING_WINDOWS_1251},
    {"Simplified Chinese", STRING_ENCODING_WINDOWS_936},
    {"Traditional Chinese", STRING_ENCODING_WINDOWS_950},
    {"Korean", STRING_ENCODING_WINDOWS_949},
};

StringEncoding EncodingForLanguage(const char *language) {
  for (const LanguageEncoding &row : windowsLanguageEncodings) {
    if (std::strcmp(row.language, language) == 0) return row.encoding;
  }
  return STRING_ENCODING_WINDOWS_1252;
}

bool NonEmpty(const char *s) { return s != nullptr && *s != '\0'; }

const char *OrNull(const char *s) { return s != nullptr ? s : "(null)"; }

bool CopyTemplate(const char *from, const char *to) {
  if (from != nullptr && File_Copy(from, to, TRUE)) return true;
  Log("%s: File_Copy from=\"%s\" to=\"%s\"\n", kFn, OrNull(from), to);
  return false;
}

// ToCodePage converts a user text for winnt.sif. Setup shows a text it
// cannot decode as garbage, which beats losing the answer, so an
// unconvertible text is written as it came.
tvx::CharPtr ToCodePage(const char *text, StringEncoding encoding) {
  char *converted = Unicode_GetAllocBytes(text, encoding);
  if (converted == nullptr) {
    Log("%s: Failed to perform conversion from UTF-8 to %s\n", kFn,
        Unicode_EncodingEnumToName(encoding));
    converted = UtilSafeStrdup0(text);
  }
  return tvx::CharPtr(converted);
}

struct Inputs {
  const char *sifTemplatePath;
  const char *xmlTemplatePath;
  const char *storePwdTemplatePath;
  const char *productKey;
  const char *fullName;
  const char *adminPassword;
  const char *guestOS;
  uint32_t version;
  const char *outputDir;
  const char *language;
  const char *imageName;
  Bool autoLogon;
  Bool keepPartitions;
};

// WriteSif fills the user's answers and the host's time-zone index into
// winnt.sif and, with a password, the logon setting into storePwd.ini.
bool WriteSif(const Inputs &in, GuestOSID osId, StringEncoding encoding, const char *sifPath,
              const char *storePwdPath, int timeZoneIndex) {
  if (NonEmpty(in.productKey)) {
    if (!IniUtil_WriteIniFileString(sifPath, "UserData", "ProductKey", in.productKey, TRUE) ||
        (GuestOS_IsWin2k(osId) &&
         !IniUtil_WriteIniFileString(sifPath, "UserData", "ProductID", in.productKey, TRUE))) {
      Log("%s: IniUtil_WriteIniFileString unattendFilePath=\"%s\", ProductKey=\"%s\"\n", kFn,
          sifPath, in.productKey);
      return false;
    }
  }

  if (NonEmpty(in.fullName)) {
    tvx::CharPtr name = ToCodePage(in.fullName, encoding);
    if (!IniUtil_WriteIniFileString(sifPath, "UserData", "FullName", name.get(), TRUE)) {
      Log("%s: IniUtil_WriteIniFileString unattendFilePath=\"%s\", FullName=\"%s\"\n", kFn,
          sifPath, in.fullName);
      return false;
    }
  }

  if (NonEmpty(in.adminPassword)) {
    tvx::CharPtr password = ToCodePage(in.adminPassword, encoding);
    if (!IniUtil_WriteIniFileString(sifPath, "GuiUnattended", "AdminPassword", password.get(),
                                    TRUE)) {
      Log("%s: IniUtil_WriteIniFileString unattendFilePath=\"%s\", AdminPassword=\"%s\"\n", kFn,
          sifPath, in.adminPassword);
      return false;
    }
    if (!IniUtil_WriteIniFileString(sifPath, "GuiUnattended", "AutoLogon", "Yes", FALSE)) {
      Log("%s: IniUtil_WriteIniFileString unattendFilePath=\"%s\", AutoLogon=\"Yes\"\n", kFn,
          sifPath);
      return false;
    }
    if (!IniUtil_WriteIniFileString(sifPath, "GuiUnattended", "AutoLogonCount", "1", FALSE)) {
      Log("%s: IniUtil_WriteIniFileString unattendFilePath=\"%s\", AutoLogonCount=\"1\"\n", kFn,
          sifPath);
      return false;
    }
    if (storePwdPath != nullptr &&
        !IniUtil_WriteIniFileString(storePwdPath, "Autologon", "Enabled",
                                    in.autoLogon ? "1" : "0", FALSE)) {
      Log("%s: IniUtil_WriteIniFileString storePwdIniPath=\"%s\"", kFn, storePwdPath);
      return false;
    }
  }

  if (timeZoneIndex >= 0 &&
      !IniUtil_WriteIniFileInt(sifPath, "GuiUnattended", "TimeZone", timeZoneIndex)) {
    Log("%s: IniUtil_WriteIniFileInt unattendFilePath=\"%s\", TimeZone=%d\n", kFn, sifPath,
        timeZoneIndex);
    return false;
  }
  return true;
}

bool Prepare(const Inputs &in) {
  GuestOSID osId = in.guestOS != nullptr ? GuestOS_GetOSIDByName(in.guestOS) : GUESTOS_ID_UNKNOWN;
  if (osId == GUESTOS_ID_UNKNOWN || !GuestOS_IsWin(osId)) {
    Log("%s: GuestOS_IsWin failed for guestID %s\n", kFn, OrNull(in.guestOS));
    return false;
  }
  if (in.outputDir == nullptr || in.imageName == nullptr) {
    Log("%s: no %s given\n", kFn, in.outputDir == nullptr ? "output directory" : "image name");
    return false;
  }

  const char *language = in.language;
  if (!NonEmpty(language)) language = GuestOS_IsWinVistaOrHigher(osId) ? "en-US" : "English";
  StringEncoding encoding = EncodingForLanguage(language);

  tvx::CharPtr sifPath(File_PathJoin(in.outputDir, "winnt.sif"));
  tvx::CharPtr xmlPath(File_PathJoin(in.outputDir, "autoun~0.xml"));
  if (!CopyTemplate(in.sifTemplatePath, sifPath.get()) ||
      !CopyTemplate(in.xmlTemplatePath, xmlPath.get())) {
    return false;
  }
  tvx::CharPtr storePwdPath;
  if (in.storePwdTemplatePath != nullptr) {
    storePwdPath.reset(File_PathJoin(in.outputDir, "storePwd.ini"));
    if (!CopyTemplate(in.storePwdTemplatePath, storePwdPath.get())) return false;
  }

  char *zoneName = nullptr;
  int zoneIndex = TimeUtil_GetLocalWindowsTimeZoneIndexAndName(&zoneName);
  tvx::CharPtr timeZoneName(zoneName);
  if (!WriteSif(in, osId, encoding, sifPath.get(), storePwdPath.get(), zoneIndex)) return false;

  if (!AutoInstallEditUnattendXml(xmlPath.get(), in.productKey, in.fullName, in.adminPassword,
                                  timeZoneName.get(), osId, in.version, language, in.imageName,
                                  in.autoLogon, in.keepPartitions)) {
    Log("%s: AutoInstallEditUnattendXml failed for \"%s\"\n", kFn, xmlPath.get());
    return false;
  }
  return true;
}

}  // namespace

extern "C" TVX_EXPORT Bool AutoInstall_PrepareAnswerFileEx(
    const char *sifTemplatePath, const char *xmlTemplatePath, const char *storePwdTemplatePath,
    const char *productKey, const char *fullName, const char *adminPassword, const char *guestOS,
    GuessVersion version, const char *outputDir, const char *language, const char *imageName,
    Bool autoLogon, Bool keepPartitions) {
  try {
    Inputs in{sifTemplatePath, xmlTemplatePath, storePwdTemplatePath, productKey,
              fullName,        adminPassword,   guestOS,              version,
              outputDir,       language,        imageName,            autoLogon,
              keepPartitions};
    return Prepare(in) ? TRUE : FALSE;
  } catch (...) {
    Log("%s: out of memory\n", kFn);
    return FALSE;
  }
}
