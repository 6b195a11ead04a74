// The medium a Linux guest's installer reads its answer file from, for the
// `unattended` subcommands: "autoinst.flp", or the boot tree mastered into
// "autoinst.iso".
#pragma once

#include <string>
#include <vector>

#include "tools_common.h"  // LogLines, with which the callers collect the library's lines
#include "tvx_guess.h"

namespace tvxcli {

class ArgParser;

struct LinuxMediaOptions {
  std::string mediaDir;     // --media: where autoinst.iso / autoinst.flp go
  std::string mkisofs;      // --mkisofs (empty: DefaultMkisofs())
  std::string isolinuxBin;  // --isolinux-bin (empty: the medium's)
  std::string templateDir;  // --floppy-templates: suse.flp, mandriva.flp
  std::string toolsDir;     // --tools: guest-tools installer files for the CD
};

// AddLinuxMediaOptions lets `parser` fill `o` from the command line.
void AddLinuxMediaOptions(ArgParser *parser, LinuxMediaOptions *o);

// The help lines of the media options.
extern const char kLinuxMediaHelp[];

// DefaultMkisofs: the first of genisoimage and xorrisofs found in PATH, or "".
std::string DefaultMkisofs();

// IsDirectory: `path` names a directory (an unpacked medium).
bool IsDirectory(const std::string &path);

// ScanMedium runs AutoInstall_ScanDisk for a directory, else
// AutoInstall_ScanISO.
bool ScanMedium(const std::string &medium, const std::string &outDir, const char *guestOS,
                unsigned version, const std::string &isolinuxBin);

// MakeLinuxMedia builds the media for the answer file prepared in
// `answerDir`, into mediaDir: for the Red Hat family the boot tree of
// `medium` (image or directory) with ks.cfg and the tools, mastered into
// autoinst.iso; for floppy guests autoinst.flp and, when the medium boots
// through isolinux, an autoinst.iso whose arguments point at the floppy (its
// absence is only a note). Everything is made in a staging directory beside
// mediaDir and moved in at the end, so a failure adds nothing there.
// Appends the files made to `out_files`; false on failure (the library's log
// lines say why).
bool MakeLinuxMedia(const std::string &medium, const GuessResult &guess,
                    const std::string &answerDir, const LinuxMediaOptions &o,
                    std::vector<std::string> *out_files, std::vector<std::string> *out_notes);

// ContinueWithMedia is the `--media` step of `unattended linux`: nothing to
// do without --media; else MakeLinuxMedia with the library's log lines
// collected into `log` (notes go there too, and to standard error unless
// `json`).
bool ContinueWithMedia(const std::string &medium, const GuessResult &guess,
                       const std::string &answerDir, const LinuxMediaOptions &o, bool json,
                       std::vector<std::string> *files, std::vector<std::string> *log);

}  // namespace tvxcli
