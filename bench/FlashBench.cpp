// Programs a 1 MiB S-record image into the lab's pen controller on the
// virtual clock, the whole update as the controller drives it (switch to
// the loader, Init, ProgramBoard, switch back). Reports the process CPU time
// per MiB (host and emulated board together, so an upper bound of the
// host's share) and the reports sent against the minimum the command set
// needs for this image.

#include <benchmark/benchmark.h>

#include <ctime>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "flash/CFLProtocol.h"
#include "lab/CLabPenController.h"
#include "support/LabImages.h"
#include "support/LabSRecUpdate.h"

namespace {

constexpr uint32_t kBase = 0x08000000;
constexpr uint32_t kBlockBytes = 4096;
constexpr uint32_t kDataBlocks = 256;          // 1 MiB
constexpr uint32_t kBlocks = kDataBlocks + 1;  // and the loader's own
constexpr uint32_t kWriteBlock = 256;

double ProcessSeconds() {
  timespec now{};
  clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

// The fewest reports this image takes with this command set: the two
// switch reports; CPU, CPU count, parameters, descriptor and checksums in
// Init; the checksums read before programming; the magic word, one checksum
// per block and the commit; per block with data an erase and its writes;
// one calculation per block, the commit and the checksums read at the end;
// the reset.
uint64_t MinimumReports() {
  const uint64_t writesPerBlock = kBlockBytes / kWriteBlock;
  return 2 + 5 + 1 + (1 + kBlocks + 1) + kDataBlocks * (1 + writesPerBlock) + (kBlocks + 1 + 1) + 1;
}

// Swallows the interface's messages, as a controller with its log off does.
class SilentNotifier : public CInterfaceNotifier {
 public:
  void InterfaceLog(const std::string&) override {}
  void InterfaceError(const std::string&) override {}
  void InterfaceProgress(unsigned int) override {}
};

void BM_SRecUpdate1MiB(benchmark::State& state) {
  auto clock = std::make_shared<CVirtualClock>();
  CClock::Set(clock);
  CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
  const std::vector<SContinuousDataBlock> image{
      LabImages::Record(kBase + kBlockBytes, kDataBlocks * kBlockBytes, 1)};

  SLabPenDescription description;
  description.cpus = {SLabFlashLayout::Uniform(kBase, kBlockBytes, kBlocks, 1, kWriteBlock)};
  uint64_t reports = 0;
  double cpuSeconds = 0.0;
  bool ok = true;
  for (auto _ : state) {
    state.PauseTiming();
    std::shared_ptr<CLabBus> bus = CLabBus::Create();
    auto pen = std::make_shared<CLabPenController>(description);
    pen->SetTraceEnabled(false);
    pen->GetLoader().SetTraceEnabled(false);
    bus->Plug(pen);
    LabSRecUpdate update(bus, {0x7A71, 0x0301, pen->GetLocationId(), 0x0002, 0x000D},
                         {0x7A71, 0x0302, pen->GetLocationId(), 0x0001, 0xFF00});
    update.SetFormat(EDS_SREC_GENERIC);
    state.ResumeTiming();

    const double start = ProcessSeconds();
    const LabSRecUpdate::SResult result = update.Run(image);
    cpuSeconds += ProcessSeconds() - start;

    state.PauseTiming();
    ok = ok && result.programmed && result.backToNormal && result.newChecksum == result.fwChecksum;
    reports += pen->GetReportCount();
    state.ResumeTiming();
  }
  const double runs = static_cast<double>(state.iterations());
  state.counters["reports"] = static_cast<double>(reports) / runs;
  state.counters["minimum_reports"] = static_cast<double>(MinimumReports());
  state.counters["report_ratio"] = static_cast<double>(reports) / runs / MinimumReports();
  state.counters["cpu_ms_per_MiB"] = cpuSeconds / runs * 1e3;
  state.counters["programmed"] = ok ? 1 : 0;
  CClock::Set(nullptr);
}
BENCHMARK(BM_SRecUpdate1MiB)->Unit(benchmark::kMillisecond)->Iterations(5);

}  // namespace
