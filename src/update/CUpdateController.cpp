#include "update/CUpdateController.h"

#include <strings.h>

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CScalarBinary.h"

namespace {

// The wait for a controller to re-enumerate: passes of one second each.
constexpr int kModeSwitchPasses = 90;
constexpr double kModeSwitchPassSeconds = 1.0;

// Pen products whose loader needs the save flag on the way back whatever
// board was updated.
constexpr uint32_t kSaveOnLeaveProductA = 855;
constexpr uint32_t kSaveOnLeaveProductB = 856;

bool SameTextIgnoringCase(const std::string& a_I, const std::string& b_I) {
  return a_I.size() == b_I.size() && strcasecmp(a_I.c_str(), b_I.c_str()) == 0;
}

}  // namespace

CUpdateController::CUpdateController() = default;

CUpdateController::~CUpdateController() { mNotifier = nullptr; }

void CUpdateController::InterfaceLog(const std::string& text_I) { CallbackLog(text_I); }

void CUpdateController::InterfaceError(const std::string& text_I) {
  CallbackError(EERROR_INTERFACE, text_I);
}

void CUpdateController::InterfaceProgress(unsigned int percent_I) { CallbackProgress(percent_I); }

void CUpdateController::UnregisterCallback(CUpdateNotifier* /*notifier_I*/) { mNotifier = nullptr; }

CUpdateController::DevicePtr CUpdateController::GetSelectedDevice() const {
  std::lock_guard<std::mutex> guard(mSelectedLock);
  return mSelectedDevice;
}

void CUpdateController::SetSelected(DevicePtr device_I) {
  std::lock_guard<std::mutex> guard(mSelectedLock);
  mSelectedDevice = std::move(device_I);
}

void CUpdateController::SetUpdateType(EUPDATE_TYPE updateType_I) {
  CallbackLog("Update type changed to " + std::to_string(static_cast<int>(updateType_I)));
  mUpdateType = updateType_I;
  ProcessStateChange(ESTATE_NONE);
}

unsigned int CUpdateController::GetDeviceCount() const {
  return mDiscovery ? mDiscovery->GetDeviceList().GetDeviceCount() : 0;
}

CDeviceList CUpdateController::GetDeviceList() const {
  return mDiscovery ? mDiscovery->GetDeviceList() : CDeviceList();
}

CUpdateController::DevicePtr CUpdateController::GetDevice(unsigned short vendorId_I,
                                                          unsigned short productId_I) const {
  return mDiscovery ? mDiscovery->FindDevice(vendorId_I, productId_I) : nullptr;
}

CUpdateController::DevicePtr CUpdateController::GetDevice(const std::string& path_I) const {
  return mDiscovery ? mDiscovery->FindDevice(path_I) : nullptr;
}

bool CUpdateController::SetSelectedDevice(DevicePtr device_I) {
  if (!device_I || !device_I->IsValid()) return false;
  SetSelected(std::move(device_I));
  return true;
}

bool CUpdateController::SetSelectedDevice(unsigned short vendorId_I, unsigned short productId_I) {
  if (!mDiscovery) return false;
  DevicePtr device = mDiscovery->FindDevice(vendorId_I, productId_I);
  if (!device) return false;
  return SetSelectedDevice(device);
}

bool CUpdateController::SetSelectedDevice(const std::string& path_I) {
  if (!mDiscovery) return false;
  DevicePtr device = mDiscovery->FindDevice(path_I);
  if (!device) return false;
  return SetSelectedDevice(device);
}

bool CUpdateController::PenAutoUpdateExists() const {
  const DevicePtr device = GetSelectedDevice();
  return device && !device->GetPenUpdate().empty();
}

bool CUpdateController::TouchAutoUpdateExists() const {
  const DevicePtr device = GetSelectedDevice();
  return device && !device->GetTouchUpdate().empty();
}

bool CUpdateController::BluetoothAutoUpdateExists() const {
  const DevicePtr device = GetSelectedDevice();
  return device && !device->GetBluetoothUpdate().empty();
}

bool CUpdateController::ScalarAutoUpdateExists() const {
  const DevicePtr device = GetSelectedDevice();
  return device && !device->GetScalarUpdate().empty();
}

std::string CUpdateController::GetUpdateFileExt() const {
  TAVASSERT_TEXT("This method is deprecated; use CSRec::GetDataSourceFormat instead!");
  return mDataSource.GetUpdateFileExt();
}

