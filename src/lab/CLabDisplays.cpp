#include "lab/CLabDisplays.h"

#include "lab/CLabFTDIBridge.h"

std::vector<SDisplay> CLabDisplays::List() const {
  std::vector<SDisplay> displays;
  for (const std::shared_ptr<CLabBoard>& board : mBus->GetBoards()) {
    const auto* bridge = dynamic_cast<const CLabFTDIBridge*>(board.get());
    if (bridge == nullptr) continue;
    SDisplay display;
    display.connector = bridge->GetPanel().connector;
    display.edid = bridge->GetScalar().GetEdid();
    displays.push_back(display);
  }
  displays.insert(displays.end(), mOthers.begin(), mOthers.end());
  return displays;
}
