#include "app/CProgram.h"

#include <cstdio>
#include <string>
#include <vector>

#include "app/CCommandLine.h"
#include "app/CFirmwareReportCommand.h"
#include "app/CListCommand.h"
#include "app/CLogOutputs.h"
#include "app/CUpdateCommand.h"
#include "app/TavVersion.h"
#include "host/CLanguageManager.h"
#include "update/CApplicationDelegate.h"

int CProgram::Main(int argc, char** argv) {
  // Made on the main thread before any other starts: it sets the locale.
  CLanguageManager::SharedInstance();

  CCommandLine commandLine;
  if (!commandLine.Parse(std::vector<std::string>(argv + 1, argv + argc))) {
    std::fprintf(stderr, "%s: %s\n", TAV_PROGRAM_NAME, commandLine.GetError().c_str());
    return ERUN_USAGE;
  }
  if (commandLine.GetHelp()) {
    std::fputs(CCommandLine::HelpText().c_str(), stdout);
    return 0;
  }
  if (commandLine.GetVersion()) {
    std::printf("%s %s\n", TAV_PROGRAM_NAME, TAV_PROGRAM_VERSION);
    return 0;
  }
  if (commandLine.GetLabListRequested() && !commandLine.GetList()) {
    if (commandLine.HasBoardOption() || commandLine.GetAll()) {
      std::fprintf(stderr,
                   "%s: --lab list names the lab's products; give a product name to update\n",
                   TAV_PROGRAM_NAME);
      return ERUN_USAGE;
    }
    CListCommand::PrintLabProducts(stdout);
    return 0;
  }

  CLogOutputs logOutputs;
  if (commandLine.GetVerbose()) logOutputs.AttachStandardError();
  if (!commandLine.GetLogFile().empty() && !logOutputs.AttachFile(commandLine.GetLogFile())) {
    std::fprintf(stderr, "%s: cannot open the log file %s\n", TAV_PROGRAM_NAME,
                 commandLine.GetLogFile().c_str());
    return 1;
  }
  if (!commandLine.GetInspectFile().empty())
    return CFirmwareReportCommand(commandLine).Run(stdout, stderr);
  if (commandLine.GetList()) return CListCommand(commandLine).Run(stdout, stderr);
  std::vector<std::string> processArguments(argv, argv + argc);
  if (processArguments.empty()) processArguments.push_back(TAV_PROGRAM_NAME);
  return CUpdateCommand(commandLine, std::move(processArguments)).Run();
}
