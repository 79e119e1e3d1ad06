#include "devices/CDeviceList.h"

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "flash/CFLDeviceInterface.h"

namespace {

// Scalar boards that answer to either of these product ids.
constexpr unsigned long kInterchangeableScalarProducts[] = {4192, 4195};

bool PathMatches(const CDevice::InterfacePtr& interface_I, const char* board_I,
                 const std::string& wanted_I) {
  if (!interface_I) return false;
  const std::string path = interface_I->GetPath();
  // For the log only: a run tells the user once when a path matches nothing.
  TavLog::Debug("%s GetDevice %s to %s\n", board_I, wanted_I.c_str(), path.c_str());
  return StringUtilities::IEquals(wanted_I, path);
}

bool IsInterchangeableScalarProduct(unsigned long productId_I) {
  for (unsigned long product : kInterchangeableScalarProducts) {
    if (productId_I == product) return true;
  }
  return false;
}

// The scalar board has no interface path of its own: it is matched by the
// vendor and product at the head of the wanted path.
bool ScalarMatches(const CDevice& device_I, const std::string& wanted_I) {
  const std::vector<std::string> tokens = StringUtilities::Tokenize(wanted_I, ":", false);
  if (tokens.size() < 2) return false;
  // Conversion errors propagate to the caller on purpose.
  const unsigned long vendor = std::stoul(tokens[0]);
  const unsigned long product = std::stoul(tokens[1]);
  if (device_I.GetScalarVendorId() != vendor) return false;
  return device_I.GetScalarProductId() == product ||
         (IsInterchangeableScalarProduct(product) &&
          IsInterchangeableScalarProduct(device_I.GetScalarProductId()));
}

}  // namespace

CDeviceList::DevicePtr CDeviceList::GetDevice(unsigned int index_I) const {
  if (index_I >= mDevices.size()) return nullptr;
  return mDevices[index_I];
}

CDeviceList::DevicePtr CDeviceList::GetDevice(unsigned short vendorId_I,
                                              unsigned short productId_I) const {
  for (const DevicePtr& device : mDevices) {
    if ((device->GetPenVendorId() == vendorId_I && device->GetPenProductId() == productId_I) ||
        (device->GetTouchVendorId() == vendorId_I && device->GetTouchProductId() == productId_I) ||
        (device->GetBluetoothVendorId() == vendorId_I &&
         device->GetBluetoothProductId() == productId_I) ||
        (device->GetScalarVendorId() == vendorId_I &&
         device->GetScalarProductId() == productId_I)) {
      return device;
    }
  }
  return nullptr;
}

CDeviceList::DevicePtr CDeviceList::GetDevice(const std::string& path_I) const {
  for (const DevicePtr& device : mDevices) {
    // Every test runs before the answer is looked at, so later boards still
    // print their line after an earlier board matched.
    bool matched = PathMatches(device->GetPenInterface(), "Pen", path_I);
    matched = PathMatches(device->GetTouchInterface(), "Touch", path_I) || matched;
    matched = PathMatches(device->GetBluetoothInterface(), "Bluetooth", path_I) || matched;
    if (device->GetScalarSupported() && ScalarMatches(*device, path_I)) matched = true;
    if (matched) return device;
  }
  return nullptr;
}

CDeviceList::DevicePtr CDeviceList::GetBestDevice() const {
  if (mDevices.empty()) return nullptr;
  for (const DevicePtr& device : mDevices) {
    if (device->GetIsFlashLoader()) return device;
  }
  return mDevices.front();
}

std::string CDeviceList::ToString() const {
  std::string text;
  for (const DevicePtr& device : mDevices) text += device->ToString() + "\n";
  return text;
}
