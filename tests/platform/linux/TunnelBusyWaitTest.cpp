// The tunnel's busy loop has no limit of its own: a master that keeps
// answering busy holds the caller for as long as it does, and the caller
// goes on as soon as it stops.

#include <gtest/gtest.h>

#include <atomic>

#include "lab/CLabHidNode.h"
#include "lab/CLabI2CMaster.h"
#include "platform/linux/CLinuxI2CFLDeviceInterface.h"
#include "support/LabFixture.h"

namespace {

class TunnelOverLab : public LabFixture {};

TEST_F(TunnelOverLab, ABusyMasterHoldsTheCallerExactlyAsLongAsItStaysBusy) {
  auto master = std::make_shared<CLabI2CMaster>(SLabI2CDescription{});
  mBus->Plug(master);
  CLinuxI2CFLDeviceInterface tunnel(Listed(*master), std::make_unique<CLabHidNode>(mBus));
  ASSERT_TRUE(tunnel.SwitchToBLMode());
  ASSERT_TRUE(tunnel.Open());
  uint32_t status = 0;
  ASSERT_TRUE(tunnel.FLProtGetStatus(status)) << "the loader answers when not busy";

  // An hour of busy answers at one poll each 20 ms.
  constexpr uint32_t kBusyPolls = 180000;
  master->Faults().Add({ELabFaultKind::eBusy, kBusyPolls, ""});
  std::atomic<bool> returned{false};
  std::atomic<bool> stillWaiting{false};
  mClock->Schedule(3000.0, [&] { stillWaiting = !returned; });
  const double start = mClock->Now();
  const bool answered = tunnel.FLProtGetStatus(status);
  returned = true;
  const double waited = mClock->Now() - start;

  EXPECT_TRUE(stillWaiting) << "gave up within 50 minutes";
  EXPECT_TRUE(answered) << "did not go on once the master was free";
  EXPECT_GE(waited, kBusyPolls * 0.02);
  EXPECT_LT(waited, kBusyPolls * 0.02 + 1.0) << "went on polling after the master was free";
  EXPECT_TRUE(master->Faults().Empty());
}

}  // namespace
