#include "update/FLAppDelegate.h"

#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <stdexcept>

#include "common/CClock.h"
#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "devices/CDevice.h"
#include "flash/CFLDeviceInterface.h"
#include "host/CLanguageManager.h"
#include "host/OProcessUtils.h"
#include "host/ProcessUtils.h"
#include "update/OFLUpdater.h"

namespace {

// A success stays on show this long before its dialog.
constexpr double kSuccessShowSeconds = 3.5;
// The programming text changes this often.
constexpr double kProgramTextPeriod = 0.5;
// After asking each driver application to quit.
constexpr double kQuitWaitSeconds = 2.0;
// After asking the helper service to stop the driver's services.
constexpr double kServiceStopWaitSeconds = 6.0;

const char* const kFamilyPrefix = "com.tavik";
// The workspace option the driver start has always passed; it asks for
// nothing a desktop entry knows.
constexpr unsigned long kDriverLaunchOptions = 65536;

std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }

const char* OutcomeText(ERunOutcome outcome_I) {
  switch (outcome_I) {
    case ERUN_SUCCESS: return "Result: the firmware was updated.";
    case ERUN_FAILED: return "Result: the update failed.";
    case ERUN_NO_DEVICE: return "Result: no supported tablet is connected.";
    case ERUN_REFUSED_FILE: return "Result: the firmware file was refused.";
    case ERUN_DECLINED: return "Result: nothing was updated.";
    case ERUN_USAGE: return "Result: nothing was updated.";
  }
  return "Result: the update failed.";
}

}  // namespace

FLAppDelegate::FLAppDelegate(SApplicationSetup setup_I) : mSetup(std::move(setup_I)) {
  // The driver is started again through the run's desktop.
  OProcessUtils::SetDesktop(mSetup.desktop);
}

void FLAppDelegate::CheckLaunchSender() {
  setUserLaunched(true);
  if (!mSetup.desktop) return;
  CDesktop& desktop = *mSetup.desktop;
  const int sender = desktop.GetLaunchSenderPid();
  const std::string identifier = desktop.GetApplicationIdOfProcess(sender);
  // Another program of the family started us: it may have left arguments
  // in the preferences file.
  if (identifier.compare(0, 9, kFamilyPrefix) == 0) {
    setUserLaunched(false);
    return;
  }
  if (!desktop.IsApplicationProcess(sender) && sender != 0 &&
      desktop.GetProcessArgumentCount() >= 2) {
    setUserLaunched(false);
  }
}

void FLAppDelegate::applicationDidFinishLaunching() {
  CheckLaunchSender();

  if (mSetup.desktop && !mSetup.desktop->RequestHidAccess()) {
    SAlert alert{EALERT_STYLE_CRITICAL,
                 T("200:250"),
                 T("200:255") + "\n\n" + T("200:257"),
                 {T("Try Again")}};
    if (mSetup.window != nullptr) mSetup.window->ShowAlert(alert);
    // The button does not try again.
    terminate(ERUN_FAILED);
    return;
  }

  if (mSetup.terminal && !CheckTerminalArguments()) return;

  if (std::shared_ptr<OUpdaterClient> client = OUpdaterClient::client()) client->connectToService();

  TavLog::Info("Stopping driver\n");
  if (mSetup.desktop) stopDriver(*mSetup.desktop);

  mUpdater = OFLUpdater::updater();
  mUpdater->setAppDelegate(this);
  if (!mUpdater->setupUpdate()) {
    if (!mTerminated && mUpdater->watchFailed()) {
      if (mSetup.terminal) notice(T("Could not secure USB for Firmware Updater."));
      terminate(ERUN_FAILED);
    } else if (!mTerminated) {
      // Without a configuration no product can be known: say which file.
      if (mSetup.terminal && !mUpdater->GetController().configurationRead()) {
        notice(StringUtilities::Format(
            T("The device configuration %s could not be read, so no product is known.").c_str(),
            mUpdater->GetController().getConfigPath().c_str()));
      }
      notifyDialog(T("Error: No supported tablet is connected. Please connect a tablet."));
      terminate(ERUN_NO_DEVICE);
    }
    return;
  }

  presentDialog();

  if (mUpdater->isCommandLine()) {
    if (!confirmProgram()) {
      terminate(ERUN_DECLINED);
      return;
    }
    mUpdater->boardProgram();
  }
  TavLog::Info("Firmware updater started.");
}

