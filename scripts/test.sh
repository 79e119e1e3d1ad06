#!/usr/bin/env bash
# Sets everything up, builds the debug preset and runs every test, then the
# same suite under ASan with UBSan and under TSan, then the bounded fuzzing.
# Each stage reports its time.
set -euo pipefail
cd "$(dirname "$0")/.."

stage() {
  local name=$1 start=$SECONDS
  shift
  echo "== $name"
  "$@"
  echo "== $name: $((SECONDS - start)) s"
}

suite() {
  bash scripts/build.sh "$1"
  ctest --preset "$1" -j "$(nproc)"
}

stage debug suite debug
stage asan suite asan
stage tsan suite tsan
stage fuzz bash scripts/fuzz.sh
