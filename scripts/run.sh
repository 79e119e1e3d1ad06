#!/usr/bin/env bash
# Sets everything up, builds, and runs the updater. With no arguments it
# updates the pen, touch and Bluetooth boards of the lab's default tablet
# (no tablet need be attached); any arguments go to the program instead.
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/build.sh release
if [ $# -eq 0 ]; then set -- --lab --yes -p "" -t "" -b ""; fi
exec ./build/release/src/app/tavik-fwupdater "$@"
