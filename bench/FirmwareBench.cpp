// Loading firmware files as an update does: a 16 MiB image as S-record text
// (S3, 32 bytes a line) in address order and shuffled, and the largest Intel
// hex image the reader takes. Reports MB/s of input text and the peak
// resident memory of one load (in a child process). The files are made once in a temporary
// folder. bench/firmware_peers.sh sets the same loads beside srec_cat and
// objcopy.
#include <benchmark/benchmark.h>
#include <malloc.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <fstream>
#include <functional>
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

  // The texts are made in a child process, so that the memory that built
  // them never becomes part of this one, whose children measure the loads.
  SFiles()
      : sorted(folder.Path("sorted.pen")),
        shuffled(folder.Path("shuffled.pen")),
        hex(folder.Path("largest.hex")) {
    const pid_t child = fork();
    if (child == 0) {
      Make();
      _exit(0);
    }
    waitpid(child, nullptr, 0);
  }

  void Make() {
    std::mt19937 rng(20240611);
    std::vector<std::string> lines;
    lines.reserve(kImageSize / 32);
    std::vector<uint8_t> chunk(32);
    for (size_t offset = 0; offset < kImageSize; offset += 32) {
      for (uint8_t& byte : chunk) byte = static_cast<uint8_t>(rng());
      lines.push_back(SRecLine('3', static_cast<uint32_t>(offset), chunk));
    }
    WriteLines(sorted, lines);
    std::shuffle(lines.begin(), lines.end(), rng);
    WriteLines(shuffled, lines);

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
    WriteLines(hex, records, "\r\n");
  }

  static void WriteLines(const std::string& path_I, const std::vector<std::string>& lines_I,
                         const std::string& end_I = "\n") {
    std::ofstream out(path_I, std::ios::binary);
    for (const std::string& line : lines_I) out << line << end_I;
  }
};

const SFiles& Files() {
  static const SFiles files;
  return files;
}

double ResidentMiB(const char* field_I) {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);) {
    if (line.rfind(field_I, 0) == 0) return std::stod(line.substr(std::strlen(field_I))) / 1024.0;
  }
  return 0;
}

// Peak resident memory of one load, taken in a child process: earlier
// iterations leave freed memory in this process that would blur the figure.
// Gives the child's peak and how much of it the load added.
std::pair<double, double> PeakOfOneLoad(const std::function<bool()>& load_I) {
  int channel[2];
  if (pipe(channel) != 0) return {0, 0};
  const pid_t child = fork();
  if (child == 0) {
    malloc_trim(0);
    std::ofstream("/proc/self/clear_refs") << "5";  // resets the peak to now
    double figures[2] = {ResidentMiB("VmRSS:"), 0};
    const bool loaded = load_I();
    figures[1] = ResidentMiB("VmHWM:");
    if (!loaded) figures[1] = -1;
    ssize_t written = write(channel[1], figures, sizeof figures);
    _exit(written == sizeof figures ? 0 : 1);
  }
  close(channel[1]);
  double figures[2] = {0, 0};
  const bool got = read(channel[0], figures, sizeof figures) == sizeof figures;
  close(channel[0]);
  waitpid(child, nullptr, 0);
  if (!got) return {0, 0};
  return {figures[1], figures[1] - figures[0]};
}

// The peak is taken before the timed loads, which would leave their freed
// memory behind for the child to inherit.
void Measure(benchmark::State& state_IO, const std::string& path_I,
             const std::function<bool()>& load_I) {
  const auto [peak, added] = PeakOfOneLoad(load_I);
  for (auto _ : state_IO) {
    if (!load_I()) state_IO.SkipWithError("load failed");
  }
  std::ifstream file(path_I, std::ios::binary | std::ios::ate);
  state_IO.SetBytesProcessed(static_cast<int64_t>(state_IO.iterations()) *
                             static_cast<int64_t>(file.tellg()));
  state_IO.counters["peak_MiB"] = peak;
  state_IO.counters["load_MiB"] = added;
}

bool LoadSRecOnce(const std::string& path_I) {
  CSRec source;
  const bool loaded = source.Load(path_I, EHID_INTERFACE);
  benchmark::DoNotOptimize(source.GetSRecDataRef().data());
  return loaded;
}

bool LoadIntelHexOnce(const std::string& path_I) {
  auto hex = std::make_shared<CIntelHex>();
  const bool loaded = hex->Load(path_I);
  benchmark::DoNotOptimize(hex->GetData());
  return loaded;
}

void LoadSRec(benchmark::State& state_IO, const std::string& path_I) {
  Measure(state_IO, path_I, [&] { return LoadSRecOnce(path_I); });
}

}  // namespace

static void BM_LoadSRecSorted16MiB(benchmark::State& state) { LoadSRec(state, Files().sorted); }
BENCHMARK(BM_LoadSRecSorted16MiB)->Unit(benchmark::kMillisecond);

static void BM_LoadSRecShuffled16MiB(benchmark::State& state) { LoadSRec(state, Files().shuffled); }
BENCHMARK(BM_LoadSRecShuffled16MiB)->Unit(benchmark::kMillisecond);

static void BM_LoadIntelHexLargest(benchmark::State& state) {
  const std::string& path = Files().hex;
  Measure(state, path, [&] { return LoadIntelHexOnce(path); });
}
BENCHMARK(BM_LoadIntelHexLargest)->Unit(benchmark::kMillisecond);
