#!/usr/bin/env bash
# Mac OS X media, probed by name only (Guess_MacOS is not in the sequence).
set -euo pipefail
. "$SRC/scripts/media/lib/mkimage.bash"
out=$1/macos
guide="Boot Camp Installation & Setup Guide.pdf"

# The Lion installer is an application bundle: a folder, not a file.
lion_app="Install Mac OS X Lion.app/Contents/Info.plist=<plist version=\"1.0\"></plist>\n"
image "$out" lion "$lion_app" "$guide=x"
image "$out" lion-udf -udf "$lion_app"
image "$out" lion-file "Install Mac OS X Lion.app=x"
image "$out" bootcamp-root "$guide=x"
image "$out" bootcamp-docs "Boot Camp/Documentation/$guide=x"
image "$out" none "Boot Camp/$guide=x"
