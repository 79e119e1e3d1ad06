#include "update/OFLUpdater.h"

#include <sys/stat.h>

#include <cstdlib>
#include <fstream>
#include <mutex>
#include <sstream>
#include <stdexcept>

#include "common/CClock.h"
#include "common/OSUtils.h"
#include "common/StringUtilities.h"
#include "common/SystemState.h"
#include "common/TavLog.h"
#include "devices/IOUtils.h"
#include "firmware/FirmwareFileCheck.h"
#include "host/CLanguageManager.h"
#include "scalar/DisplayUtils.h"
#include "scalar/ScalarProbe.h"
#include "scalar/SensorFamilies.h"
#include "settings/CSettingsArray.h"
#include "settings/CSettingsMap.h"
#include "settings/CSettingsString.h"

namespace {

constexpr uint32_t kFamilyVendorId = 0x7A5D;

// The usage pairs of the interfaces whose attach and detach are watched,
// as (usage, usage page). Pairs with usage 0 are never watched.
struct SUsagePair {
  uint32_t usage;
  uint32_t usagePage;
};
constexpr SUsagePair kWatchedUsages[] = {
    {0x01, 0x000D}, {0x01, 0xFF00}, {0x05, 0xFF00}, {0x11, 0xFF00}, {0x80, 0xFF00},
    {0x80, 0xFF01}, {0x11, 0xFF09}, {0x01, 0xFF0D}, {0x02, 0xFF0D},
};

// setupUpdate's device-list tries, one second apart.
constexpr int kDeviceListTries = 6;
// runThreadProgram's selection tries, one second apart.
constexpr int kSelectTries = 5;
// A success that is not the last is held this long and never shown.
constexpr double kIntermediateSuccessHoldSeconds = 3.5;
// On the way to the loader the normal identity is looked for under this
// product id, which no product uses, so that any present one differs.
constexpr uint32_t kLoaderSearchProductId = 0xFF00;

// The serial number in a -s value, "manufacturer:product:serial:index".
std::string ScalarSerialOf(const std::string& value_I) {
  const std::vector<std::string> parts = StringUtilities::Tokenize(value_I, ":", false);
  return parts.size() > 2 ? parts[2] : std::string();
}

const char* const kParmFileName = "fwupdater.parm";
const char* const kConfigFileName = "fw_loader.ini";

std::mutex gSingletonLock;
std::unique_ptr<SUpdaterSetup> gSetup;
OFLUpdater* gUpdater = nullptr;

bool FileExists(const std::string& path_I) {
  struct stat info {};
  return !path_I.empty() && stat(path_I.c_str(), &info) == 0;
}

std::string JoinPath(const std::string& folder_I, const std::string& name_I) {
  if (folder_I.empty()) return name_I;
  if (folder_I.back() == '/') return folder_I + name_I;
  return folder_I + "/" + name_I;
}

std::string FolderOf(const std::string& path_I) {
  const size_t slash = path_I.rfind('/');
  if (slash == std::string::npos) return std::string();
  if (slash == 0) return "/";
  return path_I.substr(0, slash);
}

std::string TrimLineEnds(const std::string& text_I) {
  const char* const blanks = " \t\r\n\v\f";
  const size_t first = text_I.find_first_not_of(blanks);
  if (first == std::string::npos) return std::string();
  const size_t last = text_I.find_last_not_of(blanks);
  return text_I.substr(first, last - first + 1);
}

// Splits at each single blank: two blanks in a row give an empty element.
std::vector<std::string> SplitAtEachBlank(const std::string& text_I) {
  std::vector<std::string> parts;
  size_t start = 0;
  while (true) {
    const size_t blank = text_I.find(' ', start);
    parts.push_back(text_I.substr(start, blank - start));
    if (blank == std::string::npos) break;
    start = blank + 1;
  }
  return parts;
}

}  // namespace

void OFLUpdater::Configure(SUpdaterSetup setup_I) {
  std::lock_guard<std::mutex> guard(gSingletonLock);
  gSetup = std::make_unique<SUpdaterSetup>(std::move(setup_I));
}

