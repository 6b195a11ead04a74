# Recognise the guest OS on the sample images: image, guest OS, display text
# and the version class where there is one.
source "$root/scripts/demo.d/samples.bash"
echo "== detect: guest OS of each sample image"
while IFS= read -r img; do
  json=$("$tool" detect --json "$img" 2>/dev/null) || true
  /usr/bin/python3 - "${img#"$media"/}" "$json" <<'PY'
import json, sys
o = json.loads(sys.argv[2])
cls = " [%s]" % o["versionName"][len("GUESS_VERSION_"):] if o["version"] else ""
print("  %-40s %-22s %s%s" % (sys.argv[1], o["guestOS"] or "-", o["displayText"] or "(not recognised)", cls))
PY
done < <(demo_images)
