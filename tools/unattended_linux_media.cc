#include "unattended_linux_media.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "command.h"
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

int TakeLinuxMediaOption(const char *cmd, const std::vector<std::string> &args, size_t *i,
                         LinuxMediaOptions *o) {
  const std::pair<const char *, std::string *> valued[] = {
      {"--media", &o->mediaDir},          {"--mkisofs", &o->mkisofs},
      {"--isolinux-bin", &o->isolinuxBin}, {"--floppy-templates", &o->templateDir},
      {"--tools", &o->toolsDir},
  };
  const std::string &a = args[*i];
  for (const auto &[flag, value] : valued) {
    std::string f = flag;
    if (a == f) {
      if (*i + 1 >= args.size()) return UsageError(cmd, a + " needs a value");
      *value = args[++*i];
      return 1;
    }
    if (a.rfind(f + "=", 0) == 0) {
      *value = a.substr(f.size() + 1);
      return 1;
    }
  }
  return 0;
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

// MakeBootCd stages the boot tree (answer file and tools included) inside
// the media directory, on the same file system, and masters it into
// autoinst.iso; the tree is gone afterwards either way.
bool MakeBootCd(const std::string &medium, const GuessResult &guess,
                const std::string &answerFile, const LinuxMediaOptions &o) {
  namespace fs = std::filesystem;
  std::string mkisofs = o.mkisofs.empty() ? DefaultMkisofs() : o.mkisofs;
  if (mkisofs.empty()) {
    std::fprintf(stderr, "tvxguest: no ISO mastering tool found (genisoimage, xorrisofs)\n");
    return false;
  }
  std::string tree = (fs::path(o.mediaDir) / ".autoinst-tree.XXXXXX").string();
  if (::mkdtemp(tree.data()) == nullptr) {
    std::fprintf(stderr, "tvxguest: cannot create a directory in %s\n", o.mediaDir.c_str());
    return false;
  }
  std::error_code ec;
  if (!answerFile.empty()) fs::copy_file(answerFile, fs::path(tree) / "ks.cfg", ec);
  bool ok = !ec && ScanMedium(medium, tree, guess.guestOS, guess.version, o.isolinuxBin) &&
            (o.toolsDir.empty() || AutoInstall_AddTools_Linux(tree.c_str(), o.toolsDir.c_str()));
  if (!ok) {
    fs::remove_all(tree, ec);
    return false;
  }
  return AutoInstall_MasterISO(tree.c_str(), mkisofs.c_str(), o.mediaDir.c_str());
}

}  // namespace

bool MakeLinuxMedia(const std::string &medium, const GuessResult &guess,
                    const std::string &answerDir, const LinuxMediaOptions &o,
                    std::vector<std::string> *out_files, std::vector<std::string> *out_notes) {
  namespace fs = std::filesystem;
  std::error_code ec;
  fs::create_directories(o.mediaDir, ec);
  std::string iso = (fs::path(o.mediaDir) / "autoinst.iso").string();
  if (!AutoInstall_NeedsFloppy_Linux(guess.guestOS)) {
    if (!MakeBootCd(medium, guess, (fs::path(answerDir) / "ks.cfg").string(), o)) return false;
    out_files->push_back(iso);
    return true;
  }
  if (!AutoInstall_MakeFloppyImg_Linux(answerDir.c_str(), o.mediaDir.c_str(),
                                       o.templateDir.c_str(), guess.guestOS)) {
    return false;
  }
  out_files->push_back((fs::path(o.mediaDir) / "autoinst.flp").string());
  // The floppy guest boots the same kind of CD, whose arguments send the
  // installer to the floppy; without one the arguments are typed at the
  // medium's own boot prompt.
  if (MakeBootCd(medium, guess, "", o)) {
    out_files->push_back(iso);
  } else {
    out_notes->push_back("no boot CD: the medium's isolinux boot tree could not be copied");
  }
  return true;
}

bool ContinueWithMedia(const std::string &medium, const GuessResult &guess,
                       const std::string &answerDir, const LinuxMediaOptions &o, bool json,
                       std::vector<std::string> *files, std::vector<std::string> *log) {
  if (o.mediaDir.empty()) return true;
  std::vector<std::string> notes;
  LogCapture capture;
  bool ok = MakeLinuxMedia(medium, guess, answerDir, o, files, &notes);
  log->insert(log->end(), capture.Lines().begin(), capture.Lines().end());
  for (const std::string &note : notes) {
    log->push_back("note: " + note);
    if (!json) std::fprintf(stderr, "tvxguest: note: %s\n", note.c_str());
  }
  return ok;
}

namespace {
void Capture(TvxLogLevel, const char *text, void *ctx) {
  std::string line = text;
  if (!line.empty() && line.back() == '\n') line.pop_back();
  static_cast<std::vector<std::string> *>(ctx)->push_back(line);
}
}  // namespace

LogCapture::LogCapture() : active_(!Verbose()) {
  if (active_) Tvx_SetLogSink(Capture, &lines_);
}
LogCapture::~LogCapture() {
  if (active_) Tvx_SetLogSink(nullptr, nullptr);
}

}  // namespace tvxcli
