// The preseed, AutoYaST and auto_inst templates, and the template filler.
//
// Post-install scripts copy the tools CD, which the medium builders master
// with short names, and give its files back their long names:
// upgra32/upgra64/upgrade.sh become tarvex-tools-upgrader-32/-64 and
// run_upgrader.sh.
#include "lib/guestInstall/autoinstall_linux_templates.h"

namespace tvx::autoinstall {

// ---- Preseed ----
// The installer joins a line that ends in a backslash with the next, so each
// tools script below is one shell command line for the installer; it writes
// the target's rc.local one echo at a time for the same reason.

#define TVX_PRESEED_HEAD(disk)                                                                  \
  "# Text mode installer settings\n"                                                            \
  "d-i finish-install/reboot_in_progress note\n"                                                \
  "ubiquity   languagechooser/language-name select   English\n"                                 \
  "ubiquity   countrychooser/shortlist   select   US\n"                                         \
  "ubiquity   time/zone   select   America/Los_Angeles\n"                                       \
  "ubiquity   debian-installer/locale select   en_US.UTF-8\n"                                   \
  "ubiquity   localechooser/supported-locales  multiselect en_US.UTF-8\n"                       \
  "ubiquity   keyboard-configuration/modelcode string   SKIP\n"                                 \
  "console-setup console-setup/layoutcode   string   us\n"                                      \
  "console-setup console-setup/layout select   U.S. English\n"                                  \
  "console-setup console-setup/variantcode  select   U.S. English\n"                            \
  "console-setup console-setup/codeset   select   . Combined - Latin; Slavic Cyrillic; "        \
  "Hebrew; basic Arabic\n"                                                                      \
  "ubiquity   partman-auto/init_automatically_partition select   Guided - use entire disk\n"  \
  "ubiquity   partman-auto/disk string   " disk "\n"                                            \
  "ubiquity   partman-auto/method  string   regular\n"                                          \
  "ubiquity   partman-auto/choose_recipe select   All files in one partition (recommended "    \
  "for new users)\n"                                                                            \
  "ubiquity   partman/confirm_write_new_label  boolean  true\n"                                 \
  "ubiquity   partman/choose_partition   select   Finish partitioning and write changes to "    \
  "disk\n"                                                                                      \
  "ubiquity   partman/confirm   boolean  true\n"                                                \
  "ubiquity   partman/confirm_nooverwrite   boolean  true\n"                                    \
  "ubiquity   passwd/user-fullname string   %s\n"                                               \
  "ubiquity   passwd/username   string   %s\n"                                                  \
  "ubiquity   passwd/user-password-crypted password %s\n"                                       \
  "ubiquity   user-setup/encrypt-home boolean false\n"                                          \
  "ubiquity   ubiquity/%s boolean true\n"                                                       \
  "ubiquity   ubiquity/use_nonfree boolean true\n"                                              \
  "ubiquity   ubiquity/download_updates boolean false\n"                                        \
  "ubiquity   ubiquity/minimal_install boolean true\n"                                          \
  "ubiquity   ubiquity/nonfree_package boolean true\n"                                          \
  "ubiquity   migration-assistant/partitions   multiselect \n"                                  \
  "ubiquity   ubiquity/summary  note\n"                                                         \
  "ubiquity   apt-setup/security-updates-failed   note\n"

// Both variants copy the tools CD to the target first.
#define TVX_PRESEED_COPY_TOOLS                                                                 \
  "mkdir -p /tmp/tarvex-toolsmnt0; \\\n"                                                       \
  "for i in sr0 scd0; do mount -t iso9660 /dev/$i /tmp/tarvex-toolsmnt0 && break; done; \\\n" \
  "rm -rf /target/opt/tarvex-tools-installer; \\\n"                                            \
  "cp -a /tmp/tarvex-toolsmnt0 /target/opt/tarvex-tools-installer; \\\n"                       \
  "umount /tmp/tarvex-toolsmnt0; \\\n"                                                         \
  "cd /target/opt/tarvex-tools-installer; \\\n"                                                \
  "mv upgra32 tarvex-tools-upgrader-32; \\\n"                                                  \
  "mv upgra64 tarvex-tools-upgrader-64; \\\n"                                                  \
  "mv upgrade.sh run_upgrader.sh; \\\n"                                                        \
  "chmod 755 tarvex-tools-upgrader-32 tarvex-tools-upgrader-64 run_upgrader.sh; \\\n"          \
  "cd /; \\\n"                                                                                 \
  "cp -p /target/etc/rc.local /target/etc/rc.local.tarvex 2>/dev/null || true; \\\n"           \
  "if [ %s = true ]; then ln -s /etc/init.d/rc.local /target/etc/rcS.d/S05rc.local || true; " \
  "fi; \\\n"

// The first boot shows a banner while the tools install from the copied CD,
// with the display manager held back until they are in.
#define TVX_PRESEED_TOOLS_CD_SCRIPT                                                            \
  TVX_PRESEED_COPY_TOOLS                                                                       \
  "cp -p /target/etc/issue /target/etc/issue.tarvex; \\\n"                                     \
  "for l in /target/etc/rc2.d/S*dm; do if [ -e \"$l\" ]; then mv \"$l\" "                      \
  "/target/opt/tarvex-tools-installer/; fi; done; \\\n"                                        \
  "echo '#!/bin/sh' > /target/etc/rc.local; \\\n"                                              \
  "echo 'echo \"            Tarvex Autoset\" > /etc/issue' >> /target/etc/rc.local; \\\n"      \
  "echo 'echo \"  PLEASE WAIT! Tarvex Tools is currently being\" >> /etc/issue' >> "           \
  "/target/etc/rc.local; \\\n"                                                                 \
  "echo 'echo \"  installed on your system. The login screen follows.\" >> /etc/issue' >> "    \
  "/target/etc/rc.local; \\\n"                                                                 \
  "echo 'cd /opt/tarvex-tools-installer && ./run_upgrader.sh' >> /target/etc/rc.local; \\\n"   \
  "echo 'cp -p /etc/rc.local.tarvex /etc/rc.local' >> /target/etc/rc.local; \\\n"             \
  "echo 'cp -p /etc/issue.tarvex /etc/issue' >> /target/etc/rc.local; \\\n"                    \
  "echo 'for l in /opt/tarvex-tools-installer/S*dm; do if [ -e \"$l\" ]; then mv \"$l\" "      \
  "/etc/rc2.d/; fi; done' >> /target/etc/rc.local; \\\n"                                       \
  "echo 'for d in gdm3 gdm lightdm kdm; do if [ -x /etc/init.d/$d ]; then /etc/init.d/$d "     \
  "restart; break; fi; done' >> /target/etc/rc.local; \\\n"                                    \
  "echo 'exit 0' >> /target/etc/rc.local; \\\n"                                                \
  "chmod 755 /target/etc/rc.local\n"

// Newer releases take the tools from the distribution's archive once the
// network answers.
#define TVX_PRESEED_NETWORK_SCRIPT                                                             \
  TVX_PRESEED_COPY_TOOLS                                                                       \
  "echo '#!/bin/sh' > /target/etc/rc.local; \\\n"                                              \
  "echo 'eject sr0; eject sr1' >> /target/etc/rc.local; \\\n"                                  \
  "echo 'mkdir -p /var/log/tarvex' >> /target/etc/rc.local; \\\n"                              \
  "echo 'exec >> /var/log/tarvex/rc.local.log 2>&1' >> /target/etc/rc.local; \\\n"             \
  "echo 'n=0; while [ $n -lt 3 ]; do if nslookup -timeout=4 archive.ubuntu.com; then break; "  \
  "fi; n=$((n + 1)); sleep 5; done' >> /target/etc/rc.local; \\\n"                             \
  "echo 'if apt-get -y install open-tvx-tools open-tvx-tools-desktop; then' >> "               \
  "/target/etc/rc.local; \\\n"                                                                 \
  "echo '  echo \"open-tvx-tools install Succeeded.\"' >> /target/etc/rc.local; \\\n"          \
  "echo '  tarvex-rpctool \"guest.upgrader_send_cmd_line_args --default\"' >> "                \
  "/target/etc/rc.local; \\\n"                                                                 \
  "echo '  tarvex-rpctool \"upgrader.setGuestFileRoot /tmp\"' >> /target/etc/rc.local; \\\n"   \
  "echo '  tarvex-rpctool \"toolinstall.installerActive 1\"' >> /target/etc/rc.local; \\\n"    \
  "echo '  tarvex-rpctool \"toolinstall.installerActive 100\"' >> /target/etc/rc.local; \\\n"  \
  "echo 'else' >> /target/etc/rc.local; \\\n"                                                  \
  "echo '  echo \"open-tvx-tools install FAILED.\"' >> /target/etc/rc.local; \\\n"             \
  "echo 'fi' >> /target/etc/rc.local; \\\n"                                                    \
  "echo 'cp -p /etc/rc.local.tarvex /etc/rc.local' >> /target/etc/rc.local; \\\n"             \
  "echo 'exit 0' >> /target/etc/rc.local; \\\n"                                                \
  "chmod 755 /target/etc/rc.local\n"

#define TVX_PRESEED(disk, script)                       \
  TVX_PRESEED_HEAD(disk)                                \
  "ubiquity   ubiquity/success_command   string \\\n" script \
  "d-i    debian-installer/splash boolean false\n"      \
  "d-i  preseed/late_command string \\\n" script

const char kPreseedToolsCdSda[] = TVX_PRESEED("/dev/sda", TVX_PRESEED_TOOLS_CD_SCRIPT);
const char kPreseedToolsCdNvme[] = TVX_PRESEED("/dev/nvme0n1", TVX_PRESEED_TOOLS_CD_SCRIPT);
const char kPreseedNetworkSda[] = TVX_PRESEED("/dev/sda", TVX_PRESEED_NETWORK_SCRIPT);
const char kPreseedNetworkNvme[] = TVX_PRESEED("/dev/nvme0n1", TVX_PRESEED_NETWORK_SCRIPT);

// ---- AutoYaST ----

#define TVX_AUTOYAST_HEAD                                                                    \
  "<?xml version=\"1.0\"?>\n"                                                                \
  "<!DOCTYPE profile SYSTEM \"/usr/share/autoinstall/dtd/profile.dtd\">\n"                   \
  "<profile xmlns=\"http://www.suse.com/1.0/yast2ns\" "                                      \
  "xmlns:config=\"http://www.suse.com/1.0/configns\">\n"                                     \
  "  <partitioning config:type=\"list\">\n"                                                  \
  "    <drive>\n"                                                                            \
  "      <use>all</use>\n"                                                                   \
  "    </drive>\n"                                                                           \
  "  </partitioning>\n"                                                                      \
  "  <software>\n"                                                                           \
  "    <patterns config:type=\"list\">\n"                                                    \
  "%s    </patterns>\n"                                                                      \
  "    <packages config:type=\"list\">\n"                                                    \
  "%s    </packages>\n"                                                                      \
  "  </software>\n"                                                                          \
  "  <general>\n"                                                                            \
  "    <mode>\n"                                                                             \
  "      <confirm config:type=\"boolean\">false</confirm>\n"                                 \
  "      <final_halt config:type=\"boolean\">%s</final_halt>\n"                              \
  "    </mode>\n"                                                                            \
  "  </general>\n"                                                                           \
  "  <configure>\n"                                                                          \
  "    <x11>\n"                                                                              \
  "      <display_manager>%s</display_manager>\n"                                            \
  "    </x11>\n"                                                                             \
  "    <networking>\n"                                                                       \
  "      <interfaces config:type=\"list\">\n"                                                \
  "        <interface>\n"                                                                    \
  "          <bootproto>dhcp</bootproto>\n"                                                  \
  "          <device>eth0</device>\n"                                                        \
  "          <startmode>onboot</startmode>\n"                                                \
  "        </interface>\n"                                                                   \
  "      </interfaces>\n"                                                                    \
  "    </networking>\n"                                                                      \
  "    <users config:type=\"list\">\n"                                                       \
  "      <user>\n"                                                                           \
  "        <encrypted config:type=\"boolean\">true</encrypted>\n"                            \
  "        <user_password>%s</user_password>\n"                                              \
  "        <username>root</username>\n"                                                      \
  "      </user>\n"                                                                          \
  "      <user>\n"                                                                           \
  "        <encrypted config:type=\"boolean\">true</encrypted>\n"                            \
  "        <user_password>%s</user_password>\n"                                              \
  "        <username>%s</username>\n"                                                       \
  "        <forename><![CDATA[%s]]></forename>\n"                                            \
  "        <surname></surname>\n"                                                            \
  "      </user>\n"                                                                          \
  "    </users>\n"                                                                           \
  "    <sysconfig config:type=\"list\">\n"                                                   \
  "      <sysconfig_entry>\n"                                                                \
  "        <sysconfig_key>DISPLAYMANAGER</sysconfig_key>\n"                                  \
  "        <sysconfig_path>/etc/sysconfig/displaymanager</sysconfig_path>\n"                 \
  "        <sysconfig_value>%s</sysconfig_value>\n"                                          \
  "      </sysconfig_entry>\n"                                                               \
  "    </sysconfig>\n"                                                                       \
  "    <scripts>\n"

#define TVX_AUTOYAST_TAIL \
  "    </scripts>\n"      \
  "  </configure>\n"      \
  "</profile>\n"

// A: the tools CD is copied before the first boot, the graphical login is
// held back until the tools are installed from the copy.
const char kAutoYastTemplateA[] =
    TVX_AUTOYAST_HEAD
    "      <chroot-scripts config:type=\"list\">\n"
    "        <script>\n"
    "          <chrooted config:type=\"boolean\">true</chrooted>\n"
    "          <filename>tools-install-pre.sh</filename>\n"
    "          <source><![CDATA[#!/bin/sh\n"
    "mkdir -p /tmp/tarvex-toolsmnt0\n"
    "mount -t iso9660 /dev/%s /tmp/tarvex-toolsmnt0\n"
    TVX_TOOLS_COPY_FROM_MOUNT
    "for l in /etc/init.d/rc5.d/S*xdm; do\n"
    "  if [ -e \"$l\" ]; then mv \"$l\" /opt/tarvex-tools-installer/; fi\n"
    "done\n"
    "chkconfig --add syslog autoyast || true\n"
    "]]></source>\n"
    "        </script>\n"
    "      </chroot-scripts>\n"
    "      <init-scripts config:type=\"list\">\n"
    "        <script>\n"
    "          <filename>tools-install.sh</filename>\n"
    "          <source><![CDATA[#!/bin/sh\n"
    "echo \"Installing Tarvex Tools, please wait...\" > /dev/tty0\n"
    "eject sr0\n"
    "eject sr1\n"
    "cd /opt/tarvex-tools-installer && ./run_upgrader.sh\n"
    "for l in /opt/tarvex-tools-installer/S*xdm; do\n"
    "  if [ -e \"$l\" ]; then mv \"$l\" /etc/init.d/rc5.d/; fi\n"
    "done\n"
    "/etc/init.d/xdm start\n"
    "]]></source>\n"
    "        </script>\n"
    "      </init-scripts>\n"
    TVX_AUTOYAST_TAIL;

// B: the tools come as a package of the distribution; the first boot only
// tells the host that the install is over.
const char kAutoYastTemplateB[] =
    TVX_AUTOYAST_HEAD
    "      <init-scripts config:type=\"list\">\n"
    "        <script>\n"
    "          <filename>tools-install.sh</filename>\n"
    "          <source><![CDATA[#!/bin/sh\n"
    "eject sr0\n"
    "eject sr1\n"
    "tarvex-rpctool \"guest.upgrader_send_cmd_line_args --default\"\n"
    "tarvex-rpctool \"upgrader.setGuestFileRoot /tmp\"\n"
    "tarvex-rpctool \"toolinstall.installerActive 1\"\n"
    "tarvex-rpctool \"toolinstall.installerActive 100\"\n"
    "]]></source>\n"
    "        </script>\n"
    "      </init-scripts>\n"
    TVX_AUTOYAST_TAIL;

// ---- auto_inst ----
// A Perl data file. User texts land in the double-quoted strings; the login
// name, restricted to [a-z0-9-], in single-quoted ones.
const char kAutoInstTemplate[] =
    "#!/usr/bin/perl -cw\n"
    "#\n"
    "# Answers for an unattended Mandriva install.\n"
    "$o = {\n"
    "  'security_user' => '%s',\n"
    "  'users' => [\n"
    "    {\n"
    "      'realname' => \"%s\",\n"
    "      'name' => '%s',\n"
    "      'password' => \"%s\",\n"
    "      'shell' => '/bin/bash',\n"
    "      'icon' => 'default',\n"
    "    },\n"
    "  ],\n"
    "  'superuser' => {\n"
    "    'password' => \"%s\",\n"
    "    'uid' => '0',\n"
    "    'gid' => '0',\n"
    "    'realname' => 'root',\n"
    "    'shell' => '/bin/bash',\n"
    "    'home' => '/root',\n"
    "  },\n"
    "  'compssUsersChoice' => {\n"
    "    'KDE' => 1, 'CONFIG' => 1, 'TEXT_TOOLS' => 1, 'SHELLS' => 1,\n"
    "    'NETWORKING_WWW' => 1, 'NETWORKING_INSTANT_MESSAGING' => 1,\n"
    "    'NETWORKING_REMOTE_ACCESS' => 1, 'OFFICE' => 1,\n"
    "  },\n"
    "  'default_packages' => [ 'sudo', 'x11-driver-video-tarvex' ],\n"
    "  'locale' => { 'lang' => 'en_US', 'country' => 'US', 'utf8' => 1 },\n"
    "  'intf' => {\n"
    "    'eth0' => { 'DEVICE' => 'eth0', 'BOOTPROTO' => 'dhcp', 'ONBOOT' => 'yes' },\n"
    "  },\n"
    "  'authentication' => { 'shadow' => 1, 'md5' => 1 },\n"
    "  'keyboard' => { 'KEYBOARD' => 'us' },\n"
    "  'timezone' => { 'timezone' => 'America/New_York', 'UTC' => 1 },\n"
    "  'X' => {\n"
    "    'resolution_wanted' => '1024x768',\n"
    "    'monitors' => [ { 'HorizSync' => '31.5-48.5', 'VertRefresh' => '50-70' } ],\n"
    "  },\n"
    "  'partitioning' => { 'auto_allocate' => 1, 'clearall' => 1, 'eraseBadPartitions' => 0 },\n"
    "  'autoExitInstall' => 1,\n"
    "  'postInstall' => <<'TARVEX_POST_INSTALL',\n"
    "mkdir -p /tmp/tarvex-toolsmnt0\n"
    "mount -t iso9660 /dev/hda /tmp/tarvex-toolsmnt0\n"
    TVX_TOOLS_COPY_FROM_MOUNT
    "cp -p /etc/rc.d/rc.local /etc/rc.d/rc.local.tarvex\n"
    "sed -i -e 's/^id:5:initdefault:/id:3:initdefault:/' /etc/inittab\n"
    "cat >> /etc/rc.d/rc.local <<'TARVEX_EOF'\n"
    "cd /opt/tarvex-tools-installer && ./run_upgrader.sh\n"
    "cp -p /etc/rc.d/rc.local.tarvex /etc/rc.d/rc.local\n"
    "sed -i -e 's/^id:3:initdefault:/id:5:initdefault:/' /etc/inittab\n"
    "telinit 5\n"
    "TARVEX_EOF\n"
    "TARVEX_POST_INSTALL\n"
    "};\n";

bool FillTemplate(std::string_view tmpl, std::initializer_list<std::string_view> values,
                  std::string *out) {
  out->clear();
  auto next = values.begin();
  for (size_t i = 0; i < tmpl.size(); ++i) {
    char c = tmpl[i];
    if (c != '%') {
      out->push_back(c);
      continue;
    }
    if (i + 1 >= tmpl.size()) return false;
    char conv = tmpl[++i];
    if (conv == '%') {
      out->push_back('%');
    } else if (conv == 's' && next != values.end()) {
      out->append(*next++);
    } else {
      return false;
    }
  }
  return next == values.end();
}

}  // namespace tvx::autoinstall
