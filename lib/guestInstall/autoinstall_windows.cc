// Answer files of an unattended Windows installation. Both generations of
// Windows setup get their file whatever the guest, since the floppy builder
// decides later which ones the guest sees: winnt.sif (INI, in the legacy
// code page of the installation language) and the unattend XML (UTF-8).
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/guestInstall/autoinstall_internal.h"
#include "lib/guestInstall/autoinstall_windows_xml.h"
#include "platform/file.h"
#include "platform/file_replace.h"
#include "platform/fileio.h"
#include "platform/guestos.h"
#include "platform/log.h"
#include "platform/unique.h"
#include "platform/timeutil.h"
#include "platform/unicode.h"
#include "platform/util.h"
#include "tvx_autoinstall_windows.h"
#include "tvx_ini.h"

namespace tvx::autoinstall {
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

// Templates are a few kilobytes; the bound keeps a wrong path (a disk image,
// say) from being loaded whole.
constexpr uint64_t kMaxTemplateBytes = 16u << 20;

bool ReadTemplate(const char *path, std::string *out) {
  FileIODescriptor fd;
  FileIO_Invalidate(&fd);
  if (FileIO_Open(&fd, path, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN) != FILEIO_SUCCESS) return false;
  uint64_t size = FileIO_GetSize(&fd);
  bool ok = size <= kMaxTemplateBytes;
  if (ok) {
    out->assign(static_cast<size_t>(size), '\0');
    ok = size == 0 || FileIO_Pread(&fd, out->data(), out->size(), 0) == FILEIO_SUCCESS;
  }
  FileIO_Close(&fd);
  return ok;
}

// CopyTemplate makes `to` a fresh copy of the template. Every answer file may
// end up holding the password, so it is private (0600) from the start, and a
// file or link already at `to` is replaced, never written through.
bool CopyTemplate(const char *from, const char *to) {
  std::string data;
  FileReplaceOptions options;
  options.links = FileLinkPolicy::kReplaceLink;
  options.secret = true;
  if (from != nullptr && ReadTemplate(from, &data) && File_ReplaceContents(to, data, options)) {
    return true;
  }
  Log("%s: File_Copy from=\"%s\" to=\"%s\"\n", kFn, OrNull(from), to);
  return false;
}

// CheckIniTexts refuses, before any file is made, a text that the INI writer
// would let add a key or a section (a line end), end its quotes early ("),
// have cut when read back (;) or clip (too long for its line).
bool CheckIniTexts(const Inputs &in) {
  const struct {
    const char *key;
    const char *text;
  } texts[] = {{"ProductKey", in.productKey}, {"FullName", in.fullName},
               {"AdminPassword", in.adminPassword}};
  for (const auto &t : texts) {
    if (t.text == nullptr) continue;
    std::string why = AutoInstallIniValueProblem(t.key, t.text);
    if (!why.empty()) {
      Log("%s: %s %s\n", kFn, t.key, why.c_str());
      return false;
    }
  }
  return true;
}

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
  if (!CheckIniTexts(in)) return false;

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

}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

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
