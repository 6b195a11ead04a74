#!/usr/bin/env bash
# tvxguest hashdata create / check and signature verify against the test PKI
# in the build's own certificate directory: every signer's status, a signed
# image verified, a flipped byte found in its block, refused hash data.
set -uo pipefail
src=${TVX_SOURCE_DIR:?}
. "$(dirname "$0")/lib/check.sh"

"$tool" hashdata create --block-size 4097 --key k --cert c i o >/dev/null 2>&1
check_exit "hashdata create with a block size above 4096" 64 $?

need_pki
pki=$certs/signers
sign() { "$src/scripts/make-test-pki" sign "$certs" "$@"; }

# One signer of each status through signature verify (the library's own
# table holds every kind of signer).
printf 'windows9-64 = "windows.iso"\n' >"$tmp/map.txt"
for row in "maker:Tarvex Signed:0" "partner:Partner Signed:0" "revoked:Invalid Certificate:1"; do
  IFS=: read -r who want code <<<"$row"
  sign "$who" "$tmp/map.txt" "$tmp/$who.sig"
  out=$("$tool" signature verify --data "$tmp/map.txt" "$tmp/$who.sig" 2>/dev/null)
  check_exit "signature verify: $who" "$code" $? "$out" "$want"
done
sign partner "$tmp/map.txt" "$tmp/partner.p7" --embed
out=$("$tool" signature verify --json "$tmp/partner.p7"); st=$?
check_exit "signature verify --json, content inside" 0 $st "$(json "$out" 'j["statusText"]')" '"Partner Signed"'
echo "not a signature" >"$tmp/junk.sig"
out=$("$tool" signature verify --json "$tmp/junk.sig"); st=$?
check_exit "signature verify: not PEM" 2 $st "$(json "$out" 'j["error"]')" '"no start line"'

# A small tools image: three full blocks and a short one.
/usr/bin/python3 -c 'import sys; sys.stdout.buffer.write(bytes((i * 7 + i // 4096) & 255 for i in range(3 * 4096 + 1000)))' >"$tmp/tools.iso"
cat "$pki/maker.pem" "$pki/maker.chain" >"$tmp/maker.bundle"
create() { "$tool" hashdata create --quiet --block-size 4096 --key "$pki/$1.key" --cert "$2" "${@:3}"; }

out=$(create maker "$tmp/maker.bundle" --embed-signature "$tmp/tools.iso" "$tmp/tools.iso.sha"); st=$?
check_exit "hashdata create, embedded signature" 0 $st "$out" "4 hashes of 4096-byte blocks"
out=$("$tool" hashdata check --json "$tmp/tools.iso.sha" "$tmp/tools.iso"); st=$?
check_exit "hashdata check: good image" 0 $st "$(json "$out" '[j["ok"], j["signature"], j["blocks"]]')" \
  '[true, "embedded", 4]'

cp "$tmp/tools.iso" "$tmp/bad.iso"
printf 'X' | dd of="$tmp/bad.iso" bs=1 seek=$((2 * 4096 + 17)) conv=notrunc status=none
out=$("$tool" hashdata check "$tmp/tools.iso.sha" "$tmp/bad.iso"); st=$?
check_exit "hashdata check: one flipped byte" 1 $st "$out" "1 of 4 BAD, first bad block 2 at offset 0x2000"

out=$(create maker "$tmp/maker.bundle" "$tmp/tools.iso" "$tmp/det.sha"); st=$?
check_exit "hashdata create, detached signature" 0 $st "$out" "det.sig"

cat "$pki/partner.pem" >"$tmp/partner.bundle"
create partner "$tmp/partner.bundle" --embed-signature "$tmp/tools.iso" "$tmp/p.sha" >/dev/null
out=$("$tool" hashdata check --json "$tmp/p.sha" "$tmp/tools.iso"); st=$?
check_exit "hashdata check: a partner may not sign tools" 1 $st "$(json "$out" 'j["signatureError"]')" \
  '"ToolsISO: Error failed to verify signature using default cert: certificate verify error (unable to get local issuer certificate)"'
cp "$tmp/junk.sig" "$tmp/det.sig"
out=$("$tool" hashdata check --json "$tmp/det.sha" "$tmp/tools.iso"); st=$?
check_exit "hashdata check: a detached signature that is no PEM" 1 $st "$(json "$out" 'j["signatureError"]')" \
  '"ToolsISO: Error failed to load signature buffer: no start line"'
out=$("$tool" hashdata check --json --cert "$certs/tvxpartner.cert" "$tmp/p.sha" "$tmp/tools.iso"); st=$?
check_exit "hashdata check: --cert names the trusted file" 0 $st "$(json "$out" 'j["ok"]')" true

head -c 512 "$tmp/tools.iso.sha" >"$tmp/short.sha"
out=$("$tool" hashdata check "$tmp/short.sha" "$tmp/tools.iso" 2>&1); st=$?
check_exit "hashdata check: refused hash data" 2 $st "$out" "ToolsISO: Error hashDataSize is too small."

exit $((fails > 0))
