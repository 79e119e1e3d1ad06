#pragma once
// A device interface whose transport is a pair of functions, for tests of
// the base's own logic (retries, guards, reporting) without a board.

#include <functional>
#include <string>
#include <vector>

#include "flash/CFLDeviceInterface.h"
#include "support/RecordingNotifier.h"

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
