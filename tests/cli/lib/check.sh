# Sourced by the command-line tests: the tool, a scratch directory $tmp that
# goes when the test ends, and the checks. Every check prints "ok: WHAT" or
# "FAIL: WHAT" and counts failures in $fails; a test ends with
# `exit $((fails > 0))`.
tool=${TVX_TOOL:?}
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
fails=0
check() {  # check WHAT COMMAND...: the command must succeed
  local what=$1; shift
  if "$@"; then echo "ok: $what"; else echo "FAIL: $what"; fails=$((fails + 1)); fi
}
check_exit() {  # check_exit WHAT EXPECTED_STATUS ACTUAL_STATUS [OUTPUT PATTERN]
  local what=$1 want=$2 got=$3
  if [ "$want" != "$got" ]; then
    echo "FAIL: $what: exit $got, expected $want"; echo "${4:-}"; fails=$((fails + 1)); return
  fi
  if [ $# -ge 5 ] && ! grep -qF -- "$5" <<<"$4"; then
    echo "FAIL: $what: output lacks '$5':"; echo "$4"; fails=$((fails + 1)); return
  fi
  echo "ok: $what"
}
status() {  # status EXPECTED COMMAND...: the command's exit status, its output dropped
  local want=$1
  shift
  "$@" >/dev/null 2>&1
  [ $? -eq "$want" ]
}
json() {  # json JSON EXPRESSION: j[...] of the parsed JSON, as JSON text
  /usr/bin/python3 -c 'import json,sys; j=json.loads(sys.argv[1]); print(json.dumps(eval(sys.argv[2])))' "$1" "$2"
}
need_pki() {  # makes the test PKI in $certs, the build's own certificate directory, or skips
  certs=${TVX_CERT_DIR:-}
  if [ -z "$certs" ]; then
    echo "skip: the build trusts a certificate directory outside its tree"
    exit $((fails > 0))
  fi
  "${TVX_SOURCE_DIR:?}/scripts/make-test-pki" "$certs" || { echo "FAIL: make-test-pki"; exit 1; }
}