CUpdateController::InterfacePtr CUpdateController::GetActiveInterface() const {
  const DevicePtr device = GetSelectedDevice();
  if (!device) return nullptr;
  switch (GetUpdateType()) {
    case EUPDATE_PEN: return device->GetPenInterface();
    case EUPDATE_TOUCH: return device->GetTouchInterface();
    case EUPDATE_BLUETOOTH: return device->GetBluetoothInterface();
    case EUPDATE_SCALAR_HID: return device->GetScalarInterface();
    case EUPDATE_SCALAR_FTDI:
    case EUPDATE_UNKNOWN: return nullptr;
  }
  return nullptr;
}

uint32_t CUpdateController::GetActiveFlashSectors() const {
  const DevicePtr device = GetSelectedDevice();
  if (!device) return 0;
  switch (GetUpdateType()) {
    case EUPDATE_PEN: return device->GetPenFlashSectors();
    case EUPDATE_TOUCH: return device->GetTouchFlashSectors();
    case EUPDATE_BLUETOOTH: return device->GetBluetoothFlashSectors();
    case EUPDATE_SCALAR_HID: return device->GetScalarFlashSectors();
    case EUPDATE_SCALAR_FTDI:
    case EUPDATE_UNKNOWN: return 0;
  }
  return 0;
}

bool CUpdateController::UpdateTypeMatchesDataSource() const {
  const EDataSourceFormat format = mDataSource.GetDataSourceFormat();
  switch (GetUpdateType()) {
    case EUPDATE_PEN: return format == EDS_SREC_PEN || format == EDS_SREC_GENERIC;
    case EUPDATE_TOUCH: return format == EDS_SREC_TOUCH || format == EDS_INTEL_HEX;
    case EUPDATE_BLUETOOTH: return format == EDS_AIROFLASH || format == EDS_AIROFLASH2;
    case EUPDATE_SCALAR_FTDI: return format == EDS_SCALAR_RTDISP;
    case EUPDATE_SCALAR_HID: return format == EDS_SCALAR_BINARY;
    case EUPDATE_UNKNOWN: return false;
  }
  return false;
}

EUPDATE_TYPE CUpdateController::ScalarUpdateType() const {
  const DevicePtr device = GetSelectedDevice();
  if (device && device->GetScalarInterfaceType() == EHID_INTERFACE) return EUPDATE_SCALAR_HID;
  return EUPDATE_SCALAR_FTDI;
}

bool CUpdateController::SetUpdateFile(const std::string& path_I) {
  CallbackLog("Processing update file: " + path_I);
  EINTERFACE_TYPE interfaceType = EINVALID_INTERFACE;
  if (GetUpdateType() == EUPDATE_SCALAR_FTDI) {
    interfaceType = EFTDI_INTERFACE;
  } else if (const InterfacePtr active = GetActiveInterface()) {
    interfaceType = active->GetInterfaceType();
  }

  if (!mDataSource.Load(path_I, interfaceType)) {
    ProcessStateChange(ESTATE_NONE);
    CallbackError(EERROR_FILE_LOAD, "");
    return false;
  }
  if (!UpdateTypeMatchesDataSource()) {
    ProcessStateChange(ESTATE_NONE);
    CallbackError(EERROR_FILE_MISMATCH, "");
    return false;
  }
  ProcessStateChange(ESTATE_READY);
  return true;
}

bool CUpdateController::SetAutoUpdateFile(const std::string& kind_I, const std::string& folder_I) {
  CallbackLog("Validating AutoUpdate file...");
  mValidAutoUpdate = false;
  std::string path = folder_I.empty() ? std::string() : folder_I + "/";
  const DevicePtr device = GetSelectedDevice();

  EINTERFACE_TYPE interfaceType = EHID_INTERFACE;
  if (kind_I == "pen" && PenAutoUpdateExists()) {
    path += device->GetPenUpdate();
    SetUpdateType(EUPDATE_PEN);
  } else if (kind_I == "touch" && TouchAutoUpdateExists()) {
    path += device->GetTouchUpdate();
    SetUpdateType(EUPDATE_TOUCH);
  } else if (kind_I == "bluetooth" && BluetoothAutoUpdateExists()) {
    path += device->GetBluetoothUpdate();
    SetUpdateType(EUPDATE_BLUETOOTH);
  } else if (kind_I == "scalar" && ScalarAutoUpdateExists()) {
    path += device->GetScalarUpdate();
    SetUpdateType(ScalarUpdateType());
    interfaceType = device->GetScalarInterfaceType();
  } else {
    return false;
  }

  // Only the load decides here: the format is not matched to the type.
  mValidAutoUpdate = mDataSource.Load(path, interfaceType);
  if (mValidAutoUpdate) ProcessStateChange(ESTATE_READY);
  return mValidAutoUpdate;
}

