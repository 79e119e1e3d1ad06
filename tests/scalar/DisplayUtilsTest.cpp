#include <gtest/gtest.h>

#include <tuple>

#include "scalar/DisplayUtils.h"

namespace {

using Bytes = std::vector<uint8_t>;

class CListedDisplays : public CDisplays {
 public:
  std::vector<SDisplay> List() const override { return displays; }
  std::vector<SDisplay> displays;
};

// A 128-byte EDID with the manufacturer packed big-endian at 8, the product
// code little-endian at 10, and a serial descriptor.
Bytes MakeEDID(uint16_t manufacturer_I, uint16_t product_I, const std::string& serial_I) {
  Bytes edid(128, 0x00);
  for (int i = 1; i <= 6; ++i) edid[i] = 0xFF;
  edid[8] = static_cast<uint8_t>(manufacturer_I >> 8);
  edid[9] = static_cast<uint8_t>(manufacturer_I);
  edid[10] = static_cast<uint8_t>(product_I);
  edid[11] = static_cast<uint8_t>(product_I >> 8);
  const Bytes tag{0x00, 0x00, 0xFF, 0x00};
  std::copy(tag.begin(), tag.end(), edid.begin() + 72);
  std::copy(serial_I.begin(), serial_I.end(), edid.begin() + 76);
  edid[76 + serial_I.size()] = 0x0A;
  return edid;
}

class DisplayUtilsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    mDisplays.displays = {
        {"card0-DP-1", MakeEDID(0x5B27, 0x0390, "PEN16A"), 0, 0, "", ""},
        {"card0-HDMI-A-1", MakeEDID(0x10AC, 0x0390, "OTHER1"), 0, 0, "", ""},
        {"lab-display", {}, 0x5B27, 0x0391, "NOEDID7", "Pen 24"},
        {"card1-DP-2", MakeEDID(0x5B27, 0x0391, "PEN24B"), 0, 0, "", ""},
    };
    DisplayUtils::SetDisplays(&mDisplays);
  }
  void TearDown() override { DisplayUtils::SetDisplays(nullptr); }

  CListedDisplays mDisplays;
};

std::vector<std::tuple<int64_t, int64_t, std::string>> Rows(
    const std::vector<std::shared_ptr<CSettingsMap>>& entries_I) {
  std::vector<std::tuple<int64_t, int64_t, std::string>> rows;
  for (const auto& entry : entries_I) {
    rows.emplace_back(entry->IntegerForKeyWithDefault("LegacyManufacturerID", int64_t{-1}),
                      entry->IntegerForKeyWithDefault("ProductID", int64_t{-1}),
                      entry->StringForKeyWithDefault("AlphanumericSerialNumber", "?"));
  }
  return rows;
}

TEST_F(DisplayUtilsTest, ListsTheFamilysDisplaysFromTheirEDIDOrWhatTheStackKnows) {
  using Row = std::tuple<int64_t, int64_t, std::string>;
  EXPECT_EQ(Rows(DisplayUtils::TavikDisplayAttributes()),
            (std::vector<Row>{
                {23335, 0x0390, "PEN16A"}, {23335, 0x0391, "NOEDID7"}, {23335, 0x0391, "PEN24B"}}));
  EXPECT_EQ(Rows(DisplayUtils::TavikDisplayAttributesWithPID(0x0391)),
            (std::vector<Row>{{23335, 0x0391, "NOEDID7"}, {23335, 0x0391, "PEN24B"}}));
  EXPECT_TRUE(DisplayUtils::TavikDisplayAttributesWithPID(0x0999).empty());
  DisplayUtils::SetDisplays(nullptr);
  EXPECT_TRUE(DisplayUtils::TavikDisplayAttributes().empty());
}

}  // namespace
