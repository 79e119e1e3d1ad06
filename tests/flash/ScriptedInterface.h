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
  // A loader of equal blocks, as Init would have read it.
  void SetLayout(uint32_t base_I, uint32_t blockBytes_I, uint16_t blocks_I, uint16_t wordSize_I,
                 uint16_t writeBlock_I, uint16_t protectedMask_I = 0) {
    mBLParams.numFlashBlocks = blocks_I;
    mBLParams.blockSize = writeBlock_I;
    mBLParams.wordSize = wordSize_I;
    mBLParams.readSize = 64;
    for (uint16_t i = 0; i < blocks_I; ++i) {
      mBLDesc.blocks[i].startAddress = base_I + i * blockBytes_I;
      mBLDesc.blocks[i].size = blockBytes_I;
      mBLDesc.blocks[i].flags =
          static_cast<uint16_t>(wordSize_I | (((protectedMask_I >> i) & 1) ? 0x8000 : 0));
    }
  }
  // How many reports with this id went out.
  size_t Sent(uint8_t id_I) const {
    size_t count = 0;
    for (const auto& report : writes) count += report[0] == id_I;
    return count;
  }

  Transfer onWrite;
  Transfer onRead;
  std::vector<std::vector<uint8_t>> writes;
  std::vector<std::vector<uint8_t>> reads;
  int opens = 0;
};
