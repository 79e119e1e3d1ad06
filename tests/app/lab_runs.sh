#!/usr/bin/env bash
# Whole runs of the program against the lab, headless, on the virtual clock:
# every product and board, the exit status of each outcome, and a run cut
# off by a vanishing board followed by a run that completes the update.
set -u
PROGRAM="$1"
STATE="$(mktemp -d "${TMPDIR:-/tmp}/lab-runs.XXXXXX")"
trap 'rm -rf "$STATE"' EXIT
failures=0

runs=0
# expect STATUS DESCRIPTION ARGUMENTS... ; with SAYS set, the output must
# also hold each of its lines.
expect() {
  local want="$1" what="$2"
  shift 2
  runs=$((runs + 1))
  local output
  output="$(timeout 120 "$PROGRAM" --lab-fast "$@" </dev/null 2>&1)"
  local got=$?
  local missing=""
  while IFS= read -r line; do
    [ -z "$line" ] && continue
    grep -qF -- "$line" <<<"$output" || missing="$missing
  missing: $line"
  done <<<"${SAYS:-}"
  if [ "$got" -ne "$want" ] || [ -n "$missing" ]; then
    echo "FAIL: $what: exit $got, expected $want$missing"
    echo "$output" | tail -15
    failures=$((failures + 1))
  else
    echo "ok: $what"
  fi
  SAYS=""
}

SAYS="  touch controller of Lab Wireless Tablet: updated from version
  Bluetooth module of Lab Wireless Tablet: updated from version
  pen controller of Lab Wireless Tablet: updated from version
Result: the firmware was updated." \
expect 0 "wireless tablet, pen touch and Bluetooth" --lab --headless --lab-state "$STATE/w" --yes -t "" -b "" -p ""
expect 0 "wireless tablet again, from the state the first run left" --lab --headless --lab-state "$STATE/w" --yes -p ""
expect 0 "classic tablet, pen re-enumerating" --lab classic-tablet --lab-state "$STATE/c" --yes -p ""
SAYS="  touch controller of Lab Classic Tablet: updated" \
expect 0 "classic tablet, vendor-class touch through its loader" --lab classic-tablet --lab-state "$STATE/c" --yes -t ""
expect 0 "AB1122 Bluetooth" --lab wireless-tablet-1122 --lab-state "$STATE/b" --yes -b ""
expect 0 "pen display, HID scalar" --lab display-hid --lab-state "$STATE/d" --yes -p "" -t "" -s ""
expect 0 "pen through the I2C tunnel" --lab tunnel-tablet --lab-state "$STATE/t" --yes -p ""
SAYS="  display scalar of Lab Pen Display FTDI: failed: Failed to open device and/or load data" \
expect 1 "a scalar whose serial number no display has, with or without --headless" --lab display-ftdi --lab-state "$STATE/f" --yes -s ""
# A scalar behind a display's bridge: --list gives the -s value that updates
# it, for each board variant; a run cut off mid-block is completed by the next.
for product in display-ftdi display-ftdi-quanta display-ftdi-venus; do
  scalar="$("$PROGRAM" --list --lab "$product" --lab-state "$STATE/$product" | awk '$1 == "scalar" { print $3 }')"
  case "$scalar" in
    23335:*:LABF*:255) ;;
    *) echo "FAIL: $product: --list gives no -s value for its scalar: '$scalar'"; failures=$((failures + 1)) ;;
  esac
  if [ "$product" = display-ftdi ]; then
    SAYS="  display scalar of Lab Pen Display FTDI: failed:" \
    expect 1 "$product: bridge gone mid-block" --lab "$product" --headless --lab-state "$STATE/$product" --yes --lab-fault vanish@3000:display-ftdi-scalar -s "$scalar"
  fi
  SAYS="display scalar of Lab Pen Display FTDI
