#include "devices/IOUtils.h"

#include <sstream>

namespace {

constexpr uint32_t kFamilyVendorId = 0x7A5D;
// A product that is genuine only when it hangs behind the family's own hub.
constexpr uint32_t kGuardedProductId = 0xFA;
constexpr uint32_t kGuardingParentProductId = 0xF9;

bool ReadTokens(const std::string& text_I, std::vector<uint32_t>& numbers_O) {
  numbers_O.clear();
  std::stringstream in(text_I);
  std::string token;
  while (std::getline(in, token, ':')) {
    if (token.empty()) continue;
    try {
      size_t used = 0;
      const unsigned long value = std::stoul(token, &used, 10);
      if (used != token.size() || value > 0xFFFFFFFFul) return false;
      numbers_O.push_back(static_cast<uint32_t>(value));
    } catch (...) {
      return false;
    }
  }
  return true;
}

void FillInfo(const std::vector<uint32_t>& numbers_I, DeviceInfo& info_O) {
  info_O.vendorId = numbers_I[0];
  info_O.productId = numbers_I[1];
  info_O.locationId = numbers_I[2];
  info_O.usage = numbers_I[3];
  info_O.usagePage = numbers_I[4];
}

}  // namespace

namespace IOUtils {

std::string DevicePathFromInfo(const DeviceInfo& info_I) {
  return std::to_string(info_I.vendorId) + ":" + std::to_string(info_I.productId) + ":" +
         std::to_string(info_I.locationId) + ":" + std::to_string(info_I.usage) + ":" +
         std::to_string(info_I.usagePage);
}

bool DeviceInfoFromPath(const std::string& path_I, DeviceInfo& info_O) {
  std::vector<uint32_t> numbers;
  if (!ReadTokens(path_I, numbers) || numbers.size() != 5) return false;
  FillInfo(numbers, info_O);
  return true;
}

bool DeviceInfoFromCommName(const std::string& name_I, DeviceInfo& info_O) {
  std::vector<uint32_t> numbers;
  if (!ReadTokens(name_I, numbers) || (numbers.size() != 5 && numbers.size() != 6)) return false;
  FillInfo(numbers, info_O);
  return true;
}

bool CompareDeviceInfo(const DeviceInfo& a_I, const DeviceInfo& b_I, uint32_t mask_I) {
  if ((mask_I & kVendorId) && a_I.vendorId != b_I.vendorId) return false;
  if ((mask_I & kProductId) && a_I.productId != b_I.productId) return false;
  if ((mask_I & kLocationId) && a_I.locationId != b_I.locationId) return false;
  if ((mask_I & kUsage) && a_I.usage != b_I.usage) return false;
  if ((mask_I & kUsagePage) && a_I.usagePage != b_I.usagePage) return false;
  return true;
}

bool IsAcceptedEntry(const SHidEntry& entry_I) {
  if (entry_I.info.vendorId == kFamilyVendorId && entry_I.info.productId == kGuardedProductId) {
    return entry_I.parentUsbVendorId == kFamilyVendorId &&
           entry_I.parentUsbProductId == kGuardingParentProductId;
  }
  return true;
}

std::vector<DeviceInfo> FindMatchedDevices(CDeviceRegistry& registry_I,
                                           const DeviceInfo& criterion_I, uint32_t mask_I) {
  std::vector<DeviceInfo> found;
  for (const SHidEntry& entry : registry_I.ListHidInterfaces(criterion_I.vendorId)) {
    if (!IsAcceptedEntry(entry)) continue;
    if (CompareDeviceInfo(entry.info, criterion_I, mask_I | kVendorId)) found.push_back(entry.info);
  }
  return found;
}

}  // namespace IOUtils
