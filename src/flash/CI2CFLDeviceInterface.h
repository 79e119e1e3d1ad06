#pragma once
// The I2C transport's logic: a controller on an I2C bus behind a USB
// master. Each loader command is wrapped in a tunnel report to the master,
// and its outcome fetched with a second one. A platform form supplies the
// master's link, WriteMaster and ReadMaster, and Open and Close.

#include <cstdint>
#include <string>
#include <vector>

#include "flash/CFLDeviceInterface.h"

class CI2CFLDeviceInterface : public CFLDeviceInterface {
 public:
  static constexpr uint8_t FW_MODE_BOOTLOADER = 0;
  static constexpr uint8_t FW_MODE_MAIN_FW = 1;

  CI2CFLDeviceInterface();
  explicit CI2CFLDeviceInterface(const std::string& path_I);

  // Asks the master for the controller's mode, every time.
  bool GetIsFlashLoader() override;
  uint32_t GetVersion() const override { return mVersion; }
  bool SwitchToBLMode() override;
  bool SwitchFromBLMode(bool save_I) override;
  bool IsAlive() override;
  bool InitEEPROM() override { return false; }

  // The tunnel: one command through the master, then its status.
  bool Write(std::vector<uint8_t>& data_IO) override;
  bool Read(std::vector<uint8_t>& data_IO) override;

  // One report to or from the master, report id in byte 0.
  virtual bool WriteMaster(std::vector<uint8_t>& data_IO) = 0;
  virtual bool ReadMaster(std::vector<uint8_t>& data_IO) = 0;

 private:
  void SendMode(uint8_t mode_I);
};
