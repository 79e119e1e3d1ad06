#pragma once
// Doubles of the seams an update works through, and the fixture every suite
// of this folder builds on: the virtual clock, the attached products, one
// journal of board calls and a folder of the test's own. The application's
// window and desktop are doubled in its own suite.

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <fstream>
#include <future>
#include <map>
#include <set>

#include "common/CVirtualClock.h"
#include "flash/CFLDeviceInterface.h"
#include "support/LogCapture.h"
#include "update/FLAppDelegate.h"
#include "update/OFLUpdater.h"

namespace update_test {

namespace fs = std::filesystem;

constexpr uint32_t kVendor = 0x7A5D;
constexpr const char* kNormalPath = "31325:256:16777216:1:65280";
constexpr const char* kLoaderPath = "31325:257:16777216:1:65280";
constexpr const char* kTouchPath = "31325:256:16777216:4:13";

// A valid S-record image of 64 bytes.
constexpr const char* kImage =
    "S113100000070E151C232A31383F464D545B626994\nS113101070777E858C939AA1A8AFB6BDC4CBD2D984\n"
    "S1131020E0E7EEF5FC030A11181F262D343B424974\nS113103050575E656C737A81888F969DA4ABB2B964\n"
    "S9030000FC\n";

// What a double was asked, in order. One thread writes at a time: the
// others wait on the clock, a join or a dispatch.
template <typename T>
class CLog {
 public:
  void Add(T item_I) { mItems.push_back(std::move(item_I)); }
  // Adds "<what><number>".
  template <typename V>
  void Add(const char* what_I, V value_I) {
    Add(what_I + std::to_string(value_I));
  }
  const std::vector<T>& Get() const { return mItems; }
  // Index of the first `item_I`, or -1.
  int At(const T& item_I) const {
    const auto found = std::find(mItems.begin(), mItems.end(), item_I);
    return found == mItems.end() ? -1 : static_cast<int>(found - mItems.begin());
  }
  bool Has(const T& item_I) const { return At(item_I) >= 0; }
  void Clear() { mItems.clear(); }

 private:
  std::vector<T> mItems;
};
using CJournal = CLog<std::string>;
using Words = std::vector<std::string>;

inline std::string Error(ECONTROLLER_ERROR error_I, const std::string& text_I) {
  return std::to_string(error_I) + ":" + text_I;
}

// A board interface that journals each call as "<name>.<call>"; the calls
// named in mFails answer false.
class CFakeInterface : public CFLDeviceInterface {
 public:
  CFakeInterface(std::string name_I, std::string path_I, CJournal& journal_I,
                 EINTERFACE_TYPE type_I = EHID_INTERFACE)
      : CFLDeviceInterface(type_I), mName(std::move(name_I)), mJournal(journal_I) {
    mPath = std::move(path_I);
  }

  bool Open() override { return Call("Open"); }
  void Close() override { Call("Close"); }
  bool SwitchToBLMode() override { return Call("SwitchToBLMode", "", mOnSwitchTo); }
  bool SwitchFromBLMode(bool save_I) override {
    return Call("SwitchFromBLMode", save_I ? "(true)" : "(false)", mOnSwitchFrom);
  }
  bool IsAlive() override { return Call("IsAlive"); }
  void RegisterCallback(CInterfaceNotifier* notifier_I) override {
    Call("RegisterCallback");
    CFLDeviceInterface::RegisterCallback(notifier_I);
  }
  void UnregisterCallback() override {
    Call("UnregisterCallback");
    CFLDeviceInterface::UnregisterCallback();
  }
  void SetProtocolType(EFLProtocolType type_I) override {
    Call("SetProtocolType", "(" + std::to_string(type_I) + ")");
  }
  bool Init(const std::vector<SContinuousDataBlock>& data_I) override {
    size_t bytes = 0;
    for (const SContinuousDataBlock& block : data_I) bytes += block.data.size();
    mBLParams.numFlashBlocks = mBlocks;
    return Call("Init", "(" + std::to_string(bytes) + " bytes)");
  }
  bool ProgramBoard() override {
    const bool ok = Call("ProgramBoard");
    if (mNotifier != nullptr) mNotifier->InterfaceProgress(50);
    if (!ok && mNotifier != nullptr) mNotifier->InterfaceError("lab: write failed");
    if (ok) CFLDeviceInterface::UpdateChecksums(0x1111, 0x2222, 0x3333);
    return ok;
  }
  void UpdateChecksums(uint32_t old_I, uint32_t new_I, uint32_t fw_I) override {
    Call("UpdateChecksums", "(" + std::to_string(old_I) + "," + std::to_string(new_I) + "," +
                                std::to_string(fw_I) + ")");
    CFLDeviceInterface::UpdateChecksums(old_I, new_I, fw_I);
  }

  std::set<std::string> mFails;
  uint16_t mBlocks = 64;  // what Init reports
  std::function<void()> mOnSwitchTo, mOnSwitchFrom;

