#!/usr/bin/env bash
# Solaris media (a release directory at the root, or .image_info for 11) and
# NetWare media (a release directory at the root).
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/solaris
info='IMAGE_SIZE=735000\nIMAGE_TYPE=Oracle Solaris 11.4 Text Install X86\nGRUB_MIN_MEM64=0\n'

# Listings come in ISO 9660 name order, so boot/ and Copyright come first.
image "$out" sol10 .cdtoc=x Copyright=x Solaris_10/Tools/ boot/
image "$out" sol10-upper SOLARIS_10/ boot/
image "$out" sol9 Copyright=x Solaris_9/
image "$out" sol8 Solaris_8/
image "$out" sol27 Solaris_2.7/
image "$out" sol11 ".image_info=$info" boot/ solaris.zlib=x
image "$out" sol11-other ".image_info=IMAGE_TYPE=OpenIndiana Hipster\n" Copyright=x Solaris_9/
image "$out" sol11-binary ".image_info=\x00Oracle Solaris 11" boot/
image "$out" sol-none README=x boot/

image "$1/netware" nw65 NW65OS/ install/ license/
image "$1/netware" nw6-upper NETWARE6/
image "$1/netware" nw51-first nw51/ nw65os/
image "$1/netware" nw-none NW4/ readme.txt=x