void FLAppDelegate::presentDialog() {
  mWindowController = mSetup.window;
  if (mWindowController == nullptr) return;
  if (mUpdater == nullptr) mUpdater = OFLUpdater::updater();
  mWindowController->initForDialog(mUpdater != nullptr && mUpdater->isCommandLine());
  mWindowController->showWindow();
  mWindowController->SetCloseHandler([this] { terminate(ERUN_DECLINED); });

  const std::shared_ptr<CDevice> device = mUpdater ? mUpdater->getSelectedDevice() : nullptr;
  if (!device) return;
  mWindowController->setTabletName(device->GetDeviceName());
  std::vector<std::string> boards;
  if (auto pen = device->GetPenInterface()) {
    boards.push_back("Pen");
    mWindowController->setPenFirmwareVersion(pen->GetVersion());
    mWindowController->setPenOldChecksum(pen->GetOldChecksum());
    mWindowController->setPenNewChecksum(pen->GetNewChecksum());
  }
  if (auto touch = device->GetTouchInterface()) {
    boards.push_back("Touch");
    mWindowController->setTouchFirmwareVersion(touch->GetVersion());
    mWindowController->setTouchOldChecksum(touch->GetOldChecksum());
    mWindowController->setTouchNewChecksum(touch->GetNewChecksum());
  }
  if (device->GetBluetoothInterface()) boards.push_back("Bluetooth");
  if (device->GetScalarSupported()) boards.push_back("Scalar");
  mWindowController->setBoardArray(boards);
}

bool FLAppDelegate::CheckTerminalArguments() {
  OFLUpdater* updater = OFLUpdater::updater();
  std::vector<OFLUpdater::UpdateEntry> entries;
  try {
    entries = OFLUpdater::parseArguments(updater->getArgs());
  } catch (const std::out_of_range&) {
    ExitBeforeStart(T("An option at the end of the arguments has no value."), ERUN_USAGE);
    return false;
  }
  if (entries.empty()) {
    ExitBeforeStart(T("No board to update: give -p, -t, -b or -s with an interface path from "
                      "--list, or \"\" for the board found (see --help)."),
                    ERUN_USAGE);
    return false;
  }
  return true;
}

void FLAppDelegate::ExitBeforeStart(const std::string& error_I, int status_I) {
  mTerminated = true;
  if (mSetup.printError) mSetup.printError(error_I);
  if (mSetup.runEnded) mSetup.runEnded(status_I, error_I);
  if (mSetup.exitProcess) mSetup.exitProcess(status_I);
}

bool FLAppDelegate::confirmProgram() {
  if (mSetup.window == nullptr) return false;
  // The type before any entry of the list applied its own: a run that names
  // a scalar still has the pen's here. Only a scalar picked in the board
  // list gets the scalar's own window.
  if (mUpdater != nullptr && mUpdater->getUpdateType() == EUPDATE_SCALAR_FTDI) {
    SAlert scalar{EALERT_STYLE_WARNING,
                  T("Tavik Firmware Update Utility"),
                  T("You are about to update the firmware of the display.") + "\n\n" +
                      T("Keep the display connected to power and to the computer, and do not "
                        "switch it off until the update has finished.") +
                      "\n\n" + T("Do you want to continue?"),
                  {T("Cancel"), T("Update")}};
    return mSetup.window->RunScalarConfirmation(scalar);
  }
  SAlert question{EALERT_STYLE_WARNING,
                  T("Tavik Firmware Update Utility"),
                  T("You are about to update the firmware.") + "\n\n" +
                      T("While programming do not disconnect or power down your device.") + "\n\n" +
                      T("Do you want to continue?"),
                  {T("No"), T("Yes")}};
  return mSetup.window->AskYesNo(question);
}

