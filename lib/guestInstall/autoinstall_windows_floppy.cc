// The floppy that setup of older Windows reads: "autoinst.flp" in the guest's
// configuration folder, holding the answer files, the password helper, the
// tools upgrader, the first-logon script and the mass-storage driver set.
// The driver set comes from a folder of the tools ISO, from a host folder,
// or, when the tools ISO is absent, from the product's driver floppy; its
// files are named in winnt.sif so that text-mode setup loads the driver.
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "platform/ascii.h"
#include "platform/fd_io.h"
#include "platform/file.h"
#include "platform/file_replace.h"
#include "platform/fileio.h"
#include "platform/log.h"
#include "platform/str.h"
#include "platform/unique.h"
#include "tvx_floppy.h"
#include "tvx_ini.h"
#include "tvx_iso9660.h"

namespace tvx {
TVX_MAKE_DELETER(Iso9660Image, Iso9660_Close);
}  // namespace tvx

namespace tvx::autoinstall {
namespace {

constexpr char kFn[] = "AutoInstall_MakeFloppyImg";
constexpr char kFloppyName[] = "autoinst.flp";
constexpr char kUpgraderName[] = "TarvexToolsUpgrader.exe";
// The driver floppy's copy: every name taken out of it is lower-cased, so
// this name can never be overwritten by one of them.
constexpr char kDriverFloppyCopy[] = "TVXSCSI.FLP";
constexpr uint64_t kFloppyBytes = 0x168000;
constexpr uint32_t kIsoMode = 2;

// Driver names that text-mode setup knows from txtsetup.oem, in the order
// they are looked for.
constexpr const char *oemDriverNames[] = {
    "tvxscsi",        "TVXSCSI",    "SYMMPI_32",   "LSI_SCSI_AMD64", "LSI_SAS_AMD64", "SYMMPI_1068",
    "LSI_SAS_32",     "LSI_SAS_X64", "LSI_SCSI_IA64", "LSI_SCSI_32",  "SYMMPI_IA64",
};

std::string Join(const char *dir, const char *name) {
  CharPtr p(File_PathJoin(dir, name));
  return p.get();
}

// CopyPrivate copies `from` over `to` through a temporary file: the image
// may end up holding a password, so it is owner-only and a link at `to` is
// replaced, never written through.
bool CopyPrivate(const char *from, const std::string &to) {
  FileIODescriptor in;
  if (FileIO_Open(&in, from, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN) != FILEIO_SUCCESS) return false;
  FileReplaceOptions options;
  options.secret = true;
  Bool ok = File_ReplaceWith(to.c_str(), options, [&in](int fd, const char *) {
    char buf[1 << 16];
    for (;;) {
      size_t n = 0;
      FileIOResult rc = FileIO_Read(&in, buf, sizeof buf, &n);
      if (rc != FILEIO_SUCCESS && rc != FILEIO_READ_ERROR_EOF) return false;
      if (!WriteAll(fd, buf, n)) return false;
      if (rc == FILEIO_READ_ERROR_EOF) return true;
    }
  });
  FileIO_Close(&in);
  return ok != FALSE;
}

// A plain file name: no folder part, nothing that leads out of a folder.
bool IsPlainName(std::string_view name) {
  return !name.empty() && name != "." && name != ".." && name.find('/') == std::string_view::npos;
}

// FloppyBuild holds what AutoInstall_MakeFloppyImg opened and made, so
// that every way out runs the same clean-up.
class FloppyBuild {
 public:
  FloppyBuild(const char *guestConfigDir, const char *resourceDir)
      : configDir_(guestConfigDir),
        resourceDir_(resourceDir),
        sif_(Join(guestConfigDir, "winnt.sif")),
        xml_(Join(guestConfigDir, "autoun~0.xml")),
        storePwd_(Join(guestConfigDir, "storePwd.ini")),
        floppy_(Join(guestConfigDir, kFloppyName)),
        upgrader_(Join(guestConfigDir, kUpgraderName)) {}
  ~FloppyBuild() { CleanUp(); }
  FloppyBuild(const FloppyBuild &) = delete;
  FloppyBuild &operator=(const FloppyBuild &) = delete;

