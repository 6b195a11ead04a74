// The process-wide Linux answer-file table.
#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "lib/guestInstall/autoinstall_linux_templates.h"

namespace tvx::autoinstall {

LinuxAnswerFileRow linuxAnswerFileTable[kLinuxAnswerFileRows] = {
    {nullptr, nullptr, nullptr, FALSE},
    {kKickstartTemplate1, "ks=cdrom:/ks.cfg", "ks.cfg", FALSE},
    {kPreseedToolsCdSda,
     "debian-installer/custom-installation=/custom find_preseed=/preseed.cfg auto "
     "preseed/file=/floppy/preseed.cfg automatic-ubiquity noprompt priority=critical "
     "locale=en_US console-setup/modelcode=evdev",
     "preseed.cfg", TRUE},
    {kAutoYastTemplateA,
     "autoyast=floppy:///autoinst.xml install=cd:/?device=sr1 driverupdate=disk:/?device=fd0",
     "autoinst.xml", TRUE},
    {kAutoYastTemplateA,
     "autoyast=floppy:///autoinst.xml install=cd:/?device=hdc driverupdate=disk:/?device=fd0",
     "autoinst.xml", TRUE},
    {kAutoInstTemplate, "auto_install=floppy", "auto_i~1.cfg", TRUE},
};

std::string LinuxAnswerFilePath(AutoInstallLinuxKind kind, const char *outputDir) {
  if (kind <= AUTOINSTALL_LINUX_NONE || kind >= static_cast<int>(kLinuxAnswerFileRows) ||
      outputDir == nullptr) {
    return "";
  }
  std::string path = outputDir;
  path += '/';
  if (kind == AUTOINSTALL_LINUX_UBUNTU) {
    path += kUbuntuAnswerSubdir;
    path += '/';
  }
  return path + linuxAnswerFileTable[kind].answerFileName;
}

}  // namespace tvx::autoinstall
