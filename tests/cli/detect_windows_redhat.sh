#!/usr/bin/env bash
# tvxguest detect on image-based Windows and Red Hat family media: what a
# person sees (display text, editions) and the exit status scripts rely on.
set -uo pipefail
tool=${TVX_TOOL:?} media=${TVX_MEDIA_DIR:?}
fail=0
check() {  # check WHAT COND...
  local what=$1; shift
  if "$@"; then echo "ok: $what"; else echo "FAIL: $what"; fail=1; fi
}
field() {  # field IMAGE KEY
  "$tool" detect --json "$media/$1.iso" 2>/dev/null |
    /usr/bin/python3 -c "import json,sys; print(json.load(sys.stdin)['$2'])"
}

# Windows 8.1 and Server 2012 R2 are shown by their own name.
check "win81-x64 displayText" test "$(field windows/win81-x64 displayText)" = "Windows 8.1 x64"
check "server2012r2 displayText" \
  test "$(field windows/server2012r2 displayText)" = "Windows Server 2012 R2"
check "win10-esd-x86 versionName" \
  test "$(field windows/win10-esd-x86 versionName)" = GUESS_VERSION_WINDOWS_10_ESD
check "centos7 guestOS and class" \
  test "$(field redhat/centos7 guestOS)/$(field redhat/centos7 versionName)" = \
  centos7-64/GUESS_VERSION_CENTOS_7
check "fedora35-aarch64 has no isolinux configuration" \
  test "$(field redhat/fedora35-aarch64 noIsolinuxConfig)" = True

"$tool" detect "$media/windows/server2019.iso" >/tmp/$$.human
check "human output lists the editions" grep -q 'Windows Server 2019 SERVERDATACENTER' /tmp/$$.human
rm -f /tmp/$$.human

"$tool" detect "$media/windows/winmain-client.iso" >/dev/null 2>&1
check "unknown client branch: exit 1" test $? -eq 1
"$tool" detect "$media/redhat/ppc64.iso" >/dev/null 2>&1
check "unknown architecture: exit 1" test $? -eq 1
check "not recognised still reports en-US" \
  test "$(field redhat/ppc64 language)" = en-US

exit $fail
