// Kickstart files for the Red Hat family. Installer releases differ in the
// directives they accept, so the templates carry those directives behind
// switches ("" keeps a line, "#" comments it out) that are set from the
// guest identifier and its version class, together with the template, the
// package list and the kernel argument that lets the installer find ks.cfg.
#include <cstring>

#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "lib/guestInstall/autoinstall_linux_templates.h"
#include "platform/str.h"

namespace tvx::autoinstall {

// Lines 1 to 13 are shared by the three templates.
#define TVX_KICKSTART_HEAD                          \
  "lang en_US\n"                                    \
  "%slangsupport --default en_US\n"                 \
  "network --bootproto dhcp\n"                      \
  "cdrom\n"                                         \
  "keyboard us\n"                                   \
  "zerombr %syes\n"                                 \
  "clearpart --all --initlabel\n"                   \
  "part /boot --size 300\n"                         \
  "part swap --recommended\n"                       \
  "part / --size 3000 --grow\n"                     \
  "%spart biosboot --fstype=biosboot --size=1\n"    \
  "install\n"                                       \
  "%smouse generic3ps/2\n"                          \
  "firstboot --disable\n"                           \
  "firewall --enabled\n"                            \
  "timezone --utc America/Los_Angeles\n"            \
  "xconfig --startxonboot %s--resolution=800x600\n" \
  "rootpw --iscrypted %s\n"                         \
  "%s\n"                                            \
  "auth --useshadow --enablemd5\n"                  \
  "bootloader --location=mbr\n"                     \
  "%skey %s\n"                                      \
  "%%packages%s\n"                                  \
  "%spython\n"                                      \
  "%s\n"                                            \
  "%s%%end\n"                                       \
  "%%post\n"

#define TVX_KICKSTART_USER_LINES \
  "/usr/sbin/adduser %s\n"       \
  "/usr/sbin/usermod -p '%s' %s\n"

// 1: the tools install from the copied tools CD at the first boot, in text
// mode, and the graphical boot comes back afterwards.
const char kKickstartTemplate1[] = TVX_KICKSTART_HEAD
    "for f in /boot/grub/menu.lst /boot/grub/grub.conf /boot/grub2/grub.conf; do\n"
    "  if [ -f \"$f\" ]; then cp -p \"$f\" \"$f.bak\"; sed -i -e 's/ rhgb//' \"$f\"; fi\n"
    "done\n"
    "cp -p /etc/rc.d/rc.local /etc/rc.d/rc.local.bak\n"
    "cat >> /etc/rc.d/rc.local <<'TARVEX_EOF'\n"
    "echo \"Installing Tarvex Tools, please wait...\"\n"
    "tarvex_selinux=$(getenforce 2>/dev/null)\n"
    "setenforce 0 2>/dev/null\n"
    "mkdir -p /tmp/tarvex-toolsmnt0\n"
    "for i in hda sr0 scd0; do mount -t iso9660 /dev/$i /tmp/tarvex-toolsmnt0 && break; "
    "done\n" TVX_TOOLS_COPY_FROM_MOUNT
    "eject sr0\n"
    "eject sr1\n"
    "./run_upgrader.sh\n"
    "cd /\n"
    "mv -f /etc/rc.d/rc.local.bak /etc/rc.d/rc.local\n"
    "for f in /boot/grub/menu.lst /boot/grub/grub.conf /boot/grub2/grub.conf; do\n"
    "  if [ -f \"$f.bak\" ]; then mv -f \"$f.bak\" \"$f\"; fi\n"
    "done\n"
    "if [ \"$tarvex_selinux\" = Enforcing ]; then setenforce 1; fi\n"
    "if [ -f /etc/inittab ]; then sed -i -e 's/^id:3:initdefault:/id:5:initdefault:/' "
    "/etc/inittab; fi\n"
    "if [ -d /run/systemd/system ]; then systemctl restart prefdm.service; else telinit 5; fi\n"
    "TARVEX_EOF\n"
    "chmod 755 /etc/rc.d/rc.local\n"
    "if [ -d /run/systemd/system ] || command -v systemctl >/dev/null 2>&1; then\n"
    "  systemctl enable rc-local.service\n"
    "fi\n" TVX_KICKSTART_USER_LINES
    "/usr/bin/chfn -f \"%s\" %s\n"
    "/bin/echo done\n"
    "%s%%end\n";

// 2: the tools come from the distribution's repositories once the network
// answers; the full name is left to the first login.
const char kKickstartTemplate2[] = TVX_KICKSTART_HEAD TVX_KICKSTART_USER_LINES
    "#/usr/bin/chfn -f \"%s\" %s\n"
    "mkdir -p /var/log/tarvex\n"
    "cat > /etc/rc.d/rc.local <<'TARVEX_EOF'\n"
    "#!/bin/sh\n"
    "exec >> /var/log/tarvex/rc.local.log 2>&1\n"
    "i=1\n"
    "while [ $i -lt 30 ]; do\n"
    "  if getent hosts mirrors.fedoraproject.org >/dev/null; then break; fi\n"
    "  sleep 1\n"
    "  i=$((i + 6))\n"
    "done\n"
    "yum -y install open-tvx-tools-desktop || /bin/true\n"
    "if rpm -q open-tvx-tools-desktop >/dev/null 2>&1; then\n"
    "  eject sr0\n"
    "  eject sr1\n"
    "  tarvex-rpctool \"guest.upgrader_send_cmd_line_args --default\"\n"
    "  tarvex-rpctool \"upgrader.setGuestFileRoot /tmp\"\n"
    "  tarvex-rpctool \"toolinstall.installerActive 1\"\n"
    "  tarvex-rpctool \"toolinstall.installerActive 100\"\n"
    "fi\n"
    "rm -f /etc/rc.d/rc.local\n"
    "TARVEX_EOF\n"
    "chmod 755 /etc/rc.d/rc.local\n"
    "%s%%end\n";

// 3: the tools package is part of the install; the first boot into the
// graphical run level only tells the host that the install is over.
const char kKickstartTemplate3[] = TVX_KICKSTART_HEAD TVX_KICKSTART_USER_LINES
    "/usr/bin/chfn -f \"%s\" %s\n"
    "if [ -f /etc/rc.d/rc.local ]; then mv /etc/rc.d/rc.local /etc/rc.d/rc.local.00; fi\n"
    "mkdir -p /var/log/tarvex /etc/rc.d/rc5.d\n"
    "cat > /etc/rc.d/rc.local <<'TARVEX_EOF'\n"
    "#!/bin/sh\n"
    "exec >> /var/log/tarvex/rc.local.log 2>&1\n"
    "eject sr0\n"
    "eject sr1\n"
    "/bin/tarvex-rpctool \"guest.upgrader_send_cmd_line_args --default\"\n"
    "/bin/tarvex-rpctool \"upgrader.setGuestFileRoot /tmp\"\n"
    "/bin/tarvex-rpctool \"toolinstall.installerActive 1\"\n"
    "/bin/tarvex-rpctool \"toolinstall.installerActive 100\"\n"
    "rm -f /etc/rc.d/rc5.d/S99rclocal /etc/rc.d/rc.local\n"
    "if [ -f /etc/rc.d/rc.local.00 ]; then mv /etc/rc.d/rc.local.00 /etc/rc.d/rc.local; fi\n"
    "TARVEX_EOF\n"
    "chmod 755 /etc/rc.d/rc.local\n"
    "ln -sf /etc/rc.d/rc.local /etc/rc.d/rc5.d/S99rclocal\n"
    "%s%%end\n";

namespace {

#define TVX_GNOME                                                          \
  "@ X Window System\n@ GNOME Desktop Environment\n@ Graphical Internet\n" \
  "@ Development Tools\n"
#define TVX_F18_GROUPS                                                               \
  "@base-x\n@core\n@development-tools\n@dial-up\n@firefox\n@fonts\n@gnome-desktop\n" \
  "@hardware-support\n@input-methods\n@libreoffice\n@multimedia\n@printing\n@standard\n"
#define TVX_EL7_HEAD "gcc\nmake\npatch\nbinutils\nkernel-devel\nftp\n@base\n@core\nopen-tvx-tools\n"
#define TVX_EL7_DESKTOP_1 "@guest-desktop-agents\n@desktop-debugging\n@dial-up\n"
#define TVX_EL7_DESKTOP_2                                                       \
  "@fonts\n@gnome-desktop\n@input-methods\n@internet-browser\n@java-platform\n" \
  "@multimedia\n@network-file-system-client\n@print-client\n"

constexpr char kAsianuxOld[] =
    "@ base-x\n@ Chinese-support\n@ Japanese-support\n@ Korean-support\n@ web-browsers\n"
    "@ kde-desktop\n";
constexpr char kAsianuxNew[] =
    "@ Chinese-support\n@ Japanese-support\n@ Korean-support\n@ general-desktop\n"
    "@ internet-browser\n@ basic-desktop\n@ desktop-platform\n@ x11\n";
constexpr char kEl6[] =
    "@ Desktop\n@ General Purpose Desktop\n@ Internet Browser\n@ X Window System\n@ Fonts\n"
    "@ Printing client\ngcc\nmake\npatch\nbinutils\nkernel-devel\n";
constexpr char kEl7[] =
    TVX_EL7_HEAD TVX_EL7_DESKTOP_1 "@directory-client\n" TVX_EL7_DESKTOP_2 "@x11\n";
constexpr char kEl7Server[] = TVX_EL7_HEAD "@guest-desktop-agents\n";
constexpr char kEl8[] =
    TVX_EL7_HEAD TVX_EL7_DESKTOP_1 TVX_EL7_DESKTOP_2 "mesa-libxatracker\nxorg-x11-drv-tarvex\n";
constexpr char kGnomeFonts[] = TVX_GNOME "@ Fonts\n";
constexpr char kGnome[] = TVX_GNOME;
constexpr char kF18[] = TVX_F18_GROUPS "kernel-PAE-devel";
constexpr char kF18x64[] = TVX_F18_GROUPS;
constexpr char kF21[] =
    "@c-development\n@container-management\n@core\n@domain-client\n@guest-agents\n"
    "@hardware-support\n@headless-management\n@server-product\n@standard\n";
constexpr char kF22[] =
    "@container-management\n@core\n@domain-client\n@guest-agents\n@headless-management\n"
    "@server-hardware-support\n@server-product\n@standard\n";

constexpr char kKsCdrom[] = "ks=cdrom:/ks.cfg";
constexpr char kKsDevCdrom[] = "ks=cdrom:/dev/cdrom:/ks.cfg";

// Fedora 14 to 29-and-higher are consecutive classes; their installers
// take %end and want a BIOS boot partition on GPT disks.
bool IsFedora14OrLater(uint32_t version) {
  return version >= GUESS_VERSION_FEDORA_14_TO_16 && version <= GUESS_VERSION_FEDORA_29_OR_HIGHER;
}

const char *VersionRule(uint32_t version) {
  return IsVersionIn(version, {GUESS_VERSION_FEDORA_17, GUESS_VERSION_FEDORA_18,
                               GUESS_VERSION_FEDORA_19_TO_20})
             ? kKsDevCdrom
             : kKsCdrom;
}

struct Choice {
  const char *templateText;
  const char *packages;
  bool modern;
  bool pythonLine;
  const char *argument;
};

int CentosMajor(uint32_t version) {
  switch (version) {
    case GUESS_VERSION_CENTOS_3:
      return 3;
    case GUESS_VERSION_CENTOS_4:
      return 4;
    case GUESS_VERSION_CENTOS_5:
      return 5;
    case GUESS_VERSION_CENTOS_6:
      return 6;
    case GUESS_VERSION_CENTOS_7:
      return 7;
    case GUESS_VERSION_CENTOS_8:
      return 8;
    default:
      return 0;
  }
}

Choice Choose(const KickstartGuest &g, uint32_t version, const char *guestOS) {
  const char *rule = VersionRule(version);
  if (g.isAsianux) {
    return {kKickstartTemplate1, g.major > 3 ? kAsianuxNew : kAsianuxOld, g.major > 3, true, rule};
  }
  if (g.enterprise && g.major == 6) return {kKickstartTemplate1, kEl6, true, true, rule};
  if (g.enterprise && g.major == 7) {
    if (version == GUESS_VERSION_RHEL_SERVER) {
      return {kKickstartTemplate3, kEl7Server, true, true, kKsCdrom};
    }
    return {kKickstartTemplate3, kEl7, true, true, rule};
  }
  if (g.enterprise && g.major > 7) return {kKickstartTemplate3, kEl8, true, false, rule};
  if (version == GUESS_VERSION_FEDORA_9_TO_12) {
    return {kKickstartTemplate1, kGnomeFonts, false, true, kKsCdrom};
  }
  const char *f18 = std::strstr(guestOS, "64") != nullptr ? kF18x64 : kF18;
  switch (version) {
    case GUESS_VERSION_FEDORA_14_TO_16:
      return {kKickstartTemplate1, kGnomeFonts, true, true, kKsCdrom};
    case GUESS_VERSION_FEDORA_17:
      return {kKickstartTemplate1, kGnomeFonts, true, true, kKsDevCdrom};
    case GUESS_VERSION_FEDORA_18:
      return {kKickstartTemplate1, f18, true, true, kKsDevCdrom};
    case GUESS_VERSION_FEDORA_19_TO_20:
      return {kKickstartTemplate2, f18, true, true, kKsDevCdrom};
    case GUESS_VERSION_FEDORA_21:
      return {kKickstartTemplate2, kF21, true, true, kKsCdrom};
    case GUESS_VERSION_FEDORA_22_TO_28:
      return {kKickstartTemplate2, kF22, true, true, kKsCdrom};
    case GUESS_VERSION_FEDORA_29_OR_HIGHER:
      return {kKickstartTemplate2, kF22, true, false, kKsCdrom};
    default:
      return {kKickstartTemplate1, kGnome, false, true, rule};
  }
}

}  // namespace

KickstartGuest ClassifyKickstartGuest(const char *guestOS, uint32_t version) {
  KickstartGuest g;
  g.isRhel = StrUtil_StartsWith(guestOS, "rhel");
  g.isAsianux = StrUtil_StartsWith(guestOS, "asianux");
  int centos = CentosMajor(version);
  g.enterprise = g.isRhel || centos != 0;
  if (g.isRhel) {
    g.major = guestOS[4] != '\0' ? guestOS[4] - '0' : 0;
  } else if (g.enterprise) {
    g.major = centos;
  } else if (g.isAsianux) {
    g.major = guestOS[7] != '\0' ? guestOS[7] - '0' : 0;
  }
  g.old = g.enterprise && g.major <= 4;
  g.rhel5 = g.enterprise && g.major == 5;
  return g;
}

bool MakeKickstart(const char *guestOS, uint32_t version, const KickstartAnswers &a,
                   std::string *out, const char **out_argument) {
  const KickstartGuest g = ClassifyKickstartGuest(guestOS, version);
  const Choice c = Choose(g, version, guestOS);
  const bool hasKey = a.installationKey != nullptr && a.installationKey[0] != '\0';
  const char *oldSwitch = g.old ? "" : "#";
  const char *modernSwitch = c.modern ? "#" : "";
  const char *endSwitch = c.modern ? "" : "#";
  if (!FillTemplate(c.templateText,
                    {oldSwitch, modernSwitch, IsFedora14OrLater(version) ? "" : "#", oldSwitch,
                     modernSwitch, a.rootCrypt, a.powerOff ? "poweroff" : "reboot",
                     g.rhel5 ? "" : "#", hasKey ? a.installationKey : "--skip",
                     g.old ? " --resolvedeps" : "", c.pythonLine ? "" : "#", c.packages, endSwitch,
                     a.userName, a.userCrypt, a.userName, a.fullNameShell, a.userName, endSwitch},
                    out)) {
    return false;
  }
  *out_argument = c.argument;
  return true;
}

}  // namespace tvx::autoinstall
