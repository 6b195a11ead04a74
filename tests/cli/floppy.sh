#!/usr/bin/env bash
# tvxguest floppy and unattended windows --floppy: images checked with fsck.fat
# and read back with mtools (the answer floppy's contents are the library's
# test); exit statuses.
set -uo pipefail
media=${TVX_MEDIA_DIR:?} src=${TVX_SOURCE_DIR:?}
. "$(dirname "$0")/lib/check.sh"
export MTOOLS_SKIP_CHECK=1
clean() { fsck.fat -n "$1" >"$tmp/fsck" 2>&1 && ! grep -qE 'rror|ong file|ree cluster|Fix|orrect' "$tmp/fsck"; }
img=$tmp/f.flp

"$tool" floppy format "$img" >/dev/null
check "format: a 1.44 MB image" test "$(stat -c %s "$img")" -eq 1474560
head -c 513 /dev/urandom >"$tmp/odd.bin"
head -c 5000 /dev/urandom >"$tmp/big.bin"
: >"$tmp/empty"
"$tool" floppy add "$img" "$tmp/big.bin" "Driver Notes.txt" &&
  "$tool" floppy add "$img" "$tmp/odd.bin" "driver notes.TXT" &&  # replaces, shorter
  "$tool" floppy add "$img" "$tmp/empty"
check "add: exit 0" test $? -eq 0
check "fsck.fat finds the image clean" clean "$img"
mcopy -n -i "$img" "::/Driver Notes.txt" "$tmp/back" && cmp -s "$tmp/back" "$tmp/odd.bin"
check "mtools reads the replaced file, no tail" test $? -eq 0
"$tool" floppy get "$img" "DRIVER NOTES.TXT" >"$tmp/out" && cmp -s "$tmp/out" "$tmp/odd.bin"
check "get to standard output" test $? -eq 0
"$tool" floppy ls --json "$img" >"$tmp/json"
check "ls --json: names, sizes and free room" /usr/bin/python3 -c '
import json, sys
o = json.load(open(sys.argv[1]))
sizes = {e["name"]: e["size"] for e in o["entries"]}
assert sizes == {"Driver Notes.txt": 513, "empty": 0}, sizes
assert o["freeBytes"] == (2847 - 2) * 512, o["freeBytes"]' "$tmp/json"

check "format refuses an existing image without --force" status 1 "$tool" floppy format "$img"
check "ls of a non-FAT file: exit 2" status 2 "$tool" floppy ls "$tmp/big.bin"
check "add without a file: exit 64" status 64 "$tool" floppy add "$img"

winxp=$media/windows-legacy/winxppro.iso
mkdir -p "$tmp/res" "$tmp/drv"
printf '@echo off\r\n' >"$tmp/res/unattend.cmd"
printf 'MZ' >"$tmp/res/storePwd.exe"
printf '[scsi]\r\nLSI_SAS_32 = "LSI SAS Adapter"\r\n' >"$tmp/drv/txtsetup.oem"
printf 'driver' >"$tmp/drv/lsi_sas.sys"
tpl=$src/data/windows
"$tool" unattended windows --sif "$tpl/winnt.sif" --xml "$tpl/autounattend.xml" \
  --storepwd "$tpl/storePwd.ini" --image-name "Windows XP Professional" --full-name Jo \
  --out "$tmp/xp" --floppy --resource-dir "$tmp/res" --scsi-dir "$tmp/drv" "$winxp" >"$tmp/out" 2>&1
check "unattended windows --floppy: exit 0" test $? -eq 0
check "only autoinst.flp stays" test "$(ls "$tmp/xp")" = autoinst.flp
check "--floppy without --resource-dir: exit 64" status 64 "$tool" unattended windows --sif a \
  --xml b --image-name c --full-name d --out "$tmp/n" --floppy "$winxp"
exit $((fails > 0))
