# Guest-tools status: a VM configuration, a tools directory holding a tools
# image with its host manifest (hash data signed by the maker) and a signed
# AVR manifest beside it, and guest manifests that come out current, too
# old, too new and blacklisted, each with its reason; then the guest's
# reports saved into the extended config file and read back from it.
# The demo's own PKI is named with --cert, so the step runs the same whatever
# directory the build trusts.
echo "== tools status: guest manifests against a signed tools image"
st="$work/status"
pki="$work/pki"
mkdir -p "$st/tools/isoimages" "$st/tree"
"$root/scripts/make-test-pki" "$pki"
signer="$pki/signers/maker"
printf 'monolithic.version = 12.2.0\nnetdriver.version = 12.2.0\n' >"$st/tree/manifest.txt"
xorriso -as mkisofs -quiet -R -J -o "$st/tools/isoimages/linux.iso" "$st/tree" 2>/dev/null
cat "$signer.pem" "$signer.chain" >"$st/signer.pem"
"$tool" hashdata create --quiet --block-size 2048 --key "$signer.key" --cert "$st/signer.pem" \
  "$st/tools/isoimages/linux.iso" "$st/tools/isoimages/linux.iso.sha" >/dev/null
avr="$st/tools/isoimages/linux_avr_manifest.txt"
printf 'monolithic.version = 12.0.0\nmonolithic.version_max = 12.9\nmonolithic.version_illegal = 12.1.1\n' >"$avr"
"$root/scripts/make-test-pki" sign "$pki" maker "$avr" "$avr.sig"
printf 'guestOS = "ubuntu-64"\nlibdir = "%s"\nextendedConfigFile = "vm.xml"\n' "$st/tools" >"$st/vm.tvx"
echo '<vm/>' >"$st/vm.xml"
echo "  host: monolithic and netdriver 12.2.0; AVR: minimum 12.0.0, maximum 12.9, illegal 12.1.1"
for v in 12.2.0 11.5.0 13.0.0 12.1.1; do
  printf 'monolithic.version = %s\nnetdriver.version = %s\nnetdriver.installed = yes\n' "$v" "$v" >"$st/guest.txt"
  echo "  guest tools $v:"
  "$tool" tools status --cert "$pki/tarvex.cert" --tools-version 12384 --guest-manifest "$st/guest.txt" "$st/vm.tvx" |
    sed 's/^/    /'
done
echo "  the ratings behind the last one (-v):"
"$tool" -v tools status --cert "$pki/tarvex.cert" --tools-version 12384 --guest-manifest "$st/guest.txt" "$st/vm.tvx" \
  2>/dev/null | sed -n '/component/,$p' | sed 's/^/  /'

echo "  the guest's update agent and manifest saved, then read back:"
printf '<agent><tools><monolithic guestVersion="11.5.0" repoVersion="12.2.0" status="9"/></tools></agent>\n' >"$st/agent.xml"
printf 'monolithic.version = 11.5.0\nnetdriver.version = 12.2.0\nnetdriver.installed = TRUE\n' >"$st/manifest.txt"
"$tool" tools save-info "$st/vm.tvx" --agent-xml "$st/agent.xml" --manifest "$st/manifest.txt" \
  --install-error 0 --counter 1 | sed 's/^/    /'
xmllint --format "$st/vm.xml" | sed 's/^/    /'
"$tool" tools status --cert "$pki/tarvex.cert" --tools-version 12384 "$st/vm.tvx" | sed 's/^/    /'
