#!/usr/bin/env bash
# A terminate or hang-up signal in the middle of programming, as a session
# or a machine shutting down sends it: the program keeps going until the
# board has left its loader, then ends before the next board.
set -u
PROGRAM="$1"
WORK="$(mktemp -d "${TMPDIR:-/tmp}/signal-runs.XXXXXX")"
trap 'rm -rf "$WORK"' EXIT
set +m
failures=0

fail() { echo "FAIL: $*"; failures=$((failures + 1)); }

for signal in TERM HUP; do
  # The reader may lag behind the program's output on a loaded machine, and
  # the signal then lands after the pen; such a try proves nothing and is
  # made again.
  for attempt in 1 2 3; do
    state="$WORK/$signal-$attempt"
    rm -f "$WORK/pipe"; mkfifo "$WORK/pipe"
    "$PROGRAM" --lab classic-tablet --lab-state "$state" --lab-fast --headless --yes --verbose \
      -p "" -t "" </dev/null >"$WORK/out" 2>"$WORK/pipe" &
    pid=$!
    sent=""
    : >"$WORK/log"
    while IFS= read -r line; do
      echo "$line" >>"$WORK/log"
      # Once, in the middle of the pen's programming.
      if [ -z "$sent" ] && [[ "$line" == *"PROGRESS: 20"* ]]; then kill -"$signal" "$pid"; sent=1; fi
    done <"$WORK/pipe"
    wait "$pid"
    status=$?
    landed=$(awk '/deferred: closing/ && !d { d = NR } /STATE->ESTATE_SUCCESS/ && !s { s = NR }
      END { print (d && s && d < s) ? "pen" : "late" }' "$WORK/log")
    [ "$landed" = pen ] && break
  done
  [ "$landed" = pen ] || { fail "SIG$signal: three tries and the signal never landed during the pen"; continue; }
  [ -n "$sent" ] || { fail "SIG$signal: the run showed no progress to interrupt"; continue; }
  grep -q "deferred: closing is disabled while the update runs" "$WORK/log" ||
    fail "SIG$signal: not deferred"
  grep -q "pen controller of Lab Classic Tablet: updated from version" "$WORK/out" ||
    fail "SIG$signal: the pen's update was not completed"
  # Whether the touch board was looked up before the end was taken varies;
  # the line then names its product or not, and it never reaches its loader.
  grep -Eq "touch controller( of Lab Classic Tablet)?: not updated: the run ended before it" \
    "$WORK/out" ||
    fail "SIG$signal: the run went on to the next board"
  grep -q "Result: the run was ended after 1 of 2 boards were updated." "$WORK/out" ||
    fail "SIG$signal: the result line does not say the pen was updated"
  [ "$status" -eq 4 ] || fail "SIG$signal: exit $status, expected 4 (ended by the user)"
  "$PROGRAM" --list --lab classic-tablet --lab-state "$state" | grep -q "in normal mode" ||
    fail "SIG$signal: the tablet was left in its loader"
  echo "SIG$signal: exit $status"
done
[ "$failures" -eq 0 ]
