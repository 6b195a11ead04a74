#!/usr/bin/env bash
# Mac OS X media, probed by name only (Guess_MacOS is not in the sequence).
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/macos
guide="Boot Camp Installation & Setup Guide.pdf"

image "$out" lion "Install Mac OS X Lion.app=x" "$guide=x"
image "$out" bootcamp-root "$guide=x"
image "$out" bootcamp-docs "Boot Camp/Documentation/$guide=x"
image "$out" none "Boot Camp/$guide=x"
