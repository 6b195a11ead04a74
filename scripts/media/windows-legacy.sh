#!/usr/bin/env bash
# Windows NT-family (NT 4.0 to Server 2003) and Windows 95/98/Me install
# media, mastered from tests/data/windows-legacy/NAME into
# OUTDIR/windows-legacy/NAME.iso. Text files get CR LF line ends, as on the
# real discs. Each image is mastered the way its era's discs were: plain
# level-1 ISO 9660 names, Joliet, Rock Ridge, or a UDF bridge.
# Usage: scripts/media/windows-legacy.sh OUTDIR
set -euo pipefail
out=${1:?usage: windows-legacy.sh OUTDIR}
SRC=${SRC:-$(cd "$(dirname "$0")/../.." && pwd)}
. "$SRC/scripts/media/lib/mkimage.bash"
data="$SRC/tests/data/windows-legacy"
dest="$out/windows-legacy"
mkdir -p "$dest"
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT

# name            format   volume id
images=(
  "win2000pro      plain    W2KPRO_EN"
  "win2000srv      plain    W2KSRV_FR"
  "win2000adv      joliet   W2KADV_EN"
  "winxppro        rr       WXPPRO_DE"
  "winxphome       plain    WXPHOME_EN"
  "winxpmce        joliet   WXPMCE_EN"
  "winxppro-x64    rr       WXPPRO_X64"
  "win2003std      joliet   WIN2003STD"
  "win2003ent      plain    WIN2003ENT"
  "win2003web      joliet   WIN2003WEB"
  "win2003sbs      joliet   WIN2003SBS"
  "win2003std-x64  rr       W2003STDX64"
  "win2003ent-x64  udf      W2003ENTX64"
  "nt4wks          plain    NTWKS40"
  "nt4srv          plain    NTSRV40"
  "win95           plain    WIN95"
  "win98           rr       WIN98"
  "winme           plain    WINME"
  "lowercase-product joliet NOTWIN"
  "no-product-id   joliet   NOTWIN"
)

for row in "${images[@]}"; do
  read -r name format volid <<<"$row"
  tree="$tmp/$name"
  cp -r "$data/$name" "$tree"
  find "$tree" -type f \( -name '*.SIF' -o -name '*.INI' -o -iname '*.txt' \) \
    -exec sed -i 's/\r*$/\r/' {} +
  case $format in
    plain) opts=() ;;
    joliet) opts=(-J) ;;
    rr) opts=(-R -J) ;;
    udf) opts=(-R -J -udf) ;;
    *) echo "windows-legacy.sh: unknown format $format" >&2; exit 1 ;;
  esac
  master "$dest/$name.iso" "$tree" \
    genisoimage -quiet "${opts[@]}" -V "$volid" -o "$dest/$name.iso" "$tree"
done
