#pragma once
// The program's main job: an update run with the board arguments, on the
// hardware or, with --lab, on an emulated product.

#include <cstdio>
#include <string>
#include <vector>

#include "app/CCommandLine.h"

class CUpdateReport;

class CUpdateCommand {
 public:
  // `processArguments_I`: the process's argument vector, program name first.
  CUpdateCommand(const CCommandLine& commandLine_I, std::vector<std::string> processArguments_I)
      : mCommandLine(commandLine_I), mProcessArguments(std::move(processArguments_I)) {}
  // Ends the process itself once the run is over; returns only on a set-up
  // error, with the status to exit with. A window run in a program without
  // the window replaces the process with the window program first.
  int Run();

  // The window, not the terminal: there is a display to open it on (a
  // Wayland or X display named in the environment whose socket is there,
  // or a Qt platform given) and --headless was not asked for.
  static bool UsesWindow(bool headless_I);

 private:
  // --all: adds the board options of every board to update to
  // `arguments_IO` and returns -1, or, when none is left, says so, reports
  // and returns the status to end with.
  int PlanAll(const std::string& labStateFolder_I, CUpdateReport& report_IO, std::FILE* reportOut_I,
              std::vector<std::string>& arguments_IO) const;

  const CCommandLine& mCommandLine;
  std::vector<std::string> mProcessArguments;
};