  bool Run(const char *baseFloppyPath, const char *toolsIsoPath, const char *scsiDriverDir,
           const char *upgraderIsoDir) {
    return OpenImage(baseFloppyPath) && (scsiDriverDir == nullptr || GetDrivers(toolsIsoPath, scsiDriverDir)) &&
           AddDrivers() && AddAnswerFiles() && AddUpgrader(toolsIsoPath, upgraderIsoDir) &&
           Add(Join(resourceDir_, "unattend.cmd"), "unattend.cmd", "UNATTENDED_CMD");
  }

 private:
  bool OpenImage(const char *baseFloppyPath) {
    unsigned long err;
    if (baseFloppyPath != nullptr) {
      if (!CopyPrivate(baseFloppyPath, floppy_)) {
        Log("%s: File_Copy from=\"%s\" to=\"%s\"\n", kFn, baseFloppyPath, floppy_.c_str());
        return false;
      }
      err = FAT_OpenVolume(FATDevFileIO_Open(floppy_.c_str()), &volume_);
      if (err != FAT_OK) {
        Log("%s: FAT_OpenVolume err=%lu floppyImageFilePath =\"%s\"\n", kFn, err, floppy_.c_str());
        return false;
      }
    } else {
      err = FAT_FormatVolume(FATDevFileIO_Open(floppy_.c_str()), kFloppyBytes, 0, &volume_);
      if (err != FAT_OK) {
        Log("%s: FAT_FormatVolume err=%lu floppyImageFilePath =\"%s\"\n", kFn, err, floppy_.c_str());
        return false;
      }
    }
    if ((err = FAT_SkipVolumeBoot(volume_)) != FAT_OK) {
      Log("%s: FAT_SkipVolumeBoot err=%lu\n", kFn, err);
      return false;
    }
    if ((err = FAT_OpenRootDirectory(volume_, &root_)) != FAT_OK) {
      Log("%s: FAT_OpenRootDirectory err=%lu\n", kFn, err);
      return false;
    }
    return true;
  }

  // GetDrivers settles the driver folder: the caller's host folder, or a
  // "scsi" folder of ours filled from the tools ISO or the driver floppy.
  bool GetDrivers(const char *toolsIsoPath, const char *scsiDriverDir) {
    if (toolsIsoPath == nullptr) {
      driverDir_ = scsiDriverDir;
      return true;
    }
    driverDir_ = Join(configDir_, "scsi");
    ownDriverDir_ = true;
    if (!File_CreateDirectory(driverDir_.c_str())) {
      Log("%s: File_CreateDirectory guestConfigDir=\"%s\"\n", kFn, configDir_);
      return false;
    }
    Iso9660Image *image = nullptr;
    int res = Iso9660_Open(toolsIsoPath, kIsoMode, &image);
    UniquePtr<Iso9660Image> iso(image);
    if (res == 0) {
      res = Iso9660_Extract(iso.get(), scsiDriverDir, driverDir_.c_str());
      if (res != 0) {
        Log("%s: Iso9660_Extract res=%d scsiDriverDir=\"%s\"tempdir=\"%s\"\n", kFn, res,
            scsiDriverDir, driverDir_.c_str());
        return false;
      }
      return true;
    }
    if (File_Exists(toolsIsoPath)) {
      Log("%s: Iso9660_Open res=%d toolsIsoPath=\"%s\"\n", kFn, res, toolsIsoPath);
      return false;
    }
    return GetDriversFromFloppy();
  }