OFLUpdater* OFLUpdater::updater() {
  std::lock_guard<std::mutex> guard(gSingletonLock);
  if (gUpdater == nullptr) {
    if (!gSetup || !gSetup->makeDiscovery) {
      TavLog::Error("Could not start Firmware Updater.");
      std::exit(-1);
    }
    gUpdater = new OFLUpdater(*gSetup);
  }
  return gUpdater;
}

void OFLUpdater::DisposeInstance() {
  OFLUpdater* updater = nullptr;
  {
    std::lock_guard<std::mutex> guard(gSingletonLock);
    updater = gUpdater;
    gUpdater = nullptr;
  }
  delete updater;
}

OFLUpdater::OFLUpdater(SUpdaterSetup setup_I)
    : mSetup(std::move(setup_I)), mDelegate(mSetup.delegate) {
  mUpdater = std::make_unique<CLinuxUpdateController>(mSetup.makeDiscovery());
  mNotifier = std::make_unique<CLinuxUpdateNotifier>(*this);
  SystemState::SetOSType();
  mHIDMgrSemaphore = CTavSemaphore::New("mHIDMgrSemaphore");
  mUpdater->RegisterCallback(mNotifier.get());
  mUpdater->setConfigPath(configPath());
}

OFLUpdater::~OFLUpdater() {
  cleanup();
  if (mThreadDevice.joinable()) mThreadDevice.join();
  if (mThreadProgram.joinable()) mThreadProgram.join();
  mUpdater->UnregisterCallback(mNotifier.get());
  mNotifier.reset();
  mUpdater.reset();
  mHIDMgrSemaphore.reset();
}

std::vector<std::string> OFLUpdater::getArgs() const {
  const std::vector<std::string>& process = mSetup.processArguments;
  const std::string parmPath = JoinPath(mSetup.preferencesFolder, kParmFileName);
  const bool userLaunched = mDelegate == nullptr || mDelegate->userLaunched();

  if (!userLaunched && !mSetup.preferencesFolder.empty() && FileExists(parmPath)) {
    std::ifstream in(parmPath);
    std::stringstream content;
    content << in.rdbuf();
    std::vector<std::string> result;
    result.push_back(process.empty() ? std::string() : process.front());
    for (const std::string& part : SplitAtEachBlank(TrimLineEnds(content.str()))) {
      result.push_back(part);
    }
    return result;
  }

  std::vector<std::string> result;
  if (process.size() >= 2) {
    for (const std::string& argument : process) result.push_back(TrimLineEnds(argument));
  }
  return result;
}

std::string OFLUpdater::configPath() const {
  const std::vector<std::string> arguments = getArgs();
  for (size_t i = 0; i < arguments.size(); ++i) {
    if (arguments[i] == "-f") return i + 1 < arguments.size() ? arguments[i + 1] : std::string();
  }
  if (mSetup.executableFolder.empty()) return std::string();
  const std::string beside = JoinPath(mSetup.executableFolder, kConfigFileName);
  if (FileExists(beside)) return beside;
  return JoinPath(mSetup.installedDataFolder, kConfigFileName);
}

std::vector<OFLUpdater::UpdateEntry> OFLUpdater::parseArguments(
    const std::vector<std::string>& arguments_I) {
  std::vector<UpdateEntry> entries;
  for (size_t i = 0; i < arguments_I.size(); ++i) {
    const std::string& option = arguments_I[i];
    const char* kind = option == "-p"   ? "pen"
                       : option == "-t" ? "touch"
                       : option == "-b" ? "bluetooth"
                       : option == "-s" ? "scalar"
                                        : nullptr;
    if (kind == nullptr) continue;
    // The next element is taken whatever it is; none at all is a range error.
    entries.emplace_back(kind, arguments_I.at(i + 1));
  }
  return entries;
}

