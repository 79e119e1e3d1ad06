// Loading firmware files as an update does: a 16 MiB image as S-record text
// (S3, 32 bytes a line) in address order and shuffled, and the largest Intel
// hex image the reader takes. Reports MB/s of input text and the peak
// resident memory of one load. The files are made once in a temporary
// folder. bench/firmware_peers.sh sets the same loads beside srec_cat and
// objcopy.
#include <benchmark/benchmark.h>
#include <malloc.h>

#include <algorithm>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"

namespace {

constexpr size_t kImageSize = size_t{16} << 20;

struct SFiles {
  CTempFolder folder;
  std::string sorted;
  std::string shuffled;
  std::string hex;

  SFiles() {
    std::mt19937 rng(20240611);
    std::vector<std::string> lines;
    lines.reserve(kImageSize / 32);
    std::vector<uint8_t> chunk(32);
    for (size_t offset = 0; offset < kImageSize; offset += 32) {
      for (uint8_t& byte : chunk) byte = static_cast<uint8_t>(rng());
      lines.push_back(SRecLine('3', static_cast<uint32_t>(offset), chunk));
    }
    sorted = WriteLines("sorted.pen", lines);
    std::shuffle(lines.begin(), lines.end(), rng);
    shuffled = WriteLines("shuffled.pen", lines);

    std::vector<std::string> records{HexRecord(4, 0, {0, 0})};
    std::vector<uint8_t> row(16);
    for (uint32_t offset = 0; offset < CIntelHex::kMaxSize; offset += 16) {
      const uint32_t address = CIntelHex::kRequiredStart + offset;
      if (address % 0x10000 == 0) {
        records.push_back(HexRecord(4, 0, {0, static_cast<uint8_t>(address >> 16)}));
      }
      for (uint8_t& byte : row) byte = static_cast<uint8_t>(rng());
      records.push_back(HexRecord(0, static_cast<uint16_t>(address), row));
    }
    records.push_back(HexRecord(1, 0, {}));
    hex = WriteLines("largest.hex", records, "\r\n");
    // The texts were built in memory; give that back before anything is measured.
    lines = {};
    malloc_trim(0);
  }

  std::string WriteLines(const std::string& name_I, const std::vector<std::string>& lines_I,
                         const std::string& end_I = "\n") {
    std::ofstream out(folder.Path(name_I), std::ios::binary);
    for (const std::string& line : lines_I) out << line << end_I;
    return folder.Path(name_I);
  }
};

const SFiles& Files() {
  static const SFiles files;
  return files;
}

// The kernel's record of peak resident memory, reset before a load.
void ResetPeakMemory() { std::ofstream("/proc/self/clear_refs") << "5"; }

double PeakMemoryMiB() {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);) {
    if (line.rfind("VmHWM:", 0) == 0) return std::stod(line.substr(6)) / 1024.0;
  }
  return 0;
}

void Report(benchmark::State& state_IO, const std::string& path_I, double peak_I) {
  std::ifstream file(path_I, std::ios::binary | std::ios::ate);
  state_IO.SetBytesProcessed(static_cast<int64_t>(state_IO.iterations()) *
                             static_cast<int64_t>(file.tellg()));
  state_IO.counters["peak_MiB"] = peak_I;
}

void LoadSRec(benchmark::State& state_IO, const std::string& path_I) {
  double peak = 0;
  for (auto _ : state_IO) {
    ResetPeakMemory();
    CSRec source;
    if (!source.Load(path_I, EHID_INTERFACE)) state_IO.SkipWithError("load failed");
    benchmark::DoNotOptimize(source.GetSRecDataRef().data());
    peak = std::max(peak, PeakMemoryMiB());
  }
  Report(state_IO, path_I, peak);
}

}  // namespace

static void BM_LoadSRecSorted16MiB(benchmark::State& state) { LoadSRec(state, Files().sorted); }
BENCHMARK(BM_LoadSRecSorted16MiB)->Unit(benchmark::kMillisecond);

static void BM_LoadSRecShuffled16MiB(benchmark::State& state) { LoadSRec(state, Files().shuffled); }
BENCHMARK(BM_LoadSRecShuffled16MiB)->Unit(benchmark::kMillisecond);

static void BM_LoadIntelHexLargest(benchmark::State& state) {
  double peak = 0;
  for (auto _ : state) {
    ResetPeakMemory();
    auto hex = std::make_shared<CIntelHex>();
    if (!hex->Load(Files().hex)) state.SkipWithError("load failed");
    benchmark::DoNotOptimize(hex->GetData());
    peak = std::max(peak, PeakMemoryMiB());
  }
  Report(state, Files().hex, peak);
}
BENCHMARK(BM_LoadIntelHexLargest)->Unit(benchmark::kMillisecond);
