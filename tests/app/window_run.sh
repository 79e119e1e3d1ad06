#!/usr/bin/env bash
# A whole lab update through the window, on the real clock, with the lab's
# state in a folder of its own: the program hands the run to the window
# program, which ends in the success state with the bar full (the update
# dialog shows 100 as 101) and exits with 0. The hand-over comes before the
# first log line, so the run logs its start once.
set -u
rm -rf "$2"
output="$(timeout 240 "$1" --lab --yes -p "" --lab-state "$2" --verbose </dev/null 2>&1)"
status=$?
for line in ESTATE_SUCCESS 'Window: "Programming Successful", progress 101' \
  '"Firmware was successfully updated.", answered "OK"' "Lab notification: com.tavik.TFUCompleted"; do
  grep -qF -- "$line" <<<"$output" || { echo "FAIL: missing: $line"; status=1; }
done
starts=$(grep -c '\[I\] tavik-fwupdater .* starting' <<<"$output")
[ "$starts" -eq 1 ] || { echo "FAIL: the start logged $starts times"; status=1; }
[ "$status" -eq 0 ] || grep -E "ESTATE|Window|Alert|Question|window program" <<<"$output" | tail -20
exit "$status"
