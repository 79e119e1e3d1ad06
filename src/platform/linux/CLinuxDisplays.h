#pragma once
// The Linux form of the displays seam: the DRM connectors under
// /sys/class/drm whose "status" reads "connected", named after their
// folders ("card0-DP-1") and sorted by name, each with the bytes of its
// "edid" file. A connector whose display gives no EDID has an empty file,
// and the entry an empty EDID; the display stack knows nothing more of it.

#include <string>

#include "seams/CDisplays.h"

class CLinuxDisplays : public CDisplays {
 public:
  explicit CLinuxDisplays(std::string classFolder_I = "/sys/class/drm")
      : mClassFolder(std::move(classFolder_I)) {}

  std::vector<SDisplay> List() const override;

 private:
  std::string mClassFolder;
};
