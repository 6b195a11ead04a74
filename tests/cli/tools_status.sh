#!/usr/bin/env bash
# tvxguest tools status / save-info: usage errors, the JSON report of a
# machine whose tools directory offers no image (the legacy number decides),
# a save and the status read back from it, and a refused save that leaves
# the extended config file as it was.
set -uo pipefail
tool=${TVX_TOOL:?}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
. "$(dirname "$0")/lib/check.sh"

printf 'guestOS = "winXPPro"\nlibdir = "%s/none"\nextendedConfigFile = "vm.xml"\n' "$work" >"$work/vm.tvx"
echo '<vm><keep/></vm>' >"$work/vm.xml"

out=$("$tool" tools status --mode 2>&1); st=$?
check_exit "status without a value for --mode" 64 $st "$out" "Try 'tvxguest tools status --help'"
out=$("$tool" tools status --tools-version 4294967296 "$work/vm.tvx" 2>&1); st=$?
check_exit "status with a legacy number beyond 32 bits" 64 $st "$out" "--tools-version"
out=$("$tool" tools status "$work/missing.tvx" 2>&1); st=$?
check_exit "status of a configuration that does not exist" 66 $st "$out" "cannot read"

out=$("$tool" tools status --json --tools-version 9216 --guest-manifest /dev/null "$work/vm.tvx"); st=$?
check_exit "JSON of an XP guest between its limits" 0 $st "$out" \
  '"status": 2, "statusName": "TOOLS_STATUS_SUPPORTED_OLD", "evaluated": false, "manifestStatus": 9'
check_exit "  with the limits" 0 0 "$out" '"minVersion": 8384, "maxVersion": 10252'

printf '<a><tools><monolithic guestVersion="9.0" status="4"/></tools></a>' >"$work/agent.xml"
printf 'null\n' >"$work/null.txt"
out=$("$tool" tools save-info "$work/vm.tvx" --agent-xml "$work/agent.xml" --manifest "$work/null.txt" \
  --install-error -5 --counter 2); st=$?
check_exit "save-info of an agent report" 0 $st "$out" "saved"
check_exit "  keeps the other elements" 0 0 "$(xmllint --xpath 'count(/vm/keep)' "$work/vm.xml")" "1"
check_exit "  writes the install info" 0 0 "$(xmllint --xpath 'string(//installError)' "$work/vm.xml")" "-5"
out=$("$tool" tools status --tools-version 9216 "$work/vm.tvx"); st=$?
check_exit "status read back as saved" 0 $st "$out" "TOOLS_STATUS_SUPPORTED_NEW (4)"

cp "$work/vm.xml" "$work/before.xml"
printf '<a><tools>' >"$work/bad.xml"
out=$("$tool" tools save-info "$work/vm.tvx" --agent-xml "$work/bad.xml" 2>&1); st=$?
check_exit "save-info of malformed XML" 1 $st "$out" "ToolsVersion: Error parsing xml from update agent."
cmp -s "$work/vm.xml" "$work/before.xml"
check_exit "  leaves the file as it was" 0 $?

[ $fails -eq 0 ] && echo "all passed"
exit $((fails > 0))
