#!/usr/bin/env bash
# The bash completion, sourced as bash-completion would: each case is the
# words typed so far, and a word the completions must or must not hold.
set -u
PROGRAM="$1" SCRIPT="$2"
# The lab product names come from the program the line starts with.
source "$SCRIPT"
failures=0
complete_words() {  # complete_words WORDS...: the last word is being typed
  COMP_WORDS=("$PROGRAM" "$@")
  COMP_CWORD=$#
  COMPREPLY=()
  _tavik_fwupdater
  printf '%s\n' "${COMPREPLY[@]}"
}
while IFS='|' read -r line want absent; do
  read -ra words <<<"$line"
  [ "${line: -1}" = " " ] && words+=("")
  got="$(complete_words "${words[@]}")"
  if ! grep -qxF -- "$want" <<<"$got" || { [ -n "$absent" ] && grep -qxF -- "$absent" <<<"$got"; }; then
    echo "FAIL: '$line' gives: $(tr '\n' ' ' <<<"$got") (want $want${absent:+, not $absent})"
    failures=$((failures + 1))
  fi
done <<'CASES'
--al|--all|--list
--lab-s|--lab-state|--lab-fast
--lab disp|display-ftdi|--list
--lab |list|
--interface |ftdi|--all
--lab-fault fail-w|fail-write@|
-p "" --ye|--yes|
CASES
# Every product --lab list names is offered.
for product in $("$PROGRAM" --lab list | cut -d' ' -f1); do
  grep -qxF "$product" <<<"$(complete_words --lab "")" || { echo "FAIL: $product not offered"; failures=$((failures + 1)); }
done
# Every option --help shows is offered.
for option in $("$PROGRAM" --help | grep -oE '^ +-[-a-z]+(, --[-a-z]+)?' | tr ',' ' '); do
  grep -qxF -- "$option" <<<"$(complete_words "$option")" || { echo "FAIL: $option not offered"; failures=$((failures + 1)); }
done
# Directories only after --lab-state, files after -f.
dir="$(mktemp -d "${TMPDIR:-/tmp}/completion.XXXXXX")"
trap 'rm -rf "$dir"' EXIT
mkdir "$dir/state" && touch "$dir/store.ini"
[ "$(complete_words --lab-state "$dir/st")" = "$dir/state" ] || { echo "FAIL: --lab-state offers files"; failures=$((failures + 1)); }
[ "$(complete_words -f "$dir/store" | tr '\n' ' ')" = "$dir/store.ini " ] || { echo "FAIL: -f offers no file"; failures=$((failures + 1)); }
[ "$failures" -eq 0 ]