void FLAppDelegate::notifyDialog(const std::string& text_I) {
  if (mSetup.window == nullptr) return;
  if (mWindowController == nullptr) mSetup.window->showWindow();
  mSetup.window->ShowAlert(
      SAlert{EALERT_STYLE_WARNING, T("Tavik Firmware Update Utility"), text_I, {T("OK")}});
}

void FLAppDelegate::updateProgressBar(double percent_I) {
  if (mWindowController != nullptr) mWindowController->setStatusProgress(percent_I);
}

void FLAppDelegate::doStateMachine(ECONTROLLER_STATE state_I) {
  setState(state_I);
  CWindowController* window = mWindowController;
  auto with = [window](const std::function<void(CWindowController&)>& action_I) {
    if (window != nullptr) action_I(*window);
  };

  switch (state_I) {
    case ESTATE_NONE:
      with([](CWindowController& w) {
        w.setStatusColor(ESTATUS_COLOR_LIGHT_GRAY);
        w.enableUIElements(true);
        w.enableProgramButton(false);
        w.enableClose(true);
      });
      return;
    case ESTATE_READY:
      TavLog::Info("ESTATE_READY\n");
      with([](CWindowController& w) {
        w.enableUIElements(true);
        w.enableClose(true);
        w.enableProgramButton(true);
      });
      return;
    case ESTATE_WAIT_LOADER:
      TavLog::Info("ESTATE_WAIT_LOADER\n");
      with([](CWindowController& w) { w.enableUIElements(false); });
      if (mUpdater != nullptr) mUpdater->updateDeviceList(true);
      with([](CWindowController& w) {
        w.enableClose(false);
        w.setStatusText(T("Waiting for Loader Mode"));
        w.setStatusColor(ESTATUS_COLOR_YELLOW);
      });
      return;
    case ESTATE_PROGRAM:
      TavLog::Info("ESTATE_PROGRAM\n");
      with([](CWindowController& w) {
        w.setStatusColor(ESTATUS_COLOR_YELLOW);
        w.enableUIElements(false);
        w.enableClose(false);
      });
      updateProgramText();
      return;
    case ESTATE_WAIT_DEVICE:
      TavLog::Info("ESTATE_WAIT_DEVICE\n");
      with([](CWindowController& w) { w.enableUIElements(false); });
      if (mUpdater != nullptr) mUpdater->updateDeviceList(false);
      with([](CWindowController& w) {
        w.enableClose(false);
        w.setStatusText(T("Waiting for Device Mode"));
        w.setStatusColor(ESTATUS_COLOR_YELLOW);
      });
      return;
    case ESTATE_SUCCESS:
      TavLog::Info("ESTATE_SUCCESS\n");
      with([](CWindowController& w) {
        w.setStatusProgress(100);
        w.setStatusColor(ESTATUS_COLOR_GREEN);
        w.setStatusText(T("Programming Successful"));
      });
      // Blocks the main thread, and the reporting thread with it, while the
      // green text is on show.
      TavSleep(kSuccessShowSeconds);
      // The last board's success says nothing of an earlier board that was
      // not updated: the dialog does not claim more than happened.
      notifyDialog(mUpdater != nullptr &&
                           mUpdater->boardResults().Outcome(ERUN_SUCCESS) != ERUN_SUCCESS
                       ? T("The last board was updated, but not every board was.")
                       : T("Firmware was successfully updated."));
      with([](CWindowController& w) { w.enableClose(true); });
      terminate(ERUN_SUCCESS);
      return;
    case ESTATE_FAILURE:
      TavLog::Info("ESTATE_FAILURE\n");
      with([](CWindowController& w) {
        w.setStatusText(T("Programming Failed"));
        w.setStatusColor(ESTATUS_COLOR_RED);
      });
      notifyDialog(T("Programming Failed"));
      with([](CWindowController& w) {
        w.enableUIElements(true);
        w.enableClose(true);
      });
      terminate(ERUN_FAILED);
      return;
    case ESTATE_TERMINATE:
      TavLog::Info("ESTATE_TERMINATE\n");
      notifyDialog(T("Error: No supported tablet is connected. Please connect a tablet."));
      with([](CWindowController& w) { w.enableClose(true); });
      terminate(ERUN_NO_DEVICE);
      return;
    case ESTATE_INVALID:
      TavLog::Info("ESTATE_INVALID\n");
      notifyDialog(T("Error: Invalid state resulted in updater termination."));
      with([](CWindowController& w) { w.enableClose(true); });
      terminate(ERUN_FAILED);
      return;
    default: return;
  }
}

