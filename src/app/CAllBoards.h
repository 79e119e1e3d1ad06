#pragma once
// --all: the board options that update every board of every product found
// for which the configuration names a firmware file, product by product in
// the order pen, touch, Bluetooth, scalar; the same list the user would
// type. A board already running the release its file names is left out.

#include <optional>
#include <string>
#include <vector>

#include "app/CListCommand.h"
#include "common/TavTypes.h"
#include "update/CBoardResults.h"

class CAllBoards {
 public:
  struct SPlan {
    std::vector<std::string> arguments;  // -p PATH -t PATH ... -s DISPLAY
    std::vector<SBoardResult> skipped;   // with the reason in `reason`
    size_t productCount = 0;
  };

  // From what discovery shows; `configPath_I` gives the folder "Firmware".
  static SPlan Plan(const std::vector<CListCommand::SProductLine>& products_I,
                    const std::string& configPath_I);

  // The release a firmware file names, as the board shows it ("1.30"), or
  // nothing for a file that names none or does not load.
  static std::optional<std::string> FileRelease(const std::string& path_I,
                                                EINTERFACE_TYPE interface_I);
  // Two version texts name the same version; an empty one matches none.
  static bool SameVersion(const std::string& a_I, const std::string& b_I);
};
