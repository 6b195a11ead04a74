// tvxguest windows-name: the display name of a Windows image's raw name.
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "json.h"
#include "tvx_autoinstall.h"

namespace tvxcli {
namespace {

constexpr const char *kCmd = "windows-name";

int Run(const std::vector<std::string> &args) {
  bool json = false;
  std::vector<std::string> raws;
  auto help = [] {
    std::printf(
        "Usage: tvxguest windows-name [--json] \"RAW NAME\"...\n\n"
        "Turns the raw name of a Windows image (base name, a space, the edition key,\n"
        "as in \"Windows 10 ENTERPRISEN\") into its localised display name, one line\n"
        "per name. Unknown editions come back unchanged.\n\n"
        "Options:\n"
        "  --json       print one JSON object per name: {\"raw\", \"pretty\"}\n"
        "  -h, --help   show this help\n");
  };
  if (int rc = ArgParser(kCmd, help).Flag("--json", &json).Parse(args, &raws); rc >= 0) return rc;
  if (raws.empty()) return UsageError(kCmd, "RAW NAME is missing");
  for (const std::string &raw : raws) {
    char *pretty = AutoInstall_GetPrettyWindowsName(raw.c_str());
    std::string p = pretty != nullptr ? pretty : raw;
    std::free(pretty);
    if (json) {
      std::printf("%s\n", JsonObject().Str("raw", raw).Str("pretty", p).Text().c_str());
    } else {
      std::printf("%s\n", p.c_str());
    }
  }
  return 0;
}

const CommandRegistration kReg({"windows-name", "display name of a Windows image's raw name", Run});

}  // namespace
}  // namespace tvxcli
