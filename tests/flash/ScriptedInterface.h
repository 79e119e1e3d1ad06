#pragma once
// A device interface whose transport is a pair of functions, for tests of
// the base's own logic (retries, guards, reporting) without a board.

#include <functional>
#include <string>
#include <vector>

#include "flash/CFLDeviceInterface.h"

class ScriptedInterface : public CFLDeviceInterface {
 public:
  using Transfer = std::function<bool(std::vector<uint8_t>& report_IO)>;

  ScriptedInterface() {
    mIsOpen = true;
    mIsFlashLoader = true;
  }

  bool Open() override {
    ++opens;
    return true;
  }
  void Close() override {}
  bool GetAttributes() override { return true; }
  std::string GetBasePath(uint8_t) override { return mPath; }
  bool SwitchToBLMode() override { return false; }
  bool SwitchFromBLMode(bool) override { return false; }
  bool IsAlive() override { return true; }
  bool InitEEPROM() override { return false; }

  bool Write(std::vector<uint8_t>& report_IO) override {
    writes.push_back(report_IO);
    return onWrite ? onWrite(report_IO) : true;
  }
  bool Read(std::vector<uint8_t>& report_IO) override {
    reads.push_back(report_IO);
    return onRead ? onRead(report_IO) : true;
  }

  void SetOpen(bool open_I) { mIsOpen = open_I; }
  void SetParams(const BL_HID_REP_GET_BL_PARAMETERS& params_I) { mBLParams = params_I; }
  void SetChecksumsSupported(bool supported_I) { mChecksumsSupported = supported_I; }

  Transfer onWrite;
  Transfer onRead;
  std::vector<std::vector<uint8_t>> writes;
  std::vector<std::vector<uint8_t>> reads;
  int opens = 0;
};

// A notifier that keeps what it hears.
class RecordingNotifier : public CInterfaceNotifier {
 public:
  void InterfaceLog(const std::string& text_I) override { logs.push_back(text_I); }
  void InterfaceError(const std::string& text_I) override { errors.push_back(text_I); }
  void InterfaceProgress(unsigned int percent_I) override { progress.push_back(percent_I); }

  bool Logged(const std::string& part_I) const {
    for (const std::string& line : logs) {
      if (line.find(part_I) != std::string::npos) return true;
    }
    return false;
  }
  size_t CountLogged(const std::string& part_I) const {
    size_t count = 0;
    for (const std::string& line : logs) count += line.find(part_I) != std::string::npos;
    return count;
  }

  std::vector<std::string> logs;
  std::vector<std::string> errors;
  std::vector<unsigned int> progress;
};
