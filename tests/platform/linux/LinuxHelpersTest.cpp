#include <gtest/gtest.h>

#include "platform/linux/HidReportDescriptor.h"
#include "platform/linux/LinuxUsbTopology.h"

namespace {

using Usages = std::vector<std::pair<uint16_t, uint16_t>>;

TEST(LinuxUsbTopology, LocationIdsFromBusAndPorts) {
  EXPECT_EQ(LocationIdFromTopology(2, "3"), 0x02300000u);
  EXPECT_EQ(LocationIdFromTopology(1, "2.3"), 0x01230000u);
  EXPECT_EQ(LocationIdFromTopology(3, "1.15.2.4.1.9"), 0x031F2419u);
  EXPECT_EQ(LocationIdFromTopology(255, "1"), 0xFF100000u);
  for (const char* bad : {"", "16", "0", "1..2", ".1", "1.", "1.2.3.4.5.6.7", "a"}) {
    EXPECT_EQ(LocationIdFromTopology(1, bad), 0u) << bad;
  }
  EXPECT_EQ(LocationIdFromTopology(0, "1"), 0u);
  EXPECT_EQ(LocationIdFromTopology(256, "1"), 0u);
}

TEST(HidReportDescriptor, TopLevelUsagesOnly) {
  const std::vector<uint8_t> descriptor{
      0x05, 0x0D,                          // usage page digitizer
      0x09, 0x02,                          // usage pen
      0xA1, 0x01,                          // collection application
      0x09, 0x20,                          //   usage stylus
      0xA1, 0x00,                          //   collection physical (nested: not listed)
      0xC0,                                //   end
      0xC0,                                // end
      0xA4,                                // push
      0x06, 0x00, 0xFF,                    // usage page vendor (two bytes)
      0x09, 0x01,                          // usage 1
      0xA1, 0x01,                          // collection
      0xFE, 0x02, 0x10, 0xAA, 0xBB,        // a long item, skipped
      0xC0,                                // end
      0xB4,                                // pop: digitizer again
      0x0B, 0x05, 0x00, 0x01, 0x00,        // extended usage: page 1, usage 5
      0xA1, 0x01, 0xC0, 0x09, 0x04,        // usage touch screen, page digitizer
      0xA1, 0x01, 0xC0, 0xA1, 0x01, 0xC0,  // a collection with no usage is not listed
      0x09,                                // truncated item ends the parse
  };
  EXPECT_EQ(HidTopLevelUsages(descriptor.data(), descriptor.size()),
            (Usages{{0x000D, 0x0002}, {0xFF00, 0x0001}, {0x0001, 0x0005}, {0x000D, 0x0004}}));
  EXPECT_TRUE(HidTopLevelUsages(descriptor.data(), 0).empty());
}

}  // namespace
