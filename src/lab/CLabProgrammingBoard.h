#pragma once
// A board programmed with the non-BL protocol's programming reports (report
// id 0xE4, 512 bytes): byte 1 names the target, byte 2 the phase (1 start,
// 2 data, 3 end). Reading the report back gives 0xE4, the target, the last
// phase and a status in byte 3: 0 ready, 1 busy, kStatusRefused for a data
// report the chip refused (a bad CRC, say), kStatusBadFrame for a report out
// of sequence. A refusal stays until the next start.
//
// The board keeps its image and a stored sum of it. Start erases the image
// and clears the stored sum; end stores the image's sum, unless something
// was refused since the start. The image is valid only when the stored sum
// is there and matches the image, so an interrupted update leaves it
// invalid, and a board with an invalid image starts under its loader
// identity (same reports).
//
// Busy times are clock time after each phase; busy faults add busy answers.

#include <string>
#include <utility>
#include <vector>

#include "lab/CLabBoard.h"

struct SLabProgrammingDescription {
  std::string name;
  uint16_t vendorId = 0x7A71;
  uint16_t productId = 0;
  uint16_t loaderProductId = 0;
  uint16_t release = 0x0100;
  std::pair<uint16_t, uint16_t> usage{0xFF00, 0x00E4};
  uint8_t target = 0;
  uint32_t imageBase = 0;
  uint32_t imageSize = 0;
  double startBusy = 0.3;
  double dataBusy = 0.05;
  double endBusy = 0.2;
};

// The USB identity a lab product gives one of its programming boards; a 0
// keeps the board's own value.
struct SLabBoardIds {
  uint16_t vendorId = 0;
  uint16_t productId = 0;
  uint16_t loaderProductId = 0;
  std::pair<uint16_t, uint16_t> usage{0, 0};

  void ApplyTo(SLabProgrammingDescription& description_IO) const;
};

class CLabProgrammingBoard : public CLabBoard {
 public:
  enum class EMode { eNormal, eLoader };
  static constexpr uint8_t kStatusReady = 0x00;
  static constexpr uint8_t kStatusBusy = 0x01;
  static constexpr uint8_t kStatusRefused = 0xEC;
  static constexpr uint8_t kStatusBadFrame = 0xEF;
  static constexpr size_t kReportSize = 512;

  explicit CLabProgrammingBoard(SLabProgrammingDescription description_I);

  const std::vector<uint8_t>& GetImage() const { return mImage; }
  bool IsImageValid() const;
  EMode GetMode() const { return mMode; }
  uint32_t GetDataTaken() const { return mDataTaken; }
  uint32_t GetRefusals() const { return mRefusals; }
  // A factory-fresh board: an image of a pattern, valid.
  void FactoryReset(uint32_t seed_I);

  std::vector<SLabInterface> GetInterfaces() const override;
  void PowerOn() override;

 protected:
  // One data report; false refuses it. The frame (id, target, phase) is
  // already checked.
  virtual bool TakeData(const std::vector<uint8_t>& report_I) = 0;
  // Where a data report carries image bytes.
  virtual std::pair<size_t, size_t> Payload() const = 0;
  // A new start: chips that count pages restart here.
  virtual void OnStart() {}

  // Writes image bytes at a chip address; false, with a violation, outside
  // the image.
  bool Store(uint32_t address_I, const uint8_t* data_I, size_t size_I);
  const SLabProgrammingDescription& Description() const { return mDescription; }

  bool OnSetFeature(const DeviceInfo& interface_I, const std::vector<uint8_t>& report_I) override;
  bool OnGetFeature(const DeviceInfo& interface_I, std::vector<uint8_t>& report_IO) override;
  std::pair<size_t, size_t> DataRange(const std::vector<uint8_t>& report_I) const override;
  bool AnswersBusyItself() const override { return true; }
  void Save(CLabStateFile& state_IO) const override;
  void Load(const CLabStateFile& state_I, bool powerCycled_I) override;

 private:
  uint32_t ImageSum() const;
  bool IsFrame(const std::vector<uint8_t>& report_I) const;

  SLabProgrammingDescription mDescription;
  std::vector<uint8_t> mImage;
  // Goes up with every change of mImage: saving after each report then
  // compares the image only when a report wrote to it.
  uint64_t mImageRevision = 1;
  uint32_t mStoredSum = 0;
  bool mSumStored = false;
  EMode mMode = EMode::eNormal;
  uint16_t mRelease = 0;  // shown in normal mode, from the image at power-on
  bool mSession = false;
  bool mRefusedSinceStart = false;
  uint8_t mLastPhase = 0;
  uint8_t mStatus = kStatusReady;
  double mBusyUntil = 0.0;
  uint32_t mDataTaken = 0;
  uint32_t mRefusals = 0;
};
