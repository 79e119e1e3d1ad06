// UpdateScalar as a run drives it: discovery over the lab bus with the
// installed device configuration, the image loaded from a file, the bridge
// found by the display's serial number and the scalar's flash programmed.

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <mutex>
#include <tuple>

#include "firmware/FirmwareFiles.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabFTDIBridge.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabProducts.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "support/LabFixture.h"
#include "support/LogCapture.h"
#include "update/CLinuxUpdateController.h"

namespace {

using Strings = std::vector<std::string>;
constexpr uint16_t kVendor = 0x7A5D;
constexpr size_t kBlock = 65536;
constexpr size_t kBlocks = 3;

class CRecorder : public CUpdateNotifier {
 public:
  void UpdateError(ECONTROLLER_ERROR, const std::string& text_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    errors.push_back(text_I);
  }
  void UpdateStatus(ECONTROLLER_STATE state_I) override {
    if (onStatus) onStatus(state_I);
  }
  void UpdateProgress(unsigned int percent_I) override { progress.push_back(percent_I); }
  Strings errors;
  std::vector<unsigned int> progress;
  std::function<void(ECONTROLLER_STATE)> onStatus;

 private:
  std::mutex mLock;
};

// Three blocks, each its own pattern, none blank; the firmware names
// release 2.23.
std::vector<uint8_t> Image() {
  std::vector<uint8_t> image(kBlocks * kBlock);
  for (size_t i = 0; i < image.size(); ++i) image[i] = static_cast<uint8_t>(i * 13 + i / kBlock);
  const uint8_t release[] = {'T', 'A', 'V', 'R', 'E', 'L', 0x23, 0x02};
  std::copy(std::begin(release), std::end(release), image.begin() + 16);
  return image;
}

class UpdateScalarOverLab : public LabFixture {
 protected:
  void TearDown() override {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    LabFixture::TearDown();
  }
  // A fresh bus with the products, one hub each, and the bridge library
  // over it. Returns their bridges in listing order.
  std::vector<std::shared_ptr<CLabFTDIBridge>> Plug(const Strings& products_I) {
    CI2CConnectorFTDI::SetApi(nullptr);
    mApi.reset();
    mBus = CLabBus::Create();
    std::vector<std::shared_ptr<CLabFTDIBridge>> bridges;
    for (unsigned port = 1; port <= products_I.size(); ++port) {
      for (const auto& board : CLabProducts::Plug(*mBus, products_I[port - 1], port)) {
        if (auto bridge = std::dynamic_pointer_cast<CLabFTDIBridge>(board))
          bridges.push_back(bridge);
      }
    }
    mApi = std::make_unique<CLabFTDIExAPI32>(mBus);
    CI2CConnectorFTDI::SetApi(mApi.get());
    return bridges;
  }
  // Runs UpdateScalar for the display whose pen is `penProductId_I`, as the
  // driver does for "-s": the serial, no index, no pattern.
  bool Update(uint16_t penProductId_I, const std::string& serial_I,
              const std::function<void(CDevice&)>& configure_I = nullptr) {
    auto discovery = std::make_unique<CLinuxDiscovery>(
        std::make_shared<CLabDeviceRegistry>(mBus),
        [this] { return std::make_unique<CLabHidNode>(mBus); },
        [this] { return std::make_unique<CLabUsbControl>(mBus); });
    discovery->SetConfig(TAV_DATA_DIR "/fw_loader.ini");
    mController = std::make_unique<CLinuxUpdateController>(std::move(discovery));
    mRecorder.errors.clear();
    mRecorder.progress.clear();
    mController->RegisterCallback(&mRecorder);
    EXPECT_TRUE(mController->UpdateDeviceList());
    EXPECT_TRUE(mController->SetSelectedDevice(kVendor, penProductId_I));
    if (configure_I) configure_I(*mController->GetSelectedDevice());
    mController->SetUpdateType(EUPDATE_SCALAR_FTDI);
    EXPECT_TRUE(mController->SetUpdateFile(mFolder.Write("scalar.bin", Image())));
    return mController->UpdateScalar(serial_I, 0, false, std::string());
  }
  static void ExpectFlashHoldsImage(const CLabFTDIBridge& bridge_I) {
    const std::vector<uint8_t>& flash = bridge_I.GetFlash().GetData();
    const std::vector<uint8_t> image = Image();
    ASSERT_GE(flash.size(), image.size());
    for (size_t b = 0; b < kBlocks; ++b) {
      EXPECT_TRUE(std::equal(image.begin() + b * kBlock, image.begin() + (b + 1) * kBlock,
                             flash.begin() + b * kBlock))
          << "block " << b;
    }
  }
  static SLabFault Fault(const std::string& text_I) {
    SLabFault fault;
    std::string error;
    EXPECT_TRUE(ParseLabFault(text_I, fault, error)) << error;
    return fault;
  }

