#!/usr/bin/env bash
# The man page renders without a warning, and names every option --help shows.
set -u
PROGRAM="$1" PAGE="$2"
failures=0
warnings="$(man --warnings -E UTF-8 -l "$PAGE" 2>&1 >/dev/null)"
if [ -n "$warnings" ]; then echo "FAIL: man warns: $warnings"; failures=$((failures + 1)); fi
# Options as the help's lines start them: "  -p PATH", "  -h, --help", "      --lab [NAME]".
options="$("$PROGRAM" --help | grep -oE '^ +-[-a-z]+(, --[-a-z]+)?' | tr ',' '\n' | tr -d ' ' | sort -u)"
[ "$(wc -l <<<"$options")" -ge 20 ] || { echo "FAIL: too few options read from --help: $options"; failures=$((failures + 1)); }
page="$(sed 's/\\-/-/g' "$PAGE")"
for option in $options; do
  grep -qE -- "(^|[^-a-z])$option([^-a-z]|$)" <<<"$page" || { echo "FAIL: $option is not in the man page"; failures=$((failures + 1)); }
done
[ "$failures" -eq 0 ]
