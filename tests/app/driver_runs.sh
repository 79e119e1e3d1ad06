#!/usr/bin/env bash
# The tablet driver around whole runs, read as a script reads the program,
# through a command substitution: the lab's driver stopped before
# programming and running again afterwards, from one run to the next; and a
# run on this desktop whose driver start leaves nothing holding our output.
set -u
PROGRAM="$1"
WORK="$(mktemp -d "${TMPDIR:-/tmp}/driver-runs.XXXXXX")"
trap 'rm -rf "$WORK"' EXIT
failures=0
fail() { echo "FAIL: $*"; failures=$((failures + 1)); }
# The number of the first line of $log holding $1, or 0.
line_of() { grep -nF -m1 -- "$1" <<<"$log" | cut -d: -f1 || true; }
in_order() {
  local previous=0 at
  for text in "$@"; do
    at="$(line_of "$text")"
    if [ -z "$at" ] || [ "$at" -le "$previous" ]; then return 1; fi
    previous="$at"
  done
}

# Two lab updates on one state folder: the second finds the driver the
# first started again, under the lab process id it was given.
for run in 1 2; do
  log="$(timeout 120 "$PROGRAM" --lab --lab-fast --headless --yes --verbose \
    --lab-state "$WORK/lab" -p "" </dev/null 2>&1)"
  [ "$run" = 1 ] && quit="(1002)" || quit="(1005)"
  if ! in_order "Stopping driver" "Terminating: com.tavik.TabletDriver" \
      "Lab application quit: com.tavik.TabletDriver $quit" "ESTATE_PROGRAM" \
      "Lab application started: com.tavik.TabletDriver" "Result: the firmware was updated."; then
    fail "lab run $run: the driver is not stopped before programming and started after it"
    echo "$log" | grep -E "driver|Terminating|Lab application|ESTATE_PROGRAM|Result"
  fi
done

# This desktop's driver: three programs of our own that run a minute. A
# launched driver holding the substitution's pipe would keep it open that
# long; the run itself ends within seconds (no tablet is found).
mkdir -p "$WORK/data/applications"
drivers="com.tavik.taviktablet com.tavik.TabletDriver com.tavik.TavikTouchDriver"
for id in $drivers; do
  cp /bin/sleep "$WORK/$id"
  printf '[Desktop Entry]\nType=Application\nName=%s\nExec=%s 60\n' "$id" "$WORK/$id" \
    >"$WORK/data/applications/$id.desktop"
done
SECONDS=0
out="$(XDG_DATA_HOME="$WORK/data" XDG_DATA_DIRS="$WORK/none" DBUS_SESSION_BUS_ADDRESS=unix:path=/nonexistent \
  "$PROGRAM" --headless --yes -p "" </dev/null 2>&1)"
took=$SECONDS
[ "$took" -lt 40 ] || fail "the output was held open for $took s after the run"
grep -q "^Result:" <<<"$out" || fail "the run says no result: $out"
started=0
for process in /proc/[0-9]*; do
  case "$(readlink "$process/exe" 2>/dev/null)" in
    "$WORK"/com.tavik.*)
      started=$((started + 1))
      [ "$(readlink "$process/fd/1")" = /dev/null ] || fail "a driver writes to $(readlink "$process/fd/1")"
      kill "${process#/proc/}" ;;
  esac
done
[ "$started" -eq 3 ] || fail "$started of the 3 driver programs were started"

[ "$failures" -eq 0 ] && echo "driver runs: ok"
[ "$failures" -eq 0 ]
