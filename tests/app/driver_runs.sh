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
# Two lab updates on one state folder: the driver is stopped before
# programming and started after it, and the second run finds it under the
# lab process id the first gave it.
for run in "1002 1005" "1005 1008"; do
  set -- $run
  log="$(timeout 120 "$PROGRAM" --lab --lab-fast --headless --yes --verbose \
    --lab-state "$WORK/lab" -p "" </dev/null 2>&1)"
  seen="$(grep -oE "Terminating: com.tavik.TabletDriver|Lab application (quit|started): com.tavik.TabletDriver \([0-9]+\)|ESTATE_PROGRAM|Result: .*" <<<"$log" | uniq)"
  want="Terminating: com.tavik.TabletDriver
Lab application quit: com.tavik.TabletDriver ($1)
ESTATE_PROGRAM
Lab application started: com.tavik.TabletDriver ($2)
Result: the firmware was updated."
  [ "$seen" = "$want" ] || fail "lab run with the driver as $1: saw
$seen"
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
out="$(XDG_DATA_HOME="$WORK/data" XDG_DATA_DIRS="$WORK/none" XDG_CONFIG_HOME="$WORK/config" \
  DBUS_SESSION_BUS_ADDRESS=unix:path=/nonexistent \
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
