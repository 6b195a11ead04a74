#!/usr/bin/env bash
# tvxguest unattended linux and tvxguest crypt: answer files for recognised
# Linux media carry the typed texts as given (each language's own parser reads
# them in the library's test), the passwords verify with the crypt command and
# openssl, and failing calls leave nothing behind.
set -uo pipefail
media=${TVX_MEDIA_DIR:?}
. "$(dirname "$0")/lib/check.sh"
name='Jo "JJ" O'"'"'Neil & Co <x> Zoë 王'
password='$(touch x)`touch x`'
root_password='r00t ${HOME} @ARGV'
answers() {  # answers OUTDIR IMAGE EXTRA...
  local out=$1 img=$2; shift 2
  "$tool" unattended linux --user jo --full-name "$name" --password "$password" \
    --root-password "$root_password" --out "$out" "$@" "$img"
}
verifies() {  # verifies PASSWORD HASH
  "$tool" crypt --check "$2" -- "$1" >/dev/null
}

centos=$media/redhat/centos7.iso
answers "$tmp/rh/new" "$centos" >"$tmp/out" 2>"$tmp/err"
check "centos7: exit 0" test $? -eq 0
ks=$tmp/rh/new/ks.cfg
check "centos7: owner-only file" test "$(stat -c %a "$ks")" = 600
check "centos7: root password verifies" \
  verifies "$root_password" "$(sed -n 's/^rootpw --iscrypted //p' "$ks")"

ubuntu=$media/debian/ubu-2004.iso
answers "$tmp/ub" "$ubuntu" --nvme --json >"$tmp/json" 2>&1
check "ubuntu --json: exit 0" test $? -eq 0
check "ubuntu --json: the preseed file" \
  grep -qF "\"files\": [\"$tmp/ub/custom/preseed.cfg\"]" "$tmp/json"
ps=$tmp/ub/custom/preseed.cfg
check "ubuntu: full name as typed" \
  grep -qxF "ubiquity   passwd/user-fullname string   $name" "$ps"
check "ubuntu: password verifies" \
  verifies "$password" "$(sed -n 's/^ubiquity   passwd\/user-password-crypted password //p' "$ps")"

# A failure (no answer file for Debian) leaves nothing in --out and no
# staging directory beside it.
debian=$media/debian/deb11-amd64.iso
answers "$tmp/f/deb" "$debian" >/dev/null 2>"$tmp/err"
check "debian: exit 1" test $? -eq 1
check "failures leave nothing, not even the folders made for --out" test ! -e "$tmp/f"
check "no staging directory left" test -z "$(find "$tmp" -name '*.staging-*')"
check "missing --user: exit 64" status 64 "$tool" unattended linux --full-name x --password p \
  --out "$tmp/u" "$centos"

# crypt: a random salt and clamped rounds cross-checked with openssl (the
# published vectors are the library's test).
hash=$(printf '%s\n' "$password" | "$tool" crypt --stdin)
salt=$(printf '%s' "$hash" | cut -d'$' -f3)
check "crypt: openssl agrees" test "$(openssl passwd -5 -salt "$salt" "$password")" = "$hash"
salt='rounds=999$abcdefghijklmnopq'  # clamped to 1000 rounds and 16 salt characters, as openssl does
check "crypt: openssl agrees on $salt" test "$(openssl passwd -5 -salt "$salt" "$password")" = \
  "$("$tool" crypt --salt "$salt" -- "$password")"
"$tool" crypt --check "$hash" wrong >/dev/null
check "crypt: a wrong password does not match (exit 1)" test $? -eq 1
exit $((fails > 0))
