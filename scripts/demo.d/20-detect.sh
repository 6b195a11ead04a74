# Recognise the guest OS on the sample images, all in one batch run: image,
# guest OS, display text and the version class where there is one.
source "$root/scripts/demo.d/samples.bash"
echo "== detect: guest OS of each sample image"
mapfile -t images < <(demo_images)
"$tool" detect --json "${images[@]}" 2>/dev/null | /usr/bin/python3 -c '
import json, sys
root = sys.argv[1]
for line in sys.stdin:
    o = json.loads(line)
    cls = " [%s]" % o["versionName"][len("GUESS_VERSION_"):] if o["version"] else ""
    print("  %-40s %-22s %s%s" % (o["path"].removeprefix(root), o["guestOS"] or "-",
                                  o["displayText"] or "(not recognised)", cls))
' "$media/" || true
