// The answer file of an unattended Linux install: the template of the
// guest's installer filled with the typed answers, each escaped for the
// language of the spot it lands in, and written in one crash-safe step.
#include <cstring>
#include <string>

#include "lib/guestInstall/autoinstall_internal.h"
#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "lib/guestInstall/autoinstall_linux_templates.h"
#include "platform/file.h"
#include "platform/file_replace.h"
#include "platform/log.h"
#include "platform/str.h"
#include "platform/unique.h"

namespace tvx::autoinstall {
namespace {

constexpr char kFn[] = "AutoInstall_PrepareAnswerFileEx_Linux";

std::string EscapeWith(const std::string &text, const char *special) {
  std::string out;
  out.reserve(text.size() + 8);
  for (char c : text) {
    if (c != '\0' && std::strchr(special, c) != nullptr) out.push_back('\\');
    out.push_back(c);
  }
  return out;
}

// SecretText is a string wiped before its memory goes back.
struct SecretText {
  std::string text;
  SecretText() = default;
  explicit SecretText(std::string t) : text(std::move(t)) {}
  SecretText(const SecretText &) = delete;
  SecretText &operator=(const SecretText &) = delete;
  ~SecretText() { explicit_bzero(text.data(), text.size()); }
};

// ValidFullName: UTF-8 (shortest forms, no surrogates, no U+FFFE/U+FFFF,
// which XML cannot carry), no control characters, no trailing backslash.
bool ValidFullName(const char *text, const char **out_why) {
  const auto *p = reinterpret_cast<const unsigned char *>(text);
  size_t len = std::strlen(text);
  if (len > 0 && p[len - 1] == '\\') {
    *out_why = "ends in a backslash";
    return false;
  }
  for (size_t i = 0; i < len;) {
    unsigned c = p[i];
    if (c < 0x20 || c == 0x7f) {
      *out_why = "holds a control character";
      return false;
    }
    if (c < 0x80) {
      ++i;
      continue;
    }
    size_t n = c >= 0xf0 ? 3 : c >= 0xe0 ? 2 : c >= 0xc2 ? 1 : 0;
    uint32_t cp = n == 3 ? c & 0x07 : n == 2 ? c & 0x0f : c & 0x1f;
    bool ok = n != 0 && c <= 0xf4 && len - i > n;
    for (size_t k = 1; ok && k <= n; ++k) {
      ok = (p[i + k] & 0xc0) == 0x80;
      cp = (cp << 6) | (p[i + k] & 0x3f);
    }
    const uint32_t kMin[] = {0, 0x80, 0x800, 0x10000};
    ok = ok && cp >= kMin[n] && cp <= 0x10ffff && !(cp >= 0xd800 && cp <= 0xdfff) && cp != 0xfffe &&
         cp != 0xffff;
    if (!ok) {
      *out_why = "is not valid UTF-8 text";
      return false;
    }
    if (cp <= 0x9f) {
      *out_why = "holds a control character";
      return false;
    }
    i += n + 1;
  }
  return true;
}

bool ValidInstallationKey(const char *key) {
  for (const char *p = key; *p != '\0'; ++p) {
    char c = *p;
    bool ok =
        (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-';
    if (!ok) return false;
  }
  return true;
}

// Crypt returns the "$5$" form of a password, copied out of the shared
// buffer; false when the crypt refuses the password.
bool Crypt(const char *password, std::string *out) {
  const char *c = AutoInstallCryptLinuxPassword(password);
  if (c == nullptr) return false;
  out->assign(c);
  return true;
}

bool MakePreseed(uint32_t version, const char *userName, const std::string &fullName,
                 const std::string &userCrypt, Bool powerOff, Bool nvmeDisk, std::string *out) {
  bool network =
      IsVersionIn(version, {GUESS_VERSION_UBUNTU_SERVER_1404, GUESS_VERSION_UBUNTU_SERVER_1410,
                            GUESS_VERSION_UBUNTU_SERVER_1504_OR_HIGHER, GUESS_VERSION_UBUNTU_1404,
                            GUESS_VERSION_UBUNTU_1410, GUESS_VERSION_UBUNTU_1504_TO_2004,
                            GUESS_VERSION_UBUNTU_2010_OR_HIGHER});
  const char *tmpl = network ? (nvmeDisk ? kPreseedNetworkNvme : kPreseedNetworkSda)
                             : (nvmeDisk ? kPreseedToolsCdNvme : kPreseedToolsCdSda);
  const char *flag = network ? "true" : "false";
  // A preseed value runs to the end of its line and is taken literally; the
  // full name was checked to be one line without a continuation backslash.
  return FillTemplate(
      tmpl, {fullName, userName, userCrypt, powerOff ? "poweroff" : "reboot", flag, flag}, out);
}

struct SuseChoice {
  const char *patterns;
  const char *packages;
  const char *templateText;
  const char *displayManager;
};

#define TVX_P(name) "      <pattern>" name "</pattern>\n"
#define TVX_SLES12_BASE TVX_P("32bit")

SuseChoice ChooseSuse(const char *guestOS, uint32_t version) {
  static constexpr char kSled12[] = TVX_P("32bit") TVX_P("Minimal") TVX_P("apparmor")
      TVX_P("desktop-base") TVX_P("desktop-gnome") TVX_P("documentation") TVX_P("gnome-basic")
          TVX_P("sled-Minimal-32bit") TVX_P("sled-apparmor-32bit") TVX_P("sled-desktop-base-32bit")
              TVX_P("sled-documentation-32bit") TVX_P("sled-x11") TVX_P("x11") TVX_P("Basis-Devel");
  static constexpr char kSledOther[] = TVX_P("default") TVX_P("desktop-gnome") TVX_P("Basis-Devel");
  static constexpr char kSles12[] = TVX_P("32bit") TVX_P("base") TVX_P("Minimal") TVX_P("apparmor")
      TVX_P("WBEM") TVX_P("documentation") TVX_P("gnome-basic") TVX_P("x11") TVX_P("Basis-Devel");
  static constexpr char kSles11[] = TVX_P("base") TVX_P("gnome") TVX_P("Basis-Devel");
  static constexpr char kSles[] = TVX_P("default") TVX_P("gnome") TVX_P("Basis-Devel");
  static constexpr char kOpenSuse13[] = TVX_P("kde") TVX_P("enhanced_base") TVX_P("devel_C_C++");
  static constexpr char kOpenSuse[] = TVX_P("kde4") TVX_P("enhanced_base") TVX_P("devel_C_C++");
  static constexpr char kKernelDevel[] = "      <package>kernel-desktop-devel</package>\n";

  bool sles12 = StrUtil_StartsWith(guestOS, "sles12");
  bool sles = StrUtil_StartsWith(guestOS, "sles");
  if (version == GUESS_VERSION_SLED_ALL) {
    if (sles12) return {kSled12, "", kAutoYastTemplateB, "gdm"};
    return {kSledOther, "", kAutoYastTemplateA, sles ? "gdm" : "kdm"};
  }
  if (sles12) return {kSles12, "", kAutoYastTemplateB, "gdm"};
  if (StrUtil_StartsWith(guestOS, "sles11")) return {kSles11, "", kAutoYastTemplateA, "gdm"};
  if (sles) return {kSles, "", kAutoYastTemplateA, "gdm"};
  if (version == GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER) {
    return {kOpenSuse13, kKernelDevel, kAutoYastTemplateA, "kdm"};
  }
  if (version == GUESS_VERSION_OPENSUSE_12) {
    return {kOpenSuse, kKernelDevel, kAutoYastTemplateB, "kdm"};
  }
  return {kOpenSuse, kKernelDevel, kAutoYastTemplateA, "kdm"};
}

bool MakeAutoYast(const char *guestOS, uint32_t version, AutoInstallLinuxKind kind,
                  const char *userName, const std::string &fullName, const std::string &userCrypt,
                  const std::string &rootCrypt, Bool powerOff, std::string *out) {
  SuseChoice c = ChooseSuse(guestOS, version);
  std::string forename = EscapeCdata(fullName);
  const char *halt = powerOff ? "true" : "false";
  if (c.templateText == kAutoYastTemplateB) {
    return FillTemplate(c.templateText,
                        {c.patterns, c.packages, halt, c.displayManager, rootCrypt, userCrypt,
                         userName, forename, c.displayManager},
                        out);
  }
  return FillTemplate(
      c.templateText,
      {c.patterns, c.packages, halt, c.displayManager, rootCrypt, userCrypt, userName, forename,
       c.displayManager, kind == AUTOINSTALL_LINUX_SLES10 ? "hda" : "sr0"},
      out);
}

// Prepare does the work of AutoInstall_PrepareAnswerFileEx_Linux.
bool Prepare(const char *guestOS, uint32_t version, const char *outputDir, const char *userName,
             const char *fullName, const char *userPassword, const char *rootPassword,
             const char *installationKey, Bool powerOff, Bool nvmeDisk) {
  AutoInstallLinuxKind kind = AutoInstallGetLinuxKind(guestOS);
  if (kind == AUTOINSTALL_LINUX_NONE || outputDir == nullptr) return false;
  if (rootPassword == nullptr || fullName == nullptr || userName == nullptr ||
      userPassword == nullptr) {
    return false;
  }
  GuessResult guess{};
  guess.guestOS = guestOS;
  if (AutoInstallValidateLinuxText(&guess, userName, AUTOINSTALL_TEXT_SHORT_NAME, nullptr) !=
      AUTOINSTALL_TEXT_OK) {
    // The name itself is not logged: it may hold anything, line breaks too.
    Log("%s: the user name is refused: only a-z, 0-9 and '-' are allowed%s\n", kFn,
        kind == AUTOINSTALL_LINUX_UBUNTU ? ", and it must begin with a letter" : "");
    return false;
  }
  const char *why = nullptr;
  if (!ValidFullName(fullName, &why)) {
    Log("%s: the full name is refused: it %s\n", kFn, why);
    return false;
  }
  if (kind == AUTOINSTALL_LINUX_REDHAT && installationKey != nullptr &&
      !ValidInstallationKey(installationKey)) {
    Log("%s: the installation key is refused: only letters, digits and '-' are allowed\n", kFn);
    return false;
  }

  SecretText text;
  std::string userCrypt, rootCrypt;
  const char *argument = nullptr;
  bool filled = false;
  switch (kind) {
    case AUTOINSTALL_LINUX_REDHAT: {
      if (!Crypt(userPassword, &userCrypt) || !Crypt(rootPassword, &rootCrypt)) break;
      std::string shellName = EscapeShellDoubleQuoted(fullName);
      KickstartAnswers a{userName,          shellName.c_str(), userCrypt.c_str(),
                         rootCrypt.c_str(), installationKey,   powerOff != 0};
      filled = MakeKickstart(guestOS, version, a, &text.text, &argument);
      break;
    }
    case AUTOINSTALL_LINUX_UBUNTU:
      filled = Crypt(userPassword, &userCrypt) &&
               MakePreseed(version, userName, fullName, userCrypt, powerOff, nvmeDisk, &text.text);
      break;
    case AUTOINSTALL_LINUX_SUSE:
    case AUTOINSTALL_LINUX_SLES10:
      filled = Crypt(rootPassword, &rootCrypt) && Crypt(userPassword, &userCrypt) &&
               MakeAutoYast(guestOS, version, kind, userName, fullName, userCrypt, rootCrypt,
                            powerOff, &text.text);
      break;
    case AUTOINSTALL_LINUX_MANDRIVA: {
      // This installer takes the passwords in clear only.
      SecretText user(EscapePerlDoubleQuoted(userPassword));
      SecretText root(EscapePerlDoubleQuoted(rootPassword));
      filled = FillTemplate(
          kAutoInstTemplate,
          {userName, EscapePerlDoubleQuoted(fullName), userName, user.text, root.text}, &text.text);
      break;
    }
    case AUTOINSTALL_LINUX_NONE:
      break;
  }
  if (!filled) {
    Log("%s: the answer file for %s could not be made\n", kFn, guestOS);
    return false;
  }

  // Directories come last, so a refused call leaves nothing behind; the ones
  // made here go again when the file cannot be written.
  std::string path = LinuxAnswerFilePath(kind, outputDir);
  std::string dir = path.substr(0, path.rfind('/'));
  char *top = nullptr;
  if (!File_CreateDirectoryHierarchy(dir.c_str(), &top)) {
    Log("%s: cannot create the directory %s\n", kFn, dir.c_str());
    free(top);
    return false;
  }
  CharPtr created(top);
  FileReplaceOptions options;
  options.secret = true;
  int err = 0;
  if (!File_ReplaceContents(path.c_str(), text.text, options, &err)) {
    Log("%s: cannot write %s: %s\n", kFn, path.c_str(), std::strerror(err));
    if (created != nullptr) File_DeleteDirectoryTree(created.get());
    return false;
  }
  if (argument != nullptr) linuxAnswerFileTable[AUTOINSTALL_LINUX_REDHAT].bootArguments = argument;
  return true;
}

}  // namespace

std::string EscapeShellDoubleQuoted(const std::string &text) { return EscapeWith(text, "\\\"$`"); }

std::string EscapePerlDoubleQuoted(const std::string &text) { return EscapeWith(text, "\\\"$@"); }

std::string EscapeCdata(const std::string &text) {
  std::string out;
  size_t from = 0;
  for (size_t at; (at = text.find("]]>", from)) != std::string::npos; from = at + 2) {
    out.append(text, from, at + 2 - from);
    out += "]]><![CDATA[";
  }
  out.append(text, from, std::string::npos);
  return out;
}

}  // namespace tvx::autoinstall

extern "C" TVX_EXPORT Bool AutoInstall_PrepareAnswerFileEx_Linux(
    const char *guestOS, uint32_t version, const char *outputDir, const char *userName,
    const char *fullName, const char *userPassword, const char *rootPassword,
    const char *installationKey, Bool powerOff, uint32_t /*reserved*/, Bool nvmeDisk) {
  try {
    return tvx::autoinstall::Prepare(guestOS, version, outputDir, userName, fullName, userPassword,
                                     rootPassword, installationKey, powerOff, nvmeDisk)
               ? TRUE
               : FALSE;
  } catch (...) {
    return FALSE;
  }
}
