// The Linux support rule, the Linux text rules and the validators' dispatch.
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <initializer_list>

#include "lib/guestInstall/autoinstall_internal.h"
#include "platform/ascii.h"
#include "platform/log.h"
#include "platform/msg.h"
#include "platform/str.h"

namespace tvx::autoinstall {
namespace {

constexpr const char *kBadLinuxName =
    "@&!*@*@(msg.autoinstall.bad_linux_name)The full name does not allow the following "
    "characters: ':\"\\,'\nEnter a new value.";
constexpr const char *kBadPasswordSubstring =
    "@&!*@*@(msg.autoinstall.bad_password_substring)The password must not contain the "
    "characters ']]>' in a row.\nEnter a new value.";
constexpr const char *kBadGecosSubstring =
    "@&!*@*@(msg.autoinstall.bad_gecos_substring)The full name must not contain the "
    "characters ']]>' in a row.\nEnter a new value.";
constexpr const char *kBadLinuxUsername =
    "@&!*@*@(msg.autoinstall.bad_linux_username)The user name must consist only of lowercase "
    "US English characters, numbers 0 to 9 and dashes.\nEnter a new value.";
constexpr const char *kBadUbuntuUsername =
    "@&!*@*@(msg.autoinstall.bad_ubuntu_username)The user name must start with a lowercase US "
    "English character.\nEnter a new value.";

// Answers end up inside XML CDATA sections of some answer files, which "]]>"
// would close early.
constexpr const char *kCdataEnd = "]]>";

bool IsOneOf(uint32_t version, std::initializer_list<GuessVersion> refused) {
  for (GuessVersion v : refused) {
    if (version == static_cast<uint32_t>(v)) return true;
  }
  return false;
}

AutoInstallTextError Refuse(char **out_message, AutoInstallTextError error, const char *msg) {
  AutoInstallSetMessage(out_message, msg);
  return error;
}

AutoInstallTextError ValidateLinuxShortName(const char *guestOS, const char *text,
                                            char **out_message) {
  // The Ubuntu installer wants a letter first.
  if (AutoInstallGetLinuxKind(guestOS) == AUTOINSTALL_LINUX_UBUNTU &&
      !(text[0] >= 'a' && text[0] <= 'z')) {
    return Refuse(out_message, AUTOINSTALL_TEXT_BAD_UBUNTU_USERNAME, kBadUbuntuUsername);
  }
  for (const char *p = text; *p != '\0'; ++p) {
    char c = *p;
    if (!((c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '-')) {
      return Refuse(out_message, AUTOINSTALL_TEXT_BAD_LINUX_USERNAME, kBadLinuxUsername);
    }
  }
  return AUTOINSTALL_TEXT_OK;
}

}  // namespace

void AutoInstallSetMessage(char **out_message, const char *idFmt) {
  if (out_message != nullptr) *out_message = Msg_GetString(idFmt);
}

std::string AutoInstallIniValueProblem(const char *key, const char *value) {
  // The writer's longest line: key, "=", two quotes and the newline within
  // the 1020 bytes it keeps.
  size_t room = 1020 - std::min<size_t>(1020, std::strlen(key) + 4);
  for (const char *p = value; *p != '\0'; ++p) {
    switch (*p) {
      case '\n': return "holds a line feed";
      case '\r': return "holds a carriage return";
      case '"': return "holds a double quote (\")";
      case ';': return "holds a semicolon (;), which ends the value when it is read";
      default:
        if (tvx::ascii::IsControl(*p)) {
          char buf[64];
          std::snprintf(buf, sizeof buf, "holds the control character 0x%02x",
                        static_cast<unsigned char>(*p));
          return buf;
        }
    }
  }
  if (std::strlen(value) > room) return "is longer than " + std::to_string(room) + " bytes";
  return "";
}

AutoInstallLinuxKind AutoInstallGetLinuxKind(const char *guestOS) {
  static const struct {
    const char *prefix;
    AutoInstallLinuxKind kind;
  } kPrefixes[] = {
      {"redhat", AUTOINSTALL_LINUX_REDHAT},   {"rhel", AUTOINSTALL_LINUX_REDHAT},
      {"asianux", AUTOINSTALL_LINUX_REDHAT},  {"fedora", AUTOINSTALL_LINUX_REDHAT},
      {"centos", AUTOINSTALL_LINUX_REDHAT},   {"sles10", AUTOINSTALL_LINUX_SLES10},
      {"sles11", AUTOINSTALL_LINUX_SUSE},     {"sles12", AUTOINSTALL_LINUX_SUSE},
      {"opensuse", AUTOINSTALL_LINUX_SUSE},   {"ubuntu", AUTOINSTALL_LINUX_UBUNTU},
      {"mandriva", AUTOINSTALL_LINUX_MANDRIVA},
  };
  if (guestOS == nullptr) return AUTOINSTALL_LINUX_NONE;
  for (const auto &p : kPrefixes) {
    if (StrUtil_StartsWith(guestOS, p.prefix)) return p.kind;
  }
  return AUTOINSTALL_LINUX_NONE;
}

AutoInstallTextError AutoInstallValidateText(const char *family, const GuessResult *guess,
                                             const char *text, AutoInstallTextKind kind,
                                             char **out_message) {
  if (family != nullptr && std::strcmp(family, "windows") == 0) {
    return AutoInstallValidateWindowsText(guess, text, kind, out_message);
  }
  if (family != nullptr && std::strcmp(family, "linux") == 0) {
    return AutoInstallValidateLinuxText(guess, text, kind, out_message);
  }
  NOT_REACHED_AT(AUTOINSTALL_SOURCE_PATH);
}

}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

extern "C" {

TVX_EXPORT Bool AutoInstallIsSupportedLinuxGuest(const GuessResult *guess) {
  if (guess == nullptr) return FALSE;
  switch (AutoInstallGetLinuxKind(guess->guestOS)) {
    case AUTOINSTALL_LINUX_REDHAT:
      if (std::strcmp(guess->guestOS, "rhel2") == 0 ||
          std::strcmp(guess->guestOS, "redhat") == 0) {
        return FALSE;
      }
      return !IsOneOf(guess->version,
                      {GUESS_VERSION_FEDORA_8, GUESS_VERSION_FEDORA_13, GUESS_VERSION_FEDORA_LIVE,
                       GUESS_VERSION_CENTOS_7_MINIMAL, GUESS_VERSION_CENTOS_8_STREAM,
                       GUESS_VERSION_ASIANUX_7_LIVE});
    case AUTOINSTALL_LINUX_UBUNTU:
      return !IsOneOf(guess->version,
                      {GUESS_VERSION_UNKNOWN, GUESS_VERSION_UBUNTU_SERVER_140402,
                       GUESS_VERSION_UBUNTU_SERVER_1410, GUESS_VERSION_UBUNTU_SERVER_804_OR_LOWER,
                       GUESS_VERSION_UBUNTU_704_OR_LOWER});
    case AUTOINSTALL_LINUX_SUSE:
    case AUTOINSTALL_LINUX_SLES10:
      return !IsOneOf(guess->version,
                      {GUESS_VERSION_OPENSUSE_11_2_OR_LOWER, GUESS_VERSION_OPENSUSE_13_1,
                       GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, GUESS_VERSION_SLES_10_SP2_OR_LOWER,
                       GUESS_VERSION_SLED_10_SP2_OR_LOWER});
    case AUTOINSTALL_LINUX_NONE:
    case AUTOINSTALL_LINUX_MANDRIVA:
      // Mandriva answer files exist, but its unattended install is not offered.
      return FALSE;
  }
  return FALSE;
}

TVX_EXPORT AutoInstallTextError AutoInstallValidateLinuxText(const GuessResult *guess,
                                                             const char *text, int kind,
                                                             char **out_message) {
  if (text == nullptr) text = "";
  switch (kind) {
    case AUTOINSTALL_TEXT_SHORT_NAME:
      return ValidateLinuxShortName(guess != nullptr ? guess->guestOS : nullptr, text,
                                    out_message);
    case AUTOINSTALL_TEXT_NAME:
      // These characters separate or quote the fields of the account database.
      if (std::strpbrk(text, ":\"\\,") != nullptr) {
        return Refuse(out_message, AUTOINSTALL_TEXT_BAD_LINUX_NAME, kBadLinuxName);
      }
      if (std::strstr(text, kCdataEnd) != nullptr) {
        return Refuse(out_message, AUTOINSTALL_TEXT_BAD_GECOS_SUBSTRING, kBadGecosSubstring);
      }
      return AUTOINSTALL_TEXT_OK;
    case AUTOINSTALL_TEXT_PASSWORD:
      if (std::strstr(text, kCdataEnd) != nullptr) {
        return Refuse(out_message, AUTOINSTALL_TEXT_BAD_PASSWORD_SUBSTRING,
                      kBadPasswordSubstring);
      }
      return AUTOINSTALL_TEXT_OK;
    default:
      return AUTOINSTALL_TEXT_OK;
  }
}

TVX_EXPORT AutoInstallTextError AutoInstall_ValidatePassword(const char *family,
                                                             const GuessResult *guess,
                                                             const char *text,
                                                             char **out_message) {
  return AutoInstallValidateText(family, guess, text, AUTOINSTALL_TEXT_PASSWORD, out_message);
}

TVX_EXPORT AutoInstallTextError AutoInstall_ValidateShortName(const char *family,
                                                              const GuessResult *guess,
                                                              const char *text,
                                                              char **out_message) {
  return AutoInstallValidateText(family, guess, text, AUTOINSTALL_TEXT_SHORT_NAME, out_message);
}

TVX_EXPORT AutoInstallTextError AutoInstall_ValidateName(const char *family,
                                                         const GuessResult *guess,
                                                         const char *text, char **out_message) {
  return AutoInstallValidateText(family, guess, text, AUTOINSTALL_TEXT_NAME, out_message);
}

}  // extern "C"
