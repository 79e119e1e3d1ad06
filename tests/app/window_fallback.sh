#!/usr/bin/env bash
# A run that would open the window but cannot start the window program
# says so in one line and updates in the terminal instead: with the window
# program missing, and with one that cannot be executed.
# Usage: window_fallback.sh PROGRAM
set -u
work="$(mktemp -d "${TMPDIR:-/tmp}/window-fallback.XXXXXX")"
trap 'rm -rf "$work"' EXIT
# A copy of the program alone, with the configuration it reads beside it.
cp "$1" "$work/tavik-fwupdater"
ln -s "$(dirname "$1")/fw_loader.ini" "$(dirname "$1")/Firmware" "$work/"
failures=0
for case in missing not-executable; do
  rm -f "$work/tavik-fwupdater-window"
  reason="No such file or directory"
  if [ "$case" = not-executable ]; then
    printf 'not a program\n' > "$work/tavik-fwupdater-window"
    reason="Permission denied"
  fi
  output="$(QT_QPA_PLATFORM=offscreen timeout 120 "$work/tavik-fwupdater" --lab classic-tablet \
    --lab-fast --lab-state "$work/state-$case" --yes -p "" </dev/null 2>&1)"
  status=$?
  said=$(grep -c "cannot start the window program .*($reason): going on in the terminal" <<<"$output")
  if [ "$status" -ne 0 ] || [ "$said" -ne 1 ] || ! grep -qF "Result: the firmware was updated." <<<"$output"; then
    echo "FAIL: $case: exit $status, the line said $said times"
    tail -8 <<<"$output"
    failures=$((failures + 1))
  else
    echo "ok: $case"
  fi
done
exit "$failures"
