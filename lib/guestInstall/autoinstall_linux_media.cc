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

// TODO(floppy): the FAT layer is merged next.
TVX_EXPORT Bool AutoInstall_MakeFloppyImg_Linux(const char *answerDir, const char *floppyDir,
                                                const char *templateDir, const char *guestOS) {
  return FALSE;
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
