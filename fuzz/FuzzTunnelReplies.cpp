// A USB master whose every report comes from the fuzzer, in front of the
// I2C tunnel: the mode report, the write status and the read reply. Mode
// switches, Init and the S-record procedure must survive any master (ASan
// and UBSan watch: a reply's length field must never carry a copy past the
// caller's report) and end once the master falls silent; only a master that
// keeps answering busy may hold the tunnel, and that takes input to say.
#include <fuzzer/FuzzedDataProvider.h>

#include <cstdint>
#include <memory>
#include <vector>

#include "FuzzInstantClock.h"
#include "FuzzedReplies.h"
#include "common/CClock.h"
#include "flash/CFLProtocol.h"
#include "flash/CI2CFLDeviceInterface.h"

namespace {

class CFuzzedMaster : public CI2CFLDeviceInterface {
 public:
  explicit CFuzzedMaster(FuzzedDataProvider& data_I) : mReplies(data_I, false) {}
  bool Open() override {
    mIsOpen = true;
    return true;
  }
  void Close() override { mIsOpen = false; }

  // A silent master answers no more: every loop over it must end.
  bool WriteMaster(std::vector<uint8_t>&) override { return mReplies.Write(); }
  bool ReadMaster(std::vector<uint8_t>& report_IO) override { return mReplies.Read(report_IO); }

 private:
  CFuzzedReplies mReplies;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  FuzzedDataProvider data(data_I, size_I);
  FuzzProcedureSetUp(data);
  CFuzzedMaster master(data);
  master.SetDataSourceFormat(static_cast<EDataSourceFormat>(data.ConsumeIntegralInRange(0, 2)));
  std::vector<SContinuousDataBlock> image(1);
  image[0].startAddress = data.ConsumeIntegral<uint32_t>();
  image[0].data.assign(data.ConsumeIntegralInRange<size_t>(0, 2000), 0x5A);
  if (!master.SwitchToBLMode()) return 0;
  master.Open();
  if (master.Init(image)) master.ProgramBoard();
  master.IsAlive();
  master.SwitchFromBLMode(false);
  return 0;
}
