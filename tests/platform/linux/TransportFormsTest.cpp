// The transports bound to their seams: the quirks each keeps, over scripted
// seams where the exact answer matters, or over the lab.

#include <gtest/gtest.h>

#include <deque>

#include "lab/CLabTouchBulk.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxBulkFLDeviceInterface.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "platform/linux/CLinuxI2CFLDeviceInterface.h"
#include "support/LabFixture.h"
#include "support/ScriptedHidNode.h"

namespace {

using Bytes = std::vector<uint8_t>;
const DeviceInfo kInfo{0x7A71, 0x0301, 0x01100000, 0x0002, 0x000D};

// The HID form or the I2C tunnel master over a HID node a test scripts.
template <class TInterface>
class ScriptedTransport : public LabFixture {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    auto node = std::make_unique<ScriptedHidNode>(mLog);
    mNode = node.get();
    mInterface = std::make_unique<TInterface>(kInfo, std::move(node));
  }

  ScriptedHidNode::SLog mLog;
  ScriptedHidNode* mNode = nullptr;
  std::unique_ptr<TInterface> mInterface;
};
using HidTransport = ScriptedTransport<CLinuxHIDFLDeviceInterface>;

TEST_F(HidTransport, AStallPassesOnlyOnAWrite) {
  ASSERT_TRUE(mInterface->Open());
  mNode->onSet = [](const Bytes&) { return EHidStatus::eStall; };
  mNode->onGet = [](Bytes&) { return EHidStatus::eStall; };
  Bytes report{0x1C, 0, 0, 0, 0};
  EXPECT_TRUE(mInterface->Write(report));
  EXPECT_FALSE(mInterface->Read(report));
  mNode->onSet = [](const Bytes&) { return EHidStatus::eBusy; };
  EXPECT_FALSE(mInterface->Write(report));
}

TEST_F(HidTransport, OpenKeepsALiveInterfaceAndRetriesABusyOneOnce) {
  mNode->openResults = {EHidStatus::eBusy, EHidStatus::eSuccess};
  ASSERT_TRUE(mInterface->Open());
  EXPECT_EQ(mLog.opens, 2);
  EXPECT_DOUBLE_EQ(mClock->GetTotalSlept(), 2.0);
  EXPECT_EQ(mInterface->GetVersion(), 0x0123u);

  // An interface that answers the probe stays as it is.
  ASSERT_TRUE(mInterface->Open());
  EXPECT_EQ(mLog.opens, 2);
  EXPECT_EQ(mLog.sets.back(), (Bytes{0x02, 0x00}));

  mInterface->Close();
  mNode->openResults = {EHidStatus::eBusy, EHidStatus::eBusy};
  EXPECT_FALSE(mInterface->Open());
  EXPECT_FALSE(mInterface->IsOpen());
  EXPECT_EQ(mLog.opens, 4);
}

// The master answers what the test queues.
class I2CTransport : public ScriptedTransport<CLinuxI2CFLDeviceInterface> {
 protected:
  void SetUp() override {
    ScriptedTransport::SetUp();
    mNode->onGet = [this](Bytes& report_IO) {
      if (mReplies.empty()) return EHidStatus::eOther;
      const Bytes reply = mReplies.front();
      mReplies.pop_front();
      std::copy(reply.begin(), reply.end(), report_IO.begin());
      return EHidStatus::eSuccess;
    };
  }

  static Bytes WriteStatus(uint8_t status_I, uint8_t id_I) {
    return {0xB2, status_I, 0, 0, 0, id_I};
  }
  static Bytes ReadReply(uint8_t status_I, size_t length_I, uint8_t id_I) {
    Bytes reply(std::max<size_t>(6, 5 + length_I), 0x5A);
    const Bytes head{
        0xB1, status_I, 0, static_cast<uint8_t>(length_I), static_cast<uint8_t>(length_I >> 8),
        id_I};
    std::copy(head.begin(), head.end(), reply.begin());
    return reply;
  }

  std::deque<Bytes> mReplies;
};

TEST_F(I2CTransport, TunnelWriteFramingAndItsLimit) {
  Bytes command(261, 0x33);
  command[0] = 0x11;
  mReplies = {WriteStatus(0xF2, 0x11)};
  EXPECT_TRUE(mInterface->Write(command));
  ASSERT_EQ(mLog.sets.size(), 1u);
  const Bytes& request = mLog.sets[0];
  ASSERT_EQ(request.size(), 265u);
  EXPECT_EQ(Bytes(request.begin(), request.begin() + 5), (Bytes{0xB2, 0x01, 0x05, 0x01, 0x11}));
  EXPECT_EQ(request.back(), 0x33);
  EXPECT_EQ(mLog.gets.back(), (Bytes{0xB2, 0, 0, 0, 0, 0}));

  command.push_back(0x33);  // 262 bytes
  EXPECT_FALSE(mInterface->Write(command));
  EXPECT_EQ(mLog.sets.size(), 1u) << "nothing sent";

  // An echo of another id, a refusal, a foreign reply: all false.
  Bytes small{0x1C, 0, 0, 0, 0};
  mReplies = {WriteStatus(0xF2, 0x1D), WriteStatus(0xF3, 0x1C), {0xB1, 0xF2, 0, 0, 0, 0x1C}};
  for (int reply = 0; reply < 3; ++reply) EXPECT_FALSE(mInterface->Write(small)) << reply;
  mReplies = {WriteStatus(0xF0, 0)};
  EXPECT_TRUE(mInterface->Write(small));
}