void FLAppDelegate::updateProgramText() {
  if (state() != ESTATE_PROGRAM || mWindowController == nullptr) return;
  const double now = CClock::Get()->Now();
  if (mLastTextChange < 0) mLastTextChange = now;
  const double elapsed = std::fabs(now - mLastTextChange);
  bool changed = false;
  if (elapsed >= kProgramTextPeriod) {
    const std::string dots(mDotCount++ % 3 + 1, '.');
    mWindowController->setStatusText(T("Updating, this may take several minutes") + dots);
    mLastTextChange = now;
    changed = true;
  }
  const double delay = changed ? kProgramTextPeriod : kProgramTextPeriod - elapsed;
  mWindowController->PostToMainLoopAfter(delay, [this] { updateProgramText(); });
}

OUpdaterClient::Request FLAppDelegate::DriverRequest() {
  return OUpdaterClient::Request{
      {"LaunchAgents", {kDriverApplications[0]}},
      {"User", {std::to_string(getuid())}},
      {"BundleID", {kDriverApplications[0], kDriverApplications[2], kDriverApplications[1]}}};
}

void FLAppDelegate::stopDriver(CDesktop& desktop_I) {
  desktop_I.PostNotification({"com.tavik.removeTavikTablet.closeModalDialog", {}, {}});
  if (std::shared_ptr<OUpdaterClient> client = OUpdaterClient::client()) {
    OUpdaterClient::Request request = DriverRequest();
    const std::vector<std::string> bundles = request["BundleID"];
    request.erase("BundleID");
    client->stopLaunchDProcess(request);
    request["BundleID"] = bundles;
    client->stopProcess(request);
    TavSleep(kServiceStopWaitSeconds);
  }
  for (const char* application : kDriverApplications) {
    for (int pid : desktop_I.RunningApplications(application)) {
      TavLog::Info("Terminating: %s\n", application);
      desktop_I.TerminateApplication(pid);
      TavSleep(kQuitWaitSeconds);
      TavLog::Info("%d\n", desktop_I.IsTerminated(pid) ? 1 : 0);
    }
  }
}

void FLAppDelegate::startDriver(CDesktop& desktop_I) {
  if (std::shared_ptr<OUpdaterClient> client = OUpdaterClient::client()) {
    client->startLaunchDProcess(DriverRequest());
  }
  for (const char* application : kDriverApplications) {
    if (desktop_I.RunningApplications(application).empty()) {
      ProcessUtils::LaunchApplicationWithBundleID(application, std::nullopt, kDriverLaunchOptions,
                                                  true, std::nullopt);
    }
  }
}

void FLAppDelegate::applicationWillTerminate() {
  if (mUpdater != nullptr) mUpdater->cleanup();
  if (mSetup.desktop) {
    startDriver(*mSetup.desktop);
    mSetup.desktop->PostNotification({"com.tavik.TFUCompleted", {}, {}});
  }
}

