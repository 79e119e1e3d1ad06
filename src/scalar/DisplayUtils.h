#pragma once
// The family's attached displays, told by the manufacturer number in their
// EDID, as display dictionaries of the one shape every caller sees:
// "LegacyManufacturerID" and "ProductID" as integers and
// "AlphanumericSerialNumber" as text. A display that gives no EDID is
// described by what the display stack knows of it instead.
//
// A display id is the display's place in the seam's list.
//
// The displays seam is one object for the whole process, set by the
// application before threads start. Without one there are no displays.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "seams/CDisplays.h"
#include "settings/CSettingsMap.h"

class DisplayUtils {
 public:
  static constexpr int64_t kTavikManufacturerID = 23335;  // 0x5B27
  static constexpr const char* kLegacyManufacturerIDKey = "LegacyManufacturerID";
  static constexpr const char* kProductIDKey = "ProductID";
  static constexpr const char* kAlphanumericSerialNumberKey = "AlphanumericSerialNumber";

  // Borrowed; must outlive every use. Null: no displays.
  static void SetDisplays(const CDisplays* displays_I);
  static const CDisplays* GetDisplays();

  // One dictionary for each attached display of the family.
  static std::vector<std::shared_ptr<CSettingsMap>> TavikDisplayAttributes();
  // Those whose "ProductID" is `productId_I`.
  static std::vector<std::shared_ptr<CSettingsMap>> TavikDisplayAttributesWithPID(
      int64_t productId_I);

  // The `-s` value that updates the scalar of a display: manufacturer,
  // product, serial number and the index 255, colon-separated.
  static std::string ScalarArgument(const CSettingsMap& display_I);

  static std::string SerialNumberFrom(const std::vector<uint8_t>& edid_I);
  static std::string DisplayNameFrom(const std::vector<uint8_t>& edid_I);

  // The display's own EDID, or for a display that gives none the block of
  // CreateEDIDOfARMDisplayID. Empty for an unknown id.
  static std::vector<uint8_t> CreateEDIDOfDisplayID(uint32_t displayId_I);
  // A block the EDID searches can read, for a display that gives no EDID:
  // 255 bytes, the EDID header, the name descriptor's pattern at 91 with
  // the name from 95, the serial's at 109 with the serial from 113. No
  // checksum. A name of 15 bytes or more runs into the serial's pattern.
  static std::vector<uint8_t> CreateEDIDOfARMDisplayID(uint32_t displayId_I);
};
