#pragma once
// A device whose every answer comes from the fuzzer, shared by the targets
// that put a procedure in front of one. Whether a report goes through and
// what a reply holds are input; a silent device (input used up) accepts
// writes as `silentAccepts_I` says and gives no replies it has not been
// given. A loop that never ends aborts after more reports than the longest
// procedure a loader may ask for: ten tries of a 16 MiB block written a byte
// a report are 167,772,160 sends; the erases, the other blocks' few
// thousand bytes and the failures (each one input byte) stay far below the
// rest of the budget.
#include <fuzzer/FuzzedDataProvider.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <vector>

#include "FuzzInstantClock.h"
#include "common/CClock.h"
#include "flash/CFLDeviceInterface.h"
#include "flash/CFLProtocol.h"

class CFuzzedReplies {
 public:
  CFuzzedReplies(FuzzedDataProvider& data_I, bool silentAccepts_I)
      : mData(data_I), mSilentAccepts(silentAccepts_I) {}

  bool Write() {
    Count();
    return mData.remaining_bytes() == 0 ? mSilentAccepts : mData.ConsumeBool();
  }
  // Fills as much of the report as input remains for; the rest keeps what
  // the caller put there.
  bool Read(std::vector<uint8_t>& report_IO) {
    Count();
    if (mData.remaining_bytes() == 0) return mSilentAccepts;
    if (!mData.ConsumeBool()) return false;
    const std::vector<uint8_t> reply = mData.ConsumeBytes<uint8_t>(report_IO.size());
    std::copy(reply.begin(), reply.end(), report_IO.begin());
    return true;
  }

 private:
  void Count() {
    if (++mReports > kReportBudget) std::abort();
  }
  static constexpr uint64_t kReportBudget = 200'000'000;
  FuzzedDataProvider& mData;
  bool mSilentAccepts;
  uint64_t mReports = 0;
};

// Once per process: no waiting and no command dump. Per input: the
// protocol the loader speaks, the first thing the input decides.
inline void FuzzProcedureSetUp(FuzzedDataProvider& data_I) {
  static const bool clockSet = [] {
    CClock::Set(std::make_shared<CInstantClock>());
    __DUMP_WRITE_COMMAND__ = false;
    return true;
  }();
  (void)clockSet;
  CFLProtocol::GetInstance()->SetProtocolType(data_I.ConsumeBool() ? EFL_PROTOCOL_NON_BL
                                                                   : EFL_PROTOCOL_LOADER);
}
