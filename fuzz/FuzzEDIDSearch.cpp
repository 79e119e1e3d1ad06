// The EDID searches over any block, and the display list over one display
// whose EDID, or whose display-stack identity, comes from the fuzzer. A
// position found must hold the pattern, and a synthetic block must give
// back the serial it was built with where the layout lets it.
#include <fuzzer/FuzzedDataProvider.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "scalar/DisplayUtils.h"
#include "scalar/HelperUtils.h"

namespace {

class COneDisplay : public CDisplays {
 public:
  std::vector<SDisplay> List() const override { return {display}; }
  SDisplay display;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  FuzzedDataProvider data(data_I, size_I);
  const std::vector<uint8_t> pattern =
      data.ConsumeBytes<uint8_t>(data.ConsumeIntegralInRange<size_t>(0, 6));
  COneDisplay displays;
  SDisplay& display = displays.display;
  display.manufacturerId = data.ConsumeBool() ? 0x5B27 : data.ConsumeIntegral<uint16_t>();
  display.productId = data.ConsumeIntegral<uint16_t>();
  display.serialNumber = data.ConsumeRandomLengthString(32);
  display.productName = data.ConsumeRandomLengthString(32);
  const bool withEDID = data.ConsumeBool();
  display.edid = data.ConsumeRemainingBytes<uint8_t>();

  const long pos = PosOfPatternInBuffer(display.edid, pattern);
  if (pos >= 0 && (static_cast<size_t>(pos) + pattern.size() > display.edid.size() ||
                   !std::equal(pattern.begin(), pattern.end(), display.edid.begin() + pos))) {
    std::abort();
  }
  ExtractSerialNumber(display.edid);
  ExtractMonitorName(display.edid);
  FindEDIDValue(display.edid, pattern);
  findEDIDValue(display.edid, HelperUtils::kMonitorNamePattern);

  if (!withEDID) display.edid.clear();
  DisplayUtils::SetDisplays(&displays);
  for (const auto& entry : DisplayUtils::TavikDisplayAttributes()) {
    DisplayUtils::ScalarArgument(*entry);
  }
  DisplayUtils::TavikDisplayAttributesWithPID(display.productId);
  const std::vector<uint8_t> block = DisplayUtils::CreateEDIDOfDisplayID(0);
  const std::vector<uint8_t> synthetic = DisplayUtils::CreateEDIDOfARMDisplayID(0);
  DisplayUtils::SerialNumberFrom(block);
  DisplayUtils::DisplayNameFrom(block);
  // A short printable name and serial come back from the synthetic block.
  const auto printable = [](const std::string& text_I) {
    return std::all_of(text_I.begin(), text_I.end(), [](char c) { return c > 0x20 && c <= 0x7E; });
  };
  if (display.productName.size() < 14 && display.serialNumber.size() < 100 &&
      !display.serialNumber.empty() && printable(display.serialNumber) &&
      printable(display.productName) && ExtractSerialNumber(synthetic) != display.serialNumber) {
    std::abort();
  }
  DisplayUtils::SetDisplays(nullptr);
  return 0;
}
