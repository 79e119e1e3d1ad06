// A scalar whose every byte clocked in comes from the fuzzer, behind a
// bridge that acknowledges every byte written. Each reader of the request
// layer must survive any answer (ASan and UBSan watch) and end once the
// scalar falls silent.
#include <fuzzer/FuzzedDataProvider.h>

#include <cstdint>
#include <cstdlib>
#include <deque>
#include <functional>
#include <memory>
#include <vector>

#include "FuzzInstantClock.h"
#include "common/CClock.h"
#include "common/TavLog.h"
#include "scalar/CI2CConnectorFTDI.h"

namespace {

// Knows the link's strings by their first bytes only: the probe, a byte
// clocked out with its acknowledge bit clocked in, a byte clocked in.
class CFuzzedBridge : public CFTDIExAPI32 {
 public:
  explicit CFuzzedBridge(FuzzedDataProvider& data_I) : mData(data_I) {}

  FT_STATUS FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) override {
    if (flags_I == FT_LIST_NUMBER_ONLY) {
      *static_cast<uint32_t*>(arg1_IO) = 1;
    } else {
      *static_cast<uint32_t*>(arg2_IO) = 0x01150000;
    }
    return FT_OK;
  }
  FT_STATUS FT_OpenEx(void*, uint32_t, FT_HANDLE* handle_O) override {
    *handle_O = this;
    return FT_OK;
  }
  FT_STATUS FT_Close(FT_HANDLE) override { return FT_OK; }
  FT_STATUS FT_ResetDevice(FT_HANDLE) override { return FT_OK; }
  FT_STATUS FT_SetUSBParameters(FT_HANDLE, uint32_t, uint32_t) override { return FT_OK; }
  FT_STATUS FT_SetChars(FT_HANDLE, uint8_t, uint8_t, uint8_t, uint8_t) override { return FT_OK; }
  FT_STATUS FT_SetTimeouts(FT_HANDLE, uint32_t, uint32_t) override { return FT_OK; }
  FT_STATUS FT_SetLatencyTimer(FT_HANDLE, uint8_t) override { return FT_OK; }
  FT_STATUS FT_SetBitMode(FT_HANDLE, uint8_t, uint8_t) override { return FT_OK; }
  FT_STATUS FT_Purge(FT_HANDLE, uint32_t) override { return FT_OK; }

  FT_STATUS FT_Write(FT_HANDLE, const void* buffer_I, uint32_t size_I,
                     uint32_t* written_O) override {
    const auto* bytes = static_cast<const uint8_t*>(buffer_I);
    if (size_I == 1 && bytes[0] == 0xAA) mPending.insert(mPending.end(), {0xFA, 0xAA});
    if (size_I == 13 && bytes[0] == 0x11) mPending.push_back(0x00);
    if (size_I == 12 && bytes[3] == 0x24) mPending.push_back(NextAnswer());
    *written_O = size_I;
    return FT_OK;
  }
  FT_STATUS FT_Read(FT_HANDLE, void* buffer_O, uint32_t size_I, uint32_t* read_O) override {
    uint32_t count = 0;
    for (; count < size_I && !mPending.empty(); ++count) {
      static_cast<uint8_t*>(buffer_O)[count] = mPending.front();
      mPending.pop_front();
    }
    *read_O = count;
    return FT_OK;
  }
  FT_STATUS FT_GetQueueStatus(FT_HANDLE, uint32_t* rxBytes_O) override {
    *rxBytes_O = static_cast<uint32_t>(mPending.size());
    return FT_OK;
  }

 private:
  // Once the input runs out the bus floats high: every reader must stop.
  uint8_t NextAnswer() {
    const std::vector<uint8_t> next = mData.ConsumeBytes<uint8_t>(1);
    if (!next.empty()) return next[0];
    if (++mSilentReads > kSilentBudget) std::abort();  // a read that never ends
    return 0xFF;
  }
  static constexpr uint64_t kSilentBudget = 100'000;
  FuzzedDataProvider& mData;
  std::deque<uint8_t> mPending;
  uint64_t mSilentReads = 0;
};

// One of each family the readers tell apart.
constexpr SENSOR_ID kSensors[] = {-1, 0x7A5D0390, 0x7A5D034A, 0x7A5D0355, 0x7A5D03B2, 0x7A5D0701};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const bool clockSet = [] {
    CClock::Set(std::make_shared<CInstantClock>());
    return true;
  }();
  (void)clockSet;
  FuzzedDataProvider data(data_I, size_I);
  g_DebugTrace = data.ConsumeBool() ? 1 : 0;
  const SENSOR_ID sid = kSensors[data.ConsumeIntegralInRange<size_t>(0, std::size(kSensors) - 1)];
  CFuzzedBridge bridge(data);
  CI2CConnectorFTDI::SetApi(&bridge);
  {
    CI2CConnectorFTDI link;
    if (link.Open(0)) {
      link.SerialNumber(sid);
      link.MonitorName();
      link.CapabilitiesString();
      link.FWVersion();
      link.ReadEDID(sid);
      link.ReadDisplayInformation(sid);
      link.ScalarReset();
      link.SaveSettingsToScalar();
    }
  }
  CI2CConnectorFTDI::SetApi(nullptr);
  g_DebugTrace = 0;
  return 0;
}