uint32_t OFLUpdater::toHex(const std::string& word_I) {
  size_t start = word_I.find_first_not_of(" \t\r\n");
  if (start == std::string::npos) return 0;
  if (word_I.compare(start, 2, "0x") == 0 || word_I.compare(start, 2, "0X") == 0) start += 2;
  uint64_t value = 0;
  for (size_t i = start; i < word_I.size(); ++i) {
    const char c = word_I[i];
    int digit = -1;
    if (c >= '0' && c <= '9') digit = c - '0';
    if (c >= 'a' && c <= 'f') digit = c - 'a' + 10;
    if (c >= 'A' && c <= 'F') digit = c - 'A' + 10;
    if (digit < 0) break;
    value = value * 16 + static_cast<uint64_t>(digit);
    // A number too large for 32 bits reads as the largest one.
    if (value > 0xFFFFFFFFull) return 0xFFFFFFFFu;
  }
  return static_cast<uint32_t>(value);
}

std::vector<std::string> OFLUpdater::createArgumentsFromAutoConfig() {
  std::vector<std::string> arguments;
  if (!mHIDManager) return arguments;

  // The rule file is a resource of the program: beside it, else installed.
  std::string rules = JoinPath(mSetup.executableFolder, "autoconfig.ini");
  if (!FileExists(rules)) rules = JoinPath(mSetup.installedDataFolder, "autoconfig.ini");
  if (!FileExists(rules)) return arguments;

  const std::shared_ptr<CSettingsMap> map =
      CSettingsMap::CastToMap(CSettingsObject::ReadFromJSONFile(rules), false);
  if (!map || !map->IsKeyPresent("auto") || !map->IsKeyPresent("product")) return arguments;
  auto words = [&map](const char* key_I) {
    std::vector<std::string> texts;
    const auto array = CSettingsArray::CastToArray(map->ObjectForKey(key_I), false);
    if (!array) return texts;
    for (size_t i = 0; i < array->ObjectCount(); ++i) {
      // Entries that are not strings are skipped.
      if (auto text = CSettingsString::CastToString(array->ObjectForIndex(i))) {
        texts.push_back(text->GetStringValue());
      }
    }
    return texts;
  };
  const std::vector<std::string> kinds = words("auto");
  std::vector<uint32_t> products;
  for (const std::string& word : words("product")) products.push_back(toHex(word));

  arguments.push_back(JoinPath(mSetup.executableFolder, "tavik-fwupdater"));
  const CDeviceList list = mUpdater->GetDeviceList();
  for (const std::string& kind : kinds) {
    for (uint32_t product : products) {
      for (unsigned int index = 0;; ++index) {
        const std::shared_ptr<CDevice> device = list.GetDevice(index);
        if (!device) break;
        auto add = [&](const char* option_I, const CDevice::InterfacePtr& interface_I,
                       uint32_t productId_I) {
          if (interface_I && productId_I == product) {
            arguments.push_back(option_I);
            arguments.push_back(interface_I->GetPath());
          }
        };
        if (kind == "pen") add("-p", device->GetPenInterface(), device->GetPenProductId());
        if (kind == "touch") add("-t", device->GetTouchInterface(), device->GetTouchProductId());
        if (kind == "bluetooth") {
          add("-b", device->GetBluetoothInterface(), device->GetBluetoothProductId());
        }
        if (kind == "scalar" && device->GetPenInterface() && device->GetPenProductId() == product) {
          for (const auto& display :
               DisplayUtils::TavikDisplayAttributesWithPID(device->GetScalarProductId())) {
            arguments.push_back("-s");
            arguments.push_back(DisplayUtils::ScalarArgument(*display));
          }
        }
      }
    }
  }
  return arguments;
}

