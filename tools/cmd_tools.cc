// tvxguest tools: the guest-tools commands. This file holds the group and
// `tools image`; other files add subcommands with SubcommandRegistration.
#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "json.h"
#include "tools_common.h"
#include "tvx_toolsiso_image.h"

namespace tvxcli {

namespace {

constexpr const char *kCmd = "tools image";

constexpr const char *kUsage =
    "Usage: tvxguest tools image [--hint NAME] [--unsigned-ok] [--cert FILE] [--json]\n"
    "                            TOOLSDIR GUESTOS\n\n"
    "Chooses the guest-tools ISO image for guest GUESTOS (an identifier such as\n"
    "\"windows9-64\") from TOOLSDIR/isoimages: the signed image map\n"
    "isoimages_manifest.txt when it exists, else the built-in family table.\n"
    "Prints the image path and why it was chosen (map, table or hint).\n\n"
    "Options:\n"
    "  --hint NAME    ask for image NAME; accepted only when the map (or, without a\n"
    "                 map, the table) lists it\n"
    "  --unsigned-ok  accept an image map without its signature file (a bad\n"
    "                 signature is never accepted)\n"
    "  --cert FILE    trust the maker certificates in FILE instead of the installed\n"
    "                 ones (for publishers checking their own signing keys)\n"
    "  --json         print one JSON object: {\"image\", \"baseName\", \"isoOpenMode\",\n"
    "                 \"source\"}\n"
    "  -h, --help     show this help\n\n"
    "Exit status: 0 an image was chosen, 1 none (the reasons go to standard error),\n"
    "64 usage error.\n";

int Image(const std::vector<std::string> &args) {
  std::string hint, cert;
  bool hasHint = false, unsignedOk = false, json = false;
  std::vector<std::string> pos;
  int parsed = ArgParser(kCmd, [] { std::fputs(kUsage, stdout); })
                   .Value("--hint", &hint, &hasHint)
                   .Value("--cert", &cert)
                   .Flag("--unsigned-ok", &unsignedOk)
                   .Flag("--json", &json)
                   .Parse(args, &pos);
  if (parsed >= 0) return parsed;
  if (pos.size() != 2) return UsageError(kCmd, "TOOLSDIR and GUESTOS are needed");

  LogLines log;
  char *path = nullptr, *base = nullptr;
  uint32_t mode = 0;
  Bool ok = ToolsISO_GetImagePathEx(pos[0].c_str(), pos[1].c_str(),
                                    hasHint ? hint.c_str() : nullptr, unsignedOk ? FALSE : TRUE,
                                    cert.empty() ? nullptr : cert.c_str(), &path, &base, &mode);
  if (!ok) {
    std::fprintf(stderr, "tvxguest: no tools image for '%s'\n", pos[1].c_str());
    log.Print(stderr);
    return 1;
  }
  struct stat st;
  std::string map = pos[0] + "/isoimages/isoimages_manifest.txt";
  const char *source = hasHint ? "hint" : stat(map.c_str(), &st) == 0 ? "map" : "table";
  if (json) {
    std::printf("%s\n", JsonObject()
                            .Str("image", path)
                            .Str("baseName", base)
                            .Num("isoOpenMode", mode)
                            .Str("source", source)
                            .Text()
                            .c_str());
  } else {
    std::printf("%s\n", path);
    std::printf("chosen by: %s%s\n", source,
                log.Contains("Unable to read signature file") ? " (map not signed)" : "");
    std::printf("base name: %s, ISO names: %s\n", base, mode == 2 ? "Joliet" : "Rock Ridge");
  }
  std::free(path);
  std::free(base);
  return 0;
}

int RunTools(const std::vector<std::string> &args) {
  return RunGroup(kToolsGroup, "Guest-tools images: choice, verification, contents.", args);
}

const CommandRegistration kGroup({kToolsGroup, "guest-tools images: choose, verify, read", RunTools});
const SubcommandRegistration kImage(kToolsGroup,
                                    {"image", "which tools image serves a guest, and why", Image});

}  // namespace
}  // namespace tvxcli
