#include "devices/IOUtils.h"

#include <algorithm>
#include <cstdio>
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

namespace {

bool IsAcceptedIdentity(uint32_t vendorId_I, uint32_t productId_I, uint32_t parentVendorId_I,
                        uint32_t parentProductId_I) {
  if (vendorId_I == kFamilyVendorId && productId_I == kGuardedProductId) {
    return parentVendorId_I == kFamilyVendorId && parentProductId_I == kGuardingParentProductId;
  }
  return true;
}

}  // namespace

bool IsAcceptedEntry(const SHidEntry& entry_I) {
  return IsAcceptedIdentity(entry_I.info.vendorId, entry_I.info.productId,
                            entry_I.parentUsbVendorId, entry_I.parentUsbProductId);
}

bool IsAcceptedEntry(const SUsbEntry& entry_I) {
  return IsAcceptedIdentity(entry_I.vendorId, entry_I.productId, entry_I.parentUsbVendorId,
                            entry_I.parentUsbProductId);
}

bool FindReleaseNumber(CDeviceRegistry& registry_I, const std::string& path_I,
                       uint16_t& release_O) {
  DeviceInfo info;
  if (!DeviceInfoFromPath(path_I, info)) return false;
  for (const SHidEntry& entry : registry_I.ListHidInterfaces(info.vendorId)) {
    if (entry.info == info) {
      release_O = entry.version;
      return true;
    }
  }
  for (const SUsbEntry& entry : registry_I.ListUsbDevices(info.vendorId)) {
    if (entry.productId == info.productId && entry.locationId == info.locationId) {
      release_O = entry.version;
      return true;
    }
  }
  return false;
}

std::string FindReleaseText(CDeviceRegistry& registry_I, const std::string& path_I) {
  uint16_t release = 0;
  if (!FindReleaseNumber(registry_I, path_I, release)) return std::string();
  char text[16];
  std::snprintf(text, sizeof(text), "%x.%02x", release >> 8, release & 0xFF);
  return text;
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

uint32_t CriterionMask(const DeviceInfo& criterion_I) {
  uint32_t mask = kVendorId;
  if (criterion_I.productId != 0) mask |= kProductId;
  if (criterion_I.locationId != 0) mask |= kLocationId;
  if (criterion_I.usage != 0) mask |= kUsage;
  if (criterion_I.usagePage != 0) mask |= kUsagePage;
  return mask;
}

std::vector<DeviceInfo> FindMatchedDevicesMultiple(CDeviceRegistry& registry_I,
                                                   const std::vector<DeviceInfo>& criteria_I) {
  std::vector<DeviceInfo> found;
  for (const DeviceInfo& criterion : criteria_I) {
    for (const DeviceInfo& info :
         FindMatchedDevices(registry_I, criterion, CriterionMask(criterion))) {
      if (std::find(found.begin(), found.end(), info) == found.end()) found.push_back(info);
    }
  }
  return found;
}

std::vector<DeviceInfo> FindUsbDevices(CDeviceRegistry& registry_I, uint32_t vendorId_I) {
  std::vector<DeviceInfo> found;
  for (const SUsbEntry& entry : registry_I.ListUsbDevices(vendorId_I)) {
    if (!IsAcceptedEntry(entry)) continue;
    found.push_back(DeviceInfo{entry.vendorId, entry.productId, entry.locationId, 0, 0});
  }
  return found;
}

uint32_t AncestorLocationId(uint32_t locationId_I, unsigned levels_I) {
  // The deepest port is the lowest nibble that is not 0.
  uint32_t location = locationId_I;
  for (unsigned level = 0; level < levels_I; ++level) {
    bool climbed = false;
    for (int shift = 0; shift <= 20; shift += 4) {
      const uint32_t nibble = 0xFu << shift;
      if (location & nibble) {
        location &= ~nibble;
        climbed = true;
        break;
      }
    }
    if (!climbed) break;
  }
  return location;
}

std::string BasePathFromInfo(const DeviceInfo& info_I, uint8_t topology_I) {
  // Without a location nothing can be told about the interface's product.
  if (info_I.locationId == 0) return std::string();
  const unsigned levels = topology_I == 0 ? 0u : topology_I - 1u;
  return std::to_string(AncestorLocationId(info_I.locationId, levels));
}

}  // namespace IOUtils
