# Sourced by scripts/e2e/run and the demo: the pieces of the boot test.
# A real distribution kernel (Debian's, downloaded as a package and unpacked,
# never installed) and a busybox RAM disk that stands in for an installer;
# both are cached beside the build directories (BUILD_DIR/e2e-cache), so
# only the first run downloads.
#
#   e2e_kernel CACHE     sets E2E_KERNEL (vmlinuz) and E2E_MODULES (module tree)
#   e2e_initrd CACHE     sets E2E_INITRD (gzip'd cpio with /init and modules)
#   e2e_dvd_tree DIR KIND  writes a small install DVD tree of KIND (centos7,
#                        ubuntu) that boots E2E_KERNEL and E2E_INITRD
#   e2e_boot LOG ARGS... boots qemu with ARGS, the console to LOG; bounded
#   e2e_expect LOG TEXT  fails, showing the log, unless LOG holds TEXT
#   e2e_show LOG REGEX   prints the installer's matching lines
e2e_here=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)

# The modules a CD-ROM and a floppy need, in load order.
e2e_module_names=(scsi_common scsi_mod libata ata_piix cdrom sr_mod isofs floppy
                  fat vfat nls_cp437 nls_utf8 nls_ascii)

e2e_kernel() {
  local cache=$1 pkg deb
  mkdir -p "$cache"
  if [ ! -d "$cache/kernel/boot" ]; then
    # linux-image-amd64 only depends on the versioned image package.
    pkg=$(apt-cache depends linux-image-amd64 | awk '/Depends: linux-image-[0-9]/ {print $2; exit}')
    [ -n "$pkg" ] || { echo "e2e: no kernel image package known to apt" >&2; return 1; }
    (cd "$cache" && apt-get download -q "$pkg" >/dev/null 2>&1) ||
      { echo "e2e: apt-get download $pkg failed" >&2; return 1; }
    deb=$(ls "$cache"/"$pkg"_*.deb | head -n 1)
    rm -rf "$cache/kernel.tmp"
    dpkg-deb -x "$deb" "$cache/kernel.tmp"
    mv "$cache/kernel.tmp" "$cache/kernel"
    rm -f "$deb"
  fi
  E2E_KERNEL=$(ls "$cache"/kernel/boot/vmlinuz-* | head -n 1)
  E2E_MODULES=$(ls -d "$cache"/kernel/lib/modules/* | head -n 1)
}

e2e_initrd() {
  local cache=$1 root m f
  E2E_INITRD=$cache/initrd.gz
  if [ -s "$E2E_INITRD" ] && [ "$E2E_INITRD" -nt "$e2e_here/init" ]; then return 0; fi
  root=$cache/initrd.tmp
  rm -rf "$root"
  mkdir -p "$root/bin" "$root/modules"
  cp /bin/busybox "$root/bin/busybox"
  cp "$e2e_here/init" "$root/init"
  chmod 755 "$root/init"
  : >"$root/modules/order"
  for m in "${e2e_module_names[@]}"; do
    f=$(find "$E2E_MODULES/kernel" -name "$m.ko" -o -name "$m.ko.xz" -o -name "$m.ko.zst" |
        head -n 1)
    # A module the kernel has built in is simply not there.
    [ -n "$f" ] || continue
    case $f in
      *.xz) xz -dc "$f" >"$root/modules/$m.ko" ;;    # busybox insmod takes plain objects
      *.zst) zstd -qdc "$f" >"$root/modules/$m.ko" ;;
      *) cp "$f" "$root/modules/$m.ko" ;;
    esac
    echo "$m" >>"$root/modules/order"
  done
  (cd "$root" && find . | busybox cpio -o -H newc 2>/dev/null) | gzip -1 >"$E2E_INITRD.tmp"
  mv "$E2E_INITRD.tmp" "$E2E_INITRD"
  rm -rf "$root"
}

# The DVD's boot menu: a first entry without an append line, then the install
# entry with askmethod among its arguments, as older Red Hat media had.
e2e_dvd_tree() {
  local dir=$1 kind=$2
  mkdir -p "$dir/isolinux"
  cp "$E2E_KERNEL" "$dir/isolinux/vmlinuz"
  cp "$E2E_INITRD" "$dir/isolinux/initrd.img"
  cp /usr/lib/ISOLINUX/isolinux.bin "$dir/isolinux/isolinux.bin"
  cp /usr/lib/syslinux/modules/bios/ldlinux.c32 "$dir/isolinux/ldlinux.c32"
  cat >"$dir/isolinux/isolinux.cfg" <<'CFG'
default vesamenu.c32
timeout 600
menu title Install media
label memtest
  menu label Run a ^memory test
  kernel memtest
label linux
  menu label ^Install
  kernel vmlinuz
  append initrd=initrd.img console=ttyS0 askmethod panic=-1 quiet
label rescue
  kernel vmlinuz
  append initrd=initrd.img console=ttyS0 rescue
CFG
  case $kind in
    centos7)
      printf '1587474930.398424\nCentOS Linux 7\nx86_64\nALL\n' >"$dir/.discinfo"
      printf -- '-----BEGIN PGP PUBLIC KEY BLOCK-----\nstand-in\n' >"$dir/RPM-GPG-KEY-CentOS-7"
      # A full DVD (not the minimal one) carries perl among its packages.
      mkdir -p "$dir/Packages"
      printf 'rpm stand-in' >"$dir/Packages/perl-5.16.3-294.el7_6.x86_64.rpm" ;;
    ubuntu)
      mkdir -p "$dir/.disk"
      printf 'Ubuntu 20.04.1 LTS "Focal Fossa" - Release amd64 (20200731)' >"$dir/.disk/info" ;;
    *) echo "e2e_dvd_tree: unknown kind $kind" >&2; return 1 ;;
  esac
}

# e2e_master_dvd TREE ISO: the DVD itself is mastered as distributions do.
e2e_master_dvd() {
  genisoimage -quiet -R -J -V E2E_DVD -b isolinux/isolinux.bin -c isolinux/boot.cat \
    -no-emul-boot -boot-load-size 4 -boot-info-table -o "$2" "$1"
}

e2e_boot() {
  local log=$1
  shift
  # TCG only: CI machines rarely offer KVM. -no-reboot turns a panic or a
  # reboot into an exit, the timeout bounds everything else.
  timeout 90 qemu-system-x86_64 -machine pc,accel=tcg -m 256 -nographic -no-reboot \
    -monitor none "$@" </dev/null >"$log" 2>&1 || true
}

# e2e_show LOG REGEX: the stand-in installer's lines (and the boot loader's
# banner) that match, without the console's escape sequences.
e2e_show() {
  tr -d '\r' <"$1" | grep -oE '(e2e: |ISOLINUX ).*' | grep -E "$2" | sed 's/^/  /'
}

e2e_expect() {
  local log=$1 text=$2
  if ! grep -qF -- "$text" "$log"; then
    echo "e2e: FAIL: console output lacks: $text" >&2
    sed 's/^/  | /' "$log" | tail -n 40 >&2
    return 1
  fi
}
