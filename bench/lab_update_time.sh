#!/usr/bin/env bash
# Times whole lab updates, one per programming procedure, each from a fresh
# state folder, on the virtual clock: the cost of the lab itself, its state
# written through to the folder included. Prints the processor seconds
# (user and system) of each procedure, best of the runs, and their sum:
# on a shared machine the wall clock says more about the neighbours.
#
#   bench/lab_update_time.sh [path/to/tavik-fwupdater] [runs]
set -euo pipefail

here="$(cd "$(dirname "$0")" && pwd)"
updater="${1:-$here/../build/debug/src/app/tavik-fwupdater}"
runs="${2:-5}"
[ -x "$updater" ] || { echo "no updater at $updater" >&2; exit 1; }
work="$(mktemp -d "${TMPDIR:-/tmp}/lab-time.XXXXXX")"
trap 'rm -rf "$work"' EXIT

scalar="$("$updater" --list --lab display-ftdi --lab-state "$work/list" | awk '$1 == "scalar" { print $3 }')"
procedures=(
  "pen|classic-tablet|-p"
  "touch|classic-tablet|-t"
  "bluetooth|wireless-tablet|-b"
  "hid-scalar|display-hid|-s"
  "tunnel|tunnel-tablet|-p"
  "ftdi-scalar|display-ftdi|-s $scalar"
)
total=0
for entry in "${procedures[@]}"; do
  IFS='|' read -r name product option <<<"$entry"
  read -r flag value <<<"$option"
  best=""
  for ((run = 0; run < runs; run++)); do
    rm -rf "$work/state"
    # bash's own time reads the child's usage to the millisecond.
    TIMEFORMAT='%3U %3S'
    { time "$updater" --lab "$product" --lab-state "$work/state" --lab-fast --headless --yes \
      "$flag" "${value:-}" >/dev/null 2>&1 || { echo "$name: run failed" >&2; exit 1; }; } 2>"$work/time"
    took=$(awk '{ print $1 + $2 }' "$work/time")
    if [ -z "$best" ] || (($(echo "$took < $best" | bc))); then best=$took; fi
  done
  printf '%-12s %6.3f s\n' "$name" "$best"
  total=$(echo "$total + $best" | bc)
done
printf '%-12s %6.3f s\n' total "$total"