void FLAppDelegate::updatesFinished() {
  if (mSetup.terminal && !mTerminated) terminate(ERUN_SUCCESS);
}

void FLAppDelegate::boardStarting(const SBoardResult& board_I) {
  if (!mSetup.terminal || !mSetup.printResult) return;
  std::string line = StringUtilities::Format(T("Updating the %s of %s").c_str(),
                                             T(CBoardResults::BoardName(board_I.kind)).c_str(),
                                             board_I.product.c_str());
  if (!board_I.path.empty()) line += " (" + board_I.path + ")";
  if (!board_I.versionBefore.empty()) {
    line += StringUtilities::Format(T(", version %s found").c_str(), board_I.versionBefore.c_str());
  }
  if (!board_I.file.empty()) {
    line += StringUtilities::Format(T(", from %s").c_str(), board_I.file.c_str());
  }
  mSetup.printResult(line + ".");
}

void FLAppDelegate::notice(const std::string& text_I) {
  if (mSetup.terminal && mSetup.printError) mSetup.printError(text_I);
}

void FLAppDelegate::PrintBoardResults() {
  if (mUpdater == nullptr || !mSetup.printResult) return;
  const std::vector<SBoardResult> results = mUpdater->boardResults().Get();
  bool reached = false;
  for (const SBoardResult& result : results) reached |= result.outcome != EBOARD_NOT_REACHED;
  if (!reached) return;
  mUpdater->refreshVersionsAfter();
  for (const SBoardResult& result : mUpdater->boardResults().Get()) {
    std::string board = T(CBoardResults::BoardName(result.kind));
    if (!result.product.empty()) {
      board = StringUtilities::Format(T("%s of %s").c_str(), board.c_str(), result.product.c_str());
    }
    std::string what;
    switch (result.outcome) {
      case EBOARD_UPDATED:
        what =
            !result.versionBefore.empty() && !result.versionAfter.empty()
                ? StringUtilities::Format(T("updated from version %s to %s").c_str(),
                                          result.versionBefore.c_str(), result.versionAfter.c_str())
                : T("updated");
        break;
      case EBOARD_FAILED: what = T("failed") + ": " + result.reason; break;
      case EBOARD_NOT_FOUND: what = T("not found") + ": " + result.reason; break;
      case EBOARD_FILE_REFUSED: what = T("firmware file refused") + ": " + result.reason; break;
      default: what = T("not updated: the run ended before it"); break;
    }
    mSetup.printResult("  " + board + ": " + what);
  }
}

std::string FLAppDelegate::ResultLine(ERunOutcome outcome_I) const {
  // A run the user ended after some boards were done must not say that
  // nothing was updated.
  if (outcome_I == ERUN_DECLINED && mUpdater != nullptr) {
    const std::vector<SBoardResult> boards = mUpdater->boardResults().Get();
    const auto updated = std::count_if(boards.begin(), boards.end(), [](const SBoardResult& b) {
      return b.outcome == EBOARD_UPDATED;
    });
    if (updated > 0) {
      return StringUtilities::Format(
          T("Result: the run was ended after %d of %d boards were updated.").c_str(),
          static_cast<int>(updated), static_cast<int>(boards.size()));
    }
  }
  return T(OutcomeText(outcome_I));
}

void FLAppDelegate::terminate(ERunOutcome outcome_I) {
  if (mTerminated) return;
  mTerminated = true;
  applicationWillTerminate();
  ERunOutcome outcome = outcome_I;
  if (mSetup.terminal) {
    if (mUpdater != nullptr) outcome = mUpdater->boardResults().Outcome(outcome_I);
    PrintBoardResults();
    if (mSetup.printResult) mSetup.printResult(ResultLine(outcome));
  }
  const int status = mSetup.terminal ? static_cast<int>(outcome) : 0;
  if (mSetup.terminal && mSetup.runEnded) mSetup.runEnded(status, ResultLine(outcome));
  if (mSetup.exitProcess) mSetup.exitProcess(status);
}
