#!/usr/bin/env bash
# tvxguest tools status / save-info: usage errors, the JSON report of a
# machine whose tools directory offers no image (the legacy number decides),
# a save and the status read back from it, and a refused save that leaves
# the extended config file as it was.
set -uo pipefail
. "$(dirname "$0")/lib/check.sh"

printf 'guestOS = "winXPPro"\nlibdir = "%s/none"\nextendedConfigFile = "vm.xml"\n' "$tmp" >"$tmp/vm.tvx"
echo '<vm><keep/></vm>' >"$tmp/vm.xml"

out=$("$tool" tools status --mode 2>&1); st=$?
check_exit "status without a value for --mode" 64 $st "$out" "Try 'tvxguest tools status --help'"
out=$("$tool" tools status --tools-version 4294967296 "$tmp/vm.tvx" 2>&1); st=$?
check_exit "status with a legacy number beyond 32 bits" 64 $st "$out" "--tools-version"
out=$("$tool" tools status "$tmp/missing.tvx" 2>&1); st=$?
check_exit "status of a configuration that does not exist" 66 $st "$out" "cannot read"

out=$("$tool" tools status --json --tools-version 9216 --guest-manifest /dev/null "$tmp/vm.tvx"); st=$?
check_exit "JSON of an XP guest between its limits" 0 $st "$out" \
  '"status": 2, "statusName": "TOOLS_STATUS_SUPPORTED_OLD", "evaluated": false, "manifestStatus": 9'
check_exit "  with the limits" 0 0 "$out" '"minVersion": 8384, "maxVersion": 10252'

printf '<a><tools><monolithic guestVersion="9.0" status="4"/></tools></a>' >"$tmp/agent.xml"
printf 'null\n' >"$tmp/null.txt"
out=$("$tool" tools save-info "$tmp/vm.tvx" --agent-xml "$tmp/agent.xml" --manifest "$tmp/null.txt" \
  --install-error -5 --counter 2); st=$?
check_exit "save-info of an agent report" 0 $st "$out" "saved"
check_exit "  keeps the other elements" 0 0 "$(xmllint --xpath 'count(/vm/keep)' "$tmp/vm.xml")" "1"
check_exit "  writes the install info" 0 0 "$(xmllint --xpath 'string(//installError)' "$tmp/vm.xml")" "-5"
out=$("$tool" tools status --tools-version 9216 "$tmp/vm.tvx"); st=$?
check_exit "status read back as saved" 0 $st "$out" "TOOLS_STATUS_SUPPORTED_NEW (4)"

cp "$tmp/vm.xml" "$tmp/before.xml"
printf '<a><tools>' >"$tmp/bad.xml"
out=$("$tool" tools save-info "$tmp/vm.tvx" --agent-xml "$tmp/bad.xml" 2>&1); st=$?
check_exit "save-info of malformed XML" 1 $st "$out" "ToolsVersion: Error parsing xml from update agent."
cmp -s "$tmp/vm.xml" "$tmp/before.xml"
check_exit "  leaves the file as it was" 0 $?

exit $((fails > 0))