bool CUpdateController::UpdateDeviceList() {
  SetSelected(nullptr);
  CallbackLog("Updating Device List...");
  if (!mDiscovery || !mDiscovery->GenerateDeviceList()) {
    CallbackError(EERROR_NO_DEVICE, "Device List Failed to Update!");
    return false;
  }
  CallbackLog("Device List Successfully Updated!");
  CallbackLog("Selecting Default Device... ");
  DevicePtr best = mDiscovery->GetBestDevice();
  SetSelected(best);
  if (!best) {
    CallbackError(EERROR_NO_DEVICE, "Could not find selected device");
    return false;
  }
  CallbackLog(best->ToString());
  return true;
}

bool CUpdateController::CheckDeviceList() {
  const DevicePtr device = GetSelectedDevice();
  if (!device) return false;
  const InterfacePtr pen = device->GetPenInterface();
  if (!pen) return false;
  TavLog::Info("CUpdateController::CheckDeviceList - checking IsAlive()...\n");
  bool alive = false;
  if (pen->Open()) alive = pen->IsAlive();
  pen->Close();
  return alive;
}

bool CUpdateController::UpdateDevice() {
  const uint32_t sectors = GetActiveFlashSectors();
  const DevicePtr device = GetSelectedDevice();
  const bool wasLoader = device && device->GetIsFlashLoader();

  const InterfacePtr mainInterface = GetActiveInterface();
  if (!mainInterface) {
    CallbackLog("mainInterface not valid.");
    TAVASSERT_TEXT("Oops - Could not get a mainInterface pointer");
    return false;
  }

  const InterfacePtr loaderInterface = GetLoaderMode();
  if (!loaderInterface) {
    CallbackLog("loaderInterface not valid.");
    TAVASSERT_TEXT("Oops - Could not get a loaderInterface pointer");
    return false;
  }

  // The selection may have been replaced while waiting for the loader.
  const DevicePtr selected = GetSelectedDevice();
  const EFLProtocolType protocolType = selected ? selected->GetProtocolType() : EFL_PROTOCOL_LOADER;
  CallbackLog("Setting protocolType to " + std::to_string(static_cast<int>(protocolType)));
  loaderInterface->SetProtocolType(protocolType);

  CallbackLog("Starting Update Device Process...");
  if (!PreUpdate()) {
    FailUpdate(EERROR_INTERFACE, "PreUpdate function failed");
    return false;
  }

  CallbackLog("Programming...");
  CallbackLog(loaderInterface->ToString());
  loaderInterface->SetDataSourceFormat(mDataSource.GetDataSourceFormat());

  const bool programmed =
      InitCheck(loaderInterface, sectors, !wasLoader) && Program(loaderInterface);
  if (!programmed) {
    // Send the controller back before reporting, whatever that answers.
    loaderInterface->SwitchFromBLMode(false);
    loaderInterface->UnregisterCallback();
    loaderInterface->Close();
    FailUpdate(EERROR_PROGRAM, "General Program Failure");
    return false;
  }

  const InterfacePtr newMainInterface = GetNormalMode();
  if (!newMainInterface) {
    FailUpdate(EERROR_LEAVE_LOADER, "There was a problem swapping out of flash mode");
    return false;
  }

  newMainInterface->UpdateChecksums(loaderInterface->GetOldChecksum(),
                                    loaderInterface->GetNewChecksum(),
                                    loaderInterface->GetFWChecksum());
  newMainInterface->UnregisterCallback();
  newMainInterface->Close();

  PostUpdate();
  return true;
}

