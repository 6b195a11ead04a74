// How a Linux answer file reaches the installer: on a floppy image, or on a
// small boot CD mastered by an external ISO tool from the boot tree.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "lib/guestInstall/autoinstall_internal.h"
#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "lib/guestInstall/autoinstall_linux_media_internal.h"
#include "platform/fd_io.h"
#include "platform/file.h"
#include "platform/file_replace.h"
#include "platform/log.h"
#include "platform/process.h"
#include "tvx_autoinstall_linux_media.h"
#include "tvx_fat.h"
#include "tvx_floppy.h"
#include "platform/unique.h"

namespace tvx::autoinstall {
namespace {

// The guest-tools files and the short names the post-install scripts expect
// on the CD.
constexpr const char *kToolsFiles[][2] = {
    {"tarvex-tools-upgrader-32", "upgra32"},
    {"tarvex-tools-upgrader-64", "upgra64"},
    {"run_upgrader.sh", "upgrade.sh"},
};

// NotAnOption keeps a relative path that begins with "-" from being read as
// an option of the tool.
std::string NotAnOption(const std::string &path) {
  return !path.empty() && path[0] == '-' ? "./" + path : path;
}

constexpr const char *kMakeFloppy = "AutoInstall_MakeFloppyImg_Linux";

// OpenFloppyVolume gives the volume of the new autoinst.flp: a fresh image
// for Ubuntu, a copy of the distribution's template floppy for the others.
FATVolume *OpenFloppyVolume(AutoInstallLinuxKind kind, const char *templateDir,
                            const std::string &image) {
  FATVolume *volume = nullptr;
  if (kind == AUTOINSTALL_LINUX_UBUNTU) {
    if (FAT_FormatVolume(FATDevFileIO_Open(image.c_str()), FAT_FLOPPY_SIZE, 0, &volume) != 0) {
      Log("%s: FAT_FormatVolume failed floppyImageFilePath=\"%s\"\n", kMakeFloppy, image.c_str());
      return nullptr;
    }
    return volume;
  }
  tvx::CharPtr templatePath(File_PathJoin(
      templateDir != nullptr ? templateDir : "",
      kind == AUTOINSTALL_LINUX_MANDRIVA ? "mandriva.flp" : "suse.flp"));
  if (templateDir == nullptr || !File_Exists(templatePath.get())) {
    Log("%s: !File_Exists failed templatePath=\"%s\"\n", kMakeFloppy, templatePath.get());
    return nullptr;
  }
  if (!CopyReplacing(templatePath.get(), image.c_str())) {
    Log("%s: File_Copy failed templatePath=\"%s\" floppyImageFilePath=\"%s\"\n", kMakeFloppy,
        templatePath.get(), image.c_str());
    return nullptr;
  }
  if (FAT_OpenVolume(FATDevFileIO_Open(image.c_str()), &volume) != 0) {
    Log("%s: FAT_OpenVolume failed floppyImageFilePath=\"%s\"\n", kMakeFloppy, image.c_str());
    return nullptr;
  }
  return volume;
}

bool MakeFloppy(AutoInstallLinuxKind kind, const char *answerDir, const char *floppyDir,
                const char *templateDir) {
  const char *name = LinuxRow(kind)->answerFileName;
  std::string answer = kind == AUTOINSTALL_LINUX_UBUNTU
                           ? std::string(answerDir) + "/" + kUbuntuAnswerSubdir + "/" + name
                           : std::string(answerDir) + "/" + name;
  if (!File_Exists(answer.c_str())) return false;
  tvx::CharPtr image(File_PathJoin(floppyDir, "autoinst.flp"));
  FATVolume *volume = OpenFloppyVolume(kind, templateDir, image.get());
  if (volume == nullptr) return false;
  FATDirectory *root = nullptr;
  bool ok = false;
  unsigned long err = FAT_SkipVolumeBoot(volume);
  if (err != 0) {
    Log("%s: FAT_SkipVolumeBoot failed err=%ld\n", kMakeFloppy, static_cast<long>(err));
  } else if ((err = FAT_OpenRootDirectory(volume, &root)) != 0) {
    Log("%s: FAT_OpenRootDirectory failed err=%ld\n", kMakeFloppy, static_cast<long>(err));
  } else if (!AddFileToFloppyImg(root, answer.c_str(), name)) {
    Log("%s: AddFileToFloppyImg failed preseedFilePath=\"%s\"\n", kMakeFloppy, answer.c_str());
  } else {
    ok = true;
  }
  // The image reaches the disk when it is closed: a failed write-back is a
  // floppy without its answer file.
  ok = FAT_CloseDirectory(root) == 0 && ok;
  ok = FAT_CloseVolume(volume) == 0 && ok;
  return ok;
}

}  // namespace

const LinuxAnswerFileRow *LinuxRow(AutoInstallLinuxKind kind) {
  if (kind <= AUTOINSTALL_LINUX_NONE || kind >= static_cast<int>(kLinuxAnswerFileRows)) {
    return &linuxAnswerFileTable[AUTOINSTALL_LINUX_NONE];
  }
  return &linuxAnswerFileTable[kind];
}

bool CopyReplacing(const char *from, const char *to) {
  UniqueFd in(::open(from, O_RDONLY | O_CLOEXEC));
  struct stat st;
  if (!in || ::fstat(in.get(), &st) != 0 || !S_ISREG(st.st_mode)) return false;
  FileReplaceOptions options;
  options.newMode = st.st_mode & 0777;
  return File_ReplaceWith(to, options, [&](int fd, const char *) {
    std::vector<char> buf(1 << 16);
    for (;;) {
      ssize_t n = ::read(in.get(), buf.data(), buf.size());
      if (n < 0 && errno == EINTR) continue;
      if (n <= 0) return n == 0;
      if (!WriteAll(fd, buf.data(), static_cast<size_t>(n))) return false;
    }
  });
}

}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