 private:
  bool Call(const std::string& call_I, const std::string& detail_I = "",
            const std::function<void()>& then_I = nullptr) {
    mJournal.Add(mName + "." + call_I + detail_I);
    if (then_I) then_I();
    return mFails.count(call_I) == 0;
  }
  std::string mName;
  CJournal& mJournal;
};

// What is attached right now; each discovery lists it.
struct SBus {
  std::vector<std::shared_ptr<CDevice>> devices;
  bool failGenerate = false;
};

class CFakeDiscovery : public CDiscovery {
 public:
  explicit CFakeDiscovery(std::shared_ptr<SBus> bus_I) : mBus(std::move(bus_I)) {}
  bool GenerateDeviceList() override {
    mDeviceList.ClearDeviceList();
    if (mBus->failGenerate) return false;
    for (const auto& device : mBus->devices) mDeviceList.AddDevice(device);
    return true;
  }

 private:
  std::shared_ptr<SBus> mBus;
};

// Lists the entries a test sets. Its watch ends at once: tests hand
// attach and detach to the watcher themselves.
class CFakeRegistry : public CDeviceRegistry {
 public:
  std::vector<SHidEntry> ListHidInterfaces(uint32_t) override { return mEntries; }
  std::vector<SUsbEntry> ListUsbDevices(uint32_t) override { return {}; }
  bool OpenWatch() override {
    if (mWatchReady.valid()) mWatchReady.wait();
    return mCanWatch;
  }
  void RunWatch(CRegistryWatcher&) override { mWatchRunning = true; }
  void StopWatching() override {}
  std::atomic<bool> mCanWatch{true};     // read by a device thread that may still run
  std::shared_future<void> mWatchReady;  // when set, the watch stands only once it is ready
  std::atomic<bool> mWatchRunning{false};  // the updater took the watch as standing
  std::vector<SHidEntry> mEntries;
};

class CFakePower : public CPowerInhibitor {
 public:
  struct SLease : CPowerAssertion {
    explicit SLease(std::atomic<int>& held_I) : held(held_I) { ++held; }
    ~SLease() override { --held; }
    std::atomic<int>& held;
  };
  std::unique_ptr<CPowerAssertion> Create(const std::string&) override {
    ++mRequests;
    return mRefuse ? nullptr : std::make_unique<SLease>(mHeld);
  }
  bool mRefuse = false;
  std::atomic<int> mHeld{0}, mRequests{0};
};

class UpdateFixture : public ::testing::Test {
 protected:
  void SetUp() override {
    CClock::Set(mClock);
    mFolder = fs::temp_directory_path() /
              ("update-" + std::to_string(getpid()) + "-" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
    fs::create_directories(mFolder / "cfg" / "Firmware");
  }
  void TearDown() override {
    OFLUpdater::DisposeInstance();
    // The clock's thread before the controller: its tasks reach into it.
    CClock::Set(nullptr);
    mClock.reset();
    fs::remove_all(mFolder);
  }

  std::shared_ptr<CFakeInterface> Board(const std::string& name_I, const std::string& path_I,
                                        EINTERFACE_TYPE type_I = EHID_INTERFACE) {
    return std::make_shared<CFakeInterface>(name_I, path_I, mJournal, type_I);
  }
  // The product "Lab Tablet" with this pen board (and this touch board).
  static std::shared_ptr<CDevice> Product(std::shared_ptr<CFakeInterface> pen_I, bool loader_I,
                                          bool intoBLMode_I,
                                          std::shared_ptr<CFakeInterface> touch_I = nullptr) {
    auto device = std::make_shared<CDevice>();
    device->SetDeviceName("Lab Tablet");
    device->SetPenVendorId(kVendor);
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
  // A pen that switches in place, so an update needs no re-enumeration.
  std::shared_ptr<CFakeInterface> AttachPen() {
    auto pen = Board("pen", kNormalPath);
    mBus->devices = {Product(pen, false, false)};
    return pen;
  }
  std::string WriteImage(const fs::path& path_I) {
    std::ofstream(path_I) << kImage;
    return path_I.string();
  }
  // fw_loader.ini, with the pen's firmware in the Firmware folder beside it.
  std::string WriteConfig() {
    WriteImage(mFolder / "cfg" / "Firmware" / "pen.pen");
    std::ofstream(mFolder / "cfg" / "fw_loader.ini") << "{}";
    return (mFolder / "cfg" / "fw_loader.ini").string();
  }
  // The seams of a run, as main makes them.
  SUpdaterSetup Setup(std::vector<std::string> arguments_I) {
    SUpdaterSetup setup;
    setup.makeDiscovery = [bus = mBus] { return std::make_unique<CFakeDiscovery>(bus); };
    setup.registry = mRegistry;
    setup.power = mPower;
    setup.processArguments = std::move(arguments_I);
    return setup;
  }

  std::shared_ptr<CVirtualClock> mClock = std::make_shared<CVirtualClock>();
  std::shared_ptr<SBus> mBus = std::make_shared<SBus>();
  std::shared_ptr<CFakeRegistry> mRegistry = std::make_shared<CFakeRegistry>();
  std::shared_ptr<CFakePower> mPower = std::make_shared<CFakePower>();
  CJournal mJournal;
  LogCapture mCapture;
  fs::path mFolder;
};

}  // namespace update_test
