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
bool IsAcceptedEntry(const SUsbEntry& entry_I);

// The release number (bcdDevice) of the USB device behind an interface
// path, as the registry lists it; false when it is not attached.
bool FindReleaseNumber(CDeviceRegistry& registry_I, const std::string& path_I, uint16_t& release_O);
// The same as the user reads it: binary-coded decimal, 0x0120 is "1.20";
// empty when the device is not attached.
std::string FindReleaseText(CDeviceRegistry& registry_I, const std::string& path_I);

// Every attached HID identity whose vendor id matches `criterion_I`, and
// the further fields selected by `mask_I` (vendor is always compared).
std::vector<DeviceInfo> FindMatchedDevices(CDeviceRegistry& registry_I,
                                           const DeviceInfo& criterion_I, uint32_t mask_I);

// The mask a criterion of a multiple search is matched with: the vendor id
// always, each further field when it is not 0.
uint32_t CriterionMask(const DeviceInfo& criterion_I);
// Runs each criterion in order; of entries equal in all five fields only the
// first found is kept.
std::vector<DeviceInfo> FindMatchedDevicesMultiple(CDeviceRegistry& registry_I,
                                                   const std::vector<DeviceInfo>& criteria_I);

// Every attached USB device of `vendorId_I` as an identity with usage and
// usage page 0: how a vendor-class interface, which has no HID node, is found.
// The guarded product counts only behind its parent, as in the HID search.
std::vector<DeviceInfo> FindUsbDevices(CDeviceRegistry& registry_I, uint32_t vendorId_I);

// The location id of the USB device `levels_I` steps up the tree from the
// one at `locationId_I` (bus in bits 31-24, one port nibble a level from bit
// 23 down). Climbing past the root port gives the bus alone.
uint32_t AncestorLocationId(uint32_t locationId_I, unsigned levels_I);
// The text that is equal for interfaces of one product: the location of the
// USB device `topology_I` levels up from the interface, 1 being the
// interface's own device (0 counts as 1). Empty without a location.
std::string BasePathFromInfo(const DeviceInfo& info_I, uint8_t topology_I);

}  // namespace IOUtils
