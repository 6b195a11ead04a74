#include "floppy_cli.h"

#include <algorithm>
#include <filesystem>

#include "arg_parser.h"
#include "command.h"
#include "tvx_fat.h"
#include "tvx_floppy.h"

namespace tvxcli {

const char *FatErrorText(unsigned long code) {
  switch (code) {
    case FAT_OK: return "success";
    case FAT_ERR_IO: return "cannot be opened, read or written";
    case FAT_ERR_CORRUPT: return "not a FAT volume, or damaged";
    case FAT_ERR_UNSUPPORTED: return "not supported (FAT32, over 64 MiB, or an unknown floppy size)";
    case FAT_ERR_NOT_FOUND: return "no such file";
    case FAT_ERR_EXISTS: return "the name is taken";
    case FAT_ERR_NO_SPACE: return "no room left";
    case FAT_ERR_BAD_NAME: return "a name FAT cannot hold";
    default: return "failed";
  }
}

void WindowsFloppyOptions::AddTo(ArgParser *parser) {
  parser->Flag("--floppy", &wanted)
      .Value("--base-floppy", &base)
      .Value("--tools-iso", &toolsIso)
      .Value("--scsi-dir", &scsiDir)
      .Value("--upgrader-dir", &upgraderDir)
      .Value("--resource-dir", &resourceDir);
}

int WindowsFloppyOptions::Check(const char *cmd) const {
  bool any = !base.empty() || !toolsIso.empty() || !scsiDir.empty() || !upgraderDir.empty() ||
             !resourceDir.empty();
  if (any && !wanted) return UsageError(cmd, "the floppy options need --floppy");
  if (wanted && resourceDir.empty()) return UsageError(cmd, "--floppy needs --resource-dir");
  return -1;
}

bool WindowsFloppyOptions::Make(const std::string &outDir) const {
  auto opt = [](const std::string &s) { return s.empty() ? nullptr : s.c_str(); };
  return AutoInstall_MakeFloppyImg(opt(base), outDir.c_str(), opt(toolsIso), opt(scsiDir),
                                   opt(upgraderDir), resourceDir.c_str()) != FALSE;
}

std::vector<std::string> WindowsFloppyOptions::Files(const std::string &outDir) const {
  std::vector<std::string> files;
  std::error_code ec;
  for (const auto &e : std::filesystem::directory_iterator(outDir, ec)) {
    files.push_back(e.path().string());
  }
  std::sort(files.begin(), files.end());
  return files;
}

const char *WindowsFloppyOptions::Help() {
  return "\nFloppy for Windows 2000, XP and Server 2003 setup:\n"
         "  --floppy              pack the answer files into DIR/autoinst.flp (they are\n"
         "                        removed from DIR), with the helpers of --resource-dir\n"
         "  --resource-dir DIR    unattend.cmd, storePwd.exe and the driver floppy\n"
         "                        tvxscsi.flp (required with --floppy)\n"
         "  --base-floppy FILE    start from a copy of this image instead of a blank one\n"
         "  --tools-iso FILE      the guest-tools ISO image\n"
         "  --scsi-dir PATH       mass-storage driver set: a folder inside --tools-iso, or\n"
         "                        a host folder without it\n"
         "  --upgrader-dir PATH   folder inside --tools-iso holding the tools upgrader\n";
}

}  // namespace tvxcli
