#!/usr/bin/env bash
# Hypervisor media: Orka ("packages.xml") and Orkai (the title of the root
# isolinux.cfg boot menu, plus the EFI loaders of 7.0).
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/orka

image "$out" orka41 packages.xml@orka/packages-4.1.xml

# name | packages.xml | more entries
table "$out" packages.xml <<'EOT'
orka35          | <iso_build><product><name>Tarvex Orka Server</name><orka_version>3.5.0</orka_version></product></iso_build>
orka-caseless   | <iso_build><product><name>TARVEX ORKA</name><orka_version>4.0</orka_version></product></iso_build>
orka-vfirst     | <iso_build><other/><product><orka_version>4.1</orka_version><name>Tarvex Orka Server</name></product></iso_build>
orka-stop-early | <iso_build><product><name>Other</name><orka_version>4.1</orka_version><name>Tarvex Orka</name></product></iso_build>
orka-replaced   | <iso_build><product><name>Tarvex Orka</name><name>Other</name><orka_version>4.1</orka_version></product></iso_build>
orka-2nd-prod   | <iso_build><product><name>Other</name></product><product><name>Tarvex Orka</name><orka_version>4.1</orka_version></product></iso_build>
orka-emptyname  | <iso_build><product><name/><orka_version>4.1</orka_version></product></iso_build>
orka-cdata      | <iso_build><product><name><![CDATA[Tarvex Orka]]></name><orka_version>4.1</orka_version></product></iso_build>
orka-noproduct  | <iso_build><name>Tarvex Orka</name><orka_version>4.1</orka_version></iso_build>
orka-wrongroot  | <build><product><name>Tarvex Orka</name><orka_version>4.1</orka_version></product></build>
orka-entity     | <!DOCTYPE iso_build [<!ENTITY n "Tarvex Orka">]><iso_build><product><name>&n;</name><orka_version>4.1</orka_version></product></iso_build>
orka-external   | <!DOCTYPE iso_build [<!ENTITY n SYSTEM "file:///etc/hostname">]><iso_build><product><name>&n;</name><orka_version>4.1</orka_version></product></iso_build>
orka-laughs     | <!DOCTYPE l [<!ENTITY a "aaaaaaaaaa"><!ENTITY b "&a;&a;&a;&a;&a;&a;&a;&a;&a;&a;"><!ENTITY c "&b;&b;&b;&b;&b;&b;&b;&b;&b;&b;"><!ENTITY d "&c;&c;&c;&c;&c;&c;&c;&c;&c;&c;"><!ENTITY e "&d;&d;&d;&d;&d;&d;&d;&d;&d;&d;"><!ENTITY f "&e;&e;&e;&e;&e;&e;&e;&e;&e;&e;"><!ENTITY g "&f;&f;&f;&f;&f;&f;&f;&f;&f;&f;">]><iso_build><product><name>&g;</name><orka_version>4.1</orka_version></product></iso_build>
orka-truncated  | <iso_build><product><name>Tarvex Orka</name><orka_version>4.1</orka_ver
orka-binary     | \x00\x01<iso_build>\xff\xfe
orka-empty      |
EOT

image "$out" orkai65 "isolinux.cfg@orka/isolinux-orkai65.cfg"

# name | isolinux.cfg | more entries
table "$out" isolinux.cfg <<'EOT'
hyperlet        | DEFAULT menu.c32\nmenu title Tarvex Hyperlet 3.5\n
orkai5          | DEFAULT menu.c32\nMENU TITLE Orkai-5.5 Installer\n
orkai60         | MENU TITLE Orkai-6.0.0 Boot Menu\nMENU TITLE Orkai-6 (fallback)\n
skyvault60      | MENU TITLE Skyvault-6.0.0 Boot Menu\n
skyvault67      | MENU TITLE Skyvault-6.7.0 Boot Menu\n
orkai-lower     | menu title Orkai-6.5.0 Boot Menu\n
orkai70         | MENU TITLE Orkai-7.0.3 Boot Menu\n
orkai70-x64     | MENU TITLE Orkai-7.0.3 Boot Menu\n  | EFI/BOOT/BOOTX64.EFI=x
orkai70-both    | MENU TITLE Skyvault-7.0.0 Boot Menu\n | EFI/BOOT/BOOTX64.EFI=x EFI/BOOT/BOOTAA64.EFI=x
orkai70-arm     | MENU TITLE Orkai-7.0.3 Boot Menu\n  | EFI/BOOT/BOOTAA64.EFI=x
orkai80         | MENU TITLE Orkai-8.0.0 Boot Menu\n
orkai-crlf      | DEFAULT menu.c32\r\nMENU TITLE Orkai-6.5.0 Boot Menu\r\n
EOT
