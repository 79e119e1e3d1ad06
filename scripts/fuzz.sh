#!/usr/bin/env bash
# Builds the fuzz preset and runs every target from its corpus in fuzz/corpus
# for a bounded time under ASan and UBSan. New inputs go to a scratch folder,
# so the tree's corpus only grows by hand; a failing input is kept in
# build/fuzz/artifacts and fails the run.
#   TAV_FUZZ_SECONDS  time per target (default 20)
#   TAV_FUZZ_RUNS     executions per target instead of a time (long runs)
#   TAV_FUZZ_ONLY     a pattern of target names to run (default all)
set -euo pipefail
cd "$(dirname "$0")/.."
bash scripts/build.sh fuzz >/dev/null

BIN=build/fuzz/fuzz
ARTIFACTS="$PWD/build/fuzz/artifacts"
mkdir -p "$ARTIFACTS"
LIMIT="-max_total_time=${TAV_FUZZ_SECONDS:-20}"
if [ -n "${TAV_FUZZ_RUNS:-}" ]; then LIMIT="-runs=$TAV_FUZZ_RUNS"; fi
# UBSan only reports unless told to stop; a report is a failure here.
export UBSAN_OPTIONS="halt_on_error=1:abort_on_error=1:print_stacktrace=1"
export ASAN_OPTIONS="abort_on_error=1:detect_leaks=1"

failed=()
for target in "$BIN"/fuzz_*; do
  name=$(basename "$target")
  [[ "$name" == *${TAV_FUZZ_ONLY:-}* ]] || continue
  corpus="fuzz/corpus/$name"
  if [ ! -d "$corpus" ]; then
    echo "fuzz: $name has no corpus folder $corpus"
    failed+=("$name")
    continue
  fi
  scratch="build/fuzz/scratch/$name"
  rm -rf "$scratch" && mkdir -p "$scratch"
  log="build/fuzz/$name.log"
  # A hang is a failure too: no single input may take 10 s. A fuzzed loader
  # that takes every report may describe a 16 MiB block and have it sent ten
  # times over: up to 168 million reports. Half that, a block whose tail is
  # no whole word, runs for over two minutes under ASan; the report budget
  # stops a loop that would not end.
  timeout=10
  if [ "$name" = fuzz_loader_replies ]; then timeout=1200; fi
  if "$target" "$LIMIT" -timeout=$timeout -rss_limit_mb=2048 -print_final_stats=1 \
      -artifact_prefix="$ARTIFACTS/$name-" "$scratch" "$corpus" >"$log" 2>&1; then
    status=ok
  else
    status=FAILED
    failed+=("$name")
  fi
  runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "$log")
  took=$(sed -n 's/^Done [0-9]* runs in \([0-9]*\) second.*/\1/p' "$log")
  echo "fuzz: $name $status, ${runs:-?} executions in ${took:-?} s"
  if [ "$status" = FAILED ]; then tail -n 40 "$log"; fi
done

if [ ${#failed[@]} -gt 0 ]; then
  echo "fuzz: failed: ${failed[*]} (inputs in $ARTIFACTS)"
  exit 1
fi
