// The answer-file templates built into the library. Each is a printf-style
// text: "%s" takes the next value, "%%" writes one percent sign, and no
// other conversion occurs (FillTemplate enforces it).
#pragma once

#include <initializer_list>
#include <string>
#include <string_view>

// Shell lines of the post-install scripts that copy the tools CD mounted at
// /tmp/tarvex-toolsmnt0 to /opt/tarvex-tools-installer and give its files
// back the long names the CD cannot carry; they end in that directory.
#define TVX_TOOLS_COPY_FROM_MOUNT                             \
  "rm -rf /opt/tarvex-tools-installer\n"                      \
  "cp -a /tmp/tarvex-toolsmnt0 /opt/tarvex-tools-installer\n" \
  "umount /tmp/tarvex-toolsmnt0\n"                            \
  "cd /opt/tarvex-tools-installer || exit 1\n"                \
  "mv upgra32 tarvex-tools-upgrader-32\n"                     \
  "mv upgra64 tarvex-tools-upgrader-64\n"                     \
  "mv upgrade.sh run_upgrader.sh\n"                           \
  "chmod 755 tarvex-tools-upgrader-32 tarvex-tools-upgrader-64 run_upgrader.sh\n"

namespace tvx::autoinstall {

// Kickstart (Red Hat family), 19 values.
extern const char kKickstartTemplate1[];
extern const char kKickstartTemplate2[];
extern const char kKickstartTemplate3[];

// Preseed (Ubuntu), 6 values: tools from the tools CD or from the network
// archive, partitioning on /dev/sda or /dev/nvme0n1.
extern const char kPreseedToolsCdSda[];
extern const char kPreseedToolsCdNvme[];
extern const char kPreseedNetworkSda[];
extern const char kPreseedNetworkNvme[];

// AutoYaST (SUSE): A with the tools CD scripts, 10 values; B with the
// network tools script, 9 values.
extern const char kAutoYastTemplateA[];
extern const char kAutoYastTemplateB[];

// auto_inst (Mandriva), 5 values.
extern const char kAutoInstTemplate[];

// FillTemplate replaces each "%s" of `tmpl` by the next value and each "%%"
// by "%". FALSE when the numbers of placeholders and values differ or the
// template holds any other '%' sequence; `out` is then unspecified.
bool FillTemplate(std::string_view tmpl, std::initializer_list<std::string_view> values,
                  std::string *out);

}  // namespace tvx::autoinstall
