#!/usr/bin/env bash
# One small tree, tests/data/guess-medium, mastered three ways for the
# medium-access tests: Rock Ridge + Joliet, plain level-1 ISO 9660 (upper-case
# 8.3 names only), and a UDF bridge. A generated BIG.TXT spans many 2048-byte
# sectors. Output: OUTDIR/guess-medium/{rr,plain,udf}.iso
# Usage: scripts/media/guess-medium.sh OUTDIR
set -euo pipefail
out=${1:?usage: guess-medium.sh OUTDIR}
SRC=${SRC:-$(cd "$(dirname "$0")/../.." && pwd)}
. "$SRC/scripts/media/lib/mkimage.bash"
dest="$out/guess-medium"
mkdir -p "$dest"
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT

cp -r "$SRC/tests/data/guess-medium" "$tmp/tree"
seq 1 3000 > "$tmp/tree/BIG.TXT"  # 13,893 bytes: seven sectors
t=$tmp/tree
master "$dest/rr.iso" "$t" genisoimage -quiet -R -J -V GUESS_RR -o "$dest/rr.iso" "$t"
master "$dest/plain.iso" "$t" genisoimage -quiet -V GUESS_PLAIN -o "$dest/plain.iso" "$t"
master "$dest/udf.iso" "$t" genisoimage -quiet -R -J -udf -V GUESS_UDF -o "$dest/udf.iso" "$t"