Result: the firmware was updated." \
  expect 0 "$product: scalar over the bridge" --lab "$product" --headless --lab-state "$STATE/$product" --yes -s "$scalar"
  if ! "$PROGRAM" --list --lab "$product" --lab-state "$STATE/$product" | grep -qE "^  scalar +FTDI +$scalar +1\.10\.0 "; then
    echo "FAIL: $product: --list shows the scalar's new version"; failures=$((failures + 1))
  fi
done
expect 4 "nobody confirms" --lab --lab-state "$STATE/n" -p ""
SAYS="  pen controller of Lab Wireless Tablet: failed:" \
expect 1 "a board that fails every read" --lab --headless --lab-state "$STATE/r" --yes --lab-fault fail-read@1000 -p ""
expect 1 "cut off mid-update" --lab classic-tablet --lab-state "$STATE/v" --yes --lab-fault vanish@200 -p ""
# A pen left in its loader is one product, with the touch board it has.
listing="$("$PROGRAM" --list --lab classic-tablet --lab-state "$STATE/v")"
if ! grep -q "^1 product found" <<<"$listing" || ! grep -q "in loader mode" <<<"$listing"; then
  echo "FAIL: a pen left in its loader lists as one product"; echo "$listing"
  failures=$((failures + 1))
fi
SAYS="  pen controller of Lab Classic Tablet: updated from version 0.03 to 1.30" \
expect 0 "the next run finishes the cut-off update" --lab classic-tablet --lab-state "$STATE/v" --yes -p ""
if ! "$PROGRAM" --list --lab classic-tablet --lab-state "$STATE/v" | grep -qE "^  pen +HID .* 1\.30 "; then
  echo "FAIL: --list shows the version the update brought"; failures=$((failures + 1))
fi
SAYS="No attached board has the interface path 1:2:3:4:5; the pen controller found is updated instead." \
expect 0 "a path that matches nothing is said once" --lab --lab-state "$STATE/p" --yes -p "1:2:3:4:5"
SAYS="The device configuration /nonexistent/fw_loader.ini could not be read, so no product is known." \
expect 2 "a configuration that cannot be read is named" --lab --lab-state "$STATE/e" --yes -p "" -f /nonexistent/fw_loader.ini
echo "[]" >"$STATE/empty.ini"
if "$PROGRAM" --list --lab --lab-state "$STATE/e" -f "$STATE/empty.ini" 2>&1 | grep -q "could not be read"; then
  echo "FAIL: [] is a valid, empty configuration"; failures=$((failures + 1))
fi
SAYS="nothing to update: give -p, -t, -b or -s" \
expect 64 "a terminal run without a board" --lab --headless --lab-state "$STATE/e" --yes
# Each "GetDevice" comparison belongs in the log, not on the screen.
if "$PROGRAM" --lab --lab-fast --lab-state "$STATE/p" --yes -p "1:2:3:4:5" </dev/null 2>&1 | grep -q GetDevice; then
  echo "FAIL: GetDevice lines on the screen"; failures=$((failures + 1))
fi
SAYS="  touch controller of Lab Classic Tablet: updated from version 2.10 to 2.20
  pen controller of Lab Classic Tablet: updated from version 1.20 to 1.30
Result: the firmware was updated." \
expect 0 "classic tablet, touch and pen in one run" --lab classic-tablet --headless --lab-state "$STATE/tp" --yes -t "" -p ""

# A German user answers "j" at the prompt of a terminal.
runs=$((runs + 1))
german="$(echo j | LANGUAGE=de LANG=C.UTF-8 timeout 60 script -qec \
  "'$PROGRAM' --lab --lab-fast --lab-state '$STATE/de' -p ''" /dev/null 2>&1)"
if [ $? -ne 0 ] || ! grep -q "Ergebnis: die Firmware wurde aktualisiert." <<<"$german" ||
   ! grep -qF "[j/N]" <<<"$german"; then
  echo "FAIL: the German prompt takes j"; echo "$german" | tail -5; failures=$((failures + 1))
fi
echo "$(( runs - failures )) passed, $failures failed"
[ "$failures" -eq 0 ]
