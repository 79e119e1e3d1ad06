#include "app/CUpdateCommand.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "app/CAllBoards.h"
#include "app/CListCommand.h"
#include "app/CRunSeams.h"
#include "common/StringUtilities.h"
#include "host/CLanguageManager.h"
#include "app/CUpdateReport.h"
#include "app/CUpdaterRun.h"
#include "app/CWindowProgram.h"
#include "app/TavVersion.h"
#include "common/LinuxPaths.h"
#include "common/TavLog.h"
#include "host/CLinuxPersistentSettings.h"
#include "host/OXPCClient.h"
#include "lab/CLabDesktop.h"
#include "lab/CLabOptions.h"
#include "lab/CLabPowerInhibitor.h"
#include "lab/CLabSession.h"
#include "platform/linux/CLinuxDesktop.h"
#include "platform/linux/CLinuxPowerInhibitor.h"
#include "platform/linux/CLinuxServiceDirectory.h"
#include "update/CApplicationDelegate.h"
#include "update/OFLUpdater.h"

namespace {

bool LabStateFolderWritable(const std::string& folder_I, std::string& error_O) {
  std::error_code code;
  std::filesystem::create_directories(folder_I, code);
  if (code) {
    error_O = code.message();
    return false;
  }
  if (access(folder_I.c_str(), W_OK | X_OK) != 0) {
    error_O = std::strerror(errno);
    return false;
  }
  return true;
}

bool IsSet(const char* name_I) {
  const char* value = std::getenv(name_I);
  return value != nullptr && value[0] != '\0';
}

// A local display whose socket is missing cannot be opened, and Qt would
// abort the run on it; a display on another host is taken on trust.
bool DisplayReachable() {
  std::error_code error;
  if (IsSet("WAYLAND_DISPLAY")) {
    const std::string name = std::getenv("WAYLAND_DISPLAY");
    const char* runtime = std::getenv("XDG_RUNTIME_DIR");
    const std::string socket =
        name.front() == '/' ? name : std::string(runtime != nullptr ? runtime : "") + "/" + name;
    if (std::filesystem::exists(socket, error)) return true;
  }
  if (!IsSet("DISPLAY")) return false;
  const std::string display = std::getenv("DISPLAY");
  if (display.front() != ':') return true;
  const std::string number = display.substr(1, display.find('.') - 1);
  return std::filesystem::exists("/tmp/.X11-unix/X" + number, error);
}

// A terminal run reads its boards from the command line, or, when another
// program of the family started it, from the arguments file it left.
bool NamesNoBoard(const CCommandLine& commandLine_I) {
  if (commandLine_I.HasBoardOption() || commandLine_I.GetAll()) return false;
  std::error_code error;
  return !std::filesystem::exists(
      LinuxPaths::AppendPathComponent(LinuxPaths::GetUserPreferencesFolderPath(), "fwupdater.parm"),
      error);
}

void SayWhatToType() {
  std::fprintf(stderr,
               "%s: nothing to update: give -p, -t, -b or -s with an interface path from --list "
               "(or \"\" for the board found), or --all for every board (see --help)\n",
               TAV_PROGRAM_NAME);
}

}  // namespace

bool CUpdateCommand::UsesWindow(bool headless_I) {
  if (headless_I) return false;
  return IsSet("QT_QPA_PLATFORM") || DisplayReachable();
}