CUpdateController::InterfacePtr CUpdateController::GetLoaderMode() {
  CallbackLog("Getting Loader Interface...");
  InterfacePtr active = GetActiveInterface();
  if (!active) return nullptr;
  active->RegisterCallback(this);
  DevicePtr device = GetSelectedDevice();

  bool waitForReattach = false;
  if (device->GetIsFlashLoader()) {
    CallbackLog("Device already in loader mode");
  } else {
    const EUPDATE_TYPE type = GetUpdateType();
    const char* word = type == EUPDATE_PEN ? "Pen" : type == EUPDATE_TOUCH ? "Touch" : "Bluetooth";
    CallbackLog(std::string("Switching ") + word + " to Loader mode... ");
    ProcessStateChange(ESTATE_WAIT_LOADER);

    // A vendor-class interface takes requests only once it is claimed, so it
    // is opened before its switch. A HID or I2C interface's switch opens it
    // itself; opened here first, it would be sent an alive probe for nothing.
    if (active->GetInterfaceType() == EBULK_INTERFACE && !active->Open()) {
      CallbackLog("Could not open the interface before the switch");
    }
    if (!active->SwitchToBLMode()) {
      if (active->GetInterfaceType() == EI2C_INTERFACE) {
        CallbackError(EERROR_PROGRAM, "I2C Device failed to switch to Loader mode");
        return nullptr;
      }
      CallbackLog("Error returned from SwitchToBLMode()");
    }
    if (!device->CanGoIntoBootloaderMode()) {
      // The controller switches in place: only the flag changes.
      device->SetIsFlashLoader(true);
      active->SetIsFlashLoader(true);
    }
    waitForReattach =
        active->GetInterfaceType() != EI2C_INTERFACE && device->CanGoIntoBootloaderMode();
  }

  if (waitForReattach) {
    for (int pass = 0; pass < kModeSwitchPasses; ++pass) {
      CallbackLog("Waiting for bootloader mode...");
      TavSleep(kModeSwitchPassSeconds);
      // The list is rebuilt only once an attach has moved the state.
      if (GetState() == ESTATE_PROGRAM && UpdateDeviceList()) {
        InterfacePtr loader = GetActiveInterface();
        if (loader && loader->Open()) {
          loader->RegisterCallback(this);
          return loader;
        }
      }
    }
    CallbackLog("Bootloader mode timeout.");
    return nullptr;
  }

  if (!active->Open()) {
    ProcessStateChange(ESTATE_FAILURE);
    return nullptr;
  }
  active->RegisterCallback(this);
  ProcessStateChange(ESTATE_PROGRAM);
  return active;
}

CUpdateController::InterfacePtr CUpdateController::GetNormalMode() {
  CallbackLog("Getting Normal Interface...");
  InterfacePtr active = GetActiveInterface();
  if (!active) return nullptr;
  active->RegisterCallback(this);
  DevicePtr device = GetSelectedDevice();

  bool waitForReattach = false;
  if (!device->GetIsFlashLoader()) {
    CallbackLog("Device not in loader mode");
  } else {
    CallbackLog("Exiting Loader Mode...");
    ProcessStateChange(ESTATE_WAIT_DEVICE);

    const bool save = GetUpdateType() == EUPDATE_PEN ||
                      device->GetPenProductId() == kSaveOnLeaveProductA ||
                      device->GetPenProductId() == kSaveOnLeaveProductB;
    if (!active->SwitchFromBLMode(save)) {
      if (active->GetInterfaceType() == EI2C_INTERFACE) {
        CallbackError(EERROR_LEAVE_LOADER, "I2C Device failed to switch from Loader mode");
        return nullptr;
      }
      CallbackLog("Error returned from SwitchFromBLMode()");
    }
    if (!device->CanGoIntoBootloaderMode()) {
      device->SetIsFlashLoader(false);
      active->SetIsFlashLoader(false);
    }
    waitForReattach =
        active->GetInterfaceType() != EI2C_INTERFACE && device->CanGoIntoBootloaderMode();
  }

  if (waitForReattach) {
    // Unlike the loader-side wait this one logs nothing, refreshes the list
    // in every pass whatever the state, and runs out silently.
    for (int pass = 0; pass < kModeSwitchPasses; ++pass) {
      TavSleep(kModeSwitchPassSeconds);
      UpdateDeviceList();
      if (GetState() == ESTATE_SUCCESS) {
        InterfacePtr normal = GetActiveInterface();
        if (normal && normal->Open()) {
          normal->RegisterCallback(this);
          return normal;
        }
      }
    }
    return nullptr;
  }

  if (!active->Open()) {
    ProcessStateChange(ESTATE_FAILURE);
    return nullptr;
  }
  active->RegisterCallback(this);
  ProcessStateChange(ESTATE_SUCCESS);
  return active;
}

