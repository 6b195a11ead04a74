#!/usr/bin/env bash
# tvxguest hashdata create / check and signature verify against the test PKI
# in the build's own certificate directory: every signer's status, a signed
# image verified, a flipped byte found in its block, refused hash data.
set -uo pipefail
tool=${TVX_TOOL:?}
src=${TVX_SOURCE_DIR:?}
certs=${TVX_CERT_DIR:-}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
. "$(dirname "$0")/lib/check.sh"

"$tool" hashdata create --block-size 4097 --key k --cert c i o >/dev/null 2>&1
check_exit "hashdata create with a block size above 4096" 64 $?

if [ -z "$certs" ]; then
  echo "skip: the build trusts a certificate directory outside its tree"
  exit $((fails > 0))
fi
"$src/scripts/make-test-pki" "$certs" || { echo "FAIL: make-test-pki"; exit 1; }
pki=$certs/signers
sign() { "$src/scripts/make-test-pki" sign "$certs" "$@"; }

# One signer of each status through signature verify (the library's own
# table holds every kind of signer).
printf 'windows9-64 = "windows.iso"\n' >"$work/map.txt"
for row in "maker:Tarvex Signed:0" "partner:Partner Signed:0" "revoked:Invalid Certificate:1"; do
  IFS=: read -r who want code <<<"$row"
  sign "$who" "$work/map.txt" "$work/$who.sig"
  out=$("$tool" signature verify --data "$work/map.txt" "$work/$who.sig" 2>/dev/null)
  check_exit "signature verify: $who" "$code" $? "$out" "$want"
done
sign partner "$work/map.txt" "$work/partner.p7" --embed
out=$("$tool" signature verify --json "$work/partner.p7"); st=$?
check_exit "signature verify --json, content inside" 0 $st "$(json "$out" 'j["statusText"]')" '"Partner Signed"'
echo "not a signature" >"$work/junk.sig"
out=$("$tool" signature verify --json "$work/junk.sig"); st=$?
check_exit "signature verify: not PEM" 2 $st "$(json "$out" 'j["error"]')" '"no start line"'

# A small tools image: three full blocks and a short one.
/usr/bin/python3 -c 'import sys; sys.stdout.buffer.write(bytes((i * 7 + i // 4096) & 255 for i in range(3 * 4096 + 1000)))' >"$work/tools.iso"
cat "$pki/maker.pem" "$pki/maker.chain" >"$work/maker.bundle"
create() { "$tool" hashdata create --quiet --block-size 4096 --key "$pki/$1.key" --cert "$2" "${@:3}"; }

out=$(create maker "$work/maker.bundle" --embed-signature "$work/tools.iso" "$work/tools.iso.sha"); st=$?
check_exit "hashdata create, embedded signature" 0 $st "$out" "4 hashes of 4096-byte blocks"
out=$("$tool" hashdata check --json "$work/tools.iso.sha" "$work/tools.iso"); st=$?
check_exit "hashdata check: good image" 0 $st "$(json "$out" '[j["ok"], j["signature"], j["blocks"]]')" \
  '[true, "embedded", 4]'

cp "$work/tools.iso" "$work/bad.iso"
printf 'X' | dd of="$work/bad.iso" bs=1 seek=$((2 * 4096 + 17)) conv=notrunc status=none
out=$("$tool" hashdata check "$work/tools.iso.sha" "$work/bad.iso"); st=$?
check_exit "hashdata check: one flipped byte" 1 $st "$out" "1 of 4 BAD, first bad block 2 at offset 0x2000"

out=$(create maker "$work/maker.bundle" "$work/tools.iso" "$work/det.sha"); st=$?
check_exit "hashdata create, detached signature" 0 $st "$out" "det.sig"
out=$("$tool" hashdata check --json "$work/det.sha" "$work/tools.iso"); st=$?
check_exit "hashdata check: detached" 0 $st "$(json "$out" '[j["ok"], j["signature"]]')" '[true, "detached"]'

cat "$pki/partner.pem" >"$work/partner.bundle"
create partner "$work/partner.bundle" --embed-signature "$work/tools.iso" "$work/p.sha" >/dev/null
out=$("$tool" hashdata check --json "$work/p.sha" "$work/tools.iso"); st=$?
check_exit "hashdata check: a partner may not sign tools" 1 $st "$(json "$out" 'j["signatureError"]')" \
  '"ToolsISO: Error failed to verify signature using default cert: certificate verify error (unable to get local issuer certificate)"'
cp "$work/junk.sig" "$work/det.sig"
out=$("$tool" hashdata check --json "$work/det.sha" "$work/tools.iso"); st=$?
check_exit "hashdata check: a detached signature that is no PEM" 1 $st "$(json "$out" 'j["signatureError"]')" \
  '"ToolsISO: Error failed to load signature buffer: no start line"'
out=$("$tool" hashdata check --json --cert "$certs/tvxpartner.cert" "$work/p.sha" "$work/tools.iso"); st=$?
check_exit "hashdata check: --cert names the trusted file" 0 $st "$(json "$out" 'j["ok"]')" true

head -c 512 "$work/tools.iso.sha" >"$work/short.sha"
out=$("$tool" hashdata check "$work/short.sha" "$work/tools.iso" 2>&1); st=$?
check_exit "hashdata check: refused hash data" 2 $st "$out" "ToolsISO: Error hashDataSize is too small."

[ "$fails" -eq 0 ] && echo "all signature CLI checks passed"
exit $((fails > 0))
