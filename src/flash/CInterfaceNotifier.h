#pragma once
// Receives log lines, errors and progress from device interfaces.

#include <string>

class CInterfaceNotifier {
 public:
  virtual ~CInterfaceNotifier() = default;
  virtual void InterfaceLog(const std::string& text_I) = 0;
  virtual void InterfaceError(const std::string& text_I) = 0;
  virtual void InterfaceProgress(unsigned int percent_I) = 0;
};