bool CUpdateController::PreUpdate() {
  CallbackProgress(1);
  const InterfacePtr active = GetActiveInterface();
  if (!active) {
    FailUpdate(EERROR_NO_DEVICE, "There is no supported interface attached");
    return false;
  }
  CallbackLog("Interface: " + active->ToString());
  if (!mDataSource.IsLoaded()) {
    FailUpdate(EERROR_FILE_LOAD, "No loaded data file found.");
    return false;
  }
  CallbackLog("Update: " + mDataSource.GetUpdateFile());
  return true;
}

bool CUpdateController::InitCheck(const InterfacePtr& interface_I, uint32_t sectors_I,
                                  bool checkSectors_I) {
  CallbackLog("InitCheck: starting...");
  switch (interface_I->GetDataSourceFormat()) {
    case EDS_SREC_PEN:
    case EDS_SREC_TOUCH:
    case EDS_SREC_GENERIC: return InitCheckForSRecData(interface_I, sectors_I, checkSectors_I);
    case EDS_INTEL_HEX: return InitCheckForIntelHexData(interface_I);
    case EDS_AIROFLASH:
    case EDS_AIROFLASH2: return InitCheckForAiroFlashData(interface_I);
    case EDS_SCALAR_BINARY: return InitCheckForScalarBinaryData(interface_I);
    default: InterfaceError("InitCheck: unrecognized data format"); return false;
  }
}

bool CUpdateController::InitCheckForSRecData(const InterfacePtr& interface_I, uint32_t sectors_I,
                                             bool checkSectors_I) {
  CallbackLog("InitCheckForSRecData: starting...");
  if (!interface_I) {
    InterfaceError("InitCheckForSRecData: NULL CFLDeviceInterface");
    return false;
  }
  if (!interface_I->Init(mDataSource.GetSRecData())) {
    InterfaceError("InitCheckForSRecData: Error Initializing Board");
    return false;
  }
  // A device that was already in loader mode skips the block count check.
  if (!checkSectors_I) return true;
  const uint32_t reported = interface_I->GetBLParamData().numFlashBlocks;
  if (sectors_I != 0 && sectors_I == reported) return true;
  InterfaceError("InitCheckForSRecData: Sector/Block mismatch! Expected " +
                 std::to_string(sectors_I) + " got " + std::to_string(reported) + "\n");
  return false;
}

// The texts of one of the three parser checks.
struct CUpdateController::SParserCheckTexts {
  const char* start;
  const char* nullInterface;
  const char* success;
  const char* failure;
};

template <typename TParser>
bool CUpdateController::InitCheckForParserData(
    const InterfacePtr& interface_I, const std::shared_ptr<TParser>& data_I,
    void (CFLDeviceInterface::*handOver_I)(std::shared_ptr<TParser>),
    const SParserCheckTexts& texts_I) {
  CallbackLog(texts_I.start);
  if (!interface_I) {
    InterfaceError(texts_I.nullInterface);
    return false;
  }
  if (!data_I || !data_I->IsLoaded()) {
    CallbackLog(texts_I.failure);
    return false;
  }
  ((*interface_I).*handOver_I)(data_I);
  CallbackLog(texts_I.success);
  return true;
}

bool CUpdateController::InitCheckForIntelHexData(const InterfacePtr& interface_I) {
  return InitCheckForParserData(
      interface_I, mDataSource.GetIntelHexData(), &CFLDeviceInterface::SetIntelHexData,
      {"InitCheckForIntelHexData: starting...", "InitCheckForIntelHexData: NULL CFLDeviceInterface",
       "InitCheckForIntelHexData: IntelHex file data is loaded; we're good to go...",
       "InitCheckForIntelHexData: ERROR - IntelHex file not loaded!"});
}

bool CUpdateController::InitCheckForAiroFlashData(const InterfacePtr& interface_I) {
  return InitCheckForParserData(
      interface_I, mDataSource.GetBinaryAiroFlashData(),
      &CFLDeviceInterface::SetBinaryAiroFlashData,
      {"InitCheckForAiroFlashData: starting...",
       "InitCheckForAiroFlashData: NULL CFLDeviceInterface",
       "InitCheckForAiroFlashData: AeroFlash file data is loaded; we're good to go...",
       "InitCheckForAiroFlashData: ERROR - BinaryAiroFlash file not loaded!"});
}

