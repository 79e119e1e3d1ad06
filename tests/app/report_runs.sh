#!/usr/bin/env bash
# --json on update runs against the lab: each report is one JSON document on
# standard output that the schema accepts, tells what became of each board,
# and the terminal's own text still reaches standard error.
set -u
PROGRAM="$1" SCHEMA="$2" VALIDATE="$3"
STATE="$(mktemp -d "${TMPDIR:-/tmp}/report-runs.XXXXXX")"
trap 'rm -rf "$STATE"' EXIT
failures=0 runs=0

# A configuration whose pen file is no firmware, and one that names no product.
CONFIG="$(dirname "$PROGRAM")/fw_loader.ini"
mkdir -p "$STATE/bad/Firmware" "$STATE/none"
cp "$CONFIG" "$STATE/bad/" && cp "$(dirname "$PROGRAM")"/Firmware/* "$STATE/bad/Firmware/"
printf 'S1\n' >"$STATE/bad/Firmware/wireless-tablet.pen"
echo "[]" >"$STATE/none/fw_loader.ini"

# report STATUS STATE-NAME CHECK STDERR-WORDS ARGUMENTS...: CHECK is a Python
# expression over the report r.
report() {
  local want="$1" state="$2" check="$3" says="$4"
  shift 4
  runs=$((runs + 1))
  timeout 120 "$PROGRAM" --lab-fast --headless --yes --json --lab-state "$STATE/$state" "$@" \
    </dev/null >"$STATE/out" 2>"$STATE/err"
  local got=$?
  local why
  why="$("$VALIDATE" "$SCHEMA" "" "r['exitStatus'] == $want and ($check)" <"$STATE/out" 2>&1)"
  if [ "$got" -ne "$want" ] || [ -n "$why" ] || [ "$(wc -l <"$STATE/out")" -ne 1 ] ||
     ! grep -qF -- "$says" "$STATE/err"; then
    echo "FAIL: $*: exit $got (want $want) $why"; tail -5 "$STATE/err"
    failures=$((failures + 1))
  fi
}

report 0 w "r['boards'][0]['outcome'] == 'updated' and r['boards'][0]['versionBefore'] != r['boards'][0]['versionAfter']
  and r['boards'][0]['states'][-1] == 'ESTATE_SUCCESS' and r['boards'][0]['checksumAfter'] == r['boards'][0]['checksumFile']
  and r['product']['vendorId'] == 31325" \
  "Result: the firmware was updated." --lab -p ""
# The pen is now at its file's version: --all leaves it and updates the rest.
report 0 w "[(b['kind'], b['outcome']) for b in r['boards']] == [('touch', 'updated'), ('bluetooth', 'updated'), ('pen', 'skipped')]
  and 'already at version 1.30' in r['boards'][2]['reason']" \
  "Skipping the pen controller of Lab Wireless Tablet" --lab --all
report 0 w "r['boards'] and all(b['skipped'] for b in r['boards'])" \
  "every board is already at its firmware file's version" --lab --all
report 1 v "r['boards'][0]['outcome'] == 'failed' and r['outcome']['errorCode'] is not None
  and 'ESTATE_FAILURE' in r['boards'][0]['states'] and r['outcome']['text'] == 'Result: the update failed.'" \
  "failed:" --lab classic-tablet --lab-fault vanish@200 -p ""
report 3 r "r['boards'][0]['outcome'] == 'file-refused' and r['boards'][0]['file'].endswith('wireless-tablet.pen')" \
  "firmware file refused" --lab -p "" -f "$STATE/bad/fw_loader.ini"
report 2 n "r['boards'] == [] and r['product'] is None" \
  "no supported tablet is connected" --lab --all -f "$STATE/none/fw_loader.ini"
touch "$STATE/file"
report 1 file/lab "r['boards'] == [] and r['outcome']['text'].startswith('--lab-state')" \
  "--lab-state $STATE/file/lab" --lab -p ""
# The scalar behind a display's bridge is reached through --all as through -s.
report 0 f "[b['kind'] for b in r['boards'] if b['outcome'] == 'updated'] == ['pen', 'scalar']" \
  "display scalar of Lab Pen Display FTDI" --lab display-ftdi --all
report 0 f "[b['kind'] for b in r['boards'] if b['skipped']] == ['pen', 'scalar']" \
  "every board is already at its firmware file's version" --lab display-ftdi --all

runs=$((runs + 1))
if ! "$PROGRAM" --list --lab display-hid --lab-state "$STATE/l" --json | "$VALIDATE" "$SCHEMA" listReport; then
  echo "FAIL: --list --json against its schema"; failures=$((failures + 1))
fi
echo "$((runs - failures)) passed, $failures failed"
[ "$failures" -eq 0 ]
