#include "lab/CLabPenController.h"

namespace {

SLabIdentity Identity(const SLabPenDescription& description_I, bool loader_I) {
  SLabIdentity identity;
  identity.vendorId = description_I.vendorId;
  identity.productId = loader_I ? description_I.loaderProductId : description_I.productId;
  identity.link = ELabLink::eHid;
  identity.usages = loader_I ? description_I.loaderUsages : description_I.usages;
  identity.release = loader_I ? description_I.loaderRelease : description_I.release;
  return identity;
}

}  // namespace

CLabPenController::CLabPenController(const SLabPenDescription& description_I)
    : CLabLoaderBoard(
          description_I.name, Identity(description_I, false), Identity(description_I, true),
          CLabLoader(description_I.protocol, description_I.cpus, description_I.deviceInfo)) {
  FactoryReset(0x5EED);
}

bool CLabPenController::OnNormalSetFeature(const std::vector<uint8_t>& report_I) {
  const std::vector<uint8_t>& r = report_I;
  if (r.size() == 3 && r[0] == 0xCC && !SpeaksLoaderInNormalMode() &&
      ((r[1] == 0x05 && r[2] == 0x6A) || (r[1] == 0x6A && r[2] == 0x05))) {
    RequestLoader();
    return true;
  }
  if (r.size() == 2 && r[0] == 0x02 && r[1] == 0x00) return true;
  if (r == std::vector<uint8_t>{0x08, 0x01, 0x00, 0xAA, 0xAA}) {
    CountEEPROMInit();
    return true;
  }
  return CLabLoaderBoard::OnNormalSetFeature(report_I);
}
