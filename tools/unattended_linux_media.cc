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

namespace fs = std::filesystem;

// Staging is a private directory inside the media directory (one file
// system, so finished media are renamed into place); it goes with whatever
// is left in it, so a failed run adds nothing to the media directory.
class Staging {
 public:
  explicit Staging(const std::string &dir) : path_((fs::path(dir) / ".autoinst.XXXXXX").string()) {
    if (::mkdtemp(path_.data()) == nullptr) path_.clear();
  }
  ~Staging() {
    std::error_code ec;
    if (!path_.empty()) fs::remove_all(path_, ec);
  }
  Staging(const Staging &) = delete;
  Staging &operator=(const Staging &) = delete;
  const std::string &Path() const { return path_; }
  // Commit moves the staged file `name` into `dir`.
  bool Commit(const char *name, const std::string &dir, std::vector<std::string> *files) {
    std::error_code ec;
    fs::path to = fs::path(dir) / name;
    fs::rename(fs::path(path_) / name, to, ec);
    if (ec) return false;
    files->push_back(to.string());
    return true;
  }

 private:
  std::string path_;
};

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
  return !ec && ScanMedium(medium, tree, guess.guestOS, guess.version, o.isolinuxBin) &&
         (o.toolsDir.empty() || AutoInstall_AddTools_Linux(tree.c_str(), o.toolsDir.c_str())) &&
         AutoInstall_MasterISO(tree.c_str(), mkisofs.c_str(), stage.c_str());
}

}  // namespace

bool MakeLinuxMedia(const std::string &medium, const GuessResult &guess,
                    const std::string &answerDir, const LinuxMediaOptions &o,
                    std::vector<std::string> *out_files, std::vector<std::string> *out_notes) {
  std::error_code ec;
  fs::create_directories(o.mediaDir, ec);
  Staging stage(o.mediaDir);
  if (stage.Path().empty()) {
    std::fprintf(stderr, "tvxguest: cannot create a directory in %s\n", o.mediaDir.c_str());
    return false;
  }
  if (!AutoInstall_NeedsFloppy_Linux(guess.guestOS)) {
    return MakeBootCd(medium, guess, (fs::path(answerDir) / "ks.cfg").string(), o,
                      stage.Path()) &&
           stage.Commit("autoinst.iso", o.mediaDir, out_files);
  }
  if (!AutoInstall_MakeFloppyImg_Linux(answerDir.c_str(), stage.Path().c_str(),
                                       o.templateDir.c_str(), guess.guestOS)) {
    return false;
  }
  // The floppy guest boots the same kind of CD, whose arguments send the
  // installer to the floppy; without one the arguments are typed at the
  // medium's own boot prompt.
  bool cd = MakeBootCd(medium, guess, "", o, stage.Path());
  if (!cd) out_notes->push_back("no boot CD: the medium's isolinux boot tree could not be copied");
  return stage.Commit("autoinst.flp", o.mediaDir, out_files) &&
         (!cd || stage.Commit("autoinst.iso", o.mediaDir, out_files));
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
