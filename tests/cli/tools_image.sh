#!/usr/bin/env bash
# tvxguest tools image / verify / cat on a tools directory signed with the
# test PKI: the choice by the map, every block verified locally and from
# lighttpd, a file read byte-exact, a flipped
# byte caught in its block; and libcurl loaded only by a command that needs it.
set -uo pipefail
src=${TVX_SOURCE_DIR:?}
. "$(dirname "$0")/lib/check.sh"
web_pid=
trap '[ -n "$web_pid" ] && kill "$web_pid" 2>/dev/null; rm -rf "$tmp"' EXIT

out=$(LD_DEBUG=libs "$tool" --version 2>&1 >/dev/null); st=$?
grep -q 'libcurl' <<<"$out" && st=99
check_exit "--version does not load libcurl" 0 $st
out=$(LD_DEBUG=libs "$tool" tools verify --quiet http://127.0.0.1:1/linux.iso 2>&1)
check_exit "a URL loads libcurl on first use" 2 $? "$out" "libcurl.so.4"

need_pki
cat "$certs/signers/maker.pem" "$certs/signers/maker.chain" >"$tmp/maker.bundle"

# Two images: Windows with a detached signature and 2048-byte blocks, Linux
# with an embedded one and 4096-byte blocks.
iso=$tmp/tools/isoimages
mkdir -p "$iso" "$tmp/tree/win" "$tmp/tree/lin/bin"
printf 'family = "windows"\n' >"$tmp/tree/win/manifest.txt"
printf 'family = "linux"\n' >"$tmp/tree/lin/manifest.txt"
head -c 200000 /dev/urandom >"$tmp/tree/lin/bin/payload"
xorriso -as mkisofs -quiet -R -J -o "$iso/windows.iso" "$tmp/tree/win" 2>/dev/null
xorriso -as mkisofs -quiet -R -J -o "$iso/linux.iso" "$tmp/tree/lin" 2>/dev/null
hashdata() {  # hashdata BLOCKSIZE [OPTIONS] IMAGE OUT
  local bs=$1
  shift
  "$tool" hashdata create --quiet --block-size "$bs" --key "$certs/signers/maker.key" \
    --cert "$tmp/maker.bundle" "$@" >/dev/null
}
hashdata 2048 "$iso/windows.iso" "$iso/windows.iso.sha"
hashdata 4096 --embed-signature "$iso/linux.iso" "$iso/linux.iso.sha"
map=$iso/isoimages_manifest.txt
printf 'windows9-64 = "windows.iso"\nrhel6 = "linux.iso"\n' >"$map"
"$src/scripts/make-test-pki" sign "$certs" maker "$map" "$map.sig"

out=$("$tool" tools image --json "$tmp/tools" windows9-64)
check_exit "map chooses the Windows image" 0 $? "$out" '"source": "map"'

out=$("$tool" tools verify "$iso/windows.iso")
check_exit "verify a detached signature" 0 $? "$out" "signature:  detached, valid"
out=$("$tool" tools verify --cert "$certs/tvxpartner.cert" "$iso/windows.iso" 2>&1)
check_exit "another certificate named with --cert is the only trust" 3 $? "$out" "Signature verification failed"
out=$("$tool" tools cat "$iso/linux.iso" bin/payload | cmp - "$tmp/tree/lin/bin/payload" 2>&1)
check_exit "cat a file byte-exact" 0 $? "$out"

port=$(/usr/bin/python3 -c 'import socket; s=socket.socket(); s.bind(("127.0.0.1",0)); print(s.getsockname()[1])')
printf 'server.document-root = "%s"\nserver.bind = "127.0.0.1"\nserver.port = %s\nmimetype.assign = ("" => "application/octet-stream")\n' \
    "$iso" "$port" >"$tmp/lighttpd.conf"
lighttpd -D -f "$tmp/lighttpd.conf" 2>/dev/null &
web_pid=$!
for _ in $(seq 50); do (exec 3<>"/dev/tcp/127.0.0.1/$port") 2>/dev/null && break; sleep 0.1; done
out=$("$tool" tools verify --json "http://127.0.0.1:$port/linux.iso?v=1")
check_exit "verify over HTTP with an embedded signature" 0 $? "$out" '"verified": true'

# Flip one byte inside the payload: verify names its block, cat fails.
offset=$(/usr/bin/python3 -c 'import sys; d=open(sys.argv[1],"rb").read(); print(d.find(open(sys.argv[2],"rb").read(4096)) + 70000)' \
  "$iso/linux.iso" "$tmp/tree/lin/bin/payload")
printf 'X' | dd of="$iso/linux.iso" bs=1 seek="$offset" conv=notrunc status=none
out=$("$tool" tools verify --json "$iso/linux.iso")
check_exit "flipped byte found" 1 $? "$out" "\"firstBadBlock\": $((offset / 4096))"
out=$("$tool" tools cat "$iso/linux.iso" bin/payload 2>&1 >/dev/null)
check_exit "cat through a bad block fails" 1 $? "$out" "Invalid data at offset"

exit $((fails > 0))
