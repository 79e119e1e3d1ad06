// The family's displays from what the stack knows of a display that gives
// no EDID; displays with EDID blobs are read from an emulated DRM tree in
// the Linux displays' tests.

#include <gtest/gtest.h>

#include <tuple>

#include "scalar/DisplayUtils.h"
#include "scalar/HelperUtils.h"

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

// The block made for a display whose system gives no EDID must read back
// through the same searches as a real one.
TEST(DisplayUtilsTest, ADisplayWithoutEDIDGetsABlockTheSearchesRead) {
  // name, serial, name read back, serial read back
  const std::vector<std::tuple<std::string, std::string, std::string, std::string>> rows = {
      {"Pen 24", "NOEDID7", "Pen 24", "NOEDID7"},
      {"", "", "-", "0"},
      {"Fifteen chars!!", "S1", "Fifteen chars!!", ""},  // the name runs over the serial's tag
  };
  for (const auto& [name, serial, nameBack, serialBack] : rows) {
    SCOPED_TRACE(name);
    CListedDisplays displays;
    displays.displays = {{"with-edid", {0x00, 0xFF, 0x01}, 0x5B27, 0x0391, "A", ""},
                         {"without", {}, 0x5B27, 0x0391, serial, name}};
    DisplayUtils::SetDisplays(&displays);
    const std::vector<uint8_t> block = DisplayUtils::CreateEDIDOfDisplayID(1);
    ASSERT_EQ(block.size(), 255u);
    EXPECT_EQ(std::vector<uint8_t>(block.begin(), block.begin() + 8),
              (std::vector<uint8_t>{0x00, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x00}));
    EXPECT_EQ(PosOfPatternInBuffer(block, HelperUtils::kMonitorNamePattern), 91);
    EXPECT_EQ(ExtractMonitorName(block), nameBack);
    EXPECT_EQ(ExtractSerialNumber(block), serialBack);
    EXPECT_EQ(DisplayUtils::CreateEDIDOfDisplayID(0), displays.displays[0].edid);
    EXPECT_TRUE(DisplayUtils::CreateEDIDOfDisplayID(4).empty());
    DisplayUtils::SetDisplays(nullptr);
  }
}

}  // namespace
