#pragma once
// The spine of one firmware update: go to loader mode, check the image
// against the loader, program, go back to normal mode, carry the checksums
// over, report. It owns the firmware data source, the discovery and the
// selected device; it starts no thread and shows nothing. Reports go to one
// CUpdateNotifier; attach and detach come in through DeviceAttach and
// DeviceDetach, from any thread.

#include <atomic>
#include <memory>
#include <mutex>
#include <string>

#include "devices/CDevice.h"
#include "devices/CDeviceList.h"
#include "devices/CDiscovery.h"
#include "firmware/CSRec.h"
#include "flash/CFLDeviceInterface.h"
#include "flash/CInterfaceNotifier.h"
#include "update/CUpdateNotifier.h"
#include "update/UpdateTypes.h"

class CUpdateController : public CInterfaceNotifier {
 public:
  using InterfacePtr = std::shared_ptr<CFLDeviceInterface>;
  using DevicePtr = std::shared_ptr<CDevice>;

  CUpdateController();
  ~CUpdateController() override;
  CUpdateController(const CUpdateController&) = delete;
  CUpdateController& operator=(const CUpdateController&) = delete;

  // Reports from device interfaces.
  void InterfaceLog(const std::string& text_I) override;
  void InterfaceError(const std::string& text_I) override;
  void InterfaceProgress(unsigned int percent_I) override;

  virtual bool StopDriver() = 0;
  virtual bool StartDriver() = 0;

  // Set-up and selection.
  void RegisterCallback(CUpdateNotifier* notifier_I) { mNotifier = notifier_I; }
  void UnregisterCallback(CUpdateNotifier* notifier_I);
  ECONTROLLER_STATE GetState() const { return mState.load(); }
  EUPDATE_TYPE GetUpdateType() const { return mUpdateType.load(); }
  bool ValidAutoUpdate() const { return mValidAutoUpdate; }
  DevicePtr GetSelectedDevice() const;
  void SetUpdateType(EUPDATE_TYPE updateType_I);

  unsigned int GetDeviceCount() const;
  CDeviceList GetDeviceList() const;
  DevicePtr GetDevice(unsigned short vendorId_I, unsigned short productId_I) const;
  DevicePtr GetDevice(const std::string& path_I) const;
  bool SetSelectedDevice(DevicePtr device_I);
  bool SetSelectedDevice(unsigned short vendorId_I, unsigned short productId_I);
  bool SetSelectedDevice(const std::string& path_I);

  bool PenAutoUpdateExists() const;
  bool TouchAutoUpdateExists() const;
  bool BluetoothAutoUpdateExists() const;
  bool ScalarAutoUpdateExists() const;

  std::string GetUpdateFile() const { return mDataSource.GetUpdateFile(); }
  std::string GetUpdateFileExt() const;
  InterfacePtr GetActiveInterface() const;
  uint32_t GetActiveFlashSectors() const;
  bool UpdateTypeMatchesDataSource() const;
  const CSRec& GetDataSource() const { return mDataSource; }

  // Running an update.
  bool SetUpdateFile(const std::string& path_I);
  bool SetAutoUpdateFile(const std::string& kind_I, const std::string& folder_I);
  bool UpdateDeviceList();
  bool CheckDeviceList();
  bool UpdateDevice();
  // The update of a scalar behind a display's FTDI bridge: the bridge whose
  // display has serial number `serial_I` (or, given a `pattern_I`, a serial
  // that matches it whole), or with `openByIndex_I` and no pattern the
  // bridge at `index_I`. Reports by state, like UpdateDevice.
  bool UpdateScalar(const std::string& serial_I, unsigned char index_I, bool openByIndex_I,
                    const std::string& pattern_I);

  // Attach and detach of the interface at `path_I`, from any thread.
  void DeviceAttach(const std::string& path_I);
  void DeviceDetach(const std::string& path_I);

  // Tells the notifier first and stores the state only when it returned:
  // an attach arriving while the notifier holds the caller is judged by the
  // old state. The driver sets ESTATE_PROGRAM through it when a run starts.
  void ProcessStateChange(ECONTROLLER_STATE state_I);

 protected:
  void CallbackLog(const std::string& text_I);
  void CallbackError(ECONTROLLER_ERROR error_I, const std::string& text_I);
  void CallbackStatus(ECONTROLLER_STATE state_I);
  void CallbackProgress(unsigned int percent_I);

  InterfacePtr GetLoaderMode();
  InterfacePtr GetNormalMode();
  bool PreUpdate();
  bool InitCheck(const InterfacePtr& interface_I, uint32_t sectors_I, bool checkSectors_I);
  bool InitCheckForSRecData(const InterfacePtr& interface_I, uint32_t sectors_I,
                            bool checkSectors_I);
  bool InitCheckForIntelHexData(const InterfacePtr& interface_I);
  bool InitCheckForAiroFlashData(const InterfacePtr& interface_I);
  bool InitCheckForScalarBinaryData(const InterfacePtr& interface_I);
  struct SParserCheckTexts;
  template <typename TParser>
  bool InitCheckForParserData(const InterfacePtr& interface_I,
                              const std::shared_ptr<TParser>& data_I,
                              void (CFLDeviceInterface::*handOver_I)(std::shared_ptr<TParser>),
                              const SParserCheckTexts& texts_I);
  bool Program(const InterfacePtr& interface_I);
  void PostUpdate();
  void FailUpdate(ECONTROLLER_ERROR error_I, const std::string& text_I);
  bool IsActivePath(const std::string& path_I) const;

  void SetSelected(DevicePtr device_I);
  EUPDATE_TYPE ScalarUpdateType() const;

  CSRec mDataSource;
  std::unique_ptr<CDiscovery> mDiscovery;
  CUpdateNotifier* mNotifier = nullptr;  // borrowed
  // Read by the device thread while the update thread writes it; atomic so
  // that the polling between threads is well defined.
  std::atomic<ECONTROLLER_STATE> mState{ESTATE_NONE};
  std::atomic<EUPDATE_TYPE> mUpdateType{EUPDATE_PEN};
  bool mValidAutoUpdate = false;

 private:
  // The selection is replaced by the update thread while the device thread
  // reads it; the lock only guards the pointer swap.
  mutable std::mutex mSelectedLock;
  DevicePtr mSelectedDevice;
};