bool OFLUpdater::setupUpdate() {
  mThreadDevice = std::thread([this] { runThreadDevice(); });
  TavSleep(1.0);

  bool listed = mUpdater->UpdateDeviceList();
  for (int attempt = 1; !listed && attempt < kDeviceListTries; ++attempt) {
    TavSleep(1.0);
    listed = mUpdater->UpdateDeviceList();
  }
  if (!listed) return false;

  // No bound: only the end of the process (cleanup) or a watch that could
  // not be set up stops this wait.
  while (!mHIDManager && !mStopping && !mWatchFailed) TavSleep(1.0);
  if (!mHIDManager) return false;

  mHIDMgrSemaphore->RequestSemaphore();
  try {
    mDeviceUpdates = parseArguments(getArgs());
  } catch (const std::out_of_range&) {
    mHIDMgrSemaphore->ReleaseSemaphore();
    TavLog::Error("An option at the end of the arguments has no value.\n");
    if (mDelegate != nullptr) {
      OSUtils::DispatchOnMainThread([this] {
        mDelegate->notifyDialog("Error: An option at the end of the arguments has no value.");
      });
    }
    Terminate(ERUN_FAILED);
    return false;
  }
  // Arguments that name no board leave the choice to the user: the window
  // then offers the board list and the file chooser. (A terminal run
  // refuses to start without a board before it gets here.)
  mFlagCommandLine = !mDeviceUpdates.empty();
  mHIDMgrSemaphore->ReleaseSemaphore();
  return true;
}

void OFLUpdater::setUpdateType(const std::string& word_I) {
  EUPDATE_TYPE type = EUPDATE_UNKNOWN;
  if (StringUtilities::IEquals(word_I, "pen")) {
    type = EUPDATE_PEN;
  } else if (StringUtilities::IEquals(word_I, "Touch")) {
    type = EUPDATE_TOUCH;
  } else if (StringUtilities::IEquals(word_I, "Bluetooth")) {
    type = EUPDATE_BLUETOOTH;
  } else if (StringUtilities::IEquals(word_I, "Scalar")) {
    const std::shared_ptr<CDevice> device = mUpdater->GetSelectedDevice();
    type = device && device->GetScalarInterfaceType() == EHID_INTERFACE ? EUPDATE_SCALAR_HID
                                                                        : EUPDATE_SCALAR_FTDI;
  }
  mUpdater->SetUpdateType(type);
}

void OFLUpdater::boardProgram() {
  mUpdater->ProcessStateChange(ESTATE_PROGRAM);
  mThreadProgram = std::thread([this] { runThreadProgram(); });
}

void OFLUpdater::cleanup() {
  mStopping = true;
  if (mSetup.registry) mSetup.registry->StopWatching();
}

void OFLUpdater::joinProgramThread() {
  if (mThreadProgram.joinable()) mThreadProgram.join();
}

void OFLUpdater::runThreadDevice() {
  mHIDMgrSemaphore->RequestSemaphore();
  if (!mSetup.registry || !mSetup.registry->OpenWatch()) {
    TavLog::Error("Could not secure USB for Firmware Updater.");
    // The main thread is still in setupUpdate, waiting for this watch: a
    // dispatch to it would never run. It sees the flag and terminates.
    mWatchFailed = true;
    mHIDMgrSemaphore->ReleaseSemaphore();
    return;
  }
  mHIDManager = true;
  mHIDMgrSemaphore->ReleaseSemaphore();
  mSetup.registry->RunWatch(*this);
}

bool OFLUpdater::MatchesWatchedUsage(const DeviceInfo& info_I) {
  if (info_I.vendorId != kFamilyVendorId) return false;
  for (const SUsagePair& pair : kWatchedUsages) {
    if (pair.usage == info_I.usage && pair.usagePage == info_I.usagePage) return true;
  }
  return false;
}

void OFLUpdater::DeviceAdded(const DeviceInfo& info_I) {
  if (MatchesWatchedUsage(info_I)) deviceAdded(info_I);
}

void OFLUpdater::DeviceRemoved(const DeviceInfo& info_I) {
  if (MatchesWatchedUsage(info_I)) deviceRemoved(info_I);
}

void OFLUpdater::deviceAdded(const DeviceInfo& info_I) {
  mUpdater->DeviceAttach(IOUtils::DevicePathFromInfo(info_I));
}

void OFLUpdater::deviceRemoved(const DeviceInfo& info_I) {
  mUpdater->DeviceDetach(IOUtils::DevicePathFromInfo(info_I));
}

