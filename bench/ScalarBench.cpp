// One 64 KiB block of a scalar's flash programmed by RTDISP on the lab's
// FTDI bridge, on the virtual clock so the lab bus adds no latency: erase
// and blank check, 256 pages, CRC check, as the flow does for each block.
// Reports the USB transfers and bytes sent against the fewest the link's
// primitives allow, and the host's CPU time (the lab's own work inside the
// bridge calls taken out) as a share of the time the I2C bus itself needs
// at 100 kHz for the same traffic.

#include <benchmark/benchmark.h>

#include <ctime>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "lab/CLabFTDIBridge.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabProducts.h"
#include "scalar/RTDISP.h"

namespace {

constexpr size_t kBlockBytes = RTDISP::FLASH_UINT_SIZE;
constexpr size_t kPage = 256;
constexpr size_t kPages = kBlockBytes / kPage;

// The primitives' transfers and bytes, from their byte strings: a START
// is one write of 36 bytes, a STOP one of 27; a byte sent is a write of 13
// bytes, a write of 3 and a read of its acknowledge; a byte read a write
// of 12 and a read.
struct SCost {
  uint64_t writes, reads, bytes;
  SCost operator+(const SCost& o_I) const {
    return {writes + o_I.writes, reads + o_I.reads, bytes + o_I.bytes};
  }
  SCost operator*(uint64_t n_I) const { return {writes * n_I, reads * n_I, bytes * n_I}; }
};
constexpr SCost kStart{1, 0, 36}, kStop{1, 0, 27}, kSend{2, 1, 16}, kGet{1, 1, 12};
// Register write: START, 94 reg value, STOP. Register read: START, 94 reg,
// START, 95, one byte in, STOP. A page: START, 94 70, 256 bytes, STOP.
const SCost kRegWrite = kStart + kSend * 3 + kStop;
const SCost kRegRead = kStart + kSend * 2 + kStart + kSend + kGet + kStop;
const SCost kPageData = kStart + kSend * (2 + kPage) + kStop;

// The fewest a block can take, every wait met at its first read:
//   erase:  6 register writes, 1 busy read, then a CRC check;
//   CRC:    6 address writes, read and write 0x6F, 1 done read, read 0x75,
//           so 7 writes and 3 reads;
//   write:  5 register writes, and per page a ready read, the page, a
//           write of 0x6F and a done read;
//   check:  a CRC as above.
// writes = 6 + 7 + 5 + P + 7, reads = 1 + 3 + 2P + 3, with P = 256 pages:
// transfers = 11 (281) + 14 (519) + 776 (256) = 209013.
SCost MinimumPerBlock() {
  const uint64_t regWrites = 6 + 7 + 5 + kPages + 7;
  const uint64_t regReads = 1 + 3 + 2 * kPages + 3;
  return kRegWrite * regWrites + kRegRead * regReads + kPageData * kPages;
}

double ThreadSeconds() {
  timespec now{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

// The lab's bridge library, counted: transfers, bytes, the bus traffic
// they clock (bytes, STARTs and STOPs, told by the primitives' strings)
// and the CPU time spent in the lab.
class CCountingApi : public CLabFTDIExAPI32 {
 public:
  using CLabFTDIExAPI32::CLabFTDIExAPI32;
  FT_STATUS FT_Write(FT_HANDLE handle_I, const void* buffer_I, uint32_t size_I,
                     uint32_t* written_O) override {
    ++writes;
    bytesSent += size_I;
    const auto* bytes = static_cast<const uint8_t*>(buffer_I);
    if (size_I == 36) ++busConditions;  // START
    if (size_I == 27) ++busConditions;  // STOP
    if ((size_I == 13 && bytes[0] == 0x11) || (size_I == 12 && bytes[3] == 0x24)) ++busBytes;
    const double start = ThreadSeconds();
    const FT_STATUS status = CLabFTDIExAPI32::FT_Write(handle_I, buffer_I, size_I, written_O);
    labSeconds += ThreadSeconds() - start;
    return status;
  }
  FT_STATUS FT_Read(FT_HANDLE handle_I, void* buffer_O, uint32_t size_I,
                    uint32_t* read_O) override {
    ++reads;
    const double start = ThreadSeconds();
    const FT_STATUS status = CLabFTDIExAPI32::FT_Read(handle_I, buffer_O, size_I, read_O);
    labSeconds += ThreadSeconds() - start;
    return status;
  }
  void Reset() { writes = reads = bytesSent = busBytes = busConditions = 0, labSeconds = 0; }

  uint64_t writes = 0, reads = 0, bytesSent = 0, busBytes = 0, busConditions = 0;
  double labSeconds = 0;
};

class CSilentNotifier : public CInterfaceNotifier {
 public:
  void InterfaceLog(const std::string&) override {}
  void InterfaceError(const std::string&) override { ++errors; }
  void InterfaceProgress(unsigned int) override {}
  int errors = 0;
};

void BM_ScalarBlock(benchmark::State& state) {
  CClock::Set(std::make_shared<CVirtualClock>());
  std::shared_ptr<CLabBus> bus = CLabBus::Create();
  std::shared_ptr<CLabFTDIBridge> bridge;
  for (const auto& board : CLabProducts::Plug(*bus, "display-ftdi")) {
    if (auto found = std::dynamic_pointer_cast<CLabFTDIBridge>(board)) bridge = found;
  }
  bridge->SetTraceEnabled(false);
  CCountingApi api(bus);
  CI2CConnectorFTDI::SetApi(&api);
  auto link = std::make_shared<CI2CConnectorFTDI>();
  std::vector<uint8_t> image(kBlockBytes);
  for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<uint8_t>(i * 13 + 1);
  CSilentNotifier notifier;
  RTDISP programmer(link, image, &notifier, false, false);
  if (!link->Open(0) || !programmer.SerialFlashIntoISP()) {
    state.SkipWithError("the lab scalar did not enter ISP");
    return;
  }
  programmer.SetDefaultReg();
  programmer.DisableHardwareFlashWriteProtect();
  programmer.EnableSoftwareFlashWriteProtect(false);
  const uint8_t crc = RTDISP::CalcByteCRC(image.data(), image.size());

  double hostSeconds = 0, busSeconds = 0;
  uint64_t writes = 0, reads = 0, bytes = 0;
  bool ok = true;
  for (auto _ : state) {
    api.Reset();
    const double start = ThreadSeconds();
    ok = ok && programmer.BlockErase(0);
    programmer.SerialFlashWriteCode(0);
    ok = ok && programmer.ReadCRC(0, kBlockBytes) == crc;
    hostSeconds += ThreadSeconds() - start - api.labSeconds;
    // 9 clocks a byte, one for each START or STOP, at 100 kHz.
    busSeconds += static_cast<double>(9 * api.busBytes + api.busConditions) / 100e3;
    writes += api.writes;
    reads += api.reads;
    bytes += api.bytesSent;
  }
  const double runs = static_cast<double>(state.iterations());
  const SCost minimum = MinimumPerBlock();
  state.counters["ft_writes"] = static_cast<double>(writes) / runs;
  state.counters["ft_reads"] = static_cast<double>(reads) / runs;
  state.counters["bytes_sent"] = static_cast<double>(bytes) / runs;
  state.counters["min_transfers"] = static_cast<double>(minimum.writes + minimum.reads);
  state.counters["min_bytes_sent"] = static_cast<double>(minimum.bytes);
  state.counters["host_cpu_ms"] = hostSeconds / runs * 1e3;
  state.counters["bus_ms"] = busSeconds / runs * 1e3;
  state.counters["host_share_pct"] = hostSeconds / busSeconds * 100;
  state.counters["programmed"] = ok && notifier.errors == 0 && bridge->GetViolations().empty();
  CI2CConnectorFTDI::SetApi(nullptr);
  link.reset();
  CClock::Set(nullptr);
}
BENCHMARK(BM_ScalarBlock)->Unit(benchmark::kMillisecond)->Iterations(5);

}  // namespace
