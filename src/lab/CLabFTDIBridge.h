#pragma once
// A pen display's scalar board as the lab has it: an FTDI USB bridge
// (0403:6014, one vendor-class interface) plugged into the product's hub
// like its other boards, whose MPSSE engine drives the I2C bus of the
// display's scalar: the DDC/CI side at 0x6E/0x6F and 0xEE, the MCU at
// 0x94/0x95, and the serial flash behind the MCU. The board's name, not the
// bridge's, names the scalar in faults and in the state folder, where the
// flash and its status registers are kept between runs.
//
// The seam form (CLabFTDIExAPI32) reaches the board under the bus's lock
// through the calls below, named after the FT_ calls they serve. Each
// transfer (Write, Read) counts as one report for the fault wrapper: a
// transfer a fault fails gives FT_IO_ERROR and moves nothing.
//
// The factory flash holds kFactoryBlocks blocks of a pattern that names no
// release, so the scalar runs the release it shipped with (kShippedRelease)
// until an update writes an image that names one.

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <vector>

#include "lab/CLabBoard.h"
#include "lab/CLabDdcScalar.h"
#include "lab/CLabI2CBus.h"
#include "lab/CLabMpsse.h"
#include "lab/CLabScalarMcu.h"
#include "lab/CLabSerialFlash.h"
#include "seams/CFTDIExAPI32.h"

struct SLabFTDIDescription {
  std::string name;
  ELabScalarVariant variant = ELabScalarVariant::ePlain;
  SLabPanel panel;
};

class CLabFTDIBridge : public CLabBoard {
 public:
  static constexpr uint16_t kVendorId = 0x0403;
  static constexpr uint16_t kProductId = 0x6014;
  static constexpr uint16_t kBridgeRelease = 0x0900;
  static constexpr size_t kFlashBlocks = 16;
  static constexpr size_t kFactoryBlocks = 4;
  static constexpr uint16_t kShippedRelease = 0x0100;
  // How many of the last transfers written the bridge shows.
  static constexpr size_t kRecentWrites = 64;

  explicit CLabFTDIBridge(SLabFTDIDescription description_I);

  std::vector<SLabInterface> GetInterfaces() const override;
  void PowerOn() override;

  // A factory-fresh flash, protected as the factory leaves it.
  void FactoryReset();

  // The FT_ side. A transfer sees the engine only in MPSSE mode; in any
  // other mode written bytes go out of the serial port and nothing comes in.
  bool RefusesOpen() { return Faults().RefuseOpen(); }
  FT_STATUS ResetDevice();
  FT_STATUS SetBitMode(uint8_t mask_I, uint8_t mode_I);
  FT_STATUS Purge(uint32_t mask_I);
  FT_STATUS Write(const uint8_t* data_I, uint32_t size_I, uint32_t& written_O);
  FT_STATUS Read(uint8_t* data_O, uint32_t size_I, uint32_t& read_O);
  uint32_t QueueStatus() const;

  const CLabSerialFlash& GetFlash() const { return mFlash; }
  const CLabScalarMcu& GetMcu() const { return mMcu; }
  const CLabDdcScalar& GetScalar() const { return mScalar; }
  const CLabMpsse& GetEngine() const { return mEngine; }
  const CLabI2CBus& GetBus() const { return mBus; }
  // The last transfers written and taken, oldest first, as a USB analyser
  // beside the bridge would show them.
  const std::deque<std::vector<uint8_t>>& GetRecentWrites() const { return mRecentWrites; }
  const SLabPanel& GetPanel() const { return mDescription.panel; }
  bool IsMpsse() const { return mMode == FT_BITMODE_MPSSE; }

 protected:
  void Save(CLabStateFile& state_IO) const override;
  void Load(const CLabStateFile& state_I, bool powerCycled_I) override;
  uint64_t StateRevision() const override { return mFlash.GetRevision(); }

 private:
  LabViolationSink Sink();
  bool TakeTransfer(bool isRead_I);
  void Remember(const uint8_t* data_I, uint32_t size_I) {
    // The oldest entry's buffer takes the newest transfer: no allocation
    // per transfer once the window is full.
    std::vector<uint8_t> entry;
    if (mRecentWrites.size() == kRecentWrites) {
      entry = std::move(mRecentWrites.front());
      mRecentWrites.pop_front();
    }
    entry.assign(data_I, data_I + size_I);
    mRecentWrites.push_back(std::move(entry));
  }
  void Restart();

  SLabFTDIDescription mDescription;
  CLabSerialFlash mFlash;
  CLabI2CBus mBus;
  CLabMpsse mEngine;
  CLabDdcScalar mScalar;
  CLabScalarMcu mMcu;
  uint8_t mMode = FT_BITMODE_RESET;
  std::deque<std::vector<uint8_t>> mRecentWrites;
};
