# Recognition across the Linux, Unix and hypervisor families: one or two
# samples of each (their test media hold many more rows).
echo "== detect: Linux, Unix and hypervisor samples"
for sample in debian/deb11-amd64 debian/ubu-2004 debian/ubu-2204-arm debian/srv-140402 \
  suse/sles10sp2 suse/sled12 suse/leap421 suse/p-sles15 mandriva/mdv2006-64 \
  mandriva/vol2010-32 mandriva/turbo8 mandriva/lumen-64 solaris/sol10 solaris/sol11 \
  netware/nw65 freebsd/fbsd13-64 freebsd/fbsd14-arm orka/orka41 orka/orkai65; do
  json=$("$tool" detect --json "$media/$sample.iso" 2>/dev/null) || true
  /usr/bin/python3 - "$sample" "$json" <<'PY'
import json, sys
o = json.loads(sys.argv[2])
print("  %-24s %-20s %-40s %s" % (sys.argv[1], o["guestOS"] or "-", o["versionName"],
                                  o["displayText"] or "(not recognised)"))
PY
done
