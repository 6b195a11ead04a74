#!/usr/bin/env bash
# ISO 9660 test images from tests/data/iso9660/tree, written to OUTDIR/iso9660:
#   rr-joliet.iso     Rock Ridge + Joliet (xorriso)
#   rr-relocated.iso  Rock Ridge + Joliet with the deep directory relocated (genisoimage)
#   joliet-only.iso   Joliet, no Rock Ridge (genisoimage)
#   plain-l1.iso      level 1 names only (genisoimage)
#   udf-bridge.iso    UDF + ISO 9660 bridge (genisoimage -udf)
# The multi-sector file big.bin is generated here rather than kept in git.
# Usage: scripts/media/iso9660.sh OUTDIR   (SRC = repository root)
set -euo pipefail
out=${1:?usage: iso9660.sh OUTDIR}/iso9660
src=${SRC:-$(cd "$(dirname "$0")/../.." && pwd)}
SRC=$src
. "$SRC/scripts/media/lib/mkimage.bash"
mkdir -p "$out"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

tree="$work/tree"
cp -a "$src/tests/data/iso9660/tree" "$tree"
# 88,893 bytes of distinct lines: spans 44 sectors and ends mid-sector, so an
# offset or length slip shows in the bytes.
seq 1 9000 | sed 's/^/line /' > "$tree/docs/big.bin"
# Fixed times keep the images reproducible between runs.
find "$tree" -exec touch -h -d '2024-01-02 03:04:05 UTC' {} +

run() {  # run IMAGE TOOL ARGS...
  master "$out/$1" "$tree" "${@:2}" -o "$out/$1" "$tree"
}

run rr-joliet.iso xorriso -as mkisofs -R -J -V TVX_RR_JOLIET
run rr-relocated.iso genisoimage -R -J -V TVX_RR_RELOC
run joliet-only.iso genisoimage -J -V TVX_JOLIET
run plain-l1.iso genisoimage -iso-level 1 -V TVX_PLAIN_L1
run udf-bridge.iso genisoimage -udf -R -J -V TVX_UDF_BRIDGE