void OFLUpdater::runThreadProgram() {
  if (!mFlagCommandLine) {
    ++mUpdateIndex;
    runUpdateStep(std::string());
    mProgramFinished = true;
    return;
  }
  mResults.Reset(mDeviceUpdates);
  for (size_t index = 0; index < mDeviceUpdates.size(); ++index) {
    // An end the user asked for while the last board was in its loader
    // waits on the main thread; it runs there before the next board starts.
    if (index > 0 && mDelegate != nullptr) OSUtils::DispatchOnMainThread([] {});
    if (mStopping) break;
    const std::string& kind = mDeviceUpdates[index].first;
    const std::string& value = mDeviceUpdates[index].second;
    mResults.Begin(index);
    setUpdateType(kind);
    ++mUpdateIndex;
    if (!prepareEntry(kind, value)) {
      if (mStopping) break;
      continue;
    }
    runUpdateStep(value);
    // A loader that never came ends the update without a state of its own.
    mResults.Finish(EBOARD_FAILED, "the board did not reach its loader mode in time");
  }
  mProgramFinished = true;
  if (mDelegate != nullptr && !mDeviceUpdates.empty() && !mStopping) {
    OSUtils::DispatchOnMainThread([this] { mDelegate->updatesFinished(); });
  }
}

namespace {

std::string UpdateNameOf(const CDevice& device_I, const std::string& kind_I) {
  if (kind_I == "pen") return device_I.GetPenUpdate();
  if (kind_I == "touch") return device_I.GetTouchUpdate();
  if (kind_I == "bluetooth") return device_I.GetBluetoothUpdate();
  return device_I.GetScalarUpdate();
}

}  // namespace

bool OFLUpdater::prepareEntry(const std::string& kind_I, const std::string& value_I) {
  const std::string boardWord = TTCLocalizedNSString(CBoardResults::BoardName(kind_I));
  if (!value_I.empty()) {
    bool selected = false;
    for (int attempt = 0; attempt < kSelectTries && !selected; ++attempt) {
      selected = mUpdater->SetSelectedDevice(value_I);
      if (!selected) TavSleep(1.0);
    }
    // The selection stays as it was; the board found is updated instead.
    if (!selected && kind_I != "scalar") {
      notice(StringUtilities::Format(
          TTCLocalizedNSString(
              "No attached board has the interface path %s; the %s found is updated instead.")
              .c_str(),
          value_I.c_str(), boardWord.c_str()));
    }
  }

  const std::shared_ptr<CDevice> device = mUpdater->GetSelectedDevice();
  const std::string product = device ? device->GetDeviceName() : std::string();
  const CDevice::InterfacePtr board = mUpdater->GetActiveInterface();
  if (device) mResults.SetIdentity(device->GetPenVendorId(), device->GetPenProductId());
  if (device && mUpdater->GetUpdateType() == EUPDATE_SCALAR_FTDI) {
    // A scalar behind its bridge has the display's description for a path.
    mResults.SetBoard(
        product, value_I,
        ProbeScalar(ScalarSerialOf(value_I), ScalarSensorId(device->GetPenProductId())).version);
  } else if (device) {
    // The interface knows its release only once opened; the registry always.
    mResults.SetBoard(product, board ? board->GetPath() : std::string(),
                      board && mSetup.registry
                          ? IOUtils::FindReleaseText(*mSetup.registry, board->GetPath())
                          : std::string());
  }

  if (mUpdater->PenAutoUpdateExists() || mUpdater->TouchAutoUpdateExists() ||
      mUpdater->BluetoothAutoUpdateExists() || mUpdater->ScalarAutoUpdateExists()) {
    const std::string folder = JoinPath(FolderOf(mUpdater->getConfigPath()), "Firmware");
    const std::string name = UpdateNameOf(*device, kind_I);
    // A product without this board is said to be one, and the run ends as
    // it does for a file that is refused.
    if (name.empty()) {
      mResults.Finish(EBOARD_NOT_FOUND,
                      StringUtilities::Format(TTCLocalizedNSString("%s has no %s").c_str(),
                                              product.c_str(), boardWord.c_str()));
      endWithDialog(
          StringUtilities::Format(TTCLocalizedNSString("Error: %s has no %s to update.").c_str(),
                                  product.c_str(), boardWord.c_str()),
          ERUN_NO_DEVICE);
      return false;
    }
    const std::string file = JoinPath(folder, name);
    const EINTERFACE_TYPE loadType =
        kind_I == "scalar" ? device->GetScalarInterfaceType() : EHID_INTERFACE;
    mResults.SetFile(file);
    if (FirmwareFileCheck::KeepsReaderAway(file, loadType) ||
        !mUpdater->SetAutoUpdateFile(kind_I, folder)) {
      std::string problem = FirmwareFileCheck::Problem(file, loadType);
      if (problem.empty()) problem = "its content is not a valid firmware file";
      TavLog::Error("Firmware file %s refused: %s\n", file.c_str(), problem.c_str());
      mResults.Finish(EBOARD_FILE_REFUSED, file + ": " + problem);
      endWithDialog(TTCLocalizedNSString(
                        "Error: The specified file does not appear to be a valid firmware file."),
                    ERUN_REFUSED_FILE);
      return false;
    }
  }

  // Configured, but not attached: nothing to switch, nothing to program.
  if (!device || (!board && mUpdater->GetUpdateType() != EUPDATE_SCALAR_FTDI)) {
    mResults.Finish(
        EBOARD_NOT_FOUND,
        device ? StringUtilities::Format(TTCLocalizedNSString("the %s of %s was not found").c_str(),
                                         boardWord.c_str(), product.c_str())
               : TTCLocalizedNSString("no supported tablet is connected"));
    return false;
  }
  if (mDelegate != nullptr) {
    const SBoardResult starting = mResults.GetCurrent();
    OSUtils::DispatchOnMainThread([this, starting] { mDelegate->boardStarting(starting); });
  }
  return true;
}

