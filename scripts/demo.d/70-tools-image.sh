# Guest-tools images: a tools directory with a signed image map and two
# signed images; the image chosen for a Windows and a Linux guest; one image
# verified locally and from a real web server on 127.0.0.1; one byte flipped
# and the failure shown. The demo's own maker certificate is named with
# --cert, so the step runs the same whatever directory the build trusts.
echo "== tools image: choose, verify locally and over HTTP, catch a tamper"
certs="$work/tools-pki"
"$root/scripts/make-test-pki" "$certs"
trust=(--cert "$certs/tarvex.cert")
tools="$work/tools"
iso="$tools/isoimages"
mkdir -p "$iso" "$work/tools-win" "$work/tools-lin"
printf 'family = "windows"\n' >"$work/tools-win/manifest.txt"
printf 'family = "linux"\n' >"$work/tools-lin/manifest.txt"
head -c 400000 /dev/zero | tr '\0' 'L' >"$work/tools-lin/payload.bin"
xorriso -as mkisofs -quiet -R -J -o "$iso/windows.iso" "$work/tools-win" 2>/dev/null
xorriso -as mkisofs -quiet -R -J -o "$iso/linux.iso" "$work/tools-lin" 2>/dev/null
cat "$certs/signers/maker.pem" "$certs/signers/maker.chain" >"$work/maker.pem"
for img in windows linux; do
  "$tool" hashdata create --quiet --block-size 2048 --key "$certs/signers/maker.key" \
    --cert "$work/maker.pem" "$iso/$img.iso" "$iso/$img.iso.sha" >/dev/null
done
printf 'windows9-64 = "windows.iso"\nubuntu-64 = "linux.iso"\n' >"$iso/isoimages_manifest.txt"
"$root/scripts/make-test-pki" sign "$certs" maker "$iso/isoimages_manifest.txt" \
  "$iso/isoimages_manifest.txt.sig"
for guest in windows9-64 ubuntu-64; do
  printf '  %-12s ' "$guest:"
  "$tool" tools image "${trust[@]}" "$tools" "$guest" | paste -sd' ' | sed "s|$tools/||"
done

"$tool" tools verify --quiet "${trust[@]}" "$iso/linux.iso" | sed "s|$iso/||; s/^/  /"
port=$(/usr/bin/python3 -c 'import socket; s=socket.socket(); s.bind(("127.0.0.1",0)); print(s.getsockname()[1])')
printf 'server.document-root = "%s"\nserver.bind = "127.0.0.1"\nserver.port = %s\nmimetype.assign = ("" => "application/octet-stream")\n' \
  "$iso" "$port" >"$work/lighttpd.conf"
lighttpd -D -f "$work/lighttpd.conf" 2>/dev/null &
web=$!
for _ in $(seq 50); do (exec 3<>"/dev/tcp/127.0.0.1/$port") 2>/dev/null && break; sleep 0.1; done
echo "  from lighttpd on 127.0.0.1:$port:"
"$tool" tools verify --quiet "${trust[@]}" "http://127.0.0.1:$port/linux.iso" | sed 's/^/    /'
kill "$web"
wait "$web" 2>/dev/null || true

offset=$(/usr/bin/python3 -c 'import sys; print(open(sys.argv[1], "rb").read().find(b"L" * 4096) + 100000)' \
  "$iso/linux.iso")
printf 'X' | dd of="$iso/linux.iso" bs=1 seek="$offset" conv=notrunc status=none
echo "  after flipping the byte at offset $offset:"
"$tool" tools verify --quiet "${trust[@]}" "$iso/linux.iso" | sed "s|$iso/||; s/^/    /" || true
"$tool" tools cat "${trust[@]}" "$iso/linux.iso" payload.bin 2>&1 >/dev/null | head -1 | sed 's/^/    /' || true
