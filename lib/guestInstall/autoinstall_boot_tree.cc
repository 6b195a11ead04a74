// The boot tree of an unattended Linux install: the installer's kernel, RAM
// disk and boot loader copied from the install medium (an ISO 9660 image or
// an unpacked tree on the host) into OUTPUT/isolinux, with a one-entry boot
// configuration that adds the arguments pointing the installer at its answer
// file. The image and the host tree differ only in how files are found, read
// and copied; one scan drives both through the Medium interface below.
#include <fcntl.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <memory>
#include <string>
#include <vector>

#include "platform/ascii.h"
#include "lib/guestInstall/autoinstall_internal.h"
#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "lib/guestInstall/autoinstall_linux_media_internal.h"
#include "platform/fd_io.h"
#include "platform/file.h"
#include "platform/file_replace.h"
#include "platform/log.h"
#include "tvx_autoinstall_linux_media.h"
#include "tvx_iso9660.h"
#include "platform/unique.h"

namespace tvx::autoinstall {
namespace {

constexpr int kMaxSearchDepth = 32;
constexpr size_t kMaxLoaderBytes = 1 << 20;
constexpr const char *kScanDisk = "AutoInstall_ScanDisk";
constexpr const char *kParseDisk = "parseCfgFilesInDisk";
// Where a host's syslinux installation keeps ldlinux.c32 when it is not
// beside isolinux.bin (Debian's layout, then the traditional one).
constexpr const char *kHostLdlinux[] = {"/usr/lib/syslinux/modules/bios/ldlinux.c32",
                                        "/usr/share/syslinux/ldlinux.c32"};

std::string Join(const std::string &dir, const std::string &name) {
  if (dir.empty() || dir.back() == '/') return dir + name;
  return dir + "/" + name;
}

std::string BaseName(const std::string &path) {
  size_t slash = path.rfind('/');
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

// A medium the scan reads. Paths are the medium's own: "/dir/file" in an
// image, host paths in a tree.
class Medium {
 public:
  virtual ~Medium() = default;
  // FindFile searches depth first, in listing order, for an entry named
  // `name` (caseless) and gives the directory that holds it.
  virtual bool FindFile(const char *name, std::string *out_dir, std::string *out_name) = 0;
  // Names lists a directory's plain files in listing order.
  virtual std::vector<std::string> Names(const std::string &dir) = 0;
  // ReadConfig reads the first kMaxConfigBytes of a file; false when it
  // cannot be read.
  virtual bool ReadConfig(const std::string &path, std::string *out) = 0;
  // Resolve turns a kernel or RAM disk reference into a path of the medium.
  virtual std::string Resolve(const std::string &cfgDir, const std::string &ref) = 0;
  // Fetch copies a file of the medium to a host path, replacing it.
  virtual bool Fetch(const std::string &path, const std::string &target) = 0;
  // Root is where the configuration search starts, as messages name it.
  virtual std::string Root() = 0;
  virtual bool Logs() = 0;
};

class IsoMedium : public Medium {
 public:
  explicit IsoMedium(Iso9660Image *image) : image_(image) {}
  ~IsoMedium() override { Iso9660_Close(image_); }

  bool FindFile(const char *name, std::string *out_dir, std::string *out_name) override {
    return Search(name, "/", 0, out_dir, out_name);
  }

  std::vector<std::string> Names(const std::string &dir) override {
    std::vector<std::string> names;
    Iso9660Dir *d = nullptr;
    if (Iso9660_OpenDir(image_, dir.c_str(), &d) != ISO9660_OK) return names;
    Iso9660DirEntry e{};
    while (Iso9660_ReadDir(image_, d, &e) == ISO9660_OK) {
      if (!e.isDirectory) names.emplace_back(e.name);
    }
    Iso9660_CloseDir(image_, d);
    return names;
  }

  bool ReadConfig(const std::string &path, std::string *out) override {
    Iso9660File *f = Open(path);
    if (f == nullptr) return false;
    out->assign(kMaxConfigBytes, '\0');
    size_t n = out->size();
    int rc = Iso9660_ReadFile(image_, f, out->data(), &n);
    Iso9660_CloseFile(image_, f);
    if (rc == ISO9660_END) n = 0;
    out->resize(n);
    return rc == ISO9660_OK || rc == ISO9660_END;
  }

  std::string Resolve(const std::string &cfgDir, const std::string &ref) override {
    return ref[0] == '/' ? ref : Join(cfgDir, ref);
  }

  bool Fetch(const std::string &path, const std::string &target) override {
    Iso9660File *f = Open(path);
    if (f == nullptr) return false;
    bool ok = File_ReplaceWith(target.c_str(), {}, [&](int fd, const char *) {
      std::vector<char> buf(1 << 16);
      for (;;) {
        size_t n = buf.size();
        int rc = Iso9660_ReadFile(image_, f, buf.data(), &n);
        if (rc == ISO9660_END) return true;
        if (rc != ISO9660_OK || !WriteAll(fd, buf.data(), n)) return false;
      }
    });
    Iso9660_CloseFile(image_, f);
    return ok;
  }

  std::string Root() override { return "/"; }
  bool Logs() override { return false; }

 private:
  // A record holding only a path makes the reader resolve it from the root.
  Iso9660File *Open(const std::string &path) {
    Iso9660DirEntry e{};
    if (path.size() >= sizeof e.name) return nullptr;
    path.copy(e.name, path.size());
    Iso9660File *f = nullptr;
    return Iso9660_OpenFile(image_, &e, &f) == ISO9660_OK ? f : nullptr;
  }

  bool Search(const char *name, const std::string &dir, int depth, std::string *out_dir,
              std::string *out_name) {
    if (depth > kMaxSearchDepth) return false;
    Iso9660Dir *d = nullptr;
    if (Iso9660_OpenDir(image_, dir.c_str(), &d) != ISO9660_OK) return false;
    std::vector<Iso9660DirEntry> entries;
    Iso9660DirEntry e{};
    while (Iso9660_ReadDir(image_, d, &e) == ISO9660_OK) entries.push_back(e);
    Iso9660_CloseDir(image_, d);
    for (const Iso9660DirEntry &entry : entries) {
      if (ascii::Equal(entry.name, name)) {
        *out_dir = dir;
        *out_name = entry.name;
        return true;
      }
      if (entry.isDirectory &&
          Search(name, Join(dir, entry.name), depth + 1, out_dir, out_name)) {
        return true;
      }
    }
    return false;
  }

  Iso9660Image *image_;
};

class DiskMedium : public Medium {
 public:
  explicit DiskMedium(std::string root) : root_(std::move(root)) {}

  bool FindFile(const char *name, std::string *out_dir, std::string *out_name) override {
    return Search(name, root_, 0, out_dir, out_name);
  }

  std::vector<std::string> Names(const std::string &dir) override {
    std::vector<std::string> names;
    char **list = nullptr;
    int n = File_ListDirectory(dir.c_str(), &list);
    for (int i = 0; i < n; ++i) {
      if (File_IsFile(Join(dir, list[i]).c_str())) names.emplace_back(list[i]);
      free(list[i]);
    }
    free(list);
    return names;
  }

  bool ReadConfig(const std::string &path, std::string *out) override {
    UniqueFd fd(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!fd) {
      Log("%s: FileIO_Open failed pathIsolinuxCfg=\"%s\"\n", kParseDisk, path.c_str());
      return false;
    }
    out->assign(kMaxConfigBytes, '\0');
    size_t n = 0;
    if (!PreadAll(fd.get(), out->data(), out->size(), 0, &n)) {
      Log("%s: FileIO_Read failed\n", kParseDisk);
      return false;
    }
    // An empty file is read fine: it just holds no entry.
    out->resize(n);
    return true;
  }

  std::string Resolve(const std::string &cfgDir, const std::string &ref) override {
    return ref[0] == '/' ? root_ + ref : Join(cfgDir, ref);
  }

  bool Fetch(const std::string &path, const std::string &target) override {
    if (CopyReplacing(path.c_str(), target.c_str())) return true;
    Log("%s: File_Copy failed from=\"%s\" to=\"%s\"\n", kScanDisk, path.c_str(), target.c_str());
    return false;
  }

  std::string Root() override { return root_; }
  bool Logs() override { return true; }

 private:
  bool Search(const char *name, const std::string &dir, int depth, std::string *out_dir,
              std::string *out_name) {
    if (depth > kMaxSearchDepth) return false;
    char **list = nullptr;
    int n = File_ListDirectory(dir.c_str(), &list);
    bool found = false;
    for (int i = 0; i < n; ++i) {
      std::string path = Join(dir, list[i]);
      struct stat st;
      if (!found && ascii::Equal(list[i], name)) {
        *out_dir = dir;
        *out_name = list[i];
        found = true;
      } else if (!found && ::lstat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode)) {
        found = Search(name, path, depth + 1, out_dir, out_name);
      }
      free(list[i]);
    }
    free(list);
    return found;
  }

  std::string root_;
};

// FindBootEntry reads the medium's boot configuration: isolinux.cfg, else
// the other .cfg files beside it. `out_cfgDir` gets the directory.
bool FindBootEntry(Medium &m, uint32_t version, BootEntry *out, std::string *out_cfgDir) {
  std::string dir, name;
  if (!m.FindFile("isolinux.cfg", &dir, &name)) {
    if (version == GUESS_VERSION_UBUNTU_2010_OR_HIGHER) {
      // Ubuntu dropped isolinux; its casper kernel takes these arguments.
      *out = {"/casper/vmlinuz", "/casper/initrd", "file=/cdrom/preseed/ubuntu.seed quiet splash --- "};
      out_cfgDir->clear();
      return true;
    }
    if (m.Logs()) {
      Log("%s: findFileInDisk failed isolinux.cfg in \"%s\"\n", kParseDisk, m.Root().c_str());
    }
    return false;
  }
  *out_cfgDir = dir;
  std::string text;
  if (m.ReadConfig(Join(dir, name), &text) && parseIsolinuxConfig(text, out)) return true;
  for (const std::string &cfg : m.Names(dir)) {
    if (ascii::EndsWith(cfg, ".cfg") && m.ReadConfig(Join(dir, cfg), &text) &&
        parseIsolinuxConfig(text, out)) {
      return true;
    }
  }
  return false;
}

bool ReadHostFile(const std::string &path, size_t limit, std::string *out) {
  UniqueFd fd(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
  return fd && ReadAllLimited(fd.get(), limit, out);
}

// PlaceLdlinux puts ldlinux.c32 beside a boot loader that cannot start
// without it, taken from where that loader came from.
bool PlaceLdlinux(Medium &m, const std::string &cfgDir, const char *isolinuxBinPath,
                  const std::string &treeDir) {
  std::string loader;
  std::string target = Join(treeDir, "ldlinux.c32");
  if (!ReadHostFile(Join(treeDir, "isolinux.bin"), kMaxLoaderBytes, &loader) ||
      !NeedsLdlinux(loader)) {
    return true;
  }
  if (isolinuxBinPath == nullptr) return m.Fetch(Join(cfgDir, "ldlinux.c32"), target);
  std::vector<std::string> candidates;
  std::string binDir = isolinuxBinPath;
  size_t slash = binDir.rfind('/');
  candidates.push_back(slash == std::string::npos ? "ldlinux.c32"
                                                  : Join(binDir.substr(0, slash + 1), "ldlinux.c32"));
  for (const char *host : kHostLdlinux) candidates.emplace_back(host);
  for (const std::string &from : candidates) {
    if (File_IsFile(from.c_str())) {
      if (CopyReplacing(from.c_str(), target.c_str())) return true;
      break;
    }
  }
  if (m.Logs()) {
    Log("%s: File_Copy failed from=\"%s\" to=\"%s\"\n", kScanDisk, candidates[0].c_str(),
        target.c_str());
  }
  return false;
}

bool Scan(Medium &m, const std::string &treeDir, const char *guestOS, uint32_t version,
          const char *isolinuxBinPath) {
  AutoInstallLinuxKind kind = AutoInstallGetLinuxKind(guestOS);
  BootEntry entry;
  std::string cfgDir;
  if (!FindBootEntry(m, version, &entry, &cfgDir)) {
    if (m.Logs()) Log("%s: parseIsolinuxConfig failed\n", kScanDisk);
    return false;
  }
  std::string kernelBase = BaseName(entry.kernel), initrdBase = BaseName(entry.initrd);
  for (const std::string *base : {&kernelBase, &initrdBase}) {
    if (base->empty() || *base == "." || *base == "..") return false;
  }
  if (!m.Fetch(m.Resolve(cfgDir, entry.kernel), Join(treeDir, kernelBase)) ||
      !m.Fetch(m.Resolve(cfgDir, entry.initrd), Join(treeDir, initrdBase))) {
    return false;
  }
  if (kind == AUTOINSTALL_LINUX_REDHAT) removeAskMethod(&entry.append);

  std::string cfgPath = Join(treeDir, "isolinux.cfg"), text;
  int err = 0;
  if (!BootConfigText(kernelBase, initrdBase, entry.append, LinuxRow(kind)->bootArguments, &text) ||
      !File_ReplaceContents(cfgPath.c_str(), text, {}, &err)) {
    if (m.Logs()) {
      Log("%s: FileIO_Open failed errio=%d configPath=\"%s\"\n", kScanDisk, err, cfgPath.c_str());
    }
    return false;
  }

  std::string binTarget = Join(treeDir, "isolinux.bin");
  if (isolinuxBinPath != nullptr) {
    if (!CopyReplacing(isolinuxBinPath, binTarget.c_str())) {
      if (m.Logs()) {
        Log("%s: File_Copy failed from=\"%s\" to=\"%s\"\n", kScanDisk, isolinuxBinPath,
            binTarget.c_str());
      }
      return false;
    }
  } else if (cfgDir.empty() || !m.Fetch(Join(cfgDir, "isolinux.bin"), binTarget)) {
    return false;
  }
  return PlaceLdlinux(m, cfgDir, isolinuxBinPath, treeDir);
}

// MakeTreeDir creates OUTPUT/isolinux and gives its path.
bool MakeTreeDir(const char *outputDir, bool logs, std::string *out) {
  *out = Join(outputDir, "isolinux");
  if (File_CreateDirectoryHierarchy(out->c_str(), nullptr)) return true;
  if (logs) Log("%s: File_CreateDirectoryHierarchy failed \"%s\"\n", kScanDisk, out->c_str());
  return false;
}

}  // namespace
}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

extern "C" {

TVX_EXPORT Bool AutoInstall_ScanISO(const char *isoPath, const char *outputDir,
                                    const char *guestOS, uint32_t version,
                                    const char *isolinuxBinPath) {
  try {
    std::string treeDir;
    if (isoPath == nullptr || outputDir == nullptr || !MakeTreeDir(outputDir, false, &treeDir)) {
      return FALSE;
    }
    Iso9660Image *image = nullptr;
    if (Iso9660_Open(isoPath, ISO9660_FORMAT_ROCKRIDGE, &image) != ISO9660_OK) return FALSE;
    IsoMedium medium(image);
    return Scan(medium, treeDir, guestOS, version, isolinuxBinPath) ? TRUE : FALSE;
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool AutoInstall_ScanDisk(const char *sourceRoot, const char *outputDir,
                                     const char *guestOS, uint32_t version,
                                     const char *isolinuxBinPath) {
  try {
    std::string treeDir;
    if (sourceRoot == nullptr || outputDir == nullptr || !MakeTreeDir(outputDir, true, &treeDir)) {
      return FALSE;
    }
    DiskMedium medium(sourceRoot);
    return Scan(medium, treeDir, guestOS, version, isolinuxBinPath) ? TRUE : FALSE;
  } catch (...) {
    return FALSE;
  }
}

}  // extern "C"
