#include "unattended_linux_media.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "arg_parser.h"
#include "command.h"
#include "staged_output.h"
#include "tvx_autoinstall.h"
#include "tvx_autoinstall_linux_media.h"
#include "tvx_log.h"

namespace tvxcli {

const char kLinuxMediaHelp[] =
    "  --mkisofs PATH        ISO mastering tool (default: genisoimage, else xorrisofs)\n"
    "  --isolinux-bin PATH   isolinux.bin for the boot CD (default: the medium's;\n"
    "                        ldlinux.c32 comes from beside it when it needs one)\n"
    "  --floppy-templates DIR  suse.flp and mandriva.flp for SUSE and Mandriva\n"
    "  --tools DIR           guest-tools installer files to put on the boot CD\n";

void AddLinuxMediaOptions(ArgParser *parser, LinuxMediaOptions *o) {
  parser->Value("--media", &o->mediaDir)
      .Value("--mkisofs", &o->mkisofs)
      .Value("--isolinux-bin", &o->isolinuxBin)
      .Value("--floppy-templates", &o->templateDir)
      .Value("--tools", &o->toolsDir);
}

std::string DefaultMkisofs() {
  const char *path = std::getenv("PATH");
  std::string dirs = path != nullptr ? path : "/usr/bin:/bin";
  for (const char *tool : {"genisoimage", "xorrisofs"}) {
    size_t start = 0;
    while (start <= dirs.size()) {
      size_t end = dirs.find(':', start);
      if (end == std::string::npos) end = dirs.size();
      std::string candidate = dirs.substr(start, end - start) + "/" + tool;
      if (end > start && ::access(candidate.c_str(), X_OK) == 0) return candidate;
      start = end + 1;
    }
  }
  return "";
}

bool IsDirectory(const std::string &path) {
  struct stat st;
  return ::stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

bool ScanMedium(const std::string &medium, const std::string &outDir, const char *guestOS,
                unsigned version, const std::string &isolinuxBin) {
  const char *bin = isolinuxBin.empty() ? nullptr : isolinuxBin.c_str();
  return IsDirectory(medium) ? AutoInstall_ScanDisk(medium.c_str(), outDir.c_str(), guestOS,
                                                     version, bin)
                             : AutoInstall_ScanISO(medium.c_str(), outDir.c_str(), guestOS,
                                                   version, bin);
}

namespace {

namespace fs = std::filesystem;

// MakeBootCd builds the boot tree (answer file and tools included) in the
// staging directory and masters it into autoinst.iso there.
bool MakeBootCd(const std::string &medium, const GuessResult &guess,
                const std::string &answerFile, const LinuxMediaOptions &o,
                const std::string &stage) {
  std::string mkisofs = o.mkisofs.empty() ? DefaultMkisofs() : o.mkisofs;
  if (mkisofs.empty()) {
    std::fprintf(stderr, "tvxguest: no ISO mastering tool found (genisoimage, xorrisofs)\n");
    return false;
  }
  std::string tree = (fs::path(stage) / "tree").string();
  std::error_code ec;
  fs::create_directory(tree, ec);
  if (!ec && !answerFile.empty()) fs::copy_file(answerFile, fs::path(tree) / "ks.cfg", ec);
  if (!ec && ScanMedium(medium, tree, guess.guestOS, guess.version, o.isolinuxBin) &&
      (o.toolsDir.empty() || AutoInstall_AddTools_Linux(tree.c_str(), o.toolsDir.c_str()))) {
    return AutoInstall_MasterISO(tree.c_str(), mkisofs.c_str(), stage.c_str());  // takes the tree
  }
  fs::remove_all(tree, ec);
  return false;
}

}  // namespace

bool MakeLinuxMedia(const std::string &medium, const GuessResult &guess,
                    const std::string &answerDir, const LinuxMediaOptions &o,
                    std::vector<std::string> *out_files, std::vector<std::string> *out_notes) {
  StagedOutput stage(o.mediaDir);
  std::string err;
  if (!stage.Open(&err)) {
    std::fprintf(stderr, "tvxguest: %s\n", err.c_str());
    return false;
  }
  bool ok;
  if (!AutoInstall_NeedsFloppy_Linux(guess.guestOS)) {
    ok = MakeBootCd(medium, guess, (fs::path(answerDir) / "ks.cfg").string(), o, stage.dir());
  } else {
    ok = AutoInstall_MakeFloppyImg_Linux(answerDir.c_str(), stage.dir().c_str(),
                                         o.templateDir.c_str(), guess.guestOS);
    // The floppy guest boots the same kind of CD, whose arguments send the
    // installer to the floppy; without one the arguments are typed at the
    // medium's own boot prompt.
    if (ok && !MakeBootCd(medium, guess, "", o, stage.dir())) {
      out_notes->push_back("no boot CD: the medium's isolinux boot tree could not be copied");
    }
  }
  if (ok && !stage.Commit(&err)) {
    std::fprintf(stderr, "tvxguest: %s\n", err.c_str());
    ok = false;
  }
  if (ok) out_files->insert(out_files->end(), stage.committed().begin(), stage.committed().end());
  return ok;
}

bool ContinueWithMedia(const std::string &medium, const GuessResult &guess,
                       const std::string &answerDir, const LinuxMediaOptions &o, bool json,
                       std::vector<std::string> *files, std::vector<std::string> *log) {
  if (o.mediaDir.empty()) return true;
  std::vector<std::string> notes;
  LogLines capture;
  bool ok = MakeLinuxMedia(medium, guess, answerDir, o, files, &notes);
  log->insert(log->end(), capture.lines.begin(), capture.lines.end());
  for (const std::string &note : notes) {
    log->push_back("note: " + note);
    if (!json) std::fprintf(stderr, "tvxguest: note: %s\n", note.c_str());
  }
  return ok;
}

}  // namespace tvxcli
