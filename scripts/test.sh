#!/usr/bin/env bash
# Sets everything up, builds the debug preset and runs every test, then the
# same suite under ASan with UBSan and under TSan, then the bounded fuzzing.
# Each stage reports its time; every stage runs even after one failed, so a
# run shows all its failures, and the script fails if any stage did.
set -euo pipefail
cd "$(dirname "$0")/.."

failed=()
stage() {
  local name=$1 start=$SECONDS status=ok
  shift
  echo "== $name"
  "$@" || { status=FAILED; failed+=("$name"); }
  echo "== $name: $status, $((SECONDS - start)) s"
}

# Called behind ||, where set -e does not hold: each step says its failure.
suite() {
  bash scripts/build.sh "$1" && ctest --preset "$1" -j "$(nproc)"
}

stage debug suite debug
stage asan suite asan
stage tsan suite tsan
stage fuzz bash scripts/fuzz.sh

if [ ${#failed[@]} -gt 0 ]; then
  echo "== failed: ${failed[*]}"
  exit 1
fi
