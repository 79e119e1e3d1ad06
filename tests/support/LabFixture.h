#pragma once
// A test with a virtual clock, the loader protocol, and an empty lab bus.

#include <gtest/gtest.h>

#include <memory>

#include "common/CClock.h"
#include "common/CVirtualClock.h"
#include "flash/CFLProtocol.h"
#include "lab/CLabBus.h"

class LabFixture : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
    mBus = CLabBus::Create();
  }
  void TearDown() override {
    mBus.reset();
    CClock::Set(nullptr);
    CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_LOADER);
  }

  // The board's interface with the given product id as the bus lists it.
  DeviceInfo Listed(const CLabBoard& board_I, size_t index_I = 0) const {
    DeviceInfo info = board_I.GetInterfaces().at(index_I).info;
    info.locationId = board_I.GetLocationId();
    return info;
  }

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  std::shared_ptr<CLabBus> mBus;
};