  bool GetDriversFromFloppy() {
    std::string from = Join(resourceDir_, "tvxscsi.flp");
    scsiCopy_ = Join(driverDir_.c_str(), kDriverFloppyCopy);
    if (!File_Copy(from.c_str(), scsiCopy_.c_str(), TRUE)) {
      Log("%s: File_Copy from=\"%s\" to=\"%s\"\n", kFn, from.c_str(), scsiCopy_.c_str());
      return false;
    }
    unsigned long err = FAT_OpenVolume(FATDevFileIO_Open(scsiCopy_.c_str()), &scsiVolume_);
    if (err != FAT_OK) {
      Log("%s: FAT_OpenVolume err=%lu scsiFlp=\"%s\"\n", kFn, err, scsiCopy_.c_str());
      return false;
    }
    if ((err = FAT_OpenRootDirectory(scsiVolume_, &scsiRoot_)) != FAT_OK) {
      Log("%s: FAT_OpenRootDirectory err=%lu\n", kFn, err);
      return false;
    }
    FATDirIter *it = nullptr;
    FAT_GetDirIter(scsiRoot_, &it);
    while (FAT_DirIterNext(it) == FAT_OK) {
      if (FAT_DirIterIsDir(it)) continue;
      char *raw = nullptr;
      if (FAT_DirIterGetName(it, &raw) != FAT_OK) continue;
      CharPtr name(raw);
      std::string lower = ascii::Lower(name.get());
      std::string target = Join(driverDir_.c_str(), lower.c_str());
      if (!IsPlainName(lower) || !GetFileFromFloppyImg(scsiRoot_, name.get(), target.c_str())) {
        Log("%s: GetFileFromFloppyImg file=\"%s\"\n", kFn, target.c_str());
        return false;
      }
    }
    CloseDriverFloppy();
    return true;
  }

  // AddDrivers puts every file of the driver folder on the floppy and names
  // it in winnt.sif; a file that cannot be added is left out.
  bool AddDrivers() {
    if (driverDir_.empty()) return true;
    char **names = nullptr;
    int nf = File_ListDirectory(driverDir_.c_str(), &names);
    ListPtr list(names);
    if (nf <= 0) {
      Log("%s: File_ListDirectory nf=%d tempdir=\"%s\"\n", kFn, nf, driverDir_.c_str());
      return false;
    }
    std::string txtsetupOem;
    for (int i = 0; i < nf; i++) {
      const char *name = names[i];
      std::string path = Join(driverDir_.c_str(), name);
      if (!AddFileToFloppyImg(root_, path.c_str(), name)) {
        Log("%s: AddFileToFloppyImg file=\"%s\"\n", kFn, name);
      } else if (!IniUtil_WriteIniFileString(sif_.c_str(), "OEMBootFiles", name, "", FALSE)) {
        Log("%s: IniUtil_WriteIniFileString OEMBootFiles=\"%s\"unattendFilePath=\"%s\"\n", kFn, name,
            sif_.c_str());
        return false;
      }
      char *base = nullptr;
      File_SplitName(name, nullptr, nullptr, &base);
      CharPtr baseOwner(base);
      if (base != nullptr && ascii::Equal(base, "txtsetup.oem")) txtsetupOem = path;
    }
    if (!txtsetupOem.empty()) WriteOEMDriverInfo(txtsetupOem.c_str(), sif_.c_str());
    return true;
  }

  bool Add(const std::string &from, const char *name, const char *what) {
    if (AddFileToFloppyImg(root_, from.c_str(), name)) return true;
    Log("%s: AddFileToFloppyImg %s=\"%s\"\n", kFn, what, from.c_str());
    return false;
  }

  bool AddAnswerFiles() {
    if (!Add(sif_, "winnt.sif", "UNATTENDED_INSTALL_FILE") ||
        !Add(xml_, "autoun~0.xml", "UNATTENDED_XML_INSTALL_FILE")) {
      return false;
    }
    if (!File_Exists(storePwd_.c_str())) return true;
    return Add(storePwd_, "storePwd.ini", "STOREPWD_INI_FILENAME") &&
           Add(Join(resourceDir_, "storePwd.exe"), "storePwd.exe", "STOREPWD_EXE_FILENAME");
  }

