#pragma once
// A controller wired to the doubles, on the virtual clock.

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>

#include "common/CVirtualClock.h"
#include "support/LogCapture.h"
#include "update/ControllerDoubles.h"

namespace controller_test {

inline constexpr const char* kNormalPath = "4660:256:16777216:1:65280";
inline constexpr const char* kLoaderPath = "4660:257:16777216:1:65280";
inline constexpr const char* kTouchPath = "4660:256:16777216:4:13";

class ControllerFixture : public ::testing::Test {
 protected:
  void SetUp() override {
    mClock = std::make_shared<CVirtualClock>();
    mBus = std::make_shared<SBus>();
    CClock::Set(mClock);
    mController = std::make_unique<CLinuxUpdateController>(std::make_unique<CFakeDiscovery>(mBus));
    mController->RegisterCallback(&mNotifier);
    mFolder = std::filesystem::temp_directory_path() /
              ("controller-" + std::to_string(getpid()) + "-" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
    std::filesystem::create_directories(mFolder);
  }

  void TearDown() override {
    // Stop the clock's thread first: its tasks reach into the controller.
    CClock::Set(nullptr);
    mClock.reset();
    mController.reset();
    std::filesystem::remove_all(mFolder);
  }

  std::shared_ptr<CFakeInterface> MakeInterface(const std::string& name_I, const std::string& path_I,
                                                EINTERFACE_TYPE type_I = EHID_INTERFACE) {
    return std::make_shared<CFakeInterface>(name_I, type_I, path_I, mJournal);
  }

  // A product with a pen board (and optionally a touch board).
  std::shared_ptr<CDevice> MakeDevice(std::shared_ptr<CFakeInterface> pen_I, bool loader_I,
                                      bool intoBLMode_I = true,
                                      std::shared_ptr<CFakeInterface> touch_I = nullptr) {
    auto device = std::make_shared<CDevice>();
    device->SetDeviceName("Lab Tablet");
    device->SetPenVendorId(0x1234);
    device->SetPenProductId(loader_I ? 0x101 : 0x100);
    device->SetPenFlashSectors(64);
    device->SetPenIntoBLMode(intoBLMode_I);
    device->SetPenUpdate("pen.pen");
    device->SetIsFlashLoader(loader_I);
    pen_I->SetIsFlashLoader(loader_I);
    device->SetPenInterface(pen_I);
    if (touch_I) {
      device->SetTouchSupported(true);
      device->SetTouchInterface(touch_I);
      device->SetTouchFlashSectors(16);
      device->SetTouchUpdate("touch.touch");
    }
    return device;
  }

  // A pen that leaves for its loader 3 s after the switch and comes back
  // 2 s after the switch back, each time with an attach from the clock's
  // thread while the update thread polls.
  void SetUpReEnumeratingPen() {
    mPen = MakeInterface("pen", kNormalPath);
    mLoader = MakeInterface("loader", kLoaderPath);
    mPenAgain = MakeInterface("penAgain", kNormalPath);
    mNormalDevice = MakeDevice(mPen, false);
    mLoaderDevice = MakeDevice(mLoader, true);
    auto normalAgain = MakeDevice(mPenAgain, false);
    mPen->mOnSwitchTo = [this] {
      mClock->Schedule(3, [this] {
        mBus->Set({mLoaderDevice});
        mController->DeviceAttach(kLoaderPath);
      });
    };
    mLoader->mOnSwitchFrom = [this, normalAgain] {
      mClock->Schedule(2, [this, normalAgain] {
        mBus->Set({normalAgain});
        mController->DeviceAttach(kNormalPath);
      });
    };
    mBus->Set({mNormalDevice});
    ASSERT_TRUE(mController->UpdateDeviceList());
  }

  std::string WriteFile(const std::string& name_I, size_t bytes_I = 64) {
    const std::string path = (mFolder / name_I).string();
    WriteSRecFile(path, 0x1000, bytes_I);
    return path;
  }

  static std::string State(ECONTROLLER_STATE state_I) { return "state:" + std::to_string(state_I); }
  static std::string Error(ECONTROLLER_ERROR error_I, const std::string& text_I) {
    return "error:" + std::to_string(error_I) + ":" + text_I;
  }

  std::shared_ptr<CVirtualClock> mClock;
  std::shared_ptr<SBus> mBus;
  CJournal mJournal;
  CRecordingNotifier mNotifier;
  LogCapture mCapture;
  std::unique_ptr<CLinuxUpdateController> mController;
  std::filesystem::path mFolder;

  std::shared_ptr<CFakeInterface> mPen, mLoader, mPenAgain;
  std::shared_ptr<CDevice> mNormalDevice, mLoaderDevice;
};

}  // namespace controller_test
