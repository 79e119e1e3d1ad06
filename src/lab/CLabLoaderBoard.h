#pragma once
// A board with a normal personality and a loader personality that speaks
// the loader command set: the pen controller and the touch controller on a
// vendor-class interface. Switching between the two makes the board drop
// off the bus and come back under the other identity, as real controllers
// do; the loader exits into normal mode only with a valid image.
//
// Under the non-BL variant the normal firmware itself answers the loader
// commands (under the non-BL ids) and no switch happens; its loader
// personality, reached only with an invalid image, speaks the same ids.

#include <string>

#include "lab/CLabBoard.h"
#include "lab/CLabLoader.h"

class CLabLoaderBoard : public CLabBoard {
 public:
  enum class EMode { eNormal, eLoader };

  CLabLoaderBoard(std::string name_I, SLabIdentity normal_I, SLabIdentity loaderIdentity_I,
                  CLabLoader engine_I);

  EMode GetMode() const { return mMode; }
  CLabLoader& GetLoader() { return mLoader; }
  const CLabLoader& GetLoader() const { return mLoader; }
  uint32_t GetEEPROMInits() const { return mEEPROMInits; }
  // A factory-fresh board: a valid image of `seed_I`, in normal mode.
  void FactoryReset(uint32_t seed_I);

  std::vector<SLabInterface> GetInterfaces() const override;
  void PowerOn() override;
  std::vector<std::string> GetViolations() const override;
  size_t GetFeatureLength(uint8_t reportId_I) const override;

 protected:
  bool OnSetFeature(const DeviceInfo& interface_I, const std::vector<uint8_t>& report_I) override;
  bool OnGetFeature(const DeviceInfo& interface_I, std::vector<uint8_t>& report_IO) override;
  std::pair<size_t, size_t> DataRange(const std::vector<uint8_t>& report_I) const override;
  void Save(CLabStateFile& state_IO) const override;
  void Load(const CLabStateFile& state_I, bool powerCycled_I) override;

  // Normal-mode answers; the defaults stall everything but what the
  // non-BL variant's firmware answers.
  virtual bool OnNormalSetFeature(const std::vector<uint8_t>& report_I);
  virtual bool OnNormalGetFeature(std::vector<uint8_t>& report_IO);

  // The normal firmware was told to go to its loader.
  void RequestLoader();
  void CountEEPROMInit() { ++mEEPROMInits; }
  bool SpeaksLoaderInNormalMode() const { return mLoader.GetProtocol() == ELabProtocol::eNonBL; }

 private:
  // A reset command reached the engine: restart into the mode the image
  // allows.
  void Restart();
  // Normal mode starts: the release its image names is the one shown.
  void StartNormal();

  SLabIdentity mNormal;
  SLabIdentity mLoaderIdentity;
  CLabLoader mLoader;
  EMode mMode = EMode::eNormal;
  uint16_t mRelease = 0;  // shown in normal mode
  uint32_t mEEPROMInits = 0;
};
