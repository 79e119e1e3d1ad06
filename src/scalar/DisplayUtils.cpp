#include "scalar/DisplayUtils.h"

#include <algorithm>

#include "common/TavLog.h"
#include "scalar/HelperUtils.h"

namespace {

const CDisplays* gDisplays = nullptr;

constexpr uint8_t kEDIDHeader[] = {0x00, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x00};
constexpr size_t kSyntheticEDIDSize = 255;
constexpr size_t kSyntheticNameTag = 93;
constexpr size_t kSyntheticName = 95;
constexpr size_t kSyntheticSerialTag = 111;
constexpr size_t kSyntheticSerial = 113;

// What identifies a display: from its EDID where it gives one.
struct SIdentity {
  int64_t manufacturerId = 0;
  int64_t productId = 0;
  std::string serialNumber;
};

bool HasEDIDHeader(const std::vector<uint8_t>& edid_I) {
  return edid_I.size() >= 12 &&
         std::equal(std::begin(kEDIDHeader), std::end(kEDIDHeader), edid_I.begin());
}

SIdentity IdentityOf(const SDisplay& display_I) {
  if (!HasEDIDHeader(display_I.edid)) {
    return {display_I.manufacturerId, display_I.productId, display_I.serialNumber};
  }
  const std::vector<uint8_t>& edid = display_I.edid;
  // The manufacturer id is packed big-endian, the product code little-endian.
  return {static_cast<int64_t>(edid[8] << 8 | edid[9]),
          static_cast<int64_t>(edid[10] | edid[11] << 8), DisplayUtils::SerialNumberFrom(edid)};
}

std::vector<SDisplay> ListDisplays() {
  return gDisplays != nullptr ? gDisplays->List() : std::vector<SDisplay>{};
}

}  // namespace

void DisplayUtils::SetDisplays(const CDisplays* displays_I) { gDisplays = displays_I; }

const CDisplays* DisplayUtils::GetDisplays() { return gDisplays; }

std::vector<std::shared_ptr<CSettingsMap>> DisplayUtils::TavikDisplayAttributes() {
  std::vector<std::shared_ptr<CSettingsMap>> attributes;
  for (const SDisplay& display : ListDisplays()) {
    const SIdentity identity = IdentityOf(display);
    if (identity.manufacturerId != kTavikManufacturerID) continue;
    auto entry = CSettingsMap::New();
    entry->SetKeyAndInteger(kLegacyManufacturerIDKey, identity.manufacturerId);
    entry->SetKeyAndInteger(kProductIDKey, identity.productId);
    entry->SetKeyAndString(kAlphanumericSerialNumberKey, identity.serialNumber);
    attributes.push_back(entry);
  }
  return attributes;
}

std::vector<std::shared_ptr<CSettingsMap>> DisplayUtils::TavikDisplayAttributesWithPID(
    int64_t productId_I) {
  std::vector<std::shared_ptr<CSettingsMap>> attributes = TavikDisplayAttributes();
  std::erase_if(attributes, [&](const std::shared_ptr<CSettingsMap>& entry_I) {
    return entry_I->IntegerForKeyWithDefault(kProductIDKey, int64_t{-1}) != productId_I;
  });
  return attributes;
}

std::string DisplayUtils::SerialNumberFrom(const std::vector<uint8_t>& edid_I) {
  return findEDIDValue(edid_I, HelperUtils::kSerialNumberPattern);
}

std::string DisplayUtils::DisplayNameFrom(const std::vector<uint8_t>& edid_I) {
  return findEDIDValue(edid_I, HelperUtils::kMonitorNamePattern);
}

std::vector<uint8_t> DisplayUtils::CreateEDIDOfDisplayID(uint32_t displayId_I) {
  const std::vector<SDisplay> displays = ListDisplays();
  if (displayId_I < displays.size() && !displays[displayId_I].edid.empty()) {
    TavLog::Info("Getting EDID of Intel display %d\n", displayId_I);
    return displays[displayId_I].edid;
  }
  TavLog::Info("Getting EDID of ARM display %d\n", displayId_I);
  return CreateEDIDOfARMDisplayID(displayId_I);
}

std::vector<uint8_t> DisplayUtils::CreateEDIDOfARMDisplayID(uint32_t displayId_I) {
  TavLog::Info("Building ARM monitor EDID %d\n", displayId_I);
  const std::vector<SDisplay> displays = ListDisplays();
  if (displayId_I >= displays.size()) return {};
  const SDisplay& display = displays[displayId_I];
  TavLog::Info("ARM EDID displayID:%d ", displayId_I);
  const std::string name = display.productName.empty() ? "-" : display.productName;
  const std::string serial = display.serialNumber.empty() ? "0" : display.serialNumber;
  TavLog::Info("ARM EDID creation %s %s", name.c_str(), serial.c_str());

  std::vector<uint8_t> edid(kSyntheticEDIDSize, 0x00);
  std::copy(std::begin(kEDIDHeader), std::end(kEDIDHeader), edid.begin());
  const auto place = [&edid](const std::string& text_I, size_t at_I) {
    const size_t count = std::min(text_I.size(), edid.size() - at_I);
    std::copy_n(text_I.begin(), count, edid.begin() + static_cast<long>(at_I));
  };
  edid[kSyntheticNameTag] = 0xFC;
  place(name, kSyntheticName);
  edid[kSyntheticSerialTag] = 0xFF;
  place(serial, kSyntheticSerial);
  return edid;
}

std::string DisplayUtils::ScalarArgument(const CSettingsMap& display_I) {
  return std::to_string(display_I.IntegerForKeyWithDefault(kLegacyManufacturerIDKey, 0)) + ":" +
         std::to_string(display_I.IntegerForKeyWithDefault(kProductIDKey, 0)) + ":" +
         display_I.StringForKeyWithDefault(kAlphanumericSerialNumberKey, std::string()) + ":255";
}
