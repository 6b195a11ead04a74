#!/usr/bin/env bash
# FreeBSD media: the kernel's ELF machine and the first line of RELNOTES.TXT.
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/freebsd

# elf MACHINE: printf %b escapes of a 64-bit little-endian ELF header
# (FreeBSD ABI, executable) whose e_machine is MACHINE; 64 bytes in all.
elf() {
  local lo=$(($1 & 255)) hi=$(($1 >> 8))
  printf '\\x7fELF\\x02\\x01\\x01\\x09%s\\x02\\x00\\x%02x\\x%02x\\x01\\x00\\x00\\x00%s' \
    "$(printf '\\x00%.0s' 1 2 3 4 5 6 7 8)" "$lo" "$hi" "$(printf '\\x00%.0s' $(seq 40))"
}
amd64=$(elf 62) i386=$(elf 3) i486=$(elf 6) i860=$(elf 7) arm64=$(elf 183) arm=$(elf 40)
notes() { printf 'RELNOTES.TXT=%s Release Notes\\n\\nThe FreeBSD Project\\n' "$1"; }

image "$out" fbsd13-64 "boot/kernel/kernel=$amd64" "$(notes 'FreeBSD 13.2-RELEASE')"
image "$out" fbsd13-32 "boot/kernel/kernel=$i386" "$(notes 'FreeBSD 13.2-RELEASE')"
image "$out" fbsd13-arm "boot/kernel/kernel=$arm64" "$(notes 'FreeBSD 13.1-RELEASE')"
image "$out" fbsd14-64 "boot/kernel/kernel=$amd64" "$(notes 'FreeBSD 14.0-RELEASE')"
image "$out" fbsd14-32 "boot/kernel/kernel=$i386" "$(notes 'FreeBSD 14.0-RELEASE')"
image "$out" fbsd14-arm "boot/kernel/kernel=$arm64" "$(notes 'FreeBSD 14.0-RELEASE')"
image "$out" fbsd12-64 "boot/kernel/kernel=$amd64" "$(notes 'FreeBSD 12.4-RELEASE')"
image "$out" fbsd12-486 "boot/kernel/kernel=$i486" "$(notes 'FreeBSD 12.4-RELEASE')"
image "$out" fbsd12-arm "boot/kernel/kernel=$arm64" "$(notes 'FreeBSD 12.4-RELEASE')"
image "$out" fbsd11-32 "boot/kernel/kernel=$i860" "$(notes 'FreeBSD 11.4-RELEASE')"
image "$out" fbsd10-64 "boot/kernel/kernel=$amd64" "$(notes 'FreeBSD 10.4-RELEASE')"
image "$out" fbsd-nonotes "boot/kernel/kernel=$amd64"
image "$out" fbsd14-line2 "boot/kernel/kernel=$amd64" "RELNOTES.TXT=Release Notes\nFreeBSD 14.0-RELEASE\n"
image "$out" fbsd13-crlf "boot/kernel/kernel=$amd64" "RELNOTES.TXT=FreeBSD 13.2-RELEASE\r\n"
image "$out" fbsd4-old "kernel=$i386" "$(notes 'FreeBSD 4.11-RELEASE')"
image "$out" fbsd13-plain -plain "boot/kernel/kernel=$amd64" "$(notes 'FreeBSD 13.2-RELEASE')"
image "$out" fbsd-arm32 "boot/kernel/kernel=$arm" "$(notes 'FreeBSD 13.2-RELEASE')"
image "$out" fbsd-short "boot/kernel/kernel=\x7fELF\x02\x01\x01\x09\x00\x00\x00\x00\x00\x00\x00\x00\x02\x00" \
  "$(notes 'FreeBSD 13.2-RELEASE')"
image "$out" fbsd-empty "boot/kernel/kernel=" "$(notes 'FreeBSD 13.2-RELEASE')"
image "$out" fbsd-notes-only "$(notes 'FreeBSD 13.2-RELEASE')"
