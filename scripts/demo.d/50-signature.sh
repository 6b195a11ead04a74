# Signed hash data for a tools image: a maker and a partner PKI made with the
# openssl CLI, the image hashed and signed, checked, then one byte flipped and
# the bad block found. The maker's certificate is named with --cert, so the
# step runs the same whatever directory the build trusts.
echo "== signature: signed hash data of a tools image"
pki="$work/pki"
"$root/scripts/make-test-pki" "$pki"
mkdir -p "$work/tools-tree"
printf 'guesttools.version = "12.1.0"\n' >"$work/tools-tree/manifest.txt"
head -c 300000 /dev/zero | tr '\0' 'T' >"$work/tools-tree/payload.bin"
xorriso -as mkisofs -quiet -V TOOLS -o "$work/linux.iso" "$work/tools-tree" 2>/dev/null
cat "$pki/signers/maker.pem" "$pki/signers/maker.chain" >"$work/maker.bundle"
echo "  maker root, maker signing CA and partner root in $pki"

"$tool" hashdata create --quiet --block-size 4096 --embed-signature \
  --key "$pki/signers/maker.key" --cert "$work/maker.bundle" \
  "$work/linux.iso" "$work/linux.iso.sha" | sed 's|^.*/|  |'
"$tool" hashdata check --quiet --cert "$pki/tarvex.cert" "$work/linux.iso.sha" \
  "$work/linux.iso" | sed 's/^/  /' || true

"$tool" hashdata create --quiet --block-size 4096 --embed-signature \
  --key "$pki/signers/partner.key" --cert "$pki/signers/partner.pem" \
  "$work/linux.iso" "$work/partner.sha" >/dev/null
echo "  signed by the partner instead (tools need the maker's signature):"
"$tool" hashdata check --quiet --cert "$pki/tarvex.cert" "$work/partner.sha" \
  "$work/linux.iso" | head -2 | sed "s/^/    /" || true

offset=$((40 * 4096 + 123))
printf 'X' | dd of="$work/linux.iso" bs=1 seek=$offset conv=notrunc status=none
echo "  after flipping the byte at offset $offset:"
"$tool" hashdata check --quiet --cert "$pki/tarvex.cert" "$work/linux.iso.sha" \
  "$work/linux.iso" | sed 's/^/    /' || true