  std::unique_ptr<CLabFTDIExAPI32> mApi;
  std::unique_ptr<CLinuxUpdateController> mController;
  CRecorder mRecorder;
  CTempFolder mFolder;
};

TEST_F(UpdateScalarOverLab, EachVariantEndsWithTheImageInFlashBlockForBlock) {
  // product, pen, serial, fault, errors reported on the way
  // clang-format off
  const std::vector<std::tuple<std::string, uint16_t, std::string, std::string, Strings>> rows = {
      {"display-ftdi", 0x0701, "LABFT0701", "", {}},
      {"display-ftdi-quanta", 0x0711, "LABFQ0711", "", {}},
      {"display-ftdi-venus", 0x0721, "LABFV0721", "", {}},
      {"display-ftdi", 0x0701, "LABFT0701", "crc-mismatch@2", {"Crc Check Fail"}},
  };
  // clang-format on
  for (const auto& [product, pen, serial, fault, errors] : rows) {
    SCOPED_TRACE(product + " " + fault);
    const auto bridges = Plug({product});
    ASSERT_EQ(bridges.size(), 1u);
    if (!fault.empty()) mBus->AddFaults({Fault(fault)}, 1);
    EXPECT_TRUE(Update(pen, serial));
    EXPECT_EQ(mController->GetState(), ESTATE_SUCCESS);
    EXPECT_EQ(mRecorder.errors, errors);
    // Blocks go from the last down, then the run ends; the new firmware
    // runs once ISP mode is left.
    EXPECT_EQ(mRecorder.progress, (std::vector<unsigned int>{0, 50, 100, 100}));
    EXPECT_FALSE(bridges[0]->GetMcu().IsInIsp());
    EXPECT_EQ(bridges[0]->GetScalar().GetRelease(), 0x0223);
    ExpectFlashHoldsImage(*bridges[0]);
    EXPECT_EQ(bridges[0]->GetViolations(), Strings{});
  }
}

TEST_F(UpdateScalarOverLab, AFlashThatNeverErasesOrStaysBusyFailsTheUpdateUntouched) {
  const auto bridges = Plug({"display-ftdi"});
  const std::vector<uint8_t> before = bridges[0]->GetFlash().GetData();
  // Configured as the Venus board: its sequence leaves this board's flash
  // protected, so every erase is refused.
  EXPECT_FALSE(Update(0x0701, "LABFT0701",
                      [](CDevice& device_I) { device_I.SetIsQisdaVenusScalarBoard(true); }));
  EXPECT_EQ(mController->GetState(), ESTATE_FAILURE);
  EXPECT_EQ(std::count(mRecorder.errors.begin(), mRecorder.errors.end(), "Block Erase Fail"), 10);
  ASSERT_GE(mRecorder.errors.size(), 2u);
  EXPECT_EQ(mRecorder.errors.end()[-2], "Exausted retries attempting to write block 2");
  EXPECT_EQ(mRecorder.errors.back(), "General Program Failure");
  EXPECT_EQ(bridges[0]->GetFlash().GetData(), before);
  EXPECT_FALSE(bridges[0]->GetMcu().IsInIsp()) << "a failed run leaves ISP mode";

  // A busy bit that never clears ends the run before anything is erased.
  const auto stuck = Plug({"display-ftdi"});
  mBus->AddFaults({Fault("stuck-busy")}, 1);
  EXPECT_FALSE(Update(0x0701, "LABFT0701"));
  EXPECT_EQ(mRecorder.errors, (Strings{"Timed out waiting for bit change", "Disable SW WP Fail",
                                       "General Program Failure"}));
  EXPECT_EQ(stuck[0]->GetFlash().GetData(), before);
}

TEST_F(UpdateScalarOverLab, OnlyTheBridgeWithTheSerialIsKeptOpen) {
  const auto bridges = Plug({"display-ftdi", "display-ftdi-quanta"});
  ASSERT_EQ(bridges.size(), 2u);
  const std::vector<uint8_t> first = bridges[0]->GetFlash().GetData();
  // While the flash is programmed, a second user can open the first bridge
  // only: the link let it go after reading its serial.
  std::vector<FT_STATUS> opens;
  mRecorder.onStatus = [&](ECONTROLLER_STATE state_I) {
    if (state_I != ESTATE_PROGRAM) return;
    CLabFTDIExAPI32 other(mBus);
    for (uint32_t location : other.Locations()) {
      FT_HANDLE handle = nullptr;
      opens.push_back(other.FT_OpenEx(reinterpret_cast<void*>(uintptr_t{location}),
                                      FT_OPEN_BY_LOCATION, &handle));
      if (handle != nullptr) other.FT_Close(handle);
    }
  };
  LogCapture log;
  EXPECT_TRUE(Update(0x0711, "LABFQ0711"));
  mRecorder.onStatus = nullptr;
  EXPECT_EQ(opens, (std::vector<FT_STATUS>{FT_OK, FT_DEVICE_NOT_OPENED}));
  EXPECT_TRUE(log.LogContains("CI2CConnectorFTDI::SerialNumber: LABFT0701\n"));
  EXPECT_EQ(bridges[0]->GetFlash().GetData(), first);
  ExpectFlashHoldsImage(*bridges[1]);
}

TEST_F(UpdateScalarOverLab, NoBridgeWithTheSerialFailsBeforeAnythingIsProgrammed) {
  // name, bridge listed, fault, serial asked for
  // clang-format off
  const std::vector<std::tuple<const char*, bool, std::string, std::string>> rows = {
      {"no bridge at all", false, "", "LABFT0701"},
      {"a bridge held elsewhere", true, "refuse-open", "LABFT0701"},
      {"another display's bridge", true, "", "labft0701"},
  };
  // clang-format on
  for (const auto& [name, bridgeSeen, fault, serial] : rows) {
    SCOPED_TRACE(name);
    Plug({"display-ftdi"});
    if (!fault.empty()) mBus->AddFaults({Fault(fault)}, 1);
    // The display's pen is still there; its bridge is not.
    if (!bridgeSeen) {
      mApi = std::make_unique<CLabFTDIExAPI32>(CLabBus::Create());
      CI2CConnectorFTDI::SetApi(mApi.get());
    }
    LogCapture log;
    std::vector<ECONTROLLER_STATE> states;
    mRecorder.onStatus = [&](ECONTROLLER_STATE state_I) { states.push_back(state_I); };
    EXPECT_FALSE(Update(0x0701, serial));
    mRecorder.onStatus = nullptr;
    EXPECT_TRUE(log.LogContains("No device found for serial number " + serial + "\n"));
    EXPECT_EQ(mRecorder.errors, Strings{"Failed to open device and/or load data"});
    EXPECT_EQ(states.back(), ESTATE_FAILURE);
    EXPECT_EQ(std::count(states.begin(), states.end(), ESTATE_PROGRAM), 0);
  }
}

TEST_F(UpdateScalarOverLab, AnUpdateCutOffMidBlockIsCompletedByTheNextRun) {
  const std::string folder = testing::TempDir() + "update-scalar-cut";
  std::filesystem::remove_all(folder);
  auto bridges = Plug({"display-ftdi"});
  const std::vector<uint8_t> factory = bridges[0]->GetFlash().GetData();
  // Far enough for block 2 to be erased and partly written.
  mBus->AddFaults({Fault("vanish@150000")}, 1);
  EXPECT_FALSE(Update(0x0701, "LABFT0701"));
  EXPECT_EQ(mController->GetState(), ESTATE_FAILURE);
  const std::vector<uint8_t> cut = bridges[0]->GetFlash().GetData();
  const std::vector<uint8_t> image = Image();
  const auto block2 = [](const std::vector<uint8_t>& bytes_I) {
    return std::vector<uint8_t>(bytes_I.begin() + 2 * kBlock, bytes_I.begin() + 3 * kBlock);
  };
  EXPECT_NE(block2(cut), block2(image));
  EXPECT_NE(block2(cut), block2(factory));
  EXPECT_NE(block2(cut), std::vector<uint8_t>(kBlock, 0xFF)) << "cut before any page";
  const uint8_t status = bridges[0]->GetFlash().GetStatus();
  ASSERT_TRUE(mBus->SaveState(folder));

  // The next run: the bus from the state folder, a controller of its own.
  mController.reset();
  bridges = Plug({"display-ftdi"});
  EXPECT_GE(mBus->LoadState(folder), 1);
  EXPECT_EQ(bridges[0]->GetFlash().GetData(), cut);
  EXPECT_EQ(bridges[0]->GetFlash().GetStatus(), status);
  EXPECT_TRUE(Update(0x0701, "LABFT0701"));
  EXPECT_EQ(mController->GetState(), ESTATE_SUCCESS);
  ExpectFlashHoldsImage(*bridges[0]);
  std::filesystem::remove_all(folder);
}

}  // namespace
