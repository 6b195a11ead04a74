# Recognise the guest OS on every sample image: image, guest OS, display text.
echo "== detect: guest OS of each sample image"
while IFS= read -r -d '' img; do
  json=$("$tool" detect --json "$img" 2>/dev/null) || true
  /usr/bin/python3 - "${img#"$media"/}" "$json" <<'PY'
import json, sys
o = json.loads(sys.argv[2])
print("  %-40s %-22s %s" % (sys.argv[1], o["guestOS"] or "-", o["displayText"] or "(not recognised)"))
PY
done < <(find "$media" -name '*.iso' -print0 | sort -z)
