// tvxguest unattended validate: checks a typed answer as the host does before
// it accepts it, and shows the localised message of a refused text.
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "json.h"
#include "tvx_autoinstall.h"
#include "unattended_common.h"

namespace tvxcli {
namespace {

constexpr const char *kCmd = "unattended validate";

const char *const kErrorNames[] = {
    "AUTOINSTALL_TEXT_OK",
    "AUTOINSTALL_TEXT_BAD_LINUX_NAME",
    "AUTOINSTALL_TEXT_BAD_WINDOWS_NAME",
    "AUTOINSTALL_TEXT_BAD_PASSWORD_SUBSTRING",
    "AUTOINSTALL_TEXT_BAD_GECOS_SUBSTRING",
    "AUTOINSTALL_TEXT_BAD_LINUX_USERNAME",
    "AUTOINSTALL_TEXT_BAD_UBUNTU_USERNAME",
};

void PrintHelp(FILE *out) {
  std::fprintf(
      out,
      "Usage: tvxguest unattended validate [--json] [--family windows|linux]\n"
      "           --kind password|short-name|name --text TEXT IMAGE\n\n"
      "Recognises IMAGE and validates TEXT as the answer of the given kind: the\n"
      "password, the user (login) name, or the full name (on Windows the account\n"
      "name). A refused text's localised message is printed.\n\n"
      "Options:\n"
      "  --family F   the rules of windows or linux (default: from the recognised guest)\n"
      "  --kind K     password, short-name or name\n"
      "  --text T     the text to check (may be empty)\n"
      "  --json       print one JSON object\n"
      "  -h, --help   show this help\n\n"
      "Exit status: the validation result (0 accepted, 1 to 6 the refusal code),\n"
      "66 when IMAGE is not an install image, 64 usage error.\n");
}

int Validate(const std::vector<std::string> &args) {
  bool json = false, haveText = false;
  std::string image, family, kind, text;
  int parsed = ArgParser(kCmd, [] { PrintHelp(stdout); })
                   .Flag("--json", &json)
                   .Value("--family", &family)
                   .Value("--kind", &kind)
                   .Value("--text", &text, &haveText)
                   .Positional(ArgParser::Single(&image, "IMAGE"))
                   .Parse(args);
  if (parsed >= 0) return parsed;
  if (image.empty()) return UsageError(kCmd, "IMAGE is missing");
  if (!haveText) return UsageError(kCmd, "--text is missing");
  if (!family.empty() && family != "windows" && family != "linux") {
    return UsageError(kCmd, "--family must be windows or linux");
  }
  decltype(&AutoInstall_ValidateName) validator = nullptr;
  if (kind == "password") {
    validator = AutoInstall_ValidatePassword;
  } else if (kind == "short-name") {
    validator = AutoInstall_ValidateShortName;
  } else if (kind == "name") {
    validator = AutoInstall_ValidateName;
  } else {
    return UsageError(kCmd, "--kind must be password, short-name or name");
  }

  GuessResult guess;
  int result = RecogniseImage(kCmd, image, &guess);
  if (result == 2) return 66;
  if (result == 1 && !json) {
    std::fprintf(stderr, "tvxguest %s: image not recognised; the general rules apply\n", kCmd);
  }
  if (family.empty()) family = GuestFamily(guess);

  char *message = nullptr;
  AutoInstallTextError error = validator(family.c_str(), &guess, text.c_str(), &message);
  std::string msg = message != nullptr ? message : "";
  std::free(message);
  unsigned code = static_cast<unsigned>(error);
  const char *name = code < sizeof kErrorNames / sizeof kErrorNames[0] ? kErrorNames[code] : "?";

  if (json) {
    std::printf("%s\n", JsonObject()
                            .StrOrNull("guestOS", guess.guestOS)
                            .Str("family", family)
                            .Str("kind", kind)
                            .Str("text", text)
                            .Num("error", code)
                            .Str("errorName", name)
                            .StrOrNull("message", error == AUTOINSTALL_TEXT_OK ? nullptr
                                                                               : msg.c_str())
                            .Text()
                            .c_str());
  } else if (error == AUTOINSTALL_TEXT_OK) {
    std::printf("accepted\n");
  } else {
    std::printf("refused (%s):\n%s\n", name, msg.c_str());
  }
  return static_cast<int>(code);
}

const SubcommandRegistration kValidate(kUnattendedGroup,
                                       {"validate", "check a typed password, user or full name",
                                        Validate});

}  // namespace
}  // namespace tvxcli
