// A loader whose every answer comes from the fuzzer: parameters, flash
// descriptor, checksums, and whether each report went through. Init and
// the S-record procedure must survive any device (ASan and UBSan watch),
// finish in bounded time, and never write outside the image they were given.
#include <fuzzer/FuzzedDataProvider.h>

#include <cstdint>
#include <memory>
#include <vector>

#include "FuzzInstantClock.h"
#include "FuzzedReplies.h"
#include "common/CClock.h"
#include "flash/CFLDeviceInterface.h"
#include "flash/CFLProtocol.h"

namespace {

class FuzzedLoader : public CFLDeviceInterface {
 public:
  explicit FuzzedLoader(FuzzedDataProvider& data_I) : mReplies(data_I, true) {
    mIsOpen = true;
    mIsFlashLoader = true;
  }
  bool Open() override { return true; }
  void Close() override {}
  bool GetAttributes() override { return true; }
  std::string GetBasePath(uint8_t) override { return {}; }
  bool SwitchToBLMode() override { return false; }
  bool SwitchFromBLMode(bool) override { return false; }
  bool IsAlive() override { return true; }
  bool InitEEPROM() override { return false; }

  // A loader that falls silent has taken every report.
  bool Write(std::vector<uint8_t>&) override { return mReplies.Write(); }
  bool Read(std::vector<uint8_t>& report_IO) override { return mReplies.Read(report_IO); }

 private:
  CFuzzedReplies mReplies;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  FuzzedDataProvider data(data_I, size_I);
  FuzzProcedureSetUp(data);
  FuzzedLoader loader(data);
  loader.SetDataSourceFormat(static_cast<EDataSourceFormat>(data.ConsumeIntegralInRange(0, 2)));
  std::vector<SContinuousDataBlock> image(2);
  image[0].startAddress = data.ConsumeIntegral<uint32_t>();
  image[0].data.assign(data.ConsumeIntegralInRange<size_t>(0, 3000), 0x5A);
  image[1].startAddress = data.ConsumeIntegral<uint32_t>();
  image[1].data.assign(data.ConsumeIntegralInRange<size_t>(0, 600), 0xA5);
  if (loader.Init(image)) loader.ProgramBoard();
  return 0;
}
