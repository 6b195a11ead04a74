#include "unattended_common.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>

#include "json.h"
#include "tvx_autoinstall.h"

namespace tvxcli {

int RecogniseImage(const char *cmd, const std::string &image, GuessResult *out) {
  std::memset(out, 0, sizeof *out);
  int result = Guess_Guest(image.c_str(), nullptr, out);
  if (result == 2) {
    std::fprintf(stderr, "tvxguest %s: cannot open '%s' as an install image\n", cmd,
                 image.c_str());
  }
  return result;
}

const char *GuestFamily(const GuessResult &guess) {
  const char *os = guess.guestOS;
  auto startsCaseless = [os](const char *prefix) {
    for (size_t i = 0; prefix[i] != '\0'; ++i) {
      char c = os[i];
      if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
      if (c != prefix[i]) return false;
    }
    return true;
  };
  if (os != nullptr && (startsCaseless("win") || startsCaseless("longhorn"))) {
    return "windows";
  }
  return "linux";
}

std::string GuestLabel(const GuessResult &guess) {
  if (guess.guestOS == nullptr) return "not recognised";
  std::string label = guess.guestOS;
  if (guess.version != GUESS_VERSION_UNKNOWN && guess.version < GUESS_VERSION_DUMMY_LAST) {
    label += std::string(" (") + Guess_GetSubString(static_cast<GuessVersion>(guess.version)) + ")";
  }
  return label;
}

namespace {

// Utf8Length is the byte length of the valid UTF-8 character at `p`, or 0.
size_t Utf8Length(const unsigned char *p) {
  if (p[0] < 0x80) return 1;
  size_t n = (p[0] & 0xE0) == 0xC0 ? 2 : (p[0] & 0xF0) == 0xE0 ? 3 : (p[0] & 0xF8) == 0xF0 ? 4 : 0;
  if (n == 0 || (n == 2 && p[0] < 0xC2)) return 0;
  for (size_t k = 1; k < n; ++k) {
    if ((p[k] & 0xC0) != 0x80) return 0;
  }
  return n;
}

const char *ControlName(unsigned char c) {
  switch (c) {
    case '\n': return "a line feed";
    case '\r': return "a carriage return";
    case '\t': return "a tab";
    default: return nullptr;
  }
}

}  // namespace

std::string CheckAnswer(const GuessResult &guess, const char *label, const std::string &text,
                        AnswerKind kind, bool forIni) {
  std::string who = label;
  const auto *p = reinterpret_cast<const unsigned char *>(text.c_str());
  size_t chars = 0;
  for (size_t i = 0; i < text.size(); ++chars) {
    unsigned char c = p[i];
    if (c < 0x20 || c == 0x7F) {
      const char *name = ControlName(c);
      char buf[32];
      std::snprintf(buf, sizeof buf, "the control character 0x%02x", c);
      return who + " holds " + (name != nullptr ? name : buf);
    }
    if (forIni && (c == '"' || c == ';')) {
      return who + " holds " + (c == '"' ? "a double quote (\")" : "a semicolon (;)") +
             ", which an INI answer file cannot carry";
    }
    size_t n = Utf8Length(p + i);
    if (n == 0) return who + " is not valid UTF-8";
    i += n;
  }
  const char *family = GuestFamily(guess);
  AutoInstallConfigInfo info;
  if (guess.guestOS != nullptr && AutoInstall_GetInstallConfigInfo(family, &guess, &info)) {
    uint32_t max = kind == AnswerKind::kPassword    ? info.passwordMaxLength
                   : kind == AnswerKind::kShortName ? info.shortNameMaxLength
                   : kind == AnswerKind::kName      ? info.nameMaxLength
                                                    : 0;
    if (max != 0 && chars > max) {
      return who + " is longer than " + std::to_string(max) + " characters";
    }
  }
  decltype(&AutoInstall_ValidateName) validator =
      kind == AnswerKind::kPassword    ? AutoInstall_ValidatePassword
      : kind == AnswerKind::kShortName ? AutoInstall_ValidateShortName
      : kind == AnswerKind::kName      ? AutoInstall_ValidateName
                                       : nullptr;
  if (validator == nullptr) return "";
  char *message = nullptr;
  AutoInstallTextError error = validator(family, &guess, text.c_str(), &message);
  std::string why = message != nullptr ? message : "";
  std::free(message);
  if (error == AUTOINSTALL_TEXT_OK) return "";
  return who + " is refused: " + why;
}

int RecogniseForAnswers(const char *cmd, const std::string &image, bool json, GuessResult *out,
                        bool *supported) {
  int rc = RecogniseImage(cmd, image, out);
  if (rc == 0 && out->guestOS != nullptr) {
    *supported = AutoInstall_IsSupportedGuest(out);
    if (!*supported && !json) {
      std::fprintf(stderr, "tvxguest %s: note: unattended install is not offered for %s\n", cmd,
                   GuestLabel(*out).c_str());
    }
    return -1;
  }
  if (json) {
    std::printf("%s\n", JsonObject()
                            .Bool("result", false)
                            .Num("guessResult", rc)
                            .StrOrNull("guestOS", nullptr)
                            .Text()
                            .c_str());
  } else if (rc != 2) {
    std::fprintf(stderr, "tvxguest %s: no guest OS recognised on %s\n", cmd, image.c_str());
  }
  return rc == 2 ? 2 : 1;
}

bool ReadFirstLine(const std::string &path, std::string *out) {
  std::ifstream in(path);
  if (!in) return false;
  std::getline(in, *out);
  if (!out->empty() && out->back() == '\r') out->pop_back();
  return true;
}

int ReportAnswers(const AnswerReport &r, bool json) {
  const GuessResult &guess = *r.guess;
  const char *versionName =
      guess.version < GUESS_VERSION_DUMMY_LAST
          ? Guess_GetSubString(static_cast<GuessVersion>(guess.version))
          : "";
  if (json) {
    JsonObject o;
    o.Bool("result", r.ok)
        .Str("guestOS", guess.guestOS)
        .Num("version", guess.version)
        .Str("versionName", versionName != nullptr ? versionName : "")
        .Bool("supported", r.supported);
    if (r.imageListed != nullptr) o.Bool("imageListed", *r.imageListed);
    std::printf("%s\n", o.StrArray("files", *r.files).StrArray("log", *r.log).Text().c_str());
    return r.ok ? 0 : 1;
  }
  std::printf("%s: %s\n", r.image->c_str(), GuestLabel(guess).c_str());
  if (!r.ok) {
    std::fprintf(stderr, "tvxguest %s: %s\n", r.cmd, r.failure);
    for (const std::string &line : *r.log) std::fprintf(stderr, "  %s\n", line.c_str());
    return 1;
  }
  for (const std::string &f : *r.files) std::printf("wrote %s\n", f.c_str());
  return 0;
}

}  // namespace tvxcli
