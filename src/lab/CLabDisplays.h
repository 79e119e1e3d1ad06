#pragma once
// The lab form of the displays seam: the panel of every pen display whose
// scalar board is on the lab bus, connected whether or not its bridge is
// (a monitor stays on its video cable when its USB side drops), with the
// EDID its scalar also gives over DDC/CI; then the displays added by hand,
// such as a pen display whose display stack gives no EDID but names its
// maker, product, serial and name.

#include <memory>
#include <vector>

#include "lab/CLabBus.h"
#include "seams/CDisplays.h"

class CLabDisplays : public CDisplays {
 public:
  explicit CLabDisplays(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) {}

  void Add(const SDisplay& display_I) { mOthers.push_back(display_I); }
  std::vector<SDisplay> List() const override;

 private:
  std::shared_ptr<CLabBus> mBus;
  std::vector<SDisplay> mOthers;
};
