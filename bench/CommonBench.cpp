// The cost of a log line when nobody listens: every line of the update path
// is formatted and dropped, so this is the overhead an update pays.
#include <benchmark/benchmark.h>

#include "common/CVirtualClock.h"
#include "common/TavLog.h"

static void BM_SilentInfoLine(benchmark::State& state) {
  for (auto _ : state) TavLog::Info("Writing block %u of %u\n", 12u, 64u);
}
BENCHMARK(BM_SilentInfoLine);

static void BM_VirtualSleep(benchmark::State& state) {
  CVirtualClock clock;
  for (auto _ : state) clock.Sleep(1.0);
}
BENCHMARK(BM_VirtualSleep);
