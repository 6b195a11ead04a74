#!/usr/bin/env bash
# tvxguest unattended windows: answer files for recognised Windows media from
# the shipped templates, checked with xmllint and read back; exit statuses and
# the library's reasons on failure.
set -uo pipefail
media=${TVX_MEDIA_DIR:?} src=${TVX_SOURCE_DIR:?}
. "$(dirname "$0")/lib/check.sh"
tpl=$src/data/windows
win10=$media/windows/win10-x64.iso
winxp=$media/windows-legacy/winxppro.iso
linux=$media/redhat/rhel5-server-x64.iso
name='Jo & O'"'"'Neil Jürgen'
password='p&ss<w>"rd'  # quotes are fine in the XML, not in winnt.sif

answers() {  # answers OUTDIR IMAGE EXTRA...
  local out=$1 img=$2; shift 2
  TZ=Asia/Tokyo "$tool" unattended windows --sif "$tpl/winnt.sif" --xml "$tpl/autounattend.xml" \
    --storepwd "$tpl/storePwd.ini" --full-name "$name" --out "$out" "$@" "$img"
}
xpath() {  # xpath FILE EXPR: the string value, through the independent tool
  xmllint --xpath "string($2)" "$1" 2>/dev/null
}
el() { printf "*[local-name()='%s']" "$1"; }
oobe="//$(el settings)[@pass='oobeSystem']/$(el component)[@name='Microsoft-Windows-Shell-Setup']"

# A planted link where an answer file goes is replaced, never written through.
mkdir -p "$tmp/w10" && echo keep >"$tmp/victim" && ln -s "$tmp/victim" "$tmp/w10/winnt.sif"
answers "$tmp/w10" "$win10" --image-name "Windows 10 Pro" --password "${password//\"/}" \
  --product-key AAAAA-BBBBB-CCCCC-DDDDD-EEEEE >"$tmp/out" 2>"$tmp/err"
check "win10: exit 0" test $? -eq 0
xml=$tmp/w10/autoun~0.xml
check "win10: account name intact" \
  test "$(xpath "$xml" "$oobe/$(el AutoLogon)/$(el Username)")" = "$name"
check "win10: planted link untouched" test "$(cat "$tmp/victim")" = keep -a ! -L "$tmp/w10/winnt.sif"
check "win10: files private" test "$(stat -c %a "$tmp/w10/winnt.sif" "$xml" "$tmp/w10/storePwd.ini" | sort -u)" = 600

# Texts that would add keys to winnt.sif, or exceed the guest's name length,
# are refused before anything is written: exit 1, the reason, nothing new in
# --out. (Each refused character has its row in the library's own test.)
for bad in $'--password=pw\rAutoLogon=Yes' "--full-name=$(printf 'n%.0s' {1..60})"; do
  answers "$tmp/inj" "$win10" --image-name "Windows 10 Pro" "$bad" >/dev/null 2>"$tmp/err"
  check "refused ${bad%%=*}: exit 1" test $? -eq 1
  check "refused ${bad%%=*}: reason" grep -qE 'holds|longer than' "$tmp/err"
  check "refused ${bad%%=*}: nothing written" test ! -e "$tmp/inj"
done

answers "$tmp/w10j" "$win10" --image-name "Windows 10 Pro" --json >"$tmp/json" 2>&1
check "win10 --json: result and files" /usr/bin/python3 -c '
import json, sys
o = json.load(open(sys.argv[1]))
assert o["result"] is True and o["guestOS"] == "windows9-64", o
assert [f.rsplit("/", 1)[1] for f in o["files"]] == ["winnt.sif", "autoun~0.xml", "storePwd.ini"]
' "$tmp/json"

# A template that cannot be copied: exit 1 and the library's reason.
"$tool" unattended windows --sif "$tpl/winnt.sif" --xml "$tmp/absent.xml" --image-name x \
  --full-name y --out "$tmp/bad" "$win10" >/dev/null 2>"$tmp/err"
check "missing template: exit 1" test $? -eq 1
check "missing template: reason shown" grep -qF \
  "AutoInstall_PrepareAnswerFileEx: File_Copy from=\"$tmp/absent.xml\"" "$tmp/err"
check "missing template: nothing left behind" test -z "$(ls -A "$tmp" | grep -e bad -e staging)"

answers "$tmp/xp" "$winxp" --image-name "Windows XP Professional" --password pw \
  --no-autologon >/dev/null 2>&1
check "winxp: exit 0" test $? -eq 0
check "winxp: logon helper told to stop" grep -qx 'Enabled=0' "$tmp/xp/storePwd.ini"

answers "$tmp/lx" "$linux" --image-name x >/dev/null 2>"$tmp/err"
check "linux image: exit 1" test $? -eq 1
check "linux image: nothing written" test -z "$(ls -A "$tmp/lx" 2>/dev/null)"

check "unreadable image: exit 2" status 2 "$tool" unattended windows --sif a --xml b \
  --image-name c --full-name d --out "$tmp/n" "$tmp/no-such.iso"
check "missing --sif: exit 64" status 64 "$tool" unattended windows --xml b "$tmp/no-such.iso"
exit $((fails > 0))
