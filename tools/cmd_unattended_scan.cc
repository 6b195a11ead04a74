// tvxguest unattended scan: the boot tree of an unattended Linux install,
// copied from an install image or an unpacked medium.
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "command_group.h"
#include "json.h"
#include "tvx_guess.h"
#include "unattended_common.h"
#include "unattended_linux_media.h"

namespace tvxcli {
namespace {

constexpr char kName[] = "unattended scan";

void PrintHelp() {
  std::printf(
      "Usage: tvxguest unattended scan [OPTIONS] --out DIR IMAGE|TREE\n\n"
      "Copy the installer's kernel, RAM disk and isolinux boot loader of an install\n"
      "image (or of a medium unpacked into the directory TREE) into DIR/isolinux, and\n"
      "write there a one-entry isolinux.cfg that boots the installer with the guest's\n"
      "answer-file arguments. `unattended linux --media` does this and masters the CD.\n\n"
      "Options:\n"
      "  --guest-os ID         guest-OS identifier (default: recognised from IMAGE;\n"
      "                        needed for a TREE)\n"
      "  --version N|NAME      version class (default: recognised)\n"
      "  --isolinux-bin PATH   isolinux.bin to use instead of the medium's\n"
      "  --out DIR             output directory (required)\n"
      "  --json                print one JSON object instead of text\n"
      "  -h, --help            show this help\n\n"
      "Exit status: 0 written, 1 not written, 2 IMAGE cannot be opened, 64 usage error.\n");
}

bool ParseVersion(const std::string &text, unsigned *out) {
  char *end = nullptr;
  unsigned long n = std::strtoul(text.c_str(), &end, 10);
  if (!text.empty() && *end == '\0' && n < GUESS_VERSION_DUMMY_LAST) {
    *out = static_cast<unsigned>(n);
    return true;
  }
  for (unsigned v = 0; v < GUESS_VERSION_DUMMY_LAST; ++v) {
    const char *name = Guess_GetSubString(static_cast<GuessVersion>(v));
    if (name != nullptr && text == name) {
      *out = v;
      return true;
    }
  }
  return false;
}

int Run(const std::vector<std::string> &args) {
  std::string guestOS, version, isolinuxBin, out;
  bool json = false;
  std::vector<std::string> positional;
  int parsed = ArgParser(kName, PrintHelp)
                   .Flag("--json", &json)
                   .Value("--guest-os", &guestOS)
                   .Value("--version", &version)
                   .Value("--isolinux-bin", &isolinuxBin)
                   .Value("--out", &out)
                   .Parse(args, &positional);
  if (parsed >= 0) return parsed;
  if (positional.size() != 1) return UsageError(kName, "expected exactly one IMAGE or TREE");
  if (out.empty()) return UsageError(kName, "--out is required");
  const std::string &medium = positional[0];
  bool tree = IsDirectory(medium);
  if (tree && guestOS.empty()) return UsageError(kName, "a TREE needs --guest-os");

  GuessResult guess{};
  if (!tree) {
    int rc = RecogniseImage(kName, medium, &guess);
    if (rc == 2) return 2;
  }
  if (!guestOS.empty()) guess.guestOS = guestOS.c_str();
  unsigned v = guess.version;
  if (!version.empty() && !ParseVersion(version, &v)) {
    return UsageError(kName, "unknown version '" + version + "'");
  }

  bool ok;
  std::vector<std::string> log;
  {
    LogLines capture;
    ok = ScanMedium(medium, out, guess.guestOS, v, isolinuxBin);
    log = capture.lines;
  }
  namespace fs = std::filesystem;
  std::vector<std::string> files;
  std::error_code ec;
  fs::path dir = fs::path(out) / "isolinux";
  if (ok) {
    for (const auto &e : fs::directory_iterator(dir, ec)) files.push_back(e.path().string());
    std::sort(files.begin(), files.end());
  }
  if (json) {
    std::printf("%s\n", JsonObject()
                            .Bool("result", ok)
                            .StrOrNull("guestOS", guess.guestOS)
                            .Num("version", v)
                            .StrArray("files", files)
                            .StrArray("log", log)
                            .Text()
                            .c_str());
    return ok ? 0 : 1;
  }
  if (!ok) {
    std::fprintf(stderr, "tvxguest %s: no boot tree written from %s\n", kName, medium.c_str());
    for (const std::string &line : log) std::fprintf(stderr, "  %s\n", line.c_str());
    return 1;
  }
  std::printf("%s: %s\n", medium.c_str(), GuestLabel(guess).c_str());
  for (const std::string &f : files) std::printf("wrote %s\n", f.c_str());
  return 0;
}

const SubcommandRegistration kRegistration(
    kUnattendedGroup, {"scan", "copy the boot tree of a Linux install medium", Run});

}  // namespace
}  // namespace tvxcli
