#!/usr/bin/env bash
# A whole lab update through the window, on the real clock, with the lab's
# state in a folder of its own: it ends in the success state with the bar
# full (the update dialog shows 100 as 101) and exits with 0.
set -u
rm -rf "$2"
output="$(timeout 240 "$1" --lab --yes -p "" --lab-state "$2" --verbose </dev/null 2>&1)"
status=$?
for line in ESTATE_SUCCESS 'Window: "Programming Successful", progress 101' \
  '"Firmware was successfully updated.", answered "OK"' "Lab notification: com.tavik.TFUCompleted"; do
  grep -qF -- "$line" <<<"$output" || { echo "FAIL: missing: $line"; status=1; }
done
[ "$status" -eq 0 ] || grep -E "ESTATE|Window|Alert|Question" <<<"$output" | tail -20
exit "$status"
