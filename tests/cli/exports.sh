#!/usr/bin/env bash
# The shared library exports exactly the functions the public headers mark
# TVX_EXPORT, under their C names: a missing one fails a host's link, an extra
# one is internal code a host could come to depend on.
set -uo pipefail
src=${TVX_SOURCE_DIR:?}
. "$(dirname "$0")/lib/check.sh"
lib=$(dirname "$tool")/libtvxguest.so
declared=$(grep -rhoE 'TVX_EXPORT [^(;]*[^A-Za-z0-9_]([A-Za-z_][A-Za-z0-9_]*)\(' "$src"/lib/public/*.h |
  grep -oE '[A-Za-z_][A-Za-z0-9_]*\($' | tr -d '(' | sort -u)
exported=$(nm -D --defined-only "$lib" | awk '$2 == "T" { sub(/@.*/, "", $3); print $3 }' | sort -u)
check "every declared function is exported" test -z "$(comm -23 <(echo "$declared") <(echo "$exported"))"
check "nothing else is exported" test -z "$(comm -13 <(echo "$declared") <(echo "$exported"))"
comm -3 <(echo "$declared") <(echo "$exported")
exit $((fails > 0))
