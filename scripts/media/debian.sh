#!/usr/bin/env bash
# Debian and Ubuntu media: ".disk/info" decides, "isolinux/isolinux.cfg" sets
# whether the medium boots with isolinux. One row per image:
#   name | .disk/info text | more entries
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/debian
iso=isolinux/isolinux.cfg@debian/isolinux.cfg

table "$out" .disk/info <<EOT
deb4-i386        | Debian GNU/Linux 4.0 r0 "Etch" - Official i386 CD Binary-1 20070407-11:55 | $iso
deb5-amd64       | Debian GNU/Linux 5.0.10 "Lenny" - Official amd64 CD Binary-1 20120310-23:53 | $iso
deb6-i386        | Debian GNU/Linux 6.0.10 "Squeeze" - Official i386 NETINST Binary-1 20140719-15:13 | $iso
deb7-amd64       | Debian GNU/Linux 7.11.0 "Wheezy" - Official amd64 CD Binary-1 20160604-15:34 | $iso
deb8-i386        | Debian GNU/Linux 8.11.1 "Jessie" - Official i386 NETINST Binary-1 20190211-02:00 | $iso
deb9-amd64       | Debian GNU/Linux 9.13.0 "Stretch" - Official amd64 NETINST 20200718-11:07 | $iso
deb9-arm64       | Debian GNU/Linux 9.13.0 "Stretch" - Official arm64 NETINST 20200718-11:07
deb10-amd64      | Debian GNU/Linux 10.4.0 "Buster" - Official amd64 NETINST 20200509-10:25 | $iso
deb10-arm64      | Debian GNU/Linux 10.4.0 "Buster" - Official arm64 NETINST 20200509-10:25
deb11-amd64      | Debian GNU/Linux 11.6.0 "Bullseye" - Official amd64 NETINST 20221217-10:42 | $iso
deb11-arm64      | Debian GNU/Linux 11.6.0 "Bullseye" - Official arm64 NETINST 20221217-10:42
deb11-noisolinux | Debian GNU/Linux 11.6.0 "Bullseye" - Official i386 NETINST 20221217-10:42
deb12-amd64      | Debian GNU/Linux 12.2.0 "Bookworm" - Official amd64 NETINST with firmware 20231007-10:28 | $iso
deb10-noarch     | Debian GNU/Linux 10.4.0 "Buster" - Official s390x NETINST 20200509-10:25
deb-amd64-first  | Debian GNU/Linux 3.1 r8 "Sarge" - Official amd64 Binary-1 (20080419) | $iso

ubu-704          | Ubuntu 7.04 "Feisty Fawn" - Release i386 (20070415) | $iso
ubu-710          | Ubuntu 7.10 "Gutsy Gibbon" - Release i386 (20071016) | $iso
kubu-804         | Kubuntu 8.04 "Hardy Heron" - Release amd64 (20080423) | $iso
xubu-1004        | Xubuntu 10.04 LTS "Lucid Lynx" - Release i386 (20100427) | $iso
edubu-804        | Edubuntu 8.04 "Hardy Heron" - Release i386 (20080423) | $iso
ubu-1404         | Ubuntu 14.04 LTS "Trusty Tahr" - Release amd64 (20140417) | $iso
ubu-140402       | Ubuntu 14.04.2 LTS "Trusty Tahr" - Release amd64 (20150218.1) | $iso
ubu-1410         | Ubuntu 14.10 "Utopic Unicorn" - Release amd64 (20141022.1) | $iso
ubu-1504         | Ubuntu 15.04 "Vivid Vervet" - Release i386 (20150422) | $iso
ubu-2004         | Ubuntu 20.04.1 LTS "Focal Fossa" - Release amd64 (20200731) | $iso
ubu-2004-noiso   | Ubuntu 20.04.1 LTS "Focal Fossa" - Release amd64 (20200731)
ubu-2010         | Ubuntu 20.10 "Groovy Gorilla" - Release amd64 (20201022)
ubu-2204-arm     | Ubuntu 22.04.3 LTS "Jammy Jellyfish" - Release arm64 (20230807.2)
ubu-oneword      | Ubuntu-amd64
ubu-noarch       | Ubuntu 18.04.5 LTS "Bionic Beaver" - Release ppc64el (20200806.1)

srv-804          | Ubuntu-Server 8.04.4 LTS "Hardy Heron" - Release i386 (20100121.1) | $iso
srv-810          | Ubuntu-Server 8.10 "Intrepid Ibex" - Release amd64 (20081029.1) | $iso
srv-1404         | Ubuntu-Server 14.04.1 LTS "Trusty Tahr" - Release amd64 (20140722.2) | $iso
srv-140402       | Ubuntu-Server 14.04.2 LTS "Trusty Tahr" - Release amd64 (20150218.1) | $iso
srv-140405       | Ubuntu-Server 14.04.5 LTS "Trusty Tahr" - Release i386 (20160803) | $iso
srv-1410         | Ubuntu-Server 14.10 "Utopic Unicorn" - Release amd64 (20141022.1) | $iso
srv-1604         | Ubuntu-Server 16.04.7 LTS "Xenial Xerus" - Release amd64 (20200810) | $iso

# Damaged markers: never a crash, at most a recognition the rules allow.
bad-empty        |
bad-binary       | \x7fELF\x02\x01\x01\x00\x00Ubuntu amd64\x00\xff\xfe
bad-nul-early    | Ubuntu\x00 20.04 amd64
bad-crlf         | Ubuntu 20.04.1 LTS "Focal Fossa" - Release amd64 (20200731)\r\n | $iso
bad-spaces       | Ubuntu\x20\x20\x20\x20\x20\x20\x20\x20 | $iso
bad-longword     | Ubuntu 14.04.0000000000000000000000000000000000000000000000000000000000001 amd64
EOT

# A release line without line ends, 1 MiB long.
big=$(mktemp)
trap 'rm -f "$big"' EXIT
{ printf 'Ubuntu 20.04 amd64 '; head -c 1048576 /dev/zero | tr '\0' 'x'; } >"$big"
image "$out" bad-huge ".disk/info@$big"
# The same release on a UDF bridge image.
image "$out" ubu-2004-udf -udf ".disk/info=Ubuntu 20.04.1 LTS \"Focal Fossa\" - Release amd64 (20200731)" "$iso"
