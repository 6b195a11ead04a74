#!/usr/bin/env bash
# SUSE family media: the root "content" file, else "media.1/products", else a
# ".S.u.S.E-disk-*" marker at the root; an isolinux.cfg in one of the loader
# directories sets whether the medium boots with isolinux.
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/suse
ld64=boot/x86_64/loader/isolinux.cfg@suse/isolinux.cfg
ld32=boot/i386/loader/isolinux.cfg@suse/isolinux.cfg
ld=boot/loader/isolinux.cfg@suse/isolinux.cfg

image "$out" sles10sp2 content@suse/content-sles10sp2 "$ld64"
image "$out" opensuse111 content@suse/content-opensuse111 "$ld64"
image "$out" opensuse132 content@suse/content-opensuse132 "$ld64"
image "$out" leap421 content@suse/content-leap421 "$ld64"
image "$out" sled12 content@suse/content-sled12 "$ld64"

# name | content | more entries
table "$out" content <<EOT
sles10sp3       | PRODUCT SUSE SLES\nVERSION 10.3\nDEFAULTBASE x86_64\n              | $ld64
sled10          | PRODUCT SUSE SLED\nVERSION 10\nDEFAULTBASE i586\n                 | $ld32
sled10sp3       | PRODUCT SUSE SLED\nVERSION 10.3\nDEFAULTBASE i586\n               | $ld32
sled11sp1       | PRODUCT SUSE SLED\nVERSION 11.1\nDEFAULTBASE i586\n               | $ld32
sles11          | PRODUCT SUSE_SLES\nVERSION 11\nBASEARCHS x86_64\n                 | $ld64
sles9           | PRODUCT SUSE SLES\nVERSION 9\nDEFAULTBASE x86_64\n                | $ld
sles12-s390     | REPOID obsproduct://build.suse.de/SUSE:SLE-12:GA/SLES/12/POOL/s390x\n
sled12-mixed    | PRODUCT openSUSE\nVERSION 13.1\nREPOID obsproduct://build.suse.de/SUSE:SLE-12:GA/SLED/12/POOL/x86_64\nPRODUCT SUSE SLES\nVERSION 10.1\n
sles-tarvex     | PRODUCT SLES-for-Tarvex\nVERSION 11.2\nBASEARCHS x86_64\n          | $ld64
suselinux       | PRODUCT SuSE Linux\nVERSION 10.0\nDEFAULTBASE i586\n              | $ld
opensuse113     | NAME openSUSE\nVERSION 11.3\nBASEARCHS i586\n                     | $ld32
opensuse121     | NAME openSUSE\nVERSION 12.1\nBASEARCHS x86_64\n                   | $ld64
opensuse131     | NAME openSUSE\nVERSION 13.1\nBASEARCHS x86_64\n                   | $ld64
opensuse-nover  | NAME openSUSE\nBASEARCHS i586\n
noproduct131    | CONTENTSTYLE 11\nVERSION 13.1\n                                   | $ld32
first-product   | PRODUCT SUSE SLES\nNAME openSUSE\nVERSION 10.1\nDEFAULTBASE i586\n
first-arch      | BASEARCHS i586 x86_64\nDEFAULTBASE x86_64\nNAME openSUSE\nVERSION 12.3\n
nld9            | PRODUCT Novell Linux Desktop\nVERSION 9\n
sjds            | PRODUCT Sun Java Desktop System\nVERSION 2\n
unknown         | PRODUCT Foo Linux\nVERSION 1.0\nDEFAULTBASE x86_64\n
unknown-repo132 | REPOID obsproduct://build.opensuse.org/openSUSE:13.2/openSUSE/13.2/POOL/x86_64\nPRODUCT Foo Linux\n
content-wins    | PRODUCT Foo Linux\n                                              | media.1/products=/\x20SLES15\x2015-0\n
bad-empty       |
bad-binary      | \x00\x01PRODUCT SUSE SLES\xff\xfe\n
bad-crlf        | PRODUCT SUSE SLES\r\nVERSION 10.2\r\nDEFAULTBASE x86_64\r\n
bad-keys-only   | PRODUCT\nVERSION\nREPOID\nBASEARCHS\n\n\n   \n
bad-version     | NAME openSUSE\nVERSION 99999999999999999999.-7\n
EOT

# name | media.1/products | more entries
table "$out" media.1/products <<EOT
p-sled11-64     | /\x20SUSE-Linux-Enterprise-Desktop-x86_64\x2011\n                  | $ld64
p-sles10-32     | /\x20SUSE-Linux-Enterprise-Server-i386\x2010\n                     | $ld32
p-sles12-64     | /\x20SUSE-Linux-SLES-x86_64\x2012\n                                | $ld64
p-sles9         | /\x20SUSE-Linux-Enterprise-Server-i386\x209\n
p-suse-64       | /\x20SUSE-Linux-10.1-x86-64\x2010.1\n                              | $ld
p-suse          | /\x20SuSE-Linux-9.3-i386\x209.3\n
p-nld9          | /\x20SLES9-SLD\x209\n
p-sjds          | /\x20SLES8-SLEC-i386-SUN\x201\n
p-leap15-64     | /\x20openSUSE-Leap\x2015.2-0\n                                     | $ld64 x86_64/
p-leap15-32     | /\x20openSUSE-Leap\x2015.2-0\n
p-tumbleweed    | /\x20openSUSE\x2020180101-0\n                                      | x86_64/
p-sles15        | /\x20SLES15\x2015-0\n
p-unknown       | /\x20Foo-Linux\x201\n
p-short         | /
EOT

image "$out" disk-marker ".S.u.S.E-disk-001.30_08_2004=" suse/
image "$out" no-marker "S.u.S.E-disk-001=" suse/

# One "content" line of 1 MiB, without line ends.
big=$(mktemp)
trap 'rm -f "$big"' EXIT
{ printf 'PRODUCT SUSE SLES '; head -c 1048576 /dev/zero | tr '\0' 'x'; } >"$big"
image "$out" bad-huge "content@$big"
