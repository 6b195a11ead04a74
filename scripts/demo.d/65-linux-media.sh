# The whole Linux road on a CentOS-like and an Ubuntu-like medium: recognise,
# check support and a typed answer, write the answer file, then make the
# medium the installer reads it from (autoinst.iso from the DVD's boot tree,
# or autoinst.flp). With qemu present the CentOS boot CD is booted too, with a
# real kernel and a stand-in installer that shows what it was given.
# shellcheck source=../e2e/lib.bash
source "$root/scripts/e2e/lib.bash"
lm=$work/linux-media
mkdir -p "$lm"
echo "== linux media: from install medium to the guest's boot CD or floppy"

# The sample CentOS image has the menu but not the installer's RAM disk: the
# demo's DVD is the sample plus a boot loader and a RAM disk (the boot test's
# real kernel and stand-in installer when qemu can boot them).
boot=0
if command -v qemu-system-x86_64 >/dev/null &&
   e2e_kernel "$(dirname "$build")/e2e-cache" 2>/dev/null &&
   e2e_initrd "$(dirname "$build")/e2e-cache"; then
  boot=1
  e2e_dvd_tree "$lm/centos-dvd" centos7
else
  xorriso -osirrox on -indev "$media/redhat/centos7.iso" -extract / "$lm/centos-dvd" 2>/dev/null
  chmod -R u+w "$lm/centos-dvd"
  printf 'stand-in RAM disk\n' >"$lm/centos-dvd/isolinux/initrd.img"
  cp /usr/lib/ISOLINUX/isolinux.bin /usr/lib/syslinux/modules/bios/ldlinux.c32 \
    "$lm/centos-dvd/isolinux/"
fi
e2e_master_dvd "$lm/centos-dvd" "$lm/centos7-like.iso" 2>/dev/null

for img in "$lm/centos7-like.iso" "$media/debian/ubu-2004.iso"; do
  name=$(basename "$img" .iso)
  echo "-- $name"
  "$tool" unattended support "$img" | sed -n 's/^\(guest\|unattended\): */  \1: /p'
  "$tool" unattended validate --kind short-name --text jdoe "$img" | sed 's/^/  validate jdoe: /' || true
  "$tool" unattended linux --user jdoe --full-name 'Jo Doe' --password 'pa$(touch pwned)ss' \
    --out "$lm/$name-answers" --media "$lm/$name-media" "$img" 2>/dev/null |
    sed -e "s|^$lm/|  |" -e "s|^$media/||" -e "s|^wrote $lm/|  wrote |" | grep -v '^debian/'
done
if [ -e "$lm/centos7-like-media/autoinst.iso" ]; then
  echo "-- autoinst.iso of centos7-like:"
  isoinfo -i "$lm/centos7-like-media/autoinst.iso" -f | sed 's/^/  /'
  isoinfo -i "$lm/centos7-like-media/autoinst.iso" -x '/ISOLINUX/ISOLINUX.CFG;1' |
    grep append | sed 's/^\s*/  /'
fi
if [ -e "$lm/ubu-2004-media/autoinst.flp" ]; then
  echo "-- autoinst.flp of ubu-2004:"
  MTOOLS_SKIP_CHECK=1 mdir -b -i "$lm/ubu-2004-media/autoinst.flp" :: | sed 's|^::/|  |'
fi
if [ "$boot" = 1 ]; then
  echo "-- booting centos7-like's autoinst.iso in qemu (TCG)"
  e2e_boot "$lm/boot.log" -cdrom "$lm/centos7-like-media/autoinst.iso" -boot d
  e2e_show "$lm/boot.log" 'ISOLINUX|kernel|cmdline|found|rootpw'
fi
