#!/usr/bin/env bash
# tvxguest detect: the JSON contract on every test image (one batch process),
# what a person sees, exit statuses, and the error lines for images that
# cannot be opened.
set -uo pipefail
media=${TVX_MEDIA_DIR:?}
. "$(dirname "$0")/lib/check.sh"

# Every image of the shelf, then a missing file and noise: the two that fail
# are reported and the run goes on.
head -c 100000 /dev/urandom >"$tmp/noise.iso"
"$tool" detect --json -r "$media" "$tmp/missing.iso" "$tmp/noise.iso" >"$tmp/all.jsonl" 2>"$tmp/err"
check "batch with unopenable images: exit 2" test $? -eq 2
check "one error line for each unopenable image" \
  test "$(grep -cF -e "'$tmp/missing.iso'" -e "'$tmp/noise.iso'" "$tmp/err")" -eq 2 -a \
  "$(wc -l <"$tmp/err")" -eq 2
images=$(find "$media" -type f \( -name '*.iso' -o -name '*.img' -o -name '*.udf' \) | wc -l)
check "one record per image ($images + 2)" test "$(wc -l <"$tmp/all.jsonl")" -eq $((images + 2))

/usr/bin/python3 - "$tmp/all.jsonl" "$media/" "$tmp/" <<'PY' || fails=$((fails + 1))
import json, sys
types = {"path": str, "result": int, "guestOS": (str, type(None)),
         "guestOSOverride": (str, type(None)), "version": int, "versionName": str,
         "noIsolinuxConfig": bool, "versionText": str, "language": str,
         "languageShort": str, "languages": str, "editions": str, "displayName": str,
         "displayText": str}
# What a person or a script reads off particular media.
expect = {
    "windows-legacy/winxppro.iso": {"guestOS": "winXPPro", "language": "German"},
    "windows/win81-x64.iso": {"displayText": "Windows 8.1 x64"},
    "windows/winmain-client.iso": {"result": 1},
    "redhat/centos7.iso": {"guestOS": "centos7-64", "versionName": "GUESS_VERSION_CENTOS_7"},
    "redhat/fedora35-aarch64.iso": {"noIsolinuxConfig": True},
    "missing.iso": {"result": 2},
    "noise.iso": {"result": 2},
}
bad, seen = 0, {}
for line in open(sys.argv[1]):
    o = json.loads(line)
    name = o["path"].removeprefix(sys.argv[2]).removeprefix(sys.argv[3])
    problems = sorted(set(o) ^ set(types))
    problems += [k for k, t in types.items() if k in o and not isinstance(o[k], t)]
    if (o["result"] == 0) != (o["guestOS"] is not None):
        problems.append("result/guestOS")
    if not o["versionName"].startswith("GUESS_VERSION_"):
        problems.append("versionName")
    problems += ["%s=%r" % (k, o.get(k)) for k, v in expect.get(name, {}).items() if o.get(k) != v]
    seen[name] = o
    if problems:
        bad = 1
        print("FAIL: %s: %s" % (name, ", ".join(problems)))
missing = sorted(set(expect) - set(seen))
if missing:
    bad = 1
    print("FAIL: no record for", missing)
print("ok: JSON contract on %d records" % len(seen) if not bad else "FAIL: JSON contract")
sys.exit(bad)
PY

# One IMAGE: the details, as before batches existed.
"$tool" detect "$media/windows/server2019.iso" >"$tmp/human"
check "one image: human output lists the editions" \
  grep -q 'Windows Server 2019 SERVERDATACENTER' "$tmp/human"
"$tool" detect "$tmp/missing.iso" >"$tmp/out" 2>"$tmp/err"
check "one missing image: exit 2, nothing on stdout, one error line" \
  test $? -eq 2 -a ! -s "$tmp/out" -a "$(wc -l <"$tmp/err")" -eq 1
# Several: one line each, exit 1 when one is not recognised.
"$tool" detect "$media/windows-legacy/win95.iso" "$media/windows/winmain-client.iso" >"$tmp/human"
check "batch not recognised: exit 1" test $? -eq 1
check "batch: a line per image" test "$(cat "$tmp/human")" = \
  "$media/windows-legacy/win95.iso: win95
$media/windows/winmain-client.iso: not recognised"

for bad in "" "--bogus x.iso" "-r" "--json=yes x.iso"; do
  # shellcheck disable=SC2086
  check "usage error 64: detect $bad" status 64 "$tool" detect $bad
done
check "-- ends the options" status 2 "$tool" detect -- "$tmp/--json"

exit $((fails > 0))
