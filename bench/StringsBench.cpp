// Base64 over a settings-sized byte blob (a stored image or a device blob
// in the settings tree travels as Base64), and version parsing as done once
// per device and per firmware file.
#include <benchmark/benchmark.h>

#include "common/FileVersion.h"
#include "common/StringUtilities.h"

static std::vector<uint8_t> Blob(size_t size_I) {
  std::vector<uint8_t> bytes(size_I);
  for (size_t i = 0; i < size_I; ++i) bytes[i] = static_cast<uint8_t>(i * 131 + 7);
  return bytes;
}

static void BM_Base64Encode(benchmark::State& state) {
  const std::vector<uint8_t> bytes = Blob(static_cast<size_t>(state.range(0)));
  for (auto _ : state) benchmark::DoNotOptimize(StringUtilities::GetBase64(bytes));
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}
BENCHMARK(BM_Base64Encode)->Arg(64 << 10);

static void BM_Base64Decode(benchmark::State& state) {
  const std::string text = StringUtilities::GetBase64(Blob(static_cast<size_t>(state.range(0))));
  for (auto _ : state) benchmark::DoNotOptimize(StringUtilities::GetBytesFromBase64(text));
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}
BENCHMARK(BM_Base64Decode)->Arg(64 << 10);

static void BM_FileVersionParse(benchmark::State& state) {
  const std::string text = "2.14.3-117";
  for (auto _ : state) benchmark::DoNotOptimize(FileVersion(text));
}
BENCHMARK(BM_FileVersionParse);
