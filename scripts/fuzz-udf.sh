#!/usr/bin/env bash
# Runs the UDF fuzzer for SECONDS (default 600) over a corpus seeded with the
# test media and the test builder's images (inputs are capped at 256 KiB, which
# keeps the 512-byte-block seeds whole). Needs `make fuzz` first.
# Usage: scripts/fuzz-udf.sh [SECONDS] [BUILD_DIR]
set -euo pipefail
secs=${1:-600}
build=${2:-build/fuzz}
root=$(cd "$(dirname "$0")/.." && pwd)
corpus="$build/corpus/udf"
seeds="$build/seeds/udf"
mkdir -p "$corpus" "$seeds" "$build/artifacts/udf"
if [ ! -e "$seeds/.done" ]; then
  "$build/fuzz/udf_fuzz_seeds" "$seeds"
  "$root/scripts/media/udf.sh" "$build/seed-media" >/dev/null
  cp "$build"/seed-media/udf/* "$seeds/"
  touch "$seeds/.done"
fi
exec "$build/fuzz/udf_fuzzer" "$corpus" "$seeds" -max_total_time="$secs" -max_len=262144 -rss_limit_mb=2048 \
  -timeout=20 -artifact_prefix="$build/artifacts/udf/" -print_final_stats=1
