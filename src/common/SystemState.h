#pragma once
// Process-wide facts about the machine: operating system and processor.
// Both start unset (2000) and are set once by SetOSType() before the
// worker threads start; reading an unset value is an assertion and a
// stated default.
//
// The enumeration values are shared with the other platforms of this
// program and never change; the Linux values come after them.

#include <cstdint>
#include <string>

enum EOSType : int32_t {
  eOSUnknown = -1,
  eOSWindows7 = 40,
  eOSWindows7HomeBasic = 50,
  eOSWindows7Starter = 51,
  eOSWindows8 = 60,
  eOSWindows81 = 61,
  eOSWindows10 = 62,
  eOSWindows11 = 63,
  eOSWindowsInfinity = 999,
  eOSX10_4 = 1000,
  eOSX10_5 = 1010,
  eOSX10_6 = 1020,
  eOSX10_7 = 1030,
  eOSX10_8 = 1040,
  eOSX10_9 = 1050,
  eOSX10_10 = 1060,
  eOSX10_11 = 1070,
  eMacOS10_12 = 1080,
  eMacOS10_13 = 1090,
  eMacOS10_14 = 1100,
  eMacOS10_15 = 1110,
  eMacOS11_0 = 1120,
  eMacOS11_1 = 1130,
  eMacOS11_2 = 1140,
  eMacOS11_3 = 1150,
  eMacOS12_0 = 1160,
  eOSXInfinity = 1999,
  eOSUnset = 2000,
  eOSLinux = 3000,
};

enum ECPUType : int32_t {
  eCPUIntel = 20,
  eCPUIntel_Rosetta = 21,
  eCPUAppleARM = 1000,
  eCPUUnset = 2000,
  eCPULinuxX86_64 = 3000,
  eCPULinuxARM64 = 3001,
  eCPULinuxOther = 3002,  // any other processor uname reports
};

class SystemState {
 public:
  // Reads uname and sets both values, logging what it found.
  static void SetOSType();
  // The same from uname's system name, release and machine fields. A system
  // other than "Linux" leaves the OS unset, so the next read asserts.
  static void SetOSTypeFromUname(const std::string& sysname_I, const std::string& release_I,
                                 const std::string& machine_I);
  // Back to unset; for tests and for a lab run that pretends a machine.
  static void Clear();

  // While unset: assertion "OSType requested before it was set" and -1.
  static EOSType GetOSType();
  // While unset: assertion "CPUType requested before it was set" and
  // eCPUIntel, so that readers take the plain path.
  static ECPUType GetCPUType();
  static std::string GetOSTypeString();

  // "Unknown" for a value not in the table.
  static std::string OSTypeToString(int32_t osType_I);
  // -1 for a text not in the table.
  static EOSType StringToOSType(const std::string& text_I);

  // True for any OS value above 1009, Linux included (libinput gives
  // touchpad gestures natively).
  static bool GetSupportsNativeGestures();
  static double GetPixelsPerInch();
  static double GetPixelsPerMM();

  // Foreground application. A Linux desktop has no portable way to name
  // the application in front (Wayland hides it on purpose), so these answer
  // "none": ApplicationSwitch() finds no application and changes nothing,
  // GetForegroundAppIdentifier() stays empty and
  // GetForegroundProcessInstanceIdentifier() is empty while no foreground
  // process is known.
  static void ApplicationSwitch();
  static void SetAppSwitchCallback();
  static std::string GetForegroundAppIdentifier();
  static std::string GetForegroundProcessInstanceIdentifier();
  // ".<pid>" of this process.
  static std::string GetProcessInstanceIdentifier();
  // "<name>.<pid>" of the parent process, the name from /proc (empty when
  // it cannot be read).
  static std::string GetProcessParentInstanceIdentifier();
};
