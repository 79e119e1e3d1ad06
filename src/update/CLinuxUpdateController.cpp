#include "update/CLinuxUpdateController.h"

CLinuxUpdateController::CLinuxUpdateController(std::unique_ptr<CDiscovery> discovery_I) {
  mDiscovery = std::move(discovery_I);
}

CLinuxUpdateController::~CLinuxUpdateController() {
  mNotifier = nullptr;
  mDiscovery.reset();
}

void CLinuxUpdateController::setConfigPath(const std::string& path_I) {
  if (mDiscovery) mDiscovery->SetConfig(path_I);
}

std::string CLinuxUpdateController::getConfigPath() const {
  return mDiscovery ? mDiscovery->GetConfig() : std::string();
}

bool CLinuxUpdateController::configurationRead() const {
  return mDiscovery && mDiscovery->GetSupportedDeviceInfo().WasRead();
}
