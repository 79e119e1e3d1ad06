#pragma once
// The emulated I2C tunnel master: a HID device that passes loader commands
// to a controller on its I2C bus and hands back the outcome. Behind it sits
// a controller whose loader speaks the loader command set.
//
// Reports it answers:
//   0xB0 (3 bytes)   set: switch the controller to mode byte 1 (0 loader,
//                    1 main firmware); get: 0xB0 0 0 in loader mode, 0xB0
//                    1 1 in main firmware; stalled while the controller
//                    restarts (restart takes kSlaveRestart seconds).
//   0xB2 (265 bytes) set: pass bytes 4.. (length in bytes 2-3) to the
//                    controller as a set report.
//   0xB2 (6 bytes)   get: status F2 and the command's id in byte 5, F3 when
//                    the controller refused it, F0 when nothing is pending.
//   0xB1 (5 bytes)   set: ask the controller for report id byte 2 with the
//                    length in bytes 3-4.
//   0xB1 (266 bytes) get: status F2, length in bytes 3-4, the report from
//                    byte 5; F3 when the controller refused.
//   0x02 0x00        the alive probe.
// Busy faults answer F1 to status reads. The master itself never leaves the
// bus; only the controller behind it changes mode.

#include <string>
#include <vector>

#include "lab/CLabBoard.h"
#include "lab/CLabLoader.h"

struct SLabI2CDescription {
  std::string name = "i2c";
  uint16_t vendorId = 0x7A71;
  uint16_t productId = 0x0331;
  uint16_t release = 0x0100;
  std::pair<uint16_t, uint16_t> usage{0xFF00, 0x00B0};
  // The tunnel carries at most 261 bytes, so the flash descriptor (10 bytes
  // a block and the id) allows at most 26 blocks behind it.
  std::vector<SLabFlashLayout> cpus{SLabFlashLayout::Uniform(0x00000000, 1024, 24, 1, 128)};
  uint16_t deviceInfo = 0x0331;
};

class CLabI2CMaster : public CLabBoard {
 public:
  static constexpr double kSlaveRestart = 1.0;

  explicit CLabI2CMaster(const SLabI2CDescription& description_I = SLabI2CDescription());

  bool IsSlaveInLoader() const { return mSlaveMode == ESlaveMode::eLoader; }
  CLabLoader& GetLoader() { return mLoader; }
  const CLabLoader& GetLoader() const { return mLoader; }

  // The bridge shows the release of the pen firmware behind it.
  std::vector<SLabInterface> GetInterfaces() const override;
  void PowerOn() override;
  std::vector<std::string> GetViolations() const override;

 protected:
  bool OnSetFeature(const DeviceInfo& interface_I, const std::vector<uint8_t>& report_I) override;
  bool OnGetFeature(const DeviceInfo& interface_I, std::vector<uint8_t>& report_IO) override;
  std::pair<size_t, size_t> DataRange(const std::vector<uint8_t>& report_I) const override;
  bool AnswersBusyItself() const override { return true; }
  void Save(CLabStateFile& state_IO) const override;
  void Load(const CLabStateFile& state_I, bool powerCycled_I) override;

 private:
  enum class ESlaveMode { eMainFw, eLoader, eRestarting };

  void SwitchSlave(uint8_t mode_I);
  ESlaveMode CurrentSlaveMode();

  SLabIdentity mIdentity;
  CLabLoader mLoader;
  ESlaveMode mSlaveMode = ESlaveMode::eMainFw;
  ESlaveMode mRestartInto = ESlaveMode::eMainFw;
  double mRestartDone = 0.0;
  // The outcome waiting for the next status read of each tunnel.
  uint8_t mWriteStatus = 0xF0;
  uint8_t mWriteId = 0;
  uint8_t mReadStatus = 0xF0;
  std::vector<uint8_t> mReadData;
};
