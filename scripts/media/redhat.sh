#!/usr/bin/env bash
# Masters the Red Hat family install media used by the tests and the demo
# into OUTDIR/redhat/NAME.iso: Rock Ridge + Joliet images like the real ones.
#
# Every image starts from tests/data/redhat/base (isolinux boot tree with its
# configuration, kernel and RAM disk stand-ins); the table below adds what
# tells the releases apart.
#
# Row: NAME|RELEASE NAME|ARCH|OPTIONS. A RELEASE NAME other than "-" writes
# .discinfo (time stamp, release name, architecture, disc numbers). Options,
# separated by blanks:
#   key=3..7          the CentOS signing key of that generation in the root
#   perl=FILE         Packages/FILE
#   tree=VARIANT      a .treeinfo variant section (repeatable); tree=@empty
#   noisocfg          no isolinux/isolinux.cfg
#   isocfg=NAME       isolinux/isolinux.cfg from tests/data/redhat/isolinux
#   live              LiveOS/squashfs.img
#   readme=asianux7   Documents/README of an Asianux 7 live image
#   efi=x64|aa64      the EFI boot loader of that architecture
#   notes=NAME        RELEASE-NOTES from tests/data/redhat/notes
#   disc=@empty|@binary|@oneline|@crlf|@twolines|@huge   a broken .discinfo
# Usage: scripts/media/redhat.sh OUTDIR   (SRC = repository root)
set -euo pipefail
out=${1:?usage: redhat.sh OUTDIR}/redhat
SRC=${SRC:-$(cd "$(dirname "$0")/../.." && pwd)}
. "$SRC/scripts/media/lib/mkimage.bash"
data=$SRC/tests/data/redhat
mkdir -p "$out"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

cases=$(cat <<'EOF'
rhel3-x86|Red Hat Enterprise Linux 3|i386|
rhel3-x64|Red Hat Enterprise Linux 3|x86_64|
rhel4-x64|Red Hat Enterprise Linux 4|x86_64|
rhel4-x86|Red Hat Enterprise Linux 4|i386|
rhel5-server-x64|Red Hat Enterprise Linux Server 5.4|x86_64|
rhel5-client-x86|Red Hat Enterprise Linux Client 5.4|i386|
rhel6-x64|Red Hat Enterprise Linux 6.5|x86_64|
rhel6-x86|Red Hat Enterprise Linux 6.5|i386|
rhel7-server-name|RHEL-7.2 Server.x86_64|x86_64|
rhel7-workstation-name|RHEL-7.2 Workstation.x86_64|x86_64|
rhel7-client-name|RHEL-7.2 Client.x86_64|x86_64|
rhel7-server-workstation|Red Hat Enterprise Linux 7.6|x86_64|tree=Server tree=Workstation
rhel7-client|Red Hat Enterprise Linux 7.6|x86_64|tree=Client
rhel7-server|Red Hat Enterprise Linux 7.6|i386|tree=Server
rhel7-no-treeinfo|Red Hat Enterprise Linux 7.6|x86_64|
rhel7-treeinfo-empty|Red Hat Enterprise Linux 7.6|x86_64|tree=@empty
rhel7-boot-x64|-||isocfg=rhel7-x86_64 key=7
rhel7-boot-x86|-||isocfg=rhel7-i386
rhel7-boot-noarch|-||isocfg=rhel7-noarch
rhel8-x64|Red Hat Enterprise Linux 8.2|x86_64|
rhel8-x86|Red Hat Enterprise Linux 8.2|i386|
centos3-x86|final|i386|key=3
centos4-x64|final|x86_64|key=4
centos5-rhel-name|Red Hat Enterprise Linux 4|x86_64|key=5
centos6-x86|CentOS 6.10|i386|key=6
centos6-x64|CentOS 6.10|x86_64|key=6
centos7|CentOS Linux 7|x86_64|key=7 perl=perl-5.16.3-294.el7_6.x86_64.rpm
centos7-last-perl|CentOS Linux 7|x86_64|key=7 perl=perl-5.16.3-297.el7.x86_64.rpm
centos7-minimal|CentOS Linux 7|x86_64|key=7
centos7-x86|CentOS Linux 7|i386|key=7 perl=perl-5.16.3-294.el7_6.x86_64.rpm
centos8|CentOS Linux 8|x86_64|
centos8-stream|CentOS Stream 8|x86_64|
centos8-x86|CentOS Linux 8|i386|
centos8-aarch64|CentOS Linux 8|aarch64|
centos-no-key|CentOS 4.8|x86_64|
asianux3|Asianux 3.0|x86_64|
asianux3-sp|Asianux Server 3 SP2|i386|
asianux4|Asianux Server 4|x86_64|
asianux7|Asianux Server 7|x86_64|
asianux7-live-named|Asianux Server 7|i386|live
oracle4|Enterprise Linux Enterprise Linux 4|i386|
oracle5|Oracle Linux Server 5.8|x86_64|
oracle6|Oracle Linux 6.5|i386|
oracle7|OL-7.9 Server.x86_64|x86_64|
oracle7-x86|OL-7.9 Server.i386|i386|
oracle8|Oracle Linux 8.4|x86_64|
fedora-core6|Fedora Core 6|i386|
fedora7|Fedora 7|x86_64|
fedora8|Fedora 8|i386|
fedora12|Fedora 12|x86_64|
fedora13|Fedora 13|x86_64|
fedora16|Fedora 16|x86_64|
fedora17|Fedora 17|x86_64|
fedora18|Fedora 18|x86_64|
fedora20|Fedora 20|x86_64|
fedora21|Fedora 21|x86_64|
fedora-server24|Fedora-Server 24|x86_64|
fedora28|Fedora 28|x86_64|
fedora29|Fedora 29|x86_64|
fedora35-aarch64|Fedora 35|aarch64|noisocfg efi=aa64
fedora-bare|Fedora|x86_64|
fedora-live-x64|-||live efi=x64
fedora-live-aa64|-||live efi=aa64 noisocfg
fedora-live|-||live
asianux7-live|-||live readme=asianux7 efi=x64
rhel21|-||notes=rhel21 noisocfg
rhel3-notes|-||notes=rhel3as
redhat9|-||notes=redhat9 key=3
notes-blank|-||notes=blank
ppc64|Red Hat Enterprise Linux 6.5|ppc64|notes=redhat9
unknown-release|Scientific Linux 6.5|x86_64|
discinfo-empty|-||disc=@empty key=6
discinfo-binary|-||disc=@binary
discinfo-one-line|-||disc=@oneline
discinfo-crlf|-||disc=@crlf
discinfo-two-lines|-||disc=@twolines
discinfo-huge|-||disc=@huge
EOF
)

