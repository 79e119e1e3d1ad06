// The update controller drives a whole pen update against the lab: it finds
// the product through discovery over the lab bus, hears attach and
// detach from the bus, switches the pen to its loader, programs an S-record
// file and brings it back.

#include <gtest/gtest.h>

#include <mutex>

#include "firmware/FirmwareFiles.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabPenController.h"
#include "lab/CLabProducts.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "support/LabFixture.h"
#include "support/LabImages.h"
#include "update/CLinuxUpdateController.h"

namespace {

class Recorder : public CUpdateNotifier {
 public:
  void UpdateError(ECONTROLLER_ERROR, const std::string& text_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    errors.push_back(text_I);
  }
  void UpdateStatus(ECONTROLLER_STATE) override {}
  void UpdateProgress(unsigned int percent_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    progress.push_back(percent_I);
  }
  std::vector<std::string> errors;
  std::vector<unsigned int> progress;

 private:
  std::mutex mLock;
};

// S3 records of 32 bytes each.
std::string SRecordText(const SContinuousDataBlock& block_I) {
  std::string text = "S00600004844521B\n";
  for (size_t at = 0; at < block_I.data.size(); at += 32) {
    const std::vector<uint8_t> chunk(block_I.data.begin() + at,
                                     block_I.data.begin() + std::min(at + 32, block_I.data.size()));
    text += SRecLine('3', block_I.startAddress + static_cast<uint32_t>(at), chunk) + "\n";
  }
  return text + "S70500000000FA\n";
}

class ControllerOverLab : public LabFixture {};

TEST_F(ControllerOverLab, APenUpdateFromFileToNormalMode) {
  const auto pen = std::dynamic_pointer_cast<CLabPenController>(
      CLabProducts::Plug(*mBus, "classic-tablet").at(0));
  const CLabFlash before = pen->GetLoader().GetCpu(0);
  const SContinuousDataBlock image = LabImages::Record(0x08002000, 0x3000, 61);
  CTempFolder folder;
  const std::string path = folder.Write("lab.pen", SRecordText(image));

  auto discovery = std::make_unique<CLinuxDiscovery>(
      std::make_shared<CLabDeviceRegistry>(mBus),
      [this] { return std::make_unique<CLabHidNode>(mBus); },
      [this] { return std::make_unique<CLabUsbControl>(mBus); });
  discovery->SetConfig(TAV_DATA_DIR "/fw_loader.ini");
  CLinuxUpdateController controller(std::move(discovery));
  Recorder recorder;
  controller.RegisterCallback(&recorder);
  const int listener = mBus->AddListener([&](const SLabInterface& interface_I, bool attached_I) {
    const std::string interfacePath = CFLDeviceInterface::PathFromInfo(interface_I.info);
    if (attached_I) {
      controller.DeviceAttach(interfacePath);
    } else {
      controller.DeviceDetach(interfacePath);
    }
  });

  ASSERT_TRUE(controller.UpdateDeviceList());
  controller.SetUpdateType(EUPDATE_PEN);
  ASSERT_TRUE(controller.SetUpdateFile(path));
  const bool updated = controller.UpdateDevice();
  mBus->RemoveListener(listener);

  ASSERT_TRUE(updated) << (recorder.errors.empty() ? "" : recorder.errors.back());
  EXPECT_EQ(controller.GetState(), ESTATE_SUCCESS);
  EXPECT_TRUE(recorder.errors.empty());
  ASSERT_FALSE(recorder.progress.empty());
  EXPECT_EQ(recorder.progress.back(), 100u);
  EXPECT_EQ(pen->GetMode(), CLabLoaderBoard::EMode::eNormal);
  EXPECT_TRUE(pen->GetLoader().IsImageValid());
  const auto expected = LabImages::Expected(before, {image});
  for (uint32_t i = 0; i < before.GetBlockCount(); ++i) {
    EXPECT_EQ(pen->GetLoader().GetCpu(0).GetBlockContent(i), expected[i]) << i;
  }
  // The sums went from the loader interface to the pen's main interface.
  std::shared_ptr<CFLDeviceInterface> main = controller.GetActiveInterface();
  ASSERT_NE(main, nullptr);
  EXPECT_NE(main->GetFWChecksum(), 0u);
  EXPECT_EQ(main->GetNewChecksum(), main->GetFWChecksum());
  EXPECT_TRUE(pen->GetViolations().empty());
}

}  // namespace
