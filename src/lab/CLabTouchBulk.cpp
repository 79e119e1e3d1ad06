#include "lab/CLabTouchBulk.h"

namespace {

SLabIdentity NormalIdentity(const SLabTouchBulkDescription& description_I) {
  SLabIdentity identity;
  identity.vendorId = description_I.vendorId;
  identity.productId = description_I.productId;
  identity.link = ELabLink::eUsbVendor;
  identity.usages = {{0, 0}};
  // Its touch input is HID: the device's return is seen by the HID watch.
  identity.hidUsages = {{0xFF0D, 0x0001}};
  identity.release = description_I.release;
  return identity;
}

SLabIdentity LoaderIdentity(const SLabTouchBulkDescription& description_I) {
  SLabIdentity identity;
  identity.vendorId = description_I.vendorId;
  identity.productId = description_I.loaderProductId;
  identity.link = ELabLink::eHid;
  identity.usages = description_I.loaderUsages;
  identity.release = description_I.loaderRelease;
  return identity;
}

// The firmware's answer to the alive probe: its status word, "ready".
constexpr uint8_t kAliveAnswer[] = {0x01, 0x00};

}  // namespace

CLabTouchBulk::CLabTouchBulk(const SLabTouchBulkDescription& description_I)
    : CLabLoaderBoard(
          description_I.name, NormalIdentity(description_I), LoaderIdentity(description_I),
          CLabLoader(ELabProtocol::eLoader, description_I.cpus, description_I.deviceInfo)) {
  FactoryReset(0x70C4);
}

bool CLabTouchBulk::OnControl(uint8_t requestType_I, uint8_t request_I, uint16_t value_I,
                              uint16_t index_I, std::vector<uint8_t>& data_IO,
                              size_t& transferred_O) {
  if (GetMode() != EMode::eNormal || IsReenumerating() || index_I != 0) return false;
  if (requestType_I == 0x41 && request_I == 0xF0 && value_I == 0xFFFF && data_IO.empty()) {
    RequestLoader();
    return true;
  }
  if (requestType_I == 0xC1 && request_I == 0x01 && value_I == 0 && data_IO.size() == 2) {
    data_IO.assign(std::begin(kAliveAnswer), std::end(kAliveAnswer));
    transferred_O = 2;
    return true;
  }
  if (requestType_I == 0x41 && request_I == 0xF5 && value_I == 0xFFFF && data_IO.empty()) {
    CountEEPROMInit();
    return true;
  }
  return false;
}
