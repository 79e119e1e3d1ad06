// Feeds arbitrary documents to the supported-device configuration. The
// document is written by people and shipped beside the program, so any
// shape must be read without a crash: elements that are no objects, boards
// of every JSON type, missing pen boards. Every device handed out must be
// the one stored under the sum of some board's ids.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "devices/CSupportedDeviceInfo.h"
#include "settings/CSettingsArray.h"
#include "settings/CSettingsObject.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::string text(reinterpret_cast<const char*>(data_I), size_I);
  std::shared_ptr<CSettingsObject> document;
  try {
    document = CSettingsObject::ReadFromJSONBuffer(text);
  } catch (...) {
    return 0;
  }
  CSupportedDeviceInfo info;
  const CSupportedDeviceInfo::DeviceMap devices =
      info.ParseDevices(CSettingsArray::CastToArray(document, false));
  for (const auto& [key, device] : devices) {
    // A copy never carries scalar sectors.
    if (device.GetScalarFlashSectors() != 0) std::abort();
    if (!device.ToString().empty()) std::abort();
    (void)key;
  }
  return 0;
}
