#!/usr/bin/env bash
# Wrong input, as a user types it: one line on standard error that starts
# with the program's name, the usage status, nothing on standard output and
# never the help text; and the few commands that print and stop.
set -u
PROGRAM="$1"
STATE="$(mktemp -d "${TMPDIR:-/tmp}/command-line.XXXXXX")"
trap 'chmod -R u+w "$STATE"; rm -rf "$STATE"' EXIT
failures=0
runs=0

refused() {  # refused STATUS WORDS-IN-THE-LINE ARGUMENTS...
  local want="$1" words="$2"
  shift 2
  runs=$((runs + 1))
  local out err got
  out="$(timeout 20 "$PROGRAM" "$@" </dev/null 2>"$STATE/err")"
  got=$?
  err="$(cat "$STATE/err")"
  if [ "$got" -ne "$want" ] || [ -n "$out" ] || [ "$(wc -l <"$STATE/err")" -ne 1 ] ||
     [[ "$err" != "tavik-fwupdater: "* ]] || [[ "$err" != *"$words"* ]]; then
    echo "FAIL: $*: exit $got (want $want), stderr: $err, stdout: ${out:0:200}"
    failures=$((failures + 1))
  fi
}

refused 64 "unknown option -x" -x --lab
refused 64 "unknown option --no-such" --no-such
refused 64 "unexpected argument \"foo\"" --lab classic-tablet foo -p ""
refused 64 "-t needs a value" --lab -t
refused 64 "-p needs a value" -p -t ""
refused 64 "--log needs a value" --log
refused 64 "not an interface path" -p "abc"
refused 64 "not a display" -s "x:y"
refused 64 "--headless takes no value" --headless=yes
refused 64 "there is no lab product called nothing" --lab=nothing -p ""
refused 64 "--lab list names" --lab list -p ""
refused 64 "--lab list names" --lab list --all
refused 64 "do not go with --list" --list -p ""
refused 64 "do not go with --list" --list --all
refused 64 "--all updates every board" --all -p ""
refused 64 "--all takes no value" --all=yes
refused 64 "needs a count" --lab --lab-fault fail-write --all
refused 64 "unknown fault kind \"bogus\"" --lab --lab-fault bogus@3 --list
refused 64 "unknown interface foo" --inspect "$STATE/none.pen" --interface foo
refused 64 "there is no lab product called nothing" --lab nothing --list
refused 64 "--json goes with" --json
refused 64 "or --all for every board" --lab --headless --yes
mkdir -p "$STATE/locked" && chmod a-w "$STATE/locked"
if [ "$(id -u)" -ne 0 ]; then
  refused 1 "--lab-state $STATE/locked/lab" --lab --lab-state "$STATE/locked/lab" --yes -p ""
fi
touch "$STATE/file"
refused 1 "--lab-state $STATE/file/lab" --lab --lab-state "$STATE/file/lab" --yes -p ""

# Files --inspect must refuse before reading them.
mkfifo "$STATE/pipe.pen"
refused 1 "not a regular file" --inspect "$STATE/pipe.pen"
truncate -s 1G "$STATE/huge.bin"
refused 1 "larger than any board takes" --inspect "$STATE/huge.bin"
refused 1 "No such file or directory" --inspect "$STATE/none.pen"
echo text >"$STATE/notes.txt"
refused 1 "is not one of a firmware file (.pen, .touch" --inspect "$STATE/notes.txt"

check() {  # check DESCRIPTION COMMAND...: the command must succeed
  runs=$((runs + 1))
  local what="$1"
  shift
  if ! "$@"; then echo "FAIL: $what"; failures=$((failures + 1)); fi
}
check "--lab list names the products" \
  bash -c '"$0" --lab list | grep -q "^classic-tablet "' "$PROGRAM"
check "--lab list after --list names the products" \
  bash -c '"$0" --list --lab list | grep -q "^display-ftdi "' "$PROGRAM"
check "--lab=NAME takes the name" \
  bash -c '"$0" --list --lab=display-hid --lab-state "$1/l" | grep -q "Lab Pen Display HID"' \
  "$PROGRAM" "$STATE"
check "--version ends with a new line" \
  bash -c '[ "$("$0" --version | tail -c 1 | od -An -c | tr -d " ")" = "\n" ]' "$PROGRAM"
check "log lines in a file carry a timestamp" \
  bash -c '"$0" --log "$1/run.log" --list --lab --lab-state "$1/l" >/dev/null &&
           grep -qE "^[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9:]{8}\.[0-9]{3} \[I\]" "$1/run.log"' \
  "$PROGRAM" "$STATE"
name="$STATE/$(printf 'odd\377name\001"')".pen
printf 'S1\n' >"$name"
check "--inspect --json gives valid JSON whatever the bytes of the path" \
  bash -c '"$0" --inspect "$1" --json | python3 -c "import json,sys; d=json.load(sys.stdin); assert d[\"error\"]"' \
  "$PROGRAM" "$name"
check "the usage line names interface paths" \
  bash -c '"$0" --help | head -1 | grep -qF "[-p PATH]"' "$PROGRAM"

echo "$(( runs - failures )) passed, $failures failed"
[ "$failures" -eq 0 ]
