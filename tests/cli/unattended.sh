#!/usr/bin/env bash
# tvxguest unattended support / validate and windows-name: exit statuses,
# messages and JSON, on an unrecognisable image of our own and on two
# sample images.
set -uo pipefail
media=${TVX_MEDIA_DIR:?}
. "$(dirname "$0")/lib/check.sh"

# windows-name
out=$("$tool" windows-name "Windows Server 2008 R2 SERVERSTANDARDACORE" "Windows 7 CUSTOM"); st=$?
check_exit "windows-name keys and modifiers" 0 $st "$out" \
  "Windows Server 2008 R2 Standard Core"
out=$("$tool" windows-name --json "Windows Longhorn SERVERWEB"); st=$?
check_exit "windows-name --json" 0 $st "$(json "$out" 'j["pretty"]')" '"Windows Server 2008 Web Edition"'
"$tool" windows-name >/dev/null 2>&1; check_exit "windows-name without a name" 64 $?

# An image that no recogniser knows, and a file that is no image.
mkdir -p "$tmp/tree" && echo "nothing to see" >"$tmp/tree/README.TXT"
xorriso -as mkisofs -quiet -V PLAIN -o "$tmp/plain.iso" "$tmp/tree" 2>/dev/null
echo "not an image" >"$tmp/text.iso"

out=$("$tool" unattended support "$tmp/plain.iso"); st=$?
check_exit "support on an unrecognised image" 1 $st "$out" "not offered"
out=$("$tool" unattended support --json "$tmp/plain.iso"); st=$?
check_exit "support --json: not supported" 1 $st "$(json "$out" 'j["supported"]')" false
check_exit "support --json: no limits without a guest" 1 $st "$(json "$out" 'j["config"]')" null
check "support on a non-image: exit 2" status 2 "$tool" unattended support "$tmp/text.iso"

v() { "$tool" unattended validate "$@" "$tmp/plain.iso" 2>/dev/null; }
out=$(v --family linux --kind short-name --text Bob); st=$?
check_exit "linux short name with a capital" 5 $st "$out" "lowercase US English characters"
out=$(v --family windows --kind name --text "a|b"); st=$?
check_exit "windows account name with |" 2 $st "$out" "must not contain the following characters"
out=$(v --json --family linux --kind name --text "x]]>y"); st=$?
check_exit "validate --json names the error" 4 $st "$(json "$out" 'j["errorName"]')" \
  AUTOINSTALL_TEXT_BAD_GECOS_SUBSTRING
out=$(v --json --family linux --kind name --text "Jane"); st=$?
check_exit "validate --json: no message when accepted" 0 $st "$(json "$out" 'j["message"]')" null
check "validate on a non-image: exit 66" \
  status 66 "$tool" unattended validate --kind name --text x "$tmp/text.iso"
for bad in "--kind nickname --text x" "--family Windows --kind name --text x" "--kind name"; do
  # shellcheck disable=SC2086
  check "validate usage: $bad" status 64 "$tool" unattended validate $bad "$tmp/plain.iso"
done
"$tool" unattended frobnicate >/dev/null 2>&1; check_exit "unknown unattended subcommand" 64 $?
"$tool" unattended support --help | grep -q "Exit status"; check_exit "support --help" 0 $?

# A recognised image that is offered and one that is not: the JSON agrees
# with the exit status. (Which guest is offered is the library's test.)
for row in redhat/centos7:0:true debian/deb11-amd64:1:false; do
  IFS=: read -r img want supported <<<"$row"
  out=$("$tool" unattended support --json "$media/$img.iso" 2>/dev/null)
  check_exit "support --json: $img" "$want" $? "$(json "$out" 'j["supported"]')" "$supported"
done

exit $((fails > 0))
