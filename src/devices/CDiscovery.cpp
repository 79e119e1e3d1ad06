#include "devices/CDiscovery.h"

bool CDiscovery::GenerateDeviceList() {
  // A configuration that gave products is kept for the whole run; a failed
  // or empty one is tried again at every scan.
  if (!mSupportedDeviceInfo.IsValid()) mSupportedDeviceInfo.ParseConfig();
  mDeviceList.ClearDeviceList();
  return true;
}
