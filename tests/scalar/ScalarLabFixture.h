#pragma once
// A lab bus with the display-ftdi product plugged, and the lab's bridge
// library set for the link, as a run with --lab has them.

#include <memory>

#include "lab/CLabFTDIBridge.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabProducts.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "support/LabFixture.h"

class ScalarLabFixture : public LabFixture {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    CLabProducts::Plug(*mBus, "display-ftdi");
    mBridge = std::dynamic_pointer_cast<CLabFTDIBridge>(mBus->FindBoard("display-ftdi-scalar"));
    ASSERT_NE(mBridge, nullptr);
    mApi = std::make_unique<CLabFTDIExAPI32>(mBus);
    CI2CConnectorFTDI::SetApi(mApi.get());
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    LabFixture::TearDown();
  }

  std::shared_ptr<CLabFTDIBridge> mBridge;
  std::unique_ptr<CLabFTDIExAPI32> mApi;
};