  // AddUpgrader takes the upgrader out of the tools ISO; without the ISO
  // file its absence is no failure.
  bool AddUpgrader(const char *toolsIsoPath, const char *upgraderIsoDir) {
    if (toolsIsoPath == nullptr || upgraderIsoDir == nullptr) return true;
    Iso9660Image *image = nullptr;
    if (Iso9660_Open(toolsIsoPath, kIsoMode, &image) == 0) {
      UniquePtr<Iso9660Image> iso(image);
      std::string inIso = Join(upgraderIsoDir, kUpgraderName);
      int res = Iso9660_ExtractFileEx(iso.get(), inIso.c_str(), upgrader_.c_str());
      if (res != 0) {
        Log("%s: Iso9660_Extract res=%d upgraderIsoLocation=\"%s\"guestConfigDir=\"%s\"\n", kFn, res,
            inIso.c_str(), configDir_);
        return false;
      }
    }
    if (AddFileToFloppyImg(root_, upgrader_.c_str(), "upgrader.exe") || !File_Exists(toolsIsoPath)) {
      return true;
    }
    Log("%s: AddFileToFloppyImg (tools \"%s\") UPGRADER_EXE=\"%s\"\n", kFn, toolsIsoPath,
        upgrader_.c_str());
    return false;
  }

  void CloseDriverFloppy() {
    FAT_CloseDirectory(scsiRoot_);
    FAT_CloseVolume(scsiVolume_);
    scsiRoot_ = nullptr;
    scsiVolume_ = nullptr;
    if (!scsiCopy_.empty()) File_UnlinkIfExists(scsiCopy_.c_str());
    scsiCopy_.clear();
  }

  // CleanUp leaves "autoinst.flp" and removes the rest: the answer files
  // (consumed by the floppy), the upgrader copy and a driver folder of ours
  // with everything in it.
  void CleanUp() {
    FAT_CloseDirectory(root_);
    FAT_CloseVolume(volume_);
    root_ = nullptr;
    volume_ = nullptr;
    if (ownDriverDir_) {
      char **names = nullptr;
      int nf = File_ListDirectory(driverDir_.c_str(), &names);
      ListPtr list(names);
      for (int i = 0; i < nf; i++) {
        std::string path = Join(driverDir_.c_str(), names[i]);
        if (path == scsiCopy_) continue;  // still open: closed below
        if (File_IsDirectory(path.c_str())) {
          File_DeleteDirectoryTree(path.c_str());
        } else {
          File_UnlinkIfExists(path.c_str());
        }
      }
    }
    for (const std::string *p : {&sif_, &xml_, &storePwd_, &upgrader_}) File_UnlinkIfExists(p->c_str());
    CloseDriverFloppy();
    if (ownDriverDir_) File_DeleteEmptyDirectory(driverDir_.c_str());
  }

  struct ListDeleter {
    void operator()(char **names) const noexcept {
      for (char **p = names; *p != nullptr; p++) std::free(*p);
      std::free(names);
    }
  };
  using ListPtr = std::unique_ptr<char *, ListDeleter>;

