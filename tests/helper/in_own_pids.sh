#!/bin/sh
# The helper signals processes by what /proc shows; a broken helper under
# test must not reach the machine's own. Where a pid namespace can be had,
# the tests run in one.
if unshare --pid --fork --mount-proc true 2>/dev/null; then
  exec unshare --pid --fork --mount-proc "$@"
fi
exec "$@"
