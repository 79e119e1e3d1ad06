#include "app/CRunSeams.h"

#include "lab/CLabBus.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabDisplays.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabOptions.h"
#include "lab/CLabProducts.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDeviceRegistry.h"
#include "platform/linux/CLinuxDisplays.h"
#include "platform/linux/CLinuxFTDIExAPI32.h"
#include "platform/linux/CLinuxHidNode.h"
#include "platform/linux/CLinuxUsbControl.h"
#include "scalar/CI2CConnectorFTDI.h"
#include "scalar/DisplayUtils.h"

std::unique_ptr<CRunSeams> CRunSeams::MakeLinux() {
  std::unique_ptr<CRunSeams> seams(new CRunSeams());
  auto registry = std::make_shared<CLinuxDeviceRegistry>();
  seams->mRegistry = registry;
  seams->mMakeHidNode = [registry] { return std::make_unique<CLinuxHidNode>(registry); };
  seams->mMakeUsbControl = [] { return std::make_unique<CLinuxUsbControl>(); };
  seams->mFTDI = std::make_shared<CLinuxFTDIExAPI32>();
  seams->mDisplays = std::make_shared<CLinuxDisplays>();
  return seams;
}

std::unique_ptr<CRunSeams> CRunSeams::MakeLab(const std::string& product_I, std::string& error_O) {
  return MakeLab(product_I, std::string(), error_O);
}

std::unique_ptr<CRunSeams> CRunSeams::MakeLab(const std::string& product_I,
                                              const std::string& stateFolder_I,
                                              std::string& error_O) {
  const std::string product = product_I.empty() ? CLabProducts::DefaultName() : product_I;
  if (!CLabProducts::IsKnown(product)) {
    error_O = "there is no lab product called " + product + "; --lab list names them";
    return nullptr;
  }
  std::unique_ptr<CRunSeams> seams(new CRunSeams());
  auto bus = CLabBus::Create();
  CLabProducts::Plug(*bus, product);
  // As the last lab run left the boards; nothing is written back.
  CLabOptions options;
  options.SetStateFolder(stateFolder_I);
  bus->LoadState(options.GetStateFolder());
  seams->mLabBus = bus;
  seams->mRegistry = std::make_shared<CLabDeviceRegistry>(bus);
  seams->mMakeHidNode = [bus] { return std::make_unique<CLabHidNode>(bus); };
  seams->mMakeUsbControl = [bus] { return std::make_unique<CLabUsbControl>(bus); };
  seams->mFTDI = std::make_shared<CLabFTDIExAPI32>(bus);
  auto displays = std::make_shared<CLabDisplays>(bus);
  for (const SDisplay& display : CLabProducts::OtherDisplays(product)) displays->Add(display);
  seams->mDisplays = displays;
  return seams;
}

std::unique_ptr<CLinuxDiscovery> CRunSeams::MakeDiscovery() const {
  return std::make_unique<CLinuxDiscovery>(mRegistry, mMakeHidNode, mMakeUsbControl);
}

void CRunSeams::ShareScalarSeams() const {
  CI2CConnectorFTDI::SetApi(mFTDI.get());
  DisplayUtils::SetDisplays(mDisplays.get());
}