TEST_F(I2CTransport, TunnelReadCopiesWhatWasAskedFor) {
  Bytes wanted(300, 0xEE);
  wanted[0] = 0x18;
  mReplies = {ReadReply(0xF2, 261, 0x18)};
  EXPECT_TRUE(mInterface->Read(wanted));
  EXPECT_EQ(mLog.sets.back(), (Bytes{0xB1, 0x01, 0x18, 0x05, 0x01}));
  EXPECT_EQ(mLog.gets.back().size(), 266u);
  EXPECT_EQ(wanted[1], 0x5A);
  EXPECT_EQ(wanted[260], 0x5A);
  EXPECT_EQ(wanted[261], 0xEE) << "only the 261 bytes asked for are copied";

  Bytes small{0x14, 1, 2, 3, 4};
  mReplies = {ReadReply(0xF0, 0, 0)};
  EXPECT_TRUE(mInterface->Read(small));
  EXPECT_EQ(small, (Bytes{0x14, 1, 2, 3, 4})) << "no data: untouched";
  mReplies = {ReadReply(0xF2, 4, 0x14)};
  EXPECT_FALSE(mInterface->Read(small)) << "another length";
  mReplies = {ReadReply(0xF2, 5, 0x15)};
  EXPECT_FALSE(mInterface->Read(small)) << "another id";
  EXPECT_EQ(small, (Bytes{0x14, 1, 2, 3, 4}));
}

TEST_F(I2CTransport, BusyIsWaitedOutWithoutLimitAndAStallIsAFailure) {
  // A minute of busy answers at one poll each 20 ms, far past any retry
  // count, then the echo.
  constexpr int kBusyPolls = 3000;
  Bytes command{0x12, 1, 0, 0, 0};
  mReplies.assign(kBusyPolls, WriteStatus(0xF1, 0));
  mReplies.push_back(WriteStatus(0xF2, 0x12));
  EXPECT_TRUE(mInterface->Write(command));
  EXPECT_NEAR(mClock->GetTotalSlept(), 0.02 * (kBusyPolls + 1), 1e-6);

  mNode->onSet = [](const Bytes&) { return EHidStatus::eStall; };
  EXPECT_FALSE(mInterface->Write(command));
}

class BulkTransport : public LabFixture {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    mTouch = std::make_shared<CLabTouchBulk>();
    mBus->Plug(mTouch);
    mInterface = std::make_unique<CLinuxBulkFLDeviceInterface>(
        Listed(*mTouch), std::make_unique<CLabUsbControl>(mBus));
  }

  std::shared_ptr<CLabTouchBulk> mTouch;
  std::unique_ptr<CLinuxBulkFLDeviceInterface> mInterface;
};

TEST_F(BulkTransport, VendorRequestsAndTheirGuards) {
  ASSERT_TRUE(mInterface->Open());
  EXPECT_TRUE(mInterface->IsAlive());
  EXPECT_EQ(mTouch->GetTrace().back().bytes, (Bytes{0xC1, 0x01, 0, 0, 0, 0, 2, 0, 0x01, 0x00}));
  // The vector is a request's fields, not a report.
  Bytes alive{0xC1, 0x01, 0x00, 0x00, 0x02};
  EXPECT_TRUE(mInterface->Write(alive));
  Bytes loaderCommand{0x14, 0, 0, 0, 0};
  EXPECT_FALSE(mInterface->Read(loaderCommand));

  mInterface->SetIsFlashLoader(true);
  const size_t seen = mTouch->GetTrace().size();
  EXPECT_FALSE(mInterface->IsAlive());
  EXPECT_FALSE(mInterface->SwitchToBLMode());
  EXPECT_EQ(mTouch->GetTrace().size(), seen);
}

// The lab's touch controller, whose vendor interface another holder keeps
// for a while.
class HeldUsbControl : public CLabUsbControl {
 public:
  HeldUsbControl(std::shared_ptr<CLabBus> bus_I, int busyClaims_I)
      : CLabUsbControl(std::move(bus_I)), mBusyClaims(busyClaims_I) {}
  EUsbStatus ClaimVendorInterface() override {
    ++claims;
    return mBusyClaims-- > 0 ? EUsbStatus::eBusy : CLabUsbControl::ClaimVendorInterface();
  }
  int claims = 0;

 private:
  int mBusyClaims;
};

TEST_F(BulkTransport, AHeldInterfaceIsWaitedForUpToFifteenMoreTries) {
  for (const auto& [busyClaims, opens] : {std::pair{15, true}, std::pair{100, false}}) {
    auto held = std::make_unique<HeldUsbControl>(mBus, busyClaims);
    HeldUsbControl* usb = held.get();
    CLinuxBulkFLDeviceInterface interface(Listed(*mTouch), std::move(held));
    EXPECT_EQ(interface.Open(), opens) << busyClaims;
    EXPECT_EQ(usb->claims, 16);
    EXPECT_EQ(usb->IsOpen(), opens);
  }
  EXPECT_NEAR(mClock->GetTotalSlept(), 2 * 30.0, 1e-9);
}

}  // namespace
