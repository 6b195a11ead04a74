#!/usr/bin/env bash
# UDF test media, mastered from tests/data/udf/tree into OUTDIR/udf:
#   bridge.iso        genisoimage -udf: UDF 1.02 beside ISO 9660 + Joliet
#   udf-only.iso      UDF 2.60 whose ISO 9660 tree is empty (files only in the
#                     UDF tree, as on Windows install media), by pycdlib
#   empty-<rev>.img   empty volumes from mkudffs, one per UDF revision
#                     (2.50 and 2.60 only exist for write-once media: they
#                     carry a virtual allocation table)
#   empty-sparable.img  a rewritable-media volume with a sparable partition
#   empty-vat150.img  a write-once volume with a UDF 1.50 allocation table
# The tree gets one generated file at mastering time: sources/big.bin, 300 KiB
# of a fixed pattern, so reads cross many blocks without a binary in git.
# Images with a metadata partition holding files come from the test-side
# builder (tests/support/udf_builder), since no packaged tool writes one
# without mounting it.
# Usage: scripts/media/udf.sh OUTDIR
set -euo pipefail
out=${1:?usage: udf.sh OUTDIR}/udf
SRC=${SRC:-$(cd "$(dirname "$0")/../.." && pwd)}
. "$SRC/scripts/media/lib/mkimage.bash"
mkdir -p "$out"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

tree="$work/tree"
cp -r "$SRC/tests/data/udf/tree" "$tree"
/usr/bin/python3 -c '
import sys
block = bytes((i * 7 + i // 251) & 0xFF for i in range(4096))
with open(sys.argv[1], "wb") as f:
    for _ in range(75):
        f.write(block)
' "$tree/sources/big.bin"

master "$out/bridge.iso" "$tree" \
  genisoimage -quiet -udf -J -R -input-charset utf-8 -V UDFBRIDGE -o "$out/bridge.iso" "$tree"

master "$out/udf-only.iso" "$tree" /usr/bin/python3 - "$tree" "$out/udf-only.iso" <<'EOF'
import os, sys
import pycdlib
src, dst = sys.argv[1], sys.argv[2]
iso = pycdlib.PyCdlib()
iso.new(interchange_level=3, vol_ident="UDFONLY", udf="2.60")
files = []
for root, dirs, names in os.walk(src):
    dirs.sort()
    rel = os.path.relpath(root, src)
    for d in dirs:
        p = "/" + os.path.normpath(os.path.join(rel, d))
        iso.add_directory(udf_path=p)
    for n in sorted(names):
        p = "/" + os.path.normpath(os.path.join(rel, n))
        files.append((os.path.join(root, n), p))
handles = []
for host, udf in files:
    f = open(host, "rb")
    handles.append(f)
    iso.add_fp(f, os.path.getsize(host), udf_path=udf)
iso.write(dst)
iso.close()
for f in handles:
    f.close()
EOF

for rev in 1.02 1.50 2.00 2.01 2.50 2.60; do
  img="$out/empty-${rev/./}.img"
  case $rev in
    2.50|2.60) media=bdr ;;
    *) media=hd ;;
  esac
  master "$img" "" mkudffs --new-file --media-type=$media --udfrev=$rev --label="EMPTY${rev/./}" \
    "$img" 4096
done
master "$out/empty-sparable.img" "" mkudffs --new-file --media-type=cdrw --udfrev=2.01 \
  --label=EMPTYSPAR "$out/empty-sparable.img" 3000
master "$out/empty-vat150.img" "" mkudffs --new-file --media-type=cdr --udfrev=1.50 \
  --label=EMPTYVAT15 "$out/empty-vat150.img" 1000
