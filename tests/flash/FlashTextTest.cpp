// The number forms of the flash log: addresses and sums must read the same
// in every log a user sends us.

#include "flash/FlashText.h"

#include <gtest/gtest.h>

namespace {

TEST(FlashText, HexPadsToTheWidthAndNeverCuts) {
  struct SCase {
    uint32_t value;
    int width;
    bool upper;
    const char* text;
  };
  const SCase cases[] = {
      {0, 0, false, "0"},          {0xAB, 4, false, "00ab"},
      {0x12345, 2, false, "12345"}, {0xFFFFFFFF, 0, true, "FFFFFFFF"},
      {0xC0DE, 10, true, "000000C0DE"},
  };
  for (const SCase& c : cases) {
    EXPECT_EQ(FlashText::Hex(c.value, c.width, c.upper), c.text) << c.text;
  }
  EXPECT_EQ(FlashText::Hex8(0x1F), "0000001F");
}

}  // namespace
