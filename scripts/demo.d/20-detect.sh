# Recognise the guest OS on the sample images: image, guest OS, display text
# and the version class where there is one.
# Families with many test images (one per rule of their recogniser) show a
# few samples named here; every image of the other families is shown.
sampled_families=(windows redhat debian suse mandriva solaris netware freebsd orka macos)
samples=(
  windows/win7-x64 windows/win81-x64 windows/win10-x64 windows/win10-enterprise
  windows/server2012r2 windows/server2019 windows/server2022 windows/win11
  redhat/rhel7-server-workstation redhat/rhel8-x64 redhat/centos7 redhat/centos7-minimal
  redhat/centos8-stream redhat/fedora29 redhat/fedora-live-x64 redhat/oracle8
  debian/deb11-amd64 debian/deb10-arm64 debian/ubu-2004 debian/ubu-2204-arm
  debian/srv-140402 suse/sles10sp2 suse/sled12 suse/leap421 suse/p-sles15
  mandriva/mdv2006-64 mandriva/vol2010-32 mandriva/turbo8 mandriva/lumen-64
  solaris/sol10 solaris/sol11 netware/nw65 freebsd/fbsd13-64 freebsd/fbsd14-arm
  orka/orka41 orka/orkai65
)
echo "== detect: guest OS of each sample image"
detect_images() {
  local img family
  while IFS= read -r -d '' img; do
    family=${img#"$media"/}
    family=${family%%/*}
    [[ " ${sampled_families[*]} " == *" $family "* ]] || printf '%s\n' "$img"
  done < <(find "$media" -name '*.iso' -print0 | sort -z)
  for img in "${samples[@]}"; do printf '%s\n' "$media/$img.iso"; done
}
while IFS= read -r img; do
  json=$("$tool" detect --json "$img" 2>/dev/null) || true
  /usr/bin/python3 - "${img#"$media"/}" "$json" <<'PY'
import json, sys
o = json.loads(sys.argv[2])
cls = " [%s]" % o["versionName"][len("GUESS_VERSION_"):] if o["version"] else ""
print("  %-40s %-22s %s%s" % (sys.argv[1], o["guestOS"] or "-", o["displayText"] or "(not recognised)", cls))
PY
done < <(detect_images)
