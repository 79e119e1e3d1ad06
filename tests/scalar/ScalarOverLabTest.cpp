// The scalar path against the lab's FTDI bridge: the link, the request
// layer and the flash programmer driving an emulated MPSSE engine, I2C bus,
// scalar, MCU and serial flash, which record any malformed traffic.

#include <gtest/gtest.h>

#include <tuple>

#include "lab/CLabFTDIBridge.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabProducts.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/RTDISP.h"
#include "support/LabFixture.h"
#include "support/RecordingNotifier.h"

namespace {

using Strings = std::vector<std::string>;

class ScalarOverLabTest : public LabFixture {
 protected:
  // A fresh bus with the product alone.
  void Plug(const std::string& product_I) {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    mBus = CLabBus::Create();
    mBoards = CLabProducts::Plug(*mBus, product_I);
    for (const auto& board : mBoards) {
      if (auto bridge = std::dynamic_pointer_cast<CLabFTDIBridge>(board)) mBridge = bridge;
    }
    mApi = std::make_unique<CLabFTDIExAPI32>(mBus);
    CI2CConnectorFTDI::SetApi(mApi.get());
  }
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    LabFixture::TearDown();
  }
  // Three blocks whose first names release 1.20.
  static std::vector<uint8_t> Image() {
    std::vector<uint8_t> image(3 * 65536);
    for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<uint8_t>(i * 7 + i / 256);
    const uint8_t release[] = {'T', 'A', 'V', 'R', 'E', 'L', 0x20, 0x01};
    std::copy(std::begin(release), std::end(release), image.begin() + 100);
    return image;
  }

  std::vector<std::shared_ptr<CLabBoard>> mBoards;
  std::shared_ptr<CLabFTDIBridge> mBridge;
  std::unique_ptr<CLabFTDIExAPI32> mApi;
};

TEST_F(ScalarOverLabTest, EachBoardIsFoundByItsSerialAndProgrammedToTheNewRelease) {
  // product, serial, Quanta, Qisda Venus
  // clang-format off
  const std::vector<std::tuple<std::string, std::string, bool, bool>> rows = {
      {"display-ftdi", "LABFT0701", false, false},
      {"display-ftdi-quanta", "LABFQ0711", true, false},
      {"display-ftdi-venus", "LABFV0721", false, true},
  };
  // clang-format on
  for (const auto& [product, serial, quanta, venus] : rows) {
    SCOPED_TRACE(product);
    Plug(product);
    ASSERT_EQ(CI2CConnectorFTDI::NumberOfDevices(), 1);
    auto link = std::make_shared<CI2CConnectorFTDI>();
    ASSERT_TRUE(link->Open(0));
    EXPECT_EQ(link->SerialNumber(0x7A5D0701), serial);
    EXPECT_EQ(link->MonitorName(), "Lab Display");
    EXPECT_TRUE(link->FWVersion() == FileVersion(1, 0, 0, FileVersion::EFinalVersion, 0));

    RecordingNotifier notifier;
    EXPECT_TRUE(RTDISP(link, Image(), &notifier, quanta, venus).StartISPFlash());
    EXPECT_EQ(notifier.errors, Strings{});
    EXPECT_EQ(notifier.progress, (std::vector<unsigned int>{0, 50, 100}));
    link->ScalarReset();
    TavSleep(1.0);
    EXPECT_TRUE(link->FWVersion() == FileVersion(1, 20, 0, FileVersion::EFinalVersion, 0));
    EXPECT_EQ(mBridge->GetViolations(), Strings{});
  }
}

TEST_F(ScalarOverLabTest, FlashFaultsAreReportedRetriedOrFatal) {
  const Strings tenErases = [] {
    Strings errors;
    for (int i = 0; i < 10; ++i)
      errors.insert(errors.end(), {"Block erase check failed", "Block Erase Fail"});
    errors.push_back("Exausted retries attempting to write block 2");
    return errors;
  }();
  // fault, Qisda Venus flags on the plain board, succeeds, errors
  // clang-format off
  const std::vector<std::tuple<std::string, bool, bool, Strings>> rows = {
      {"crc-mismatch@4", false, true, {"Crc Check Fail"}},
      {"stuck-busy", false, false, {"Timed out waiting for bit change", "Disable SW WP Fail"}},
      {"", true, false, tenErases},  // the wrong board's sequence leaves the flash protected
  };
  // clang-format on
  for (const auto& [fault, venus, succeeds, errors] : rows) {
    SCOPED_TRACE(fault);
    Plug("display-ftdi");
    if (!fault.empty()) {
      SLabFault parsed;
      std::string error;
      ASSERT_TRUE(ParseLabFault(fault, parsed, error)) << error;
      mBridge->Faults().Add(parsed);
    }
    auto link = std::make_shared<CI2CConnectorFTDI>();
    ASSERT_TRUE(link->Open(0));
    RecordingNotifier notifier;
    EXPECT_EQ(RTDISP(link, Image(), &notifier, false, venus).StartISPFlash(), succeeds);
    EXPECT_EQ(notifier.errors, errors);
  }
}

}  // namespace