void OFLUpdater::endWithDialog(const std::string& text_I, ERunOutcome outcome_I) {
  if (mDelegate != nullptr) {
    OSUtils::DispatchOnMainThread([this, text_I] { mDelegate->notifyDialog(text_I); });
  }
  Terminate(outcome_I);
  mStopping = true;
}

void OFLUpdater::notice(const std::string& text_I) {
  TavLog::Info("%s\n", text_I.c_str());
  if (mDelegate == nullptr) return;
  OSUtils::DispatchOnMainThread([this, text_I] { mDelegate->notice(text_I); });
}

void OFLUpdater::refreshVersionsAfter() {
  const std::vector<SBoardResult> results = mResults.Get();
  std::unique_ptr<CDiscovery> discovery;
  for (size_t index = 0; index < results.size(); ++index) {
    const SBoardResult& result = results[index];
    if (result.outcome != EBOARD_UPDATED) continue;
    DeviceInfo before;
    // A scalar behind its bridge has no interface path; its bridge is still
    // held by the update that reports here, so its new version is for --list.
    if (!IOUtils::DeviceInfoFromPath(result.path, before)) continue;
    if (!discovery) {
      discovery = mSetup.makeDiscovery();
      discovery->SetConfig(mUpdater->getConfigPath());
      discovery->GenerateDeviceList();
    }
    // The board is back where it was plugged in, whatever id it shows.
    const CDeviceList list = discovery->GetDeviceList();
    for (unsigned int i = 0; const std::shared_ptr<CDevice> device = list.GetDevice(i); ++i) {
      const CDevice::InterfacePtr board = result.kind == "pen"     ? device->GetPenInterface()
                                          : result.kind == "touch" ? device->GetTouchInterface()
                                          : result.kind == "bluetooth"
                                              ? device->GetBluetoothInterface()
                                              : device->GetScalarInterface();
      DeviceInfo now;
      if (board && IOUtils::DeviceInfoFromPath(board->GetPath(), now) &&
          now.locationId == before.locationId && mSetup.registry) {
        const std::string version = IOUtils::FindReleaseText(*mSetup.registry, board->GetPath());
        if (!version.empty()) {
          mResults.SetVersionAfter(index, version);
          break;
        }
      }
    }
  }
}

