#pragma once
// An interface notifier that keeps everything it hears, for tests.

#include <string>
#include <vector>

#include "flash/CInterfaceNotifier.h"

class RecordingNotifier : public CInterfaceNotifier {
 public:
  void InterfaceLog(const std::string& text_I) override { logs.push_back(text_I); }
  void InterfaceError(const std::string& text_I) override { errors.push_back(text_I); }
  void InterfaceProgress(unsigned int percent_I) override { progress.push_back(percent_I); }

  bool Logged(const std::string& part_I) const { return CountLogged(part_I) != 0; }
  size_t CountLogged(const std::string& part_I) const {
    size_t count = 0;
    for (const std::string& line : logs) count += line.find(part_I) != std::string::npos;
    return count;
  }

  std::vector<std::string> logs;
  std::vector<std::string> errors;
  std::vector<unsigned int> progress;
};
