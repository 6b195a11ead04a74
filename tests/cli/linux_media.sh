#!/usr/bin/env bash
# tvxguest unattended scan and `unattended linux --media`: boot trees from
# install media mastered here (images and the same trees unpacked), read
# back with isoinfo, and the floppy checked with fsck.fat and mtools.
set -uo pipefail
. "$(dirname "$0")/lib/check.sh"
bin=/usr/lib/ISOLINUX/isolinux.bin ldlinux=/usr/lib/syslinux/modules/bios/ldlinux.c32
master() { xorriso -as mkisofs -quiet -R -J -o "$2" "$1" 2>/dev/null; }

# A CentOS 7 DVD: a first entry without append, askmethod in the install entry.
dvd=$tmp/centos
mkdir -p "$dvd/isolinux"
printf '1587474930.398424\nCentOS Linux 7\nx86_64\nALL\n' >"$dvd/.discinfo"
printf 'key\n' >"$dvd/RPM-GPG-KEY-CentOS-7"
printf 'KERNEL-centos' >"$dvd/isolinux/vmlinuz"
printf 'INITRD-centos' >"$dvd/isolinux/initrd.img"
cp "$bin" "$dvd/isolinux/isolinux.bin"
cp "$ldlinux" "$dvd/isolinux/ldlinux.c32"
printf 'default vesamenu.c32\nlabel check\n  kernel memtest\nlabel linux\n  kernel vmlinuz\n  append initrd=initrd.img inst.stage2=hd:LABEL=CentOS askmethod quiet\nlabel rescue\n  kernel vmlinuz\n  append initrd=initrd.img rescue\n' \
  >"$dvd/isolinux/isolinux.cfg"
master "$dvd" "$tmp/centos.iso"

"$tool" unattended scan --out "$tmp/scan-iso" "$tmp/centos.iso" >"$tmp/out" 2>&1
check "scan of the CentOS image: exit 0" test $? -eq 0
check "scan of the unpacked tree: exit 0" \
  status 0 "$tool" unattended scan --guest-os centos7-64 --out "$tmp/scan-tree" "$dvd"
for f in vmlinuz initrd.img isolinux.bin ldlinux.c32; do
  check "image scan: $f byte-identical" cmp -s "$dvd/isolinux/$f" "$tmp/scan-iso/isolinux/$f"
done
check "image and tree give one configuration" \
  cmp -s "$tmp/scan-iso/isolinux/isolinux.cfg" "$tmp/scan-tree/isolinux/isolinux.cfg"
check "append line: askmethod gone, kickstart argument added" \
  grep -qx $'\tappend initrd=initrd.img inst.stage2=hd:LABEL=CentOS quiet  ks=cdrom:/ks.cfg' \
  "$tmp/scan-iso/isolinux/isolinux.cfg"

# openSUSE keeps a loader directory per architecture; the first one listed
# wins and its relative names are taken from there.
suse=$tmp/suse
for arch in i386 x86_64; do
  mkdir -p "$suse/boot/$arch/loader"
  printf 'label linux\n  kernel linux\n  append initrd=initrd splash=silent\n' \
    >"$suse/boot/$arch/loader/isolinux.cfg"
  printf 'K-%s' "$arch" >"$suse/boot/$arch/loader/linux"
  printf 'I-%s' "$arch" >"$suse/boot/$arch/loader/initrd"
  cp "$bin" "$suse/boot/$arch/loader/isolinux.bin"
done
cp "$ldlinux" "$suse/boot/i386/loader/ldlinux.c32"
master "$suse" "$tmp/suse.iso"
check "openSUSE image: exit 0" \
  status 0 "$tool" unattended scan --guest-os opensuse-64 --out "$tmp/suse-iso" "$tmp/suse.iso"
check "openSUSE: kernel of the first loader directory" \
  cmp -s "$suse/boot/i386/loader/linux" "$tmp/suse-iso/isolinux/linux"
check "openSUSE: AutoYaST arguments" grep -q 'splash=silent  autoyast=floppy:///autoinst.xml' \
  "$tmp/suse-iso/isolinux/isolinux.cfg"

# Ubuntu 16.04 keeps its entries in txt.cfg, included from an isolinux.cfg
# that has none: the other .cfg files of that directory are tried in order.
u16=$tmp/ubuntu1604
mkdir -p "$u16/isolinux" "$u16/casper"
printf 'include menu.cfg\ndefault vesamenu.c32\nprompt 0\n' >"$u16/isolinux/isolinux.cfg"
printf 'menu title Ubuntu\n' >"$u16/isolinux/menu.cfg"
printf 'default live\nlabel live\n  kernel /casper/vmlinuz.efi\n  append  file=/cdrom/preseed/ubuntu.seed boot=casper initrd=/casper/initrd.lz quiet splash ---\n' \
  >"$u16/isolinux/txt.cfg"
