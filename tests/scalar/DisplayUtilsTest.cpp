// The family's displays from what the stack knows of a display that gives
// no EDID; displays with EDID blobs are read from an emulated DRM tree in
// the Linux displays' tests.

#include <gtest/gtest.h>

#include <tuple>

#include "scalar/DisplayUtils.h"

namespace {

class CListedDisplays : public CDisplays {
 public:
  std::vector<SDisplay> List() const override { return displays; }
  std::vector<SDisplay> displays;
};

TEST(DisplayUtilsTest, ADisplayWithoutEDIDIsKnownByWhatTheStackTellsOfIt) {
  CListedDisplays displays;
  displays.displays = {{"other-maker", {}, 0x10AC, 0x0391, "OTHER1", ""},
                       {"lab-display", {}, 0x5B27, 0x0391, "NOEDID7", "Pen 24"},
                       {"header-only", {0x00, 0xFF, 0xFF, 0xFF}, 0x5B27, 0x0390, "SHORT", ""}};
  DisplayUtils::SetDisplays(&displays);
  using Row = std::tuple<int64_t, int64_t, std::string>;
  std::vector<Row> rows;
  for (const auto& entry : DisplayUtils::TavikDisplayAttributesWithPID(0x0391)) {
    rows.emplace_back(entry->IntegerForKeyWithDefault("LegacyManufacturerID", int64_t{-1}),
                      entry->IntegerForKeyWithDefault("ProductID", int64_t{-1}),
                      entry->StringForKeyWithDefault("AlphanumericSerialNumber", "?"));
  }
  EXPECT_EQ(rows, (std::vector<Row>{{23335, 0x0391, "NOEDID7"}}));
  EXPECT_EQ(DisplayUtils::TavikDisplayAttributes().size(), 2u) << "a cut EDID is no EDID";
  DisplayUtils::SetDisplays(nullptr);
  EXPECT_TRUE(DisplayUtils::TavikDisplayAttributes().empty());
}

}  // namespace
