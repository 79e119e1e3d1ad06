#pragma once
// Identity of HID interfaces and the searches over the device registry.
// An interface path is the text form of a DeviceInfo: the five fields in
// decimal joined by ":".

#include <cstdint>
#include <string>
#include <vector>

#include "common/TavTypes.h"
#include "seams/CDeviceRegistry.h"

namespace IOUtils {

// Field mask bits of a DeviceInfo.
enum EDeviceInfoField : uint32_t {
  kVendorId = 1,
  kProductId = 2,
  kLocationId = 4,
  kUsage = 8,
  kUsagePage = 16,
  kAllFields = 65535,
};

std::string DevicePathFromInfo(const DeviceInfo& info_I);
// Exactly five decimal tokens; false otherwise.
bool DeviceInfoFromPath(const std::string& path_I, DeviceInfo& info_O);
// Five or six tokens; a sixth is ignored.
bool DeviceInfoFromCommName(const std::string& name_I, DeviceInfo& info_O);
// True when every field selected by `mask_I` is equal.
bool CompareDeviceInfo(const DeviceInfo& a_I, const DeviceInfo& b_I, uint32_t mask_I);

// The identities of a registry entry as discovery may see them: product
// 0xFA of the vendor counts only behind its 0xF9 parent, and is dropped
// otherwise.
bool IsAcceptedEntry(const SHidEntry& entry_I);

// Every attached HID identity whose vendor id matches `criterion_I`, and
// the further fields selected by `mask_I` (vendor is always compared).
std::vector<DeviceInfo> FindMatchedDevices(CDeviceRegistry& registry_I,
                                           const DeviceInfo& criterion_I, uint32_t mask_I);

}  // namespace IOUtils
