#include "devices/CDeviceList.h"

#include <strings.h>

#include <cstdio>
#include <sstream>

#include "flash/CFLDeviceInterface.h"

namespace {

bool IEqualsText(const std::string& a_I, const std::string& b_I) {
  return a_I.size() == b_I.size() && strcasecmp(a_I.c_str(), b_I.c_str()) == 0;
}

std::vector<std::string> SplitAtColon(const std::string& text_I) {
  std::vector<std::string> tokens;
  std::stringstream in(text_I);
  std::string token;
  while (std::getline(in, token, ':')) {
    if (!token.empty()) tokens.push_back(token);
  }
  return tokens;
}

bool PathMatches(const CDevice::InterfacePtr& interface_I, const char* board_I,
                 const std::string& wanted_I) {
  if (!interface_I) return false;
  const std::string path = interface_I->GetPath();
  std::printf("%s GetDevice %s to %s\n", board_I, wanted_I.c_str(), path.c_str());
  return IEqualsText(wanted_I, path);
}

bool IsInterchangeableScalarProduct(unsigned long productId_I) {
  return productId_I == 4192 || productId_I == 4195;
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
        (device->GetScalarVendorId() == vendorId_I && device->GetScalarProductId() == productId_I)) {
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
    if (device->GetScalarSupported()) {
      const std::vector<std::string> tokens = SplitAtColon(path_I);
      if (tokens.size() >= 2) {
        // Conversion errors propagate to the caller on purpose.
        const unsigned long vendor = std::stoul(tokens[0]);
        const unsigned long product = std::stoul(tokens[1]);
        if (device->GetScalarVendorId() == vendor &&
            (device->GetScalarProductId() == product ||
             (IsInterchangeableScalarProduct(product) &&
              IsInterchangeableScalarProduct(device->GetScalarProductId())))) {
          matched = true;
        }
      }
    }
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
