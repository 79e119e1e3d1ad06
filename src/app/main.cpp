#include <cstdio>
#include <string>
#include <vector>

#include "app/CCommandLine.h"
#include "app/CFirmwareReportCommand.h"
#include "app/CListCommand.h"
#include "app/CLogOutputs.h"
#include "app/CUpdateCommand.h"
#include "app/TavVersion.h"
#include "common/TavLog.h"

int main(int argc, char** argv) {
  CCommandLine commandLine;
  if (!commandLine.Parse(std::vector<std::string>(argv + 1, argv + argc))) {
    std::fprintf(stderr, "%s: %s\n", TAV_PROGRAM_NAME, commandLine.GetError().c_str());
    std::fputs(CCommandLine::HelpText().c_str(), stderr);
    return 1;
  }
  if (commandLine.GetHelp()) {
    std::fputs(CCommandLine::HelpText().c_str(), stdout);
    return 0;
  }
  if (commandLine.GetVersion()) {
    std::printf("%s %s\n", TAV_PROGRAM_NAME, TAV_PROGRAM_VERSION);
    return 0;
  }

  CLogOutputs logOutputs;
  if (commandLine.GetVerbose()) logOutputs.AttachStandardError();
  if (!commandLine.GetLogFile().empty() && !logOutputs.AttachFile(commandLine.GetLogFile())) {
    std::fprintf(stderr, "%s: cannot open log file %s\n", TAV_PROGRAM_NAME,
                 commandLine.GetLogFile().c_str());
    return 1;
  }
  if (!commandLine.GetInspectFile().empty())
    return CFirmwareReportCommand(commandLine).Run(stdout, stderr);
  if (commandLine.GetList()) return CListCommand(commandLine).Run(stdout, stderr);
  TavLog::Info("%s %s starting\n", TAV_PROGRAM_NAME, TAV_PROGRAM_VERSION);
  return CUpdateCommand(commandLine, std::vector<std::string>(argv, argv + argc)).Run();
}
