#!/usr/bin/env bash
# Sets everything up, builds, and runs the updater with the given arguments
# (default: --help).
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/build.sh release
if [ $# -eq 0 ]; then set -- --help; fi
exec ./build/release/src/app/tavik-fwupdater "$@"
