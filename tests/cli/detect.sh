#!/usr/bin/env bash
# tvxguest detect: the JSON contract on every test image, exit statuses,
# and the error line for images that cannot be opened.
set -uo pipefail
tool=${TVX_TOOL:?} media=${TVX_MEDIA_DIR:?}
fail=0
check() {  # check WHAT COND...
  local what=$1; shift
  if "$@"; then echo "ok: $what"; else echo "FAIL: $what"; fail=1; fi
}
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT

# Every key, with its type, and the exit status equal to "result".
validate='
import json, sys
want = {"result": int, "guestOS": (str, type(None)), "guestOSOverride": (str, type(None)),
        "version": int, "versionName": str, "noIsolinuxConfig": bool, "versionText": str,
        "language": str, "languageShort": str, "languages": str, "editions": str,
        "displayName": str, "displayText": str}
o = json.load(open(sys.argv[1]))
assert set(o) == set(want), sorted(set(o) ^ set(want))
for k, t in want.items():
    assert isinstance(o[k], t), k
assert o["result"] == int(sys.argv[2]), (o["result"], sys.argv[2])
assert (o["result"] == 0) == (o["guestOS"] is not None)
assert o["versionName"].startswith("GUESS_VERSION_")
'
count=0
while IFS= read -r -d '' img; do
  "$tool" detect --json "$img" >"$tmp/out.json" 2>"$tmp/err"
  rc=$?
  name=${img#"$media"/}
  check "$name: exit $rc, JSON contract" \
    /usr/bin/python3 -c "$validate" "$tmp/out.json" "$rc"
  count=$((count + 1))
done < <(find "$media" -name '*.iso' -print0 | sort -z)
check "found test images ($count)" test "$count" -gt 0

field() {  # field IMAGE KEY
  "$tool" detect --json "$media/$1" 2>/dev/null |
    /usr/bin/python3 -c "import json,sys; print(json.load(sys.stdin)['$2'])"
}
check "winxppro guestOS" test "$(field windows-legacy/winxppro.iso guestOS)" = winXPPro
check "winxppro language" test "$(field windows-legacy/winxppro.iso language)" = German
check "win2003std-x64 displayText" \
  test "$(field windows-legacy/win2003std-x64.iso displayText)" = winNetStandard-64

"$tool" detect "$media/windows-legacy/win95.iso" >"$tmp/human"
check "human output names image and guest" grep -q 'win95.iso: win95$' "$tmp/human"

"$tool" detect "$tmp/missing.iso" >"$tmp/out" 2>"$tmp/err"
rc=$?
check "missing image: exit 2" test "$rc" -eq 2
check "missing image: one error line naming it" \
  test "$(wc -l <"$tmp/err")" -eq 1 -a -n "$(grep -F "$tmp/missing.iso" "$tmp/err")"
head -c 100000 /dev/urandom >"$tmp/noise.iso"
"$tool" detect --json "$tmp/noise.iso" >"$tmp/out.json" 2>"$tmp/err"
rc=$?
check "noise: exit 2 and JSON result 2" /usr/bin/python3 -c "$validate" "$tmp/out.json" "$rc"
check "noise: one error line naming it" grep -qF "noise.iso" "$tmp/err"

"$tool" detect >/dev/null 2>&1
check "no IMAGE: usage error 64" test $? -eq 64
"$tool" detect --bogus x.iso >/dev/null 2>&1
check "unknown option: usage error 64" test $? -eq 64
check "--help" "$tool" detect --help

exit $fail