bool CUpdateController::InitCheckForScalarBinaryData(const InterfacePtr& interface_I) {
  return InitCheckForParserData(
      interface_I, mDataSource.GetScalarBinaryData(), &CFLDeviceInterface::SetScalarBinaryData,
      {"InitCheckForScalarBinaryData: starting...",
       "InitCheckForScalarBinaryData: NULL CFLDeviceInterface",
       "InitCheckForScalarBinaryData: Scalar Binary file data is loaded; we're good to go...",
       "InitCheckForScalarBinaryData: ERROR - ScalarBinary file not loaded!"});
}

bool CUpdateController::Program(const InterfacePtr& interface_I) {
  interface_I->SetDataSourceFormat(mDataSource.GetDataSourceFormat());
  if (!interface_I->ProgramBoard()) {
    InterfaceError("Error Programming Board");
    return false;
  }
  return true;
}

void CUpdateController::PostUpdate() {
  CallbackLog("Device Update complete!");
  ProcessStateChange(ESTATE_SUCCESS);
  CallbackProgress(100);
}

void CUpdateController::FailUpdate(ECONTROLLER_ERROR error_I, const std::string& text_I) {
  CallbackLog("Device Update failed!");
  CallbackError(error_I, text_I);
  ProcessStateChange(ESTATE_FAILURE);
}

void CUpdateController::DeviceAttach(const std::string& path_I) {
  // Only the state counts, not which device attached.
  switch (GetState()) {
    case ESTATE_WAIT_LOADER:
      CallbackLog("IMPORTANT Attach Message (" + path_I + ") STATE->ESTATE_PROGRAM");
      ProcessStateChange(ESTATE_PROGRAM);
      break;
    case ESTATE_WAIT_DEVICE:
      CallbackLog("IMPORTANT Attach Message (" + path_I + ") STATE->ESTATE_SUCCESS");
      ProcessStateChange(ESTATE_SUCCESS);
      break;
    default: CallbackLog("Ignored Attach Message (" + path_I + ")"); break;
  }
}

void CUpdateController::DeviceDetach(const std::string& path_I) {
  const DevicePtr device = GetSelectedDevice();
  if (!device || !IsActivePath(path_I) || !device->CanGoIntoBootloaderMode()) {
    CallbackLog("Ignored Unimportant Detach Message (" + path_I + ")");
    return;
  }
  const ECONTROLLER_STATE state = GetState();
  if (state == ESTATE_NONE || state == ESTATE_READY || state == ESTATE_SUCCESS) {
    CallbackLog("IMPORTANT Detach Message (" + path_I + ") STATE->ESTATE_TERMINATE");
    ProcessStateChange(ESTATE_TERMINATE);
    return;
  }
  // Expected while an update runs; nothing to do after one ended.
  CallbackLog("Ignored Detach Message (" + path_I + ")");
}

bool CUpdateController::IsActivePath(const std::string& path_I) const {
  const DevicePtr device = GetSelectedDevice();
  if (!device) return false;
  for (const InterfacePtr& interface :
       {device->GetPenInterface(), device->GetTouchInterface(), device->GetBluetoothInterface()}) {
    if (interface && SameTextIgnoringCase(path_I, interface->GetPath())) return true;
  }
  return false;
}

void CUpdateController::CallbackLog(const std::string& text_I) {
  if (mNotifier != nullptr) mNotifier->UpdateLog(text_I);
}

void CUpdateController::CallbackError(ECONTROLLER_ERROR error_I, const std::string& text_I) {
  if (mNotifier != nullptr) mNotifier->UpdateError(error_I, text_I);
}

void CUpdateController::CallbackStatus(ECONTROLLER_STATE state_I) {
  if (mNotifier != nullptr) mNotifier->UpdateStatus(state_I);
}

void CUpdateController::CallbackProgress(unsigned int percent_I) {
  if (mNotifier != nullptr) mNotifier->UpdateProgress(percent_I);
}

void CUpdateController::ProcessStateChange(ECONTROLLER_STATE state_I) {
  CallbackStatus(state_I);
  mState = state_I;
}
