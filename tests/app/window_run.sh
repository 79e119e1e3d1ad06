#!/usr/bin/env bash
# A whole lab update through the window, on the real clock: the run ends in
# the success state with the bar full (the update dialog shows 100 as 101)
# and exits with 0, with the lab's state kept in a folder of its own.
set -u
PROGRAM="$1"
STATE="$2"
rm -rf "$STATE"
output="$(timeout 240 "$PROGRAM" --lab --yes -p "" --lab-state "$STATE" --verbose </dev/null 2>&1)"
status=$?
failures=0
expect_line() {
  if ! grep -qF -- "$1" <<<"$output"; then
    echo "FAIL: missing: $1"
    failures=$((failures + 1))
  fi
}
expect_line "ESTATE_SUCCESS"
expect_line 'Window: "Programming Successful", progress 101'
expect_line '"Firmware was successfully updated.", answered "OK"'
expect_line "Lab notification: com.tavik.TFUCompleted"
if [ "$status" -ne 0 ]; then
  echo "FAIL: exit status $status"
  failures=$((failures + 1))
fi
if [ "$failures" -ne 0 ]; then
  grep -v GetDevice <<<"$output" | grep -E "ESTATE|Window|Alert|Question" | tail -20
fi
[ "$failures" -eq 0 ]
