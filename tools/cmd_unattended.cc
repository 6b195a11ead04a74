// tvxguest unattended: the group, and `unattended support`, which tells
// whether unattended install is offered for an image and with which limits.
#include <cstdio>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "json.h"
#include "tvx_autoinstall.h"
#include "unattended_common.h"

namespace tvxcli {
namespace {

constexpr const char *kSupportCmd = "unattended support";

void PrintSupportHelp(FILE *out) {
  std::fprintf(out,
               "Usage: tvxguest unattended support [--json] [--family windows|linux] IMAGE\n\n"
               "Recognises IMAGE and tells whether unattended install is offered for it, with\n"
               "the limits on the user name, full name and password the user types.\n\n"
               "Options:\n"
               "  --family F   the answer-limit family (default: from the recognised guest)\n"
               "  --json       print one JSON object\n"
               "  -h, --help   show this help\n\n"
               "Exit status: 0 offered, 1 not offered or not recognised, 2 not an image,\n"
               "64 usage error.\n");
}

std::vector<std::string> ReservedList(const ReservedName *list) {
  std::vector<std::string> out;
  for (; list != nullptr && list->name != nullptr; ++list) {
    out.push_back(std::string(list->name) + (list->isStem ? "*" : ""));
  }
  return out;
}

std::string Joined(const std::vector<std::string> &names) {
  if (names.empty()) return "(none)";
  std::string s;
  for (const std::string &n : names) s += (s.empty() ? "" : ", ") + n;
  return s;
}

std::string Flags(const Bool *flags, int n, const char *sep) {
  std::string s;
  for (int i = 0; i < n; ++i) s += (i ? sep : "") + std::to_string(flags[i] ? 1 : 0);
  return s;
}

int Support(const std::vector<std::string> &args) {
  bool json = false;
  std::string image, family;
  int parsed = ArgParser(kSupportCmd, [] { PrintSupportHelp(stdout); })
                   .Flag("--json", &json)
                   .Value("--family", &family)
                   .Positional(ArgParser::Single(&image, "IMAGE"))
                   .Parse(args);
  if (parsed >= 0) return parsed;
  if (image.empty()) return UsageError(kSupportCmd, "IMAGE is missing");
  if (!family.empty() && family != "windows" && family != "linux") {
    return UsageError(kSupportCmd, "--family must be windows or linux");
  }

  GuessResult guess;
  int result = RecogniseImage(kSupportCmd, image, &guess);
  if (result == 2) return 2;
  if (family.empty()) family = GuestFamily(guess);
  bool offered = AutoInstall_IsSupportedGuest(&guess);
  AutoInstallConfigInfo info{};
  bool haveInfo = AutoInstall_GetInstallConfigInfo(family.c_str(), &guess, &info);
  std::vector<std::string> shortNames = ReservedList(info.reservedShortNames);
  std::vector<std::string> names = ReservedList(info.reservedNames);

  if (json) {
    std::string config = "null";
    if (haveInfo) {
      JsonObject c;
      if (info.reservedShortNames) {
        c.StrArray("reservedShortNames", shortNames);
      } else {
        c.Raw("reservedShortNames", "null");
      }
      if (info.reservedNames) {
        c.StrArray("reservedNames", names);
      } else {
        c.Raw("reservedNames", "null");
      }
      c.Num("shortNameMaxLength", info.shortNameMaxLength)
          .Num("nameMaxLength", info.nameMaxLength)
          .Num("guestValue", info.guestValue)
          .Num("passwordMaxLength", info.passwordMaxLength)
          .Raw("familyFlags", "[" + Flags(info.familyFlags, 4, ",") + "]")
          .Raw("guestFlags", "[" + Flags(info.guestFlags, 2, ",") + "]");
      config = c.Text();
    }
    std::printf("%s\n", JsonObject()
                            .Num("result", result)
                            .StrOrNull("guestOS", guess.guestOS)
                            .Num("version", guess.version)
                            .Bool("supported", offered)
                            .Str("family", family)
                            .Raw("config", config)
                            .Text()
                            .c_str());
  } else {
    std::printf("guest:       %s\n", GuestLabel(guess).c_str());
    std::printf("unattended:  %s\n", offered ? "offered" : "not offered");
    if (haveInfo) {
      std::printf("family:      %s\n", family.c_str());
      if (info.shortNameMaxLength != 0) {
        std::printf("user name:   at most %u characters; reserved: %s\n",
                    info.shortNameMaxLength, Joined(shortNames).c_str());
      }
      std::printf("%-12s at most %u characters; reserved: %s\n",
                  family == "windows" ? "account:" : "full name:", info.nameMaxLength,
                  Joined(names).c_str());
      std::printf("password:    at most %u characters\n", info.passwordMaxLength);
      std::printf("flags:       family %s, guest %s, value %u\n",
                  Flags(info.familyFlags, 4, " ").c_str(), Flags(info.guestFlags, 2, " ").c_str(),
                  info.guestValue);
    }
  }
  return offered ? 0 : 1;
}

int RunUnattended(const std::vector<std::string> &args) {
  return RunGroup(kUnattendedGroup,
                  "Unattended installation: support, answer limits, validation.", args);
}

const CommandRegistration kGroup({"unattended", "unattended install: support, limits, validation",
                                  RunUnattended});
const SubcommandRegistration kSupport(kUnattendedGroup,
                                      {"support", "is unattended install offered, with which limits",
                                       Support});

}  // namespace
}  // namespace tvxcli