extern "C" {

TVX_EXPORT Bool AutoInstall_NeedsFloppy_Linux(const char *guestOS) {
  return LinuxRow(AutoInstallGetLinuxKind(guestOS))->needsFloppy ? TRUE : FALSE;
}

TVX_EXPORT Bool AutoInstall_MakeFloppyImg_Linux(const char *answerDir, const char *floppyDir,
                                                const char *templateDir, const char *guestOS) {
  try {
    AutoInstallLinuxKind kind = AutoInstallGetLinuxKind(guestOS);
    if (kind == AUTOINSTALL_LINUX_NONE || kind == AUTOINSTALL_LINUX_REDHAT) return TRUE;
    if (answerDir == nullptr || floppyDir == nullptr) return FALSE;
    return MakeFloppy(kind, answerDir, floppyDir, templateDir) ? TRUE : FALSE;
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool AutoInstall_AddTools_Linux(const char *destinationDir, const char *toolsDir) {
  try {
    if (destinationDir == nullptr || toolsDir == nullptr) return FALSE;
    for (const auto &file : kToolsFiles) {
      tvx::CharPtr from(File_PathJoin(toolsDir, file[0]));
      tvx::CharPtr to(File_PathJoin(destinationDir, file[1]));
      if (!CopyReplacing(from.get(), to.get())) return FALSE;
    }
    return TRUE;
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT Bool AutoInstall_MasterISO(const char *treeDir, const char *mkisofsPath,
                                      const char *outputDir) {
  try {
    if (treeDir == nullptr || mkisofsPath == nullptr || outputDir == nullptr) return FALSE;
    tvx::CharPtr isoPath(File_PathJoin(outputDir, "autoinst.iso"));
    std::string iso = NotAnOption(isoPath.get()), tree = NotAnOption(treeDir);
    const char *const argv[] = {mkisofsPath, "-o", iso.c_str(), "-b", "isolinux/isolinux.bin",
                                "-c", "isolinux/boot.cat", "-no-emul-boot", "-boot-load-size",
                                "4", "-boot-info-table", tree.c_str(), nullptr};
    int status = Process_Run(argv);
    File_DeleteDirectoryTree(treeDir);
    return status == 0 ? TRUE : FALSE;
  } catch (...) {
    return FALSE;
  }
}

}  // extern "C"