void OFLUpdater::runUpdateStep(const std::string& value_I) {
  if (!mSetup.power) return;
  // Held for the length of this update; released on every way out.
  std::unique_ptr<CPowerAssertion> assertion =
      mSetup.power->Create("Updating Tavik tablet firmware");
  if (!assertion) {
    mResults.Finish(EBOARD_FAILED, "the system would not stay awake for the update");
    return;
  }

  if (mUpdater->GetUpdateType() != EUPDATE_SCALAR_FTDI) {
    mUpdater->UpdateDevice();
    return;
  }
  const std::vector<std::string> parts = StringUtilities::Tokenize(value_I, ":", false);
  const unsigned char index =
      parts.size() > 3 ? static_cast<unsigned char>(std::atoi(parts[3].c_str())) : 0;
  mUpdater->UpdateScalar(ScalarSerialOf(value_I), index, false, std::string());
}

void OFLUpdater::callBackStatus(ECONTROLLER_STATE state_I) {
  // Recorded before the state machine sees it: a last success or a failure
  // ends the process from there.
  mResults.NoteState(state_I);
  // Programming is over and the loader still holds the sums it worked out;
  // the last board's own record of them comes too late for the report.
  if (state_I == ESTATE_WAIT_DEVICE) {
    const CDevice::InterfacePtr board = mUpdater->GetActiveInterface();
    if (board && board->GetChecksumsSupported()) {
      mResults.SetChecksums(board->GetOldChecksum(), board->GetNewChecksum(),
                            board->GetFWChecksum());
    }
  }
  if (state_I == ESTATE_SUCCESS) mResults.Finish(EBOARD_UPDATED);
  if (state_I == ESTATE_FAILURE) mResults.Finish(EBOARD_FAILED);
  if (state_I == ESTATE_SUCCESS && mUpdateIndex < static_cast<int>(mDeviceUpdates.size())) {
    TavSleep(kIntermediateSuccessHoldSeconds);
    return;
  }
  if (mDelegate == nullptr) return;
  OSUtils::DispatchOnMainThread([this, state_I] { mDelegate->doStateMachine(state_I); });
}

void OFLUpdater::callBackProgress(unsigned int percent_I) {
  const double entries = mDeviceUpdates.empty() ? 1.0 : static_cast<double>(mDeviceUpdates.size());
  const double overall = (static_cast<double>(percent_I) + 100.0 * mUpdateIndex - 100.0) / entries;
  if (mDelegate == nullptr) return;
  OSUtils::DispatchOnMainThread([this, overall] { mDelegate->updateProgressBar(overall); });
}

void OFLUpdater::updateDeviceList(bool toLoader_I) {
  const std::shared_ptr<CDevice> device = mUpdater->GetSelectedDevice();
  if (!device || !mSetup.registry) return;
  DeviceInfo info;
  info.vendorId = device->GetPenVendorId();
  info.productId = device->GetPenProductId();
  // A first search by vendor and product whose answer is not used.
  IOUtils::FindMatchedDevices(*mSetup.registry, info, IOUtils::kVendorId | IOUtils::kProductId);
  if (toLoader_I) info.productId = kLoaderSearchProductId;
  const std::vector<DeviceInfo> found =
      IOUtils::FindMatchedDevices(*mSetup.registry, info, IOUtils::kVendorId);
  if (found.size() == 1 && found.front().productId != info.productId) {
    mUpdater->DeviceDetach(IOUtils::DevicePathFromInfo(info));
    mUpdater->DeviceAttach(IOUtils::DevicePathFromInfo(found.front()));
  }
}

void OFLUpdater::Terminate(ERunOutcome outcome_I) {
  if (mDelegate == nullptr) return;
  OSUtils::DispatchOnMainThread([this, outcome_I] { mDelegate->terminate(outcome_I); });
}
