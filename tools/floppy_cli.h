// Shared by the floppy commands: FAT result texts, and the --floppy options
// of `unattended windows`.
#pragma once

#include <string>
#include <vector>

namespace tvxcli {

class ArgParser;

// FatErrorText names a FAT result code.
const char *FatErrorText(unsigned long code);

// WindowsFloppyOptions: `unattended windows --floppy` packs the answer files
// into autoinst.flp with AutoInstall_MakeFloppyImg.
struct WindowsFloppyOptions {
  bool wanted = false;
  std::string base, toolsIso, scsiDir, upgraderDir, resourceDir;

  // AddTo lets `parser` fill these from the command line.
  void AddTo(ArgParser *parser);
  // Check runs after parsing: an exit status for a usage error, else -1.
  int Check(const char *cmd) const;
  // Make builds the floppy in `outDir` from the answer files there.
  bool Make(const std::string &outDir) const;
  // Files lists what `outDir` holds afterwards.
  std::vector<std::string> Files(const std::string &outDir) const;
  static const char *Help();
};

}  // namespace tvxcli