centos_key() {
  case $1 in
    3) echo RPM-GPG-KEY-CentOS-3 ;;
    4) echo RPM-GPG-KEY-centos4 ;;
    *) echo "RPM-GPG-KEY-CentOS-$1" ;;
  esac
}

write_discinfo() {  # FILE MODE
  case $2 in
    @empty) : >"$1" ;;
    @binary) { head -c 600 /dev/zero | tr '\0' '\201'; printf '\0\nCentOS Linux 8\nx86_64\n'; } >"$1" ;;
    @oneline) printf '1587474930.398424 CentOS Linux 8 x86_64 ALL' >"$1" ;;
    @crlf) printf '1587474930.398424\r\nCentOS Linux 8\r\nx86_64\r\nALL\r\n' >"$1" ;;
    @twolines) printf '1587474930.398424\nCentOS Linux 8\n' >"$1" ;;
    @huge)
      # The three lines that count, then some 2 MiB of further lines.
      { printf '1587474930.398424\nCentOS Stream 8\nx86_64\n'
        head -c 2097152 /dev/zero | tr '\0' 'x' | fold -w 100; } >"$1" ;;
  esac
}

write_treeinfo() {  # FILE VARIANT...
  local v
  {
    printf '[general]\nfamily = Red Hat Enterprise Linux\nversion = 7.6\narch = x86_64\n\n'
    for v in "$@"; do printf '[variant-%s]\nid = %s\nvariants = %s\n\n' "$v" "$v" "$v"; done
  } >"$1"
}

while IFS='|' read -r name release arch opts; do
  [ -n "$name" ] || continue
  tree=$work/$name
  cp -r "$data/base" "$tree"
  variants=()
  if [ "$release" != - ]; then
    printf '1587474930.398424\n%s\n%s\nALL\n' "$release" "$arch" >"$tree/.discinfo"
  fi
  for opt in $opts; do
    case $opt in
      key=*) printf -- '-----BEGIN PGP PUBLIC KEY BLOCK-----\nstand-in\n' >"$tree/$(centos_key "${opt#key=}")" ;;
      perl=*) mkdir -p "$tree/Packages" && printf 'rpm stand-in' >"$tree/Packages/${opt#perl=}" ;;
      tree=@empty) : >"$tree/.treeinfo" ;;
      tree=*) variants+=("${opt#tree=}") ;;
      noisocfg) rm -f "$tree/isolinux/isolinux.cfg" ;;
      isocfg=*) cp "$data/isolinux/${opt#isocfg=}.cfg" "$tree/isolinux/isolinux.cfg" ;;
      live) mkdir -p "$tree/LiveOS" && printf 'hsqs stand-in' >"$tree/LiveOS/squashfs.img" ;;
      readme=asianux7) mkdir -p "$tree/Documents" && printf 'Asianux Server 7 == MIRACLE LINUX V7 SP2\n' >"$tree/Documents/README" ;;
      efi=x64) mkdir -p "$tree/EFI/BOOT" && printf 'MZ stand-in' >"$tree/EFI/BOOT/grubx64.efi" ;;
      efi=aa64) mkdir -p "$tree/EFI/BOOT" && printf 'MZ stand-in' >"$tree/EFI/BOOT/BOOTAA64.EFI" ;;
      notes=*) cp "$data/notes/${opt#notes=}" "$tree/RELEASE-NOTES" ;;
      disc=*) write_discinfo "$tree/.discinfo" "${opt#disc=}" ;;
      *) echo "redhat.sh: $name: unknown option $opt" >&2; exit 1 ;;
    esac
  done
  [ ${#variants[@]} -eq 0 ] || write_treeinfo "$tree/.treeinfo" "${variants[@]}"
  # Packages beside the perl builds, as on full media.
  [ -d "$tree/Packages" ] && printf 'rpm stand-in' >"$tree/Packages/bash-4.2.46-34.el7.x86_64.rpm"
  master "$out/$name.iso" "$tree" genisoimage -quiet -R -J -joliet-long \
    -V "$(echo "$name" | tr a-z- A-Z_ | cut -c1-32)" -o "$out/$name.iso" "$tree"
  rm -rf "$tree"
done <<<"$cases"
