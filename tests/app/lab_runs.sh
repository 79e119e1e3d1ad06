#!/usr/bin/env bash
# Whole runs of the program against the lab, headless, on the virtual clock:
# every product and board, the exit status of each outcome, and a run cut
# off by a vanishing board followed by a run that completes the update.
set -u
PROGRAM="$1"
STATE="$(mktemp -d "${TMPDIR:-/tmp}/lab-runs.XXXXXX")"
trap 'rm -rf "$STATE"' EXIT
failures=0

expect() {  # expect STATUS DESCRIPTION ARGUMENTS...
  local want="$1" what="$2"
  shift 2
  local output
  output="$(timeout 120 "$PROGRAM" --headless --lab-fast "$@" </dev/null 2>&1)"
  local got=$?
  if [ "$got" -ne "$want" ]; then
    echo "FAIL: $what: exit $got, expected $want"
    echo "$output" | tail -15
    failures=$((failures + 1))
  else
    echo "ok: $what"
  fi
}

expect 0 "wireless tablet, pen touch and Bluetooth" --lab --lab-state "$STATE/w" --yes -p "" -t "" -b ""
expect 0 "wireless tablet again, from the state the first run left" --lab --lab-state "$STATE/w" --yes -p ""
expect 0 "classic tablet, pen re-enumerating" --lab classic-tablet --lab-state "$STATE/c" --yes -p ""
# The vendor-class transport asks for the loader only on an open interface,
# and the update flow never opens it first: the switch is refused, the loader
# never comes, and the run ends as a failure once the wait runs out.
expect 1 "classic tablet, vendor-class touch never reaches its loader" --lab classic-tablet --lab-state "$STATE/c" --yes -t ""
expect 0 "AB1122 Bluetooth" --lab wireless-tablet-1122 --lab-state "$STATE/b" --yes -b ""
expect 0 "pen display, HID scalar" --lab display-hid --lab-state "$STATE/d" --yes -p "" -t "" -s ""
expect 0 "pen through the I2C tunnel" --lab tunnel-tablet --lab-state "$STATE/t" --yes -p ""
expect 1 "scalar behind the bridge is refused" --lab display-ftdi --lab-state "$STATE/f" --yes -s "1:2:SN:255"
expect 4 "nobody confirms" --lab --lab-state "$STATE/n" -p ""
expect 1 "a board that fails every read" --lab --lab-state "$STATE/r" --yes --lab-fault fail-read@1000 -p ""
expect 1 "cut off mid-update" --lab classic-tablet --lab-state "$STATE/v" --yes --lab-fault vanish@200 -p ""
expect 0 "the next run finishes the cut-off update" --lab classic-tablet --lab-state "$STATE/v" --yes -p ""
echo "$(( 12 - failures )) passed, $failures failed"
[ "$failures" -eq 0 ]
