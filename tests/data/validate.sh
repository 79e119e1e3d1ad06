#!/bin/sh
# validate.sh TOOL ARGS...: runs the validator, or skips (77) without it.
command -v "$1" > /dev/null || { echo "SKIP: $1 is not installed"; exit 77; }
exec "$@"
