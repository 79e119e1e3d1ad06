#include "app/CUpdaterRun.h"

#include <cstdio>

#include "app/CApplicationRun.h"
#include "app/TavVersion.h"
#include "host/CLanguageManager.h"
#include "ui/terminal/CTerminalWindowController.h"
#include "update/FLAppDelegate.h"

namespace {

CUpdaterRun::TWindowFrontEnd sWindowFrontEnd = nullptr;

int RunInTerminal(SRunSeams seams_I, SRunOptions options_I) {
  CTerminalWindowController window;
  window.SetAssumeYes(options_I.assumeYes);
  options_I.window = false;
  CApplicationRun run(std::move(seams_I), std::move(options_I), window);
  FLAppDelegate& delegate = run.MakeApplication(
      [&window](const std::string& line_I) { window.PrintLine(stdout, line_I); },
      [&window](const std::string& line_I) {
        window.PrintLine(stderr, std::string(TAV_PROGRAM_NAME) + ": " + line_I);
      });
  delegate.applicationDidFinishLaunching();
  window.RunMainLoop();
  return run.GetStatus();
}

}  // namespace

int CUpdaterRun::Run(SRunSeams seams_I, SRunOptions options_I) {
  // Made on the main thread before any other starts: it sets the locale.
  CLanguageManager::SharedInstance();
  return options_I.window && sWindowFrontEnd != nullptr
             ? sWindowFrontEnd(std::move(seams_I), std::move(options_I))
             : RunInTerminal(std::move(seams_I), std::move(options_I));
}

void CUpdaterRun::SetWindowFrontEnd(TWindowFrontEnd frontEnd_I) { sWindowFrontEnd = frontEnd_I; }

bool CUpdaterRun::HasWindowFrontEnd() { return sWindowFrontEnd != nullptr; }
