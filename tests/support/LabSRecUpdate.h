#pragma once
// Drives one S-record update of a lab board the way the update controller
// does: switch the main interface to the loader, wait for the loader to
// attach, Init, ProgramBoard, switch back and wait for normal mode. Used by
// the end-to-end tests, the interruption campaign and the benchmark.

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "common/CClock.h"
#include "flash/CFLDeviceInterface.h"
#include "lab/CLabBus.h"
#include "lab/CLabHidNode.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "support/RecordingNotifier.h"

class LabSRecUpdate {
 public:
  struct SResult {
    bool programmed = false;    // Init and ProgramBoard succeeded
    bool backToNormal = false;  // the board came back in normal mode
    uint32_t oldChecksum = 0;
    uint32_t newChecksum = 0;
    uint32_t fwChecksum = 0;
  };

  // `normal_I` and `loader_I`: the identities as the bus lists them
  // (location included). A non-BL board stays on one interface.
  LabSRecUpdate(std::shared_ptr<CLabBus> bus_I, DeviceInfo normal_I, DeviceInfo loader_I)
      : mBus(std::move(bus_I)), mNormal(normal_I), mLoader(loader_I) {}

  // Where the interfaces' HID nodes come from: the lab's by default.
  void SetNodeFactory(std::function<std::unique_ptr<CHidNode>()> factory_I) {
    mNodeFactory = std::move(factory_I);
  }
  // Runs after every one-second wait, as a device thread would see events.
  void SetAfterWait(std::function<void()> afterWait_I) { mAfterWait = std::move(afterWait_I); }
  void SetProtocol(EFLProtocolType protocol_I) { mProtocol = protocol_I; }
  void SetFormat(EDataSourceFormat format_I) { mFormat = format_I; }
  RecordingNotifier& Notifier() { return mNotifier; }

  bool IsListed(const DeviceInfo& info_I) const {
    for (const SLabInterface& entry : mBus->ListInterfaces()) {
      if (entry.info == info_I) return true;
    }
    return false;
  }

  // Up to 90 one-second passes, as the controller waits.
  bool WaitFor(const DeviceInfo& info_I) const {
    for (int pass = 0; pass < 90; ++pass) {
      TavSleep(1.0);
      if (mAfterWait) mAfterWait();
      if (IsListed(info_I)) return true;
    }
    return false;
  }

  std::unique_ptr<CLinuxHIDFLDeviceInterface> MakeInterface(const DeviceInfo& info_I) const {
    std::unique_ptr<CHidNode> node =
        mNodeFactory ? mNodeFactory() : std::make_unique<CLabHidNode>(mBus);
    return std::make_unique<CLinuxHIDFLDeviceInterface>(info_I, std::move(node));
  }

  SResult Run(const std::vector<SContinuousDataBlock>& image_I) {
    SResult result;
    const bool nonBL = mProtocol == EFL_PROTOCOL_NON_BL;
    if (!nonBL && !IsListed(mLoader)) {
      std::unique_ptr<CLinuxHIDFLDeviceInterface> main = MakeInterface(mNormal);
      main->RegisterCallback(&mNotifier);
      if (!main->SwitchToBLMode() || !WaitFor(mLoader)) return result;
    }
    std::unique_ptr<CLinuxHIDFLDeviceInterface> loader =
        MakeInterface(nonBL && !IsListed(mLoader) ? mNormal : mLoader);
    loader->SetIsFlashLoader(true);
    if (!loader->Open()) return result;
    loader->SetProtocolType(mProtocol);
    loader->RegisterCallback(&mNotifier);
    loader->SetDataSourceFormat(mFormat);
    result.programmed = loader->Init(image_I) && loader->ProgramBoard();
    result.oldChecksum = loader->GetOldChecksum();
    result.newChecksum = loader->GetNewChecksum();
    result.fwChecksum = loader->GetFWChecksum();
    if (!result.programmed) {
      loader->SwitchFromBLMode(false);
      loader->Close();
      return result;
    }
    loader->SwitchFromBLMode(true);
    loader->Close();
    result.backToNormal = (nonBL && IsListed(mNormal)) || WaitFor(mNormal);
    return result;
  }

 private:
  std::shared_ptr<CLabBus> mBus;
  DeviceInfo mNormal;
  DeviceInfo mLoader;
  EFLProtocolType mProtocol = EFL_PROTOCOL_LOADER;
  EDataSourceFormat mFormat = EDS_SREC_PEN;
  std::function<std::unique_ptr<CHidNode>()> mNodeFactory;
  std::function<void()> mAfterWait;
  RecordingNotifier mNotifier;
};
