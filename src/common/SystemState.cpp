#include "common/SystemState.h"

#include <sys/utsname.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <fstream>
#include <mutex>

#include "common/StringUtilities.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "common/TavSysErrStr.h"

namespace {

// Written once before the worker threads start; atomics only so that a
// test that sets them again stays free of data races.
std::atomic<int32_t> mOS{eOSUnset};
std::atomic<int32_t> mCPU{eCPUUnset};

std::mutex mAppLock;
std::string mAppIdentifier;
int mPreviousApp = 0;

struct SOSName {
  int32_t mValue;
  const char* mText;
};

// Walked in this order by both conversions.
constexpr SOSName kOSNames[] = {
    {eOSWindows7, "Windows 7"},
    {eOSWindows7HomeBasic, "Windows 7 Home Basic"},
    {eOSWindows7Starter, "Windows 7 Starter"},
    {eOSWindows8, "Windows 8"},
    {eOSWindows81, "Windows 8.1"},
    {eOSWindows10, "Windows 10"},
    {eOSWindows11, "Windows 11"},
    {eOSWindowsInfinity, "Windows Infinity"},
    {eOSX10_4, "OSX 10.4"},
    {eOSX10_5, "OSX 10.5"},
    {eOSX10_6, "OSX 10.6"},
    {eOSX10_7, "OSX 10.7"},
    {eOSX10_8, "OSX 10.8"},
    {eOSX10_9, "OSX 10.9"},
    {eOSX10_10, "OSX 10.10"},
    {eOSX10_11, "OSX 10.11"},
    {eMacOS10_12, "macOS 10.12"},
    {eMacOS10_13, "macOS 10.13"},
    {eMacOS10_14, "macOS 10.14"},
    {eMacOS10_15, "macOS 10.15"},
    {eMacOS11_0, "macOS 11.0"},
    {eMacOS11_1, "macOS 11.1"},
    {eMacOS11_2, "macOS 11.2"},
    {eMacOS11_3, "macOS 11.3"},
    {eMacOS12_0, "macOS 12.0"},
    {eOSXInfinity, "OSX Infinity"},
    {eOSUnset, "Unset"},
    {eOSUnknown, "Unknown"},
    {eOSLinux, "Linux"},
};

constexpr double kPixelsPerInch = 96.0;
constexpr double kMillimetresPerInch = 25.4;
// Above this OS value the desktop has native gestures.
constexpr int32_t kLastOSWithoutGestures = 1009;

ECPUType CPUFromMachine(const std::string& machine_I) {
  if (machine_I == "x86_64" || machine_I == "amd64") return eCPULinuxX86_64;
  if (machine_I == "aarch64" || machine_I == "arm64") return eCPULinuxARM64;
  return eCPULinuxOther;
}

void LogCPU(ECPUType cpu_I, const std::string& machine_I) {
  switch (cpu_I) {
    case eCPULinuxX86_64: TavLog::Info("mCPU = ECPUType::eCPULinuxX86_64\n"); break;
    case eCPULinuxARM64: TavLog::Info("mCPU = ECPUType::eCPULinuxARM64\n"); break;
    default: TavLog::Info("mCPU = ECPUType::eCPULinuxOther (%s)\n", machine_I.c_str()); break;
  }
}

std::string ProcessName(pid_t pid_I) {
  std::ifstream comm("/proc/" + std::to_string(pid_I) + "/comm");
  std::string name;
  std::getline(comm, name);
  return name;
}

}  // namespace

void SystemState::SetOSType() {
  utsname names{};
  if (uname(&names) != 0) {
    TavLog::Error("uname failed: %s\n", TavSysErrStr(errno).c_str());
    return;
  }
  SetOSTypeFromUname(names.sysname, names.release, names.machine);
}

void SystemState::SetOSTypeFromUname(const std::string& sysname_I, const std::string& release_I,
                                     const std::string& machine_I) {
  TavLog::Info("Raw system version %s %s %s\n", sysname_I.c_str(), release_I.c_str(),
               machine_I.c_str());
  if (sysname_I == "Linux") {
    TavLog::Info("SYSTEM VERSION: Linux %s\n", release_I.c_str());
    mOS = eOSLinux;
  }
  const ECPUType cpu = CPUFromMachine(machine_I);
  LogCPU(cpu, machine_I);
  mCPU = cpu;
  TavLog::Info("mOS set to %x\n", static_cast<unsigned>(mOS.load()));
}

void SystemState::Clear() {
  mOS = eOSUnset;
  mCPU = eCPUUnset;
  std::lock_guard<std::mutex> guard(mAppLock);
  mAppIdentifier.clear();
  mPreviousApp = 0;
}

EOSType SystemState::GetOSType() {
  const int32_t os = mOS;
  if (os == eOSUnset) {
    TAVASSERT_TEXT("\"OSType requested before it was set\"");
    return eOSUnknown;
  }
  return static_cast<EOSType>(os);
}

ECPUType SystemState::GetCPUType() {
  const int32_t cpu = mCPU;
  if (cpu == eCPUUnset) {
    TAVASSERT_TEXT("\"CPUType requested before it was set\"");
    return eCPUIntel;
  }
  return static_cast<ECPUType>(cpu);
}

std::string SystemState::GetOSTypeString() { return OSTypeToString(mOS); }

std::string SystemState::OSTypeToString(int32_t osType_I) {
  for (const SOSName& entry : kOSNames) {
    if (entry.mValue == osType_I) return entry.mText;
  }
  return "Unknown";
}

EOSType SystemState::StringToOSType(const std::string& text_I) {
  for (const SOSName& entry : kOSNames) {
    if (text_I == entry.mText) return static_cast<EOSType>(entry.mValue);
  }
  return eOSUnknown;
}

bool SystemState::GetSupportsNativeGestures() { return mOS > kLastOSWithoutGestures; }

double SystemState::GetPixelsPerInch() { return kPixelsPerInch; }

double SystemState::GetPixelsPerMM() { return kPixelsPerInch / kMillimetresPerInch; }

void SystemState::ApplicationSwitch() {
  // No foreground application can be read here (see the header): with none
  // the switch does nothing, as it does elsewhere when nothing is in front.
}

void SystemState::SetAppSwitchCallback() { ApplicationSwitch(); }

std::string SystemState::GetForegroundAppIdentifier() {
  SetAppSwitchCallback();
  std::lock_guard<std::mutex> guard(mAppLock);
  return mAppIdentifier;
}

std::string SystemState::GetForegroundProcessInstanceIdentifier() {
  std::lock_guard<std::mutex> guard(mAppLock);
  if (mPreviousApp == 0) return std::string();
  return StringUtilities::Format("%s.%d", mAppIdentifier.c_str(), mPreviousApp);
}

std::string SystemState::GetProcessInstanceIdentifier() {
  return StringUtilities::Format(".%d", static_cast<int>(getpid()));
}

std::string SystemState::GetProcessParentInstanceIdentifier() {
  const pid_t parent = getppid();
  return StringUtilities::Format("%s.%d", ProcessName(parent).c_str(), static_cast<int>(parent));
}