printf 'K-1604' >"$u16/casper/vmlinuz.efi"
printf 'I-1604' >"$u16/casper/initrd.lz"
cp "$bin" "$ldlinux" "$u16/isolinux/"
master "$u16" "$tmp/ubuntu1604.iso"
"$tool" unattended scan --guest-os ubuntu-64 --out "$tmp/u16" "$tmp/ubuntu1604.iso" >/dev/null 2>&1
check "Ubuntu 16.04: entry from txt.cfg" \
  grep -qx $'\tappend initrd=initrd.lz file=/cdrom/preseed/ubuntu.seed boot=casper quiet splash ---  debian-installer/custom-installation=/custom find_preseed=/preseed.cfg auto preseed/file=/floppy/preseed.cfg automatic-ubiquity noprompt priority=critical locale=en_US console-setup/modelcode=evdev' \
  "$tmp/u16/isolinux/isolinux.cfg"
check "Ubuntu 16.04: casper kernel" cmp -s "$u16/casper/vmlinuz.efi" "$tmp/u16/isolinux/vmlinuz.efi"

# Ubuntu 20.10 has no isolinux: the casper defaults and the caller's loader,
# whose ldlinux.c32 comes from the host's syslinux.
ubu=$tmp/ubuntu
mkdir -p "$ubu/casper"
printf 'K-casper' >"$ubu/casper/vmlinuz"
printf 'I-casper' >"$ubu/casper/initrd"
master "$ubu" "$tmp/ubuntu.iso"
check "Ubuntu 20.10 without --isolinux-bin: exit 1" status 1 "$tool" unattended scan \
  --guest-os ubuntu-64 --version GUESS_VERSION_UBUNTU_2010_OR_HIGHER --out "$tmp/ubu" "$tmp/ubuntu.iso"
check "Ubuntu 20.10 with --isolinux-bin: exit 0" status 0 "$tool" unattended scan \
  --guest-os ubuntu-64 --version 10 --isolinux-bin "$bin" --out "$tmp/ubu" "$tmp/ubuntu.iso"
check "casper kernel under its base name" cmp -s "$ubu/casper/vmlinuz" "$tmp/ubu/isolinux/vmlinuz"
check "ldlinux.c32 from the host" \
  cmp -s "$ldlinux" "$tmp/ubu/isolinux/ldlinux.c32"
check "casper arguments" grep -q 'file=/cdrom/preseed/ubuntu.seed quiet splash ---  debian-installer' \
  "$tmp/ubu/isolinux/isolinux.cfg"

check "scan without --out: usage error 64" status 64 "$tool" unattended scan "$tmp/centos.iso"
check "tree without --guest-os: usage error 64" status 64 "$tool" unattended scan --out "$tmp/x" "$dvd"

# The whole road, when the answer-file command is built in.
answers=(--user jdoe --full-name 'J Doe' --password 'pw$(touch x)' --root-password 'r`id`')
media="$tmp/m \$(touch pwned) \`touch pwned\` \"q\""
(cd "$tmp" && "$tool" unattended linux "${answers[@]}" --out "$tmp/ans" --media "$media" \
  "$tmp/centos.iso" >/dev/null 2>&1)
check "CentOS road: exit 0" test $? -eq 0
check "no command ran from a path" test -z "$(find "$tmp" -name 'pwned*' -o -name x)"
check "ks.cfg at the root of autoinst.iso" \
  sh -c 'isoinfo -i "$1" -x "/KS.CFG;1" | grep -qF "rootpw --iscrypted \$5\$"' - "$media/autoinst.iso"
check "the media directory holds autoinst.iso alone" test "$(ls -A "$media")" = autoinst.iso
check "a failing mastering tool: exit 1" status 1 "$tool" unattended linux "${answers[@]}" \
  --out "$tmp/ans2" --media "$tmp/failed" --mkisofs /bin/false "$tmp/centos.iso"
check "... and nothing left in the media directory" test -z "$(ls -A "$tmp/failed" 2>/dev/null)"
check "... nor in the answer directory" test -z "$(ls -A "$tmp/ans2" 2>/dev/null)"
check "... nor any staging directory" test -z "$(find "$tmp" -maxdepth 1 -name '.*staging*')"
ubuiso=$tmp/ubu2004.iso
mkdir -p "$tmp/u2004/.disk"
printf 'Ubuntu 20.04.1 LTS "Focal Fossa" - Release amd64 (20200731)' >"$tmp/u2004/.disk/info"
master "$tmp/u2004" "$ubuiso"
"$tool" unattended linux "${answers[@]}" --out "$tmp/ubans" --media "$tmp/ubmedia" "$ubuiso" \
  >/dev/null 2>&1
check "Ubuntu road: exit 0" test $? -eq 0
check "autoinst.flp is clean for fsck.fat" fsck.fat -n "$tmp/ubmedia/autoinst.flp" >/dev/null 2>&1
MTOOLS_SKIP_CHECK=1 mcopy -n -i "$tmp/ubmedia/autoinst.flp" ::preseed.cfg "$tmp/preseed.back" 2>/dev/null
check "preseed.cfg on the floppy is the answer file" cmp -s "$tmp/ubans/custom/preseed.cfg" "$tmp/preseed.back"
exit $((fails > 0))
