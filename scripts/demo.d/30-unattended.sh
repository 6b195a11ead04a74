# Unattended install on the sample images: whether it is offered and with
# which limits, then one refused answer per family, as the host would show it.
source "$root/scripts/demo.d/samples.bash"
echo "== unattended: support and answer limits of the sample images"
linux_img="" windows_img=""
while IFS= read -r img; do
  json=$("$tool" unattended support --json "$img" 2>/dev/null) || true
  [ -n "$json" ] || continue
  line=$(/usr/bin/python3 - "${img#"$media"/}" "$json" <<'PY'
import json, sys
o = json.loads(sys.argv[2])
if o["guestOS"] is None:
    sys.exit(0)
c = o["config"] or {}
limits = "user %s, name %s, password %s" % (
    c.get("shortNameMaxLength") or "-", c.get("nameMaxLength"), c.get("passwordMaxLength"))
print("%s\t%s\t  %-40s %-22s %-12s %s" % (o["family"], "1" if o["supported"] else "0",
      sys.argv[1], o["guestOS"], "offered" if o["supported"] else "not offered", limits))
PY
)
  [ -n "$line" ] || continue
  IFS=$'\t' read -r family offered text <<<"$line"
  echo "$text"
  if [ "$offered" = 1 ] && [ "$family" = linux ] && [ -z "$linux_img" ]; then linux_img=$img; fi
  if [ "$offered" = 1 ] && [ "$family" = windows ] && [ -z "$windows_img" ]; then windows_img=$img; fi
done < <(demo_images)

for pair in "linux|short-name|Bob" "windows|name|Doe, John"; do
  IFS='|' read -r family kind text <<<"$pair"
  img=$linux_img
  [ "$family" = windows ] && img=$windows_img
  [ -n "$img" ] || continue
  echo "== unattended: validate $kind '$text' for ${img#"$media"/}"
  "$tool" unattended validate --kind "$kind" --text "$text" "$img" | sed 's/^/  /' || true
done
echo "== windows-name: display names of raw image names"
for raw in "Windows 10 ENTERPRISEN" "Windows Longhorn SERVERSTANDARD" \
           "Windows Server 2008 R2 SERVERSTANDARDACORE"; do
  printf '  %-45s -> %s\n' "$raw" "$("$tool" windows-name "$raw")"
done
