#!/usr/bin/env bash
# tvxguest media ls/cat/extract on the mastered ISO 9660 and bridge images.
set -uo pipefail
media=${TVX_MEDIA_DIR:?}/iso9660
src=${TVX_SOURCE_DIR:?}
. "$(dirname "$0")/lib/check.sh"

first=$("$tool" media ls "$media/rr-joliet.iso" | head -1)
check "ls names the reader and the volume" [ "$first" = 'iso9660 (rock ridge) volume "TVX_RR_JOLIET"' ]
check "ls marks directories" bash -c "'$tool' media ls '$media/rr-joliet.iso' | grep -qx '           -  docs/'"
check "ls -R shows nested files with sizes" \
  bash -c "'$tool' media ls -R '$media/rr-joliet.iso' docs | grep -qx '       88893  big.bin'"
plain=$("$tool" media ls "$media/plain-l1.iso" | grep -c ' KERNEL$')
check "ls drops the dot of a level-1 name without extension" [ "$plain" = 1 ]
check "cat finds that name without its dot" status 0 "$tool" media cat "$media/plain-l1.iso" KERNEL
bridge=$("$tool" media ls "$media/udf-bridge.iso" | head -1)
check "a bridge image opens as UDF first" [ "${bridge%% *}" = udf ]
forced=$("$tool" media ls --iso9660 "$media/udf-bridge.iso" | head -1)
check "--iso9660 forces the ISO 9660 reader" [ "$forced" = 'iso9660 (rock ridge) volume "TVX_UDF_BRIDGE"' ]
check "ls --json parses" bash -c "'$tool' media ls --json -R '$media/joliet-only.iso' | python3 -m json.tool >/dev/null"

seq 1 9000 | sed 's/^/line /' > "$tmp/big.expected"
for img in rr-joliet plain-l1 udf-bridge; do
  "$tool" media cat "$media/$img.iso" docs/big.bin > "$tmp/big.$img"
  check "cat $img docs/big.bin" cmp -s "$tmp/big.$img" "$tmp/big.expected"
done

# A whole tree back out equals the tree it was mastered from.
cp -a "$src/tests/data/iso9660/tree" "$tmp/expected"
cp "$tmp/big.expected" "$tmp/expected/docs/big.bin"
for img in rr-joliet udf-bridge; do
  check "extract / of $img equals the source tree" \
    bash -c "'$tool' media extract '$media/$img.iso' / '$tmp/out-$img' && diff -r '$tmp/expected' '$tmp/out-$img' >/dev/null"
done
check "extract of a file lands under its own name" \
  bash -c "'$tool' media extract '$media/rr-joliet.iso' isolinux/isolinux.cfg '$tmp/one' && cmp -s '$tmp/one/isolinux.cfg' '$src/tests/data/iso9660/tree/isolinux/isolinux.cfg'"

check "missing image: status 2" status 2 "$tool" media ls "$tmp/none.iso"
check "missing image: the system's reason" \
  bash -c "'$tool' media ls '$tmp/none.iso' 2>&1 | grep -q 'No such file or directory'"
mkfifo "$tmp/fifo"
check "a FIFO is refused without waiting" status 2 timeout 20 "$tool" media ls "$tmp/fifo"
check "cat to a full disk: status 1" \
  bash -c "'$tool' media cat '$media/rr-joliet.iso' docs/big.bin >/dev/full 2>/dev/null; [ \$? -eq 1 ]"
check "ls to a full disk: status 1" bash -c "! '$tool' media ls -R '$media/rr-joliet.iso' >/dev/full 2>/dev/null"
check "ls of a file names it once" \
  bash -c "'$tool' media ls '$media/rr-joliet.iso' docs/big.bin 2>&1 >/dev/null | grep -c docs/big.bin | grep -qx 1"
check "missing path: status 1" status 1 "$tool" media cat "$media/rr-joliet.iso" no/such
check "missing directory: status 1" status 1 "$tool" media ls "$media/rr-joliet.iso" nodir
check "unknown subcommand: status 64" status 64 "$tool" media rm x
exit $((fails > 0))
