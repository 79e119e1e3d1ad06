#!/usr/bin/env bash
# Sets everything up, builds the debug preset and runs every test.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/build.sh debug
ctest --preset debug -j "$(nproc)"
