#!/usr/bin/env bash
# The program maps no Qt library; the window program does (so that the
# check itself is seen to find one).
# Usage: no_qt.sh PROGRAM WINDOW_PROGRAM
set -u
status=0
if ldd "$1" | grep -E 'libQt6'; then
  echo "FAIL: $1 loads Qt"
  status=1
fi
ldd "$2" | grep -q 'libQt6Widgets' || { echo "FAIL: $2 does not load Qt Widgets"; status=1; }
exit "$status"
