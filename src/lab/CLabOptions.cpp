#include "lab/CLabOptions.h"

#include <cstdlib>

bool CLabOptions::AddFault(const std::string& text_I, std::string& error_O) {
  SLabFault fault;
  if (!ParseLabFault(text_I, fault, error_O)) return false;
  mFaults.push_back(fault);
  return true;
}

std::string CLabOptions::GetStateFolder() const {
  return mStateFolder.empty() ? DefaultStateFolder() : mStateFolder;
}

std::string CLabOptions::DefaultStateFolder() {
  const char* state = std::getenv("XDG_STATE_HOME");
  if (state != nullptr && state[0] == '/') return std::string(state) + "/tavik/lab";
  const char* home = std::getenv("HOME");
  return std::string(home != nullptr ? home : "") + "/.local/state/tavik/lab";
}