int CUpdateCommand::Run() {
  std::string error;
  // A report for scripts needs no window, and owns standard output: what
  // the terminal shows goes to standard error instead.
  bool window = !mCommandLine.GetInspectJson() && UsesWindow(mCommandLine.GetHeadless());
  // The window program runs this same command again from its start: so
  // this is the last point before anything is written, touched or taken
  // that must happen once.
  if (window && !CUpdaterRun::HasWindowFrontEnd()) {
    const std::string path = CWindowProgram::GetPath(LinuxPaths::GetExecutableFolderPath());
    error = CWindowProgram::Exec(path, mProcessArguments);
    // A terminal run is always possible.
    std::fprintf(stderr, "%s: cannot start the window program %s (%s): going on in the terminal\n",
                 TAV_PROGRAM_NAME, path.c_str(), error.c_str());
    window = false;
  }
  TavLog::Info("%s %s starting\n", TAV_PROGRAM_NAME, TAV_PROGRAM_VERSION);
  if (!window && NamesNoBoard(mCommandLine)) {
    SayWhatToType();
    return ERUN_USAGE;
  }
  std::FILE* reportOut = nullptr;
  if (mCommandLine.GetInspectJson()) {
    std::fflush(stdout);
    reportOut = fdopen(dup(STDOUT_FILENO), "w");
    dup2(STDERR_FILENO, STDOUT_FILENO);
  }
  CUpdateReport report;
  // A run that cannot start still owes a script its report.
  const auto endBeforeRun = [&report, reportOut](int status_I, const std::string& text_I) {
    std::fprintf(stderr, "%s: %s\n", TAV_PROGRAM_NAME, text_I.c_str());
    if (reportOut != nullptr) std::fputs(report.ToJson({}, status_I, text_I).c_str(), reportOut);
    return status_I;
  };
  CLabOptions labOptions;
  for (const std::string& fault : mCommandLine.GetLabFaults()) {
    if (!labOptions.AddFault(fault, error)) {
      std::fprintf(stderr, "%s: --lab-fault %s: %s\n", TAV_PROGRAM_NAME, fault.c_str(),
                   error.c_str());
      return ERUN_USAGE;
    }
  }
  labOptions.SetStateFolder(mCommandLine.GetLabState());
  labOptions.SetFast(mCommandLine.GetLabFast());
  // Found out now, not after an update whose result could not be kept.
  if (mCommandLine.GetLab() && !LabStateFolderWritable(labOptions.GetStateFolder(), error)) {
    return endBeforeRun(ERUN_FAILED, "--lab-state " + labOptions.GetStateFolder() + ": " + error);
  }

  std::vector<std::string> boardArguments = mCommandLine.GetUpdaterArguments();
  if (mCommandLine.GetAll()) {
    const int status = PlanAll(labOptions.GetStateFolder(), report, reportOut, boardArguments);
    if (status >= 0) return status;
  }

  std::unique_ptr<CRunSeams> seams =
      mCommandLine.GetLab()
          ? CRunSeams::MakeLab(mCommandLine.GetLabName(), labOptions.GetStateFolder(), error)
          : CRunSeams::MakeLinux();
  if (!seams) return endBeforeRun(ERUN_USAGE, error);

  seams->ShareScalarSeams();

  // A lab run starts from the state the last one left and gives it back at
  // the end, whichever way the run ends.
  std::unique_ptr<CLabSession> session;
  if (seams->GetLabBus()) {
    session = std::make_unique<CLabSession>(seams->GetLabBus(), labOptions);
    session->Start();
  }

  SRunSeams runSeams;
  runSeams.registry = seams->GetRegistry();
  if (seams->GetLabBus()) {
    runSeams.power = std::make_shared<CLabPowerInhibitor>();
    runSeams.desktop = std::make_shared<CLabDesktop>(labOptions.GetStateFolder());
  } else {
    runSeams.power = std::make_shared<CLinuxPowerInhibitor>();
    runSeams.desktop = std::make_shared<CLinuxDesktop>(seams->GetRegistry());
    // The update helper on the system bus, where one is installed.
    OXPCClient::SetServiceDirectory(OXPCClient::kPrivileged,
                                    std::make_shared<CLinuxServiceDirectory>(true));
    // The user's data store on the session bus, where one runs, keeps the
    // persistent settings.
    OXPCClient::SetServiceDirectory(0, std::make_shared<CLinuxServiceDirectory>(false));
    CPersistentSettings::SetFactory([] { return std::make_unique<CLinuxPersistentSettings>(); });
  }
  CRunSeams* seamsForDiscovery = seams.get();
  runSeams.makeDiscovery = [seamsForDiscovery] { return seamsForDiscovery->MakeDiscovery(); };
  runSeams.executableFolder = LinuxPaths::GetExecutableFolderPath();
  runSeams.installedDataFolder = LinuxPaths::GetInstalledDataFolderPath();

  SRunOptions options;
  // The updater sees the board options alone, as the program was given them.
  options.processArguments.push_back(mProcessArguments.front());
  for (const std::string& argument : boardArguments) {
    options.processArguments.push_back(argument);
  }
  options.assumeYes = mCommandLine.GetYes();
  options.window = window;
  if (reportOut != nullptr) {
    options.runEnded = [reportOut, &report](int status_I, const std::string& lastLine_I) {
      std::fputs(
          report.ToJson(OFLUpdater::updater()->boardResults().Get(), status_I, lastLine_I).c_str(),
          reportOut);
      std::fflush(reportOut);
    };
  }
  CLabSession* sessionToFinish = session.get();
  options.beforeExit = [sessionToFinish] {
    if (sessionToFinish != nullptr) sessionToFinish->Finish();
  };
  return CUpdaterRun::Run(std::move(runSeams), std::move(options));
}

int CUpdateCommand::PlanAll(const std::string& labStateFolder_I, CUpdateReport& report_IO,
                            std::FILE* reportOut_I, std::vector<std::string>& arguments_IO) const {
  // Found on seams of its own, so that the run's lab faults count only the
  // run's own traffic.
  std::string error;
  const std::unique_ptr<CRunSeams> seams =
      mCommandLine.GetLab() ? CRunSeams::MakeLab(mCommandLine.GetLabName(), labStateFolder_I, error)
                            : CRunSeams::MakeLinux();
  if (!seams) {
    std::fprintf(stderr, "%s: %s\n", TAV_PROGRAM_NAME, error.c_str());
    return ERUN_USAGE;
  }
  const std::string configPath = CListCommand::ConfigPath(arguments_IO);
  const CAllBoards::SPlan plan =
      CAllBoards::Plan(CListCommand::Find(*seams, configPath), configPath);
  for (const SBoardResult& board : plan.skipped) {
    std::printf("%s\n", StringUtilities::Format(
                             TTCLocalizedNSString("Skipping the %s of %s (%s): already at version %s.")
                                 .c_str(),
                             TTCLocalizedNSString(CBoardResults::BoardName(board.kind)).c_str(),
                             board.product.c_str(), board.path.c_str(), board.versionBefore.c_str())
                             .c_str());
    report_IO.AddSkipped(board);
  }
  if (!plan.arguments.empty()) {
    arguments_IO.insert(arguments_IO.end(), plan.arguments.begin(), plan.arguments.end());
    return -1;
  }
  // Nothing left to run the updater for.
  const ERunOutcome outcome = plan.productCount == 0 ? ERUN_NO_DEVICE : ERUN_SUCCESS;
  const std::string result = TTCLocalizedNSString(
      outcome == ERUN_SUCCESS ? "Result: every board is already at its firmware file's version."
                              : "Result: no supported tablet is connected.");
  std::printf("%s\n", result.c_str());
  if (reportOut_I != nullptr)
    std::fputs(report_IO.ToJson({}, outcome, result).c_str(), reportOut_I);
  return outcome;
}