  const char *configDir_;
  const char *resourceDir_;
  std::string sif_, xml_, storePwd_, floppy_, upgrader_;
  FATVolume *volume_ = nullptr;
  FATDirectory *root_ = nullptr;
  std::string driverDir_;
  bool ownDriverDir_ = false;  // "scsi" in the config folder, not the caller's
  std::string scsiCopy_;
  FATVolume *scsiVolume_ = nullptr;
  FATDirectory *scsiRoot_ = nullptr;
};

// ReadWhole reads a small text file; false for a missing or empty file.
bool ReadWhole(const char *path, std::string *out) {
  FileIODescriptor fd;
  if (FileIO_Open(&fd, path, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN) != FILEIO_SUCCESS) return false;
  uint64_t size = FileIO_GetSize(&fd);
  bool ok = size != 0 && size != UINT64_MAX && size < SIZE_MAX;
  if (ok) {
    try {
      out->resize(static_cast<size_t>(size));
      ok = FileIO_Read(&fd, out->data(), out->size(), nullptr) == FILEIO_SUCCESS;
    } catch (...) {
      ok = false;
    }
  }
  FileIO_Close(&fd);
  return ok;
}

// OemDriverKey finds, in one line of txtsetup.oem, the quoted description
// of a known driver: the line names the driver before its first "=", and
// the description is the first quoted text after it.
bool OemDriverKey(std::string_view line, std::string *key) {
  size_t eq = line.find('=');
  if (eq == std::string_view::npos) return false;
  std::string_view head = line.substr(0, eq);
  for (const char *driver : oemDriverNames) {
    if (head.find(driver) == std::string_view::npos) continue;
    size_t open = line.find('"', eq + 1);
    size_t close = open == std::string_view::npos ? open : line.find('"', open + 1);
    if (close == std::string_view::npos) continue;
    *key = std::string(line.substr(open, close - open + 1));
    return true;
  }
  return false;
}

}  // namespace
}  // namespace tvx::autoinstall

using tvx::autoinstall::FloppyBuild;

Bool AutoInstall_MakeFloppyImg(const char *baseFloppyPath, const char *guestConfigDir,
                               const char *toolsIsoPath, const char *scsiDriverDir,
                               const char *upgraderIsoDir, const char *resourceDir) {
  if (resourceDir == nullptr || guestConfigDir == nullptr) return FALSE;
  try {
    FloppyBuild build(guestConfigDir, resourceDir);
    return build.Run(baseFloppyPath, toolsIsoPath, scsiDriverDir, upgraderIsoDir) ? TRUE : FALSE;
  } catch (...) {
    return FALSE;
  }
}

Bool AutoInstall_AddFileToFloppyImg(const char *srcPath, const char *nameOnFloppy,
                                    const char *guestConfigDir) {
  if (srcPath == nullptr || nameOnFloppy == nullptr || guestConfigDir == nullptr) return FALSE;
  tvx::CharPtr floppy(File_PathJoin(guestConfigDir, tvx::autoinstall::kFloppyName));
  FATVolume *volume = nullptr;
  if (FAT_OpenVolume(FATDevFileIO_Open(floppy.get()), &volume) != FAT_OK) return FALSE;
  FATDirectory *root = nullptr;
  Bool ok = FALSE;
  if (FAT_OpenRootDirectory(volume, &root) == FAT_OK) {
    ok = AddFileToFloppyImg(root, srcPath, nameOnFloppy);
    if (FAT_CloseDirectory(root) != FAT_OK) ok = FALSE;
  }
  if (FAT_CloseVolume(volume) != FAT_OK) ok = FALSE;
  return ok;
}

void WriteOEMDriverInfo(const char *txtsetupOemPath, const char *winntSifPath) {
  if (txtsetupOemPath == nullptr || winntSifPath == nullptr) return;
  try {
    std::string text;
    if (!tvx::autoinstall::ReadWhole(txtsetupOemPath, &text)) return;
    text.resize(std::strlen(text.c_str()));  // the text ends at a NUL byte
    std::string_view rest(text);
    while (!rest.empty()) {
      size_t nl = rest.find('\n');
      std::string_view line = rest.substr(0, nl);
      rest = nl == std::string_view::npos ? std::string_view() : rest.substr(nl + 1);
      std::string key;
      if (tvx::autoinstall::OemDriverKey(line, &key)) {
        // One driver per set: the first description found is the one.
        IniUtil_WriteIniFileString(winntSifPath, "MassStorageDrivers", key.c_str(), "OEM", FALSE);
        return;
      }
    }
    Warning("%s: Failed to detect the type of driver in %s\n", "WriteOEMDriverInfo", txtsetupOemPath);
  } catch (...) {
  }
}
