# Look inside a sample image: the reader that served, the volume and the root.
echo "== media ls $(basename "$media/iso9660/rr-joliet.iso")"
"$tool" media ls "$media/iso9660/rr-joliet.iso"
