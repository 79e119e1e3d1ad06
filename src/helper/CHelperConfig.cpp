#include "helper/CHelperConfig.h"

#include <cctype>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>

#include "helper/HelperLog.h"

namespace {

// Longer names are no unit's (systemd's own limit).
constexpr size_t kMaxUnitName = 255;

}  // namespace

bool CHelperConfig::IsUnitName(const std::string& name_I) {
  if (name_I.empty() || name_I.size() > kMaxUnitName) return false;
  for (char c : name_I) {
    if (!std::isalnum(static_cast<unsigned char>(c)) && std::strchr(":-_.\\@", c) == nullptr) {
      return false;
    }
  }
  const size_t dot = name_I.rfind('.');
  if (dot == 0 || dot == std::string::npos) return false;
  const std::string suffix = name_I.substr(dot);
  return suffix == ".service" || suffix == ".socket" || suffix == ".target" || suffix == ".timer" ||
         suffix == ".path";
}

bool CHelperConfig::Read(const std::string& path_I, std::string& error_O) {
  mParts.clear();
  std::ifstream in(path_I);
  if (!in) {
    error_O = std::strerror(errno);
    return false;
  }
  std::string line;
  for (int number = 1; std::getline(in, line); ++number) {
    line = line.substr(0, line.find('#'));
    std::istringstream words(line);
    std::string kind, identifier, target, extra;
    if (!(words >> kind)) continue;
    if (kind == "ignore" && (words >> identifier) && !(words >> extra)) {
      mParts[identifier];
      continue;
    }
    const bool complete = static_cast<bool>(words >> identifier >> target) && !(words >> extra);
    if (complete && kind == "unit" && IsUnitName(target)) {
      mParts[identifier].units.push_back(target);
    } else if (complete && kind == "executable" && target.front() == '/') {
      mParts[identifier].executables.push_back(target);
    } else {
      HelperLog::Print(LOG_WARNING, "%s:%d: not understood, left out", path_I.c_str(), number);
    }
  }
  return true;
}

std::vector<std::string> CHelperConfig::GetUnits(const std::string& identifier_I) const {
  const auto found = mParts.find(identifier_I);
  return found == mParts.end() ? std::vector<std::string>() : found->second.units;
}

std::vector<std::string> CHelperConfig::GetExecutables(const std::string& identifier_I) const {
  const auto found = mParts.find(identifier_I);
  return found == mParts.end() ? std::vector<std::string>() : found->second.executables;
}

std::vector<std::string> CHelperConfig::GetIdentifiers() const {
  std::vector<std::string> identifiers;
  for (const auto& entry : mParts) identifiers.push_back(entry.first);
  return identifiers;
}
