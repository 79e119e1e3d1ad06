#pragma once
// The driver of a running application: parses the arguments into a list of
// updates, keeps the device watch alive on its own thread, runs the updates
// on a second thread, and carries status and progress from the controller
// to the application object on the main thread.

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "common/CTavSemaphore.h"
#include "devices/CDiscovery.h"
#include "seams/CDeviceRegistry.h"
#include "seams/CPowerInhibitor.h"
#include "update/CApplicationDelegate.h"
#include "update/CBoardResults.h"
#include "update/CLinuxUpdateController.h"
#include "update/CLinuxUpdateNotifier.h"

// What a run gives the driver: the seams it works through and the facts of
// the process that the original read from the platform.
struct SUpdaterSetup {
  std::function<std::unique_ptr<CDiscovery>()> makeDiscovery;
  std::shared_ptr<CDeviceRegistry> registry;
  std::shared_ptr<CPowerInhibitor> power;
  std::vector<std::string> processArguments;  // program name first
  std::string preferencesFolder;              // holds fwupdater.parm
  std::string executableFolder;               // fw_loader.ini beside the program
  std::string installedDataFolder;            // fw_loader.ini of the installation
  // The application object, known at creation: whether it was launched by
  // the user decides where the arguments, and the configuration, come from.
  CApplicationDelegate* delegate = nullptr;
};

class OFLUpdater : public CRegistryWatcher {
 public:
  // An update entry: its kind ("pen", "touch", "bluetooth", "scalar") and
  // the value that followed the option.
  using UpdateEntry = std::pair<std::string, std::string>;

  // Must come before the first updater(): the run's seams.
  static void Configure(SUpdaterSetup setup_I);
  // The singleton, created at first use. Without a configuration it cannot
  // start, and the process ends with -1.
  static OFLUpdater* updater();
  // Stops the threads and deletes the singleton (end of process, tests).
  static void DisposeInstance();

  ~OFLUpdater() override;

  void setAppDelegate(CApplicationDelegate* delegate_I) { mDelegate = delegate_I; }
  EUPDATE_TYPE getUpdateType() const { return mUpdater->GetUpdateType(); }
  std::shared_ptr<CDevice> getSelectedDevice() const { return mUpdater->GetSelectedDevice(); }
  CLinuxUpdateController& GetController() { return *mUpdater; }

  std::vector<std::string> getArgs() const;
  std::string configPath() const;
  // Throws std::out_of_range for an option in last place.
  static std::vector<UpdateEntry> parseArguments(const std::vector<std::string>& arguments_I);
  static uint32_t toHex(const std::string& word_I);
  // Arguments built from the attached devices and the rule file
  // "autoconfig.ini" (JSON: "auto" board words, "product" hex ids). Nothing
  // on the launch path calls it; the arguments in force come from getArgs.
  std::vector<std::string> createArgumentsFromAutoConfig();

  bool setupUpdate();
  void setUpdateType(const std::string& word_I);
  bool setFileURL(const std::string& path_I) { return mUpdater->SetUpdateFile(path_I); }
  void boardProgram();
  void cleanup();
  void updateDeviceList(bool toLoader_I);

  void callBackStatus(ECONTROLLER_STATE state_I);
  void callBackProgress(unsigned int percent_I);

  // Attach and detach from the device watch, for matching interfaces only.
  void DeviceAdded(const DeviceInfo& info_I) override;
  void DeviceRemoved(const DeviceInfo& info_I) override;
  void deviceAdded(const DeviceInfo& info_I);
  void deviceRemoved(const DeviceInfo& info_I);

  // True after setupUpdate when the arguments name a board to update;
  // false leaves the board and the file to the user.
  bool isCommandLine() const { return mFlagCommandLine; }
  int updateIndex() const { return mUpdateIndex; }
  void setUpdateIndex(int index_I) { mUpdateIndex = index_I; }
  std::vector<UpdateEntry> deviceUpdates() const { return mDeviceUpdates; }
  // What became of each board asked for.
  const CBoardResults& boardResults() const { return mResults; }
  CBoardResults& boardResults() { return mResults; }
  // Reads the boards that were updated once more, for the version they now
  // run. Call once the run is over.
  void refreshVersionsAfter();
  // An error the controller reported, kept as the reason of the current board.
  void noteError(ECONTROLLER_ERROR code_I, const std::string& text_I) {
    mResults.NoteError(code_I, text_I);
  }
  // The device watch could not be set up.
  bool watchFailed() const { return mWatchFailed; }
  // True once the update thread has gone through its list.
  bool programThreadFinished() const { return mProgramFinished; }
  // Waits for the update thread to end (tests and the end of a headless run).
  void joinProgramThread();

 private:
  explicit OFLUpdater(SUpdaterSetup setup_I);

  void runThreadDevice();
  void runThreadProgram();
  void runUpdateStep(const std::string& value_I);
  // False when the entry cannot go on; its outcome is then recorded.
  bool prepareEntry(const std::string& kind_I, const std::string& value_I);
  void notice(const std::string& text_I);
  // The dialog, then the end of the run; the update loop goes no further.
  void endWithDialog(const std::string& text_I, ERunOutcome outcome_I);
  static bool MatchesWatchedUsage(const DeviceInfo& info_I);
  void Terminate(ERunOutcome outcome_I);

  SUpdaterSetup mSetup;
  CApplicationDelegate* mDelegate = nullptr;  // the application object
  std::unique_ptr<CLinuxUpdateController> mUpdater;
  std::unique_ptr<CLinuxUpdateNotifier> mNotifier;
  std::shared_ptr<CTavSemaphore> mHIDMgrSemaphore;
  // The watch of attach and detach is set up; stands in for the HID manager.
  std::atomic<bool> mHIDManager{false};
  std::atomic<bool> mFlagCommandLine{false};
  std::atomic<int> mUpdateIndex{0};
  std::vector<UpdateEntry> mDeviceUpdates;
  std::atomic<bool> mProgramFinished{false};
  std::atomic<bool> mStopping{false};
  std::atomic<bool> mWatchFailed{false};
  CBoardResults mResults;
  std::thread mThreadProgram;
  std::thread mThreadDevice;
};
