#include "app/CUpdateCommand.h"

#include <cstdio>

#include "app/CRunSeams.h"
#include "app/CUpdaterRun.h"
#include "app/TavVersion.h"
#include "common/LinuxPaths.h"
#include "lab/CLabDesktop.h"
#include "lab/CLabOptions.h"
#include "lab/CLabPowerInhibitor.h"
#include "lab/CLabSession.h"
#include "platform/linux/CLinuxDesktop.h"
#include "platform/linux/CLinuxPowerInhibitor.h"

int CUpdateCommand::Run() {
  std::string error;
  CLabOptions labOptions;
  for (const std::string& fault : mCommandLine.GetLabFaults()) {
    if (!labOptions.AddFault(fault, error)) {
      std::fprintf(stderr, "%s: --lab-fault %s: %s\n", TAV_PROGRAM_NAME, fault.c_str(),
                   error.c_str());
      return 1;
    }
  }
  labOptions.SetStateFolder(mCommandLine.GetLabState());
  labOptions.SetFast(mCommandLine.GetLabFast());

  std::unique_ptr<CRunSeams> seams =
      mCommandLine.GetLab()
          ? CRunSeams::MakeLab(mCommandLine.GetLabName(), labOptions.GetStateFolder(), error)
          : CRunSeams::MakeLinux();
  if (!seams) {
    std::fprintf(stderr, "%s: %s\n", TAV_PROGRAM_NAME, error.c_str());
    return 1;
  }

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
    runSeams.desktop = std::make_shared<CLabDesktop>();
  } else {
    runSeams.power = std::make_shared<CLinuxPowerInhibitor>();
    runSeams.desktop = std::make_shared<CLinuxDesktop>(seams->GetRegistry());
  }
  CRunSeams* seamsForDiscovery = seams.get();
  runSeams.makeDiscovery = [seamsForDiscovery] { return seamsForDiscovery->MakeDiscovery(); };
  runSeams.executableFolder = LinuxPaths::GetExecutableFolderPath();
  runSeams.installedDataFolder = LinuxPaths::GetInstalledDataFolderPath();

  SRunOptions options;
  options.processArguments = mProcessArguments;
  options.headless = mCommandLine.GetHeadless();
  options.assumeYes = mCommandLine.GetYes();
  CLabSession* sessionToFinish = session.get();
  options.beforeExit = [sessionToFinish] {
    if (sessionToFinish != nullptr) sessionToFinish->Finish();
  };
  return CUpdaterRun::Run(std::move(runSeams), std::move(options));
}
