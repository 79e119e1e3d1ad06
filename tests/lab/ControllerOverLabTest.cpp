// The update controller drives a whole pen update against the lab: it finds
// the pen through a small discovery over the lab bus, hears attach and
// detach from the bus, switches the pen to its loader, programs an S-record
// file and brings it back.

#include <gtest/gtest.h>

#include <mutex>

#include "devices/CDiscovery.h"
#include "firmware/FirmwareFiles.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabPenController.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "support/LabFixture.h"
#include "support/LabImages.h"
#include "update/CLinuxUpdateController.h"

namespace {

constexpr uint16_t kPen = 0x0301;
constexpr uint16_t kLoader = 0x0302;

// One device per pen found on the bus: its digitizer interface in normal
// mode, its loader interface in loader mode.
class LabDiscovery : public CDiscovery {
 public:
  explicit LabDiscovery(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) {}

  bool GenerateDeviceList() override {
    mDeviceList.ClearDeviceList();
    for (const SLabInterface& entry : mBus->ListInterfaces()) {
      const bool loader = entry.info.productId == kLoader;
      const bool pen = entry.info.productId == kPen && entry.info.usagePage == 0x000D;
      if (!loader && !pen) continue;
      auto device = std::make_shared<CDevice>();
      device->SetDeviceName("lab pen");
      device->SetPenVendorId(entry.info.vendorId);
      device->SetPenProductId(kPen);
      device->SetPenInterfaceType(EHID_INTERFACE);
      device->SetPenFlashSectors(48);
      device->SetPenIntoBLMode(true);
      device->SetIsFlashLoader(loader);
      auto interface = std::make_shared<CLinuxHIDFLDeviceInterface>(
          entry.info, std::make_unique<CLabHidNode>(mBus));
      interface->SetIsFlashLoader(loader);
      device->SetPenInterface(interface);
      mDeviceList.AddDevice(device);
    }
    return mDeviceList.GetDeviceCount() != 0;
  }

 private:
  std::shared_ptr<CLabBus> mBus;
};

class Recorder : public CUpdateNotifier {
 public:
  void UpdateError(ECONTROLLER_ERROR, const std::string& text_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    errors.push_back(text_I);
  }
  void UpdateStatus(ECONTROLLER_STATE state_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    states.push_back(state_I);
  }
  void UpdateProgress(unsigned int percent_I) override {
    std::lock_guard<std::mutex> guard(mLock);
    progress.push_back(percent_I);
  }
  std::vector<std::string> errors;
  std::vector<ECONTROLLER_STATE> states;
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
  auto pen = std::make_shared<CLabPenController>();
  mBus->Plug(pen);
  const CLabFlash before = pen->GetLoader().GetCpu(0);
  const SContinuousDataBlock image = LabImages::Record(0x08002000, 0x3000, 61);
  CTempFolder folder;
  const std::string path = folder.Write("lab.pen", SRecordText(image));

  CLinuxUpdateController controller(std::make_unique<LabDiscovery>(mBus));
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
