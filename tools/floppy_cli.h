// Shared by the floppy commands: FAT result texts, and the --floppy options
// of `unattended windows`.
#pragma once

#include <string>
#include <vector>

namespace tvxcli {

// FatErrorText names a FAT result code.
const char *FatErrorText(unsigned long code);

// WindowsFloppyOptions: `unattended windows --floppy` packs the answer files
// into autoinst.flp with AutoInstall_MakeFloppyImg.
struct WindowsFloppyOptions {
  bool wanted = false;
  std::string base, toolsIso, scsiDir, upgraderDir, resourceDir;

  static constexpr int kNotMine = -2, kTaken = -1;
  // Take consumes args[*i] (and its value) when it is one of the floppy
  // options: kTaken, kNotMine, or an exit status for a usage error.
  int Take(const char *cmd, const std::vector<std::string> &args, size_t *i);
  // Check runs after parsing: an exit status for a usage error, else -1.
  int Check(const char *cmd) const;
  // Make builds the floppy in `outDir` from the answer files there.
  bool Make(const std::string &outDir) const;
  // Files lists what `outDir` holds afterwards.
  std::vector<std::string> Files(const std::string &outDir) const;
  static const char *Help();
};

}  // namespace tvxcli
