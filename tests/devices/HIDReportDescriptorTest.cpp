#include <gtest/gtest.h>

#include <vector>

#include "devices/HIDReportDescriptor.h"

using HIDReportDescriptor::SUsagePair;
using HIDReportDescriptor::TopLevelUsagePairs;

namespace {

using Bytes = std::vector<uint8_t>;

std::vector<SUsagePair> Parse(const Bytes& bytes_I) { return TopLevelUsagePairs(bytes_I); }

// A pen collection (digitizer page, usage 2) holding a nested physical
// collection, then a vendor collection (page 0xFF00, usage 1) with a feature
// report, as a tablet's interface describes itself.
const Bytes kTabletDescriptor = {
    0x05, 0x0D,                                                  // Usage Page (digitizer)
    0x09, 0x02,                                                  // Usage (pen)
    0xA1, 0x01,                                                  // Collection (application)
    0x85, 0x02,                                                  //   Report ID
    0x09, 0x20,                                                  //   Usage (stylus)
    0xA1, 0x00,                                                  //   Collection (physical), nested
    0x09, 0x42,                                                  //     Usage (tip switch)
    0x15, 0x00, 0x25, 0x01, 0x75, 0x01, 0x95, 0x01, 0x81, 0x02,  //     Input
    0xC0,                                                        //   End Collection
    0xC0,                                                        // End Collection
    0x06, 0x00, 0xFF,                                            // Usage Page (0xFF00)
    0x09, 0x01,                                                  // Usage (1)
    0xA1, 0x01,                                                  // Collection (application)
    0x85, 0x03, 0x75, 0x08, 0x96, 0x00, 0x01, 0x09, 0x01, 0xB1, 0x02,  // Feature
    0xC0,
};

}  // namespace

TEST(HIDReportDescriptorTest, ListsEveryTopLevelCollectionInOrderAndNoNestedOne) {
  EXPECT_EQ(Parse(kTabletDescriptor), (std::vector<SUsagePair>{{0x02, 0x0D}, {0x01, 0xFF00}}));

  // Three top-level collections, one of them nested two deep inside.
  Bytes three = {0x05, 0x01, 0x09, 0x02, 0xA1, 0x01, 0x09, 0x01, 0xA1, 0x00, 0x09,
                 0x30, 0xA1, 0x02, 0xC0, 0xC0, 0xC0, 0x05, 0x0D, 0x09, 0x04, 0xA1,
                 0x01, 0xC0, 0x06, 0x01, 0xFF, 0x09, 0x80, 0xA1, 0x01, 0xC0};
  EXPECT_EQ(Parse(three), (std::vector<SUsagePair>{{0x02, 0x01}, {0x04, 0x0D}, {0x80, 0xFF01}}));

  // A stray End Collection at the top does not push later collections
  // down a level, and an unclosed collection still counts.
  EXPECT_EQ(Parse({0xC0, 0xC0, 0x05, 0x0D, 0x09, 0x02, 0xA1, 0x01}),
            (std::vector<SUsagePair>{{0x02, 0x0D}}));
}

TEST(HIDReportDescriptorTest, UsageTakesItsPageAsTheCollectionSeesIt) {
  // The page set after the usage, still before the collection, applies.
  EXPECT_EQ(Parse({0x09, 0x02, 0x05, 0x0D, 0xA1, 0x01, 0xC0}),
            (std::vector<SUsagePair>{{0x02, 0x0D}}));
  // A four-byte usage carries its own page and ignores the global one.
  EXPECT_EQ(Parse({0x06, 0x00, 0xFF, 0x0B, 0x02, 0x00, 0x0D, 0x00, 0xA1, 0x01, 0xC0}),
            (std::vector<SUsagePair>{{0x02, 0x0D}}));
  // The first of several usages names the collection; Usage Minimum serves
  // when there is no Usage.
  EXPECT_EQ(Parse({0x05, 0x0D, 0x09, 0x04, 0x09, 0x02, 0xA1, 0x01, 0xC0, 0x19, 0x05, 0x29, 0x07,
                   0xA1, 0x01, 0xC0}),
            (std::vector<SUsagePair>{{0x04, 0x0D}, {0x05, 0x0D}}));
  // A usage used up by an Input item does not name the next collection.
  EXPECT_EQ(Parse({0x05, 0x0D, 0x09, 0x02, 0x81, 0x02, 0xA1, 0x01, 0xC0}),
            (std::vector<SUsagePair>{{0x00, 0x0D}}));
  // Push and Pop save and restore the page; a Pop with nothing pushed
  // leaves it alone.
  EXPECT_EQ(Parse({0x05, 0x0D, 0xA4, 0x06, 0x00, 0xFF, 0xB4, 0xB4, 0x09, 0x02, 0xA1, 0x01, 0xC0}),
            (std::vector<SUsagePair>{{0x02, 0x0D}}));
}

TEST(HIDReportDescriptorTest, StepsOverLongAndReservedItems) {
  // A long item whose data looks like a collection is skipped whole.
  Bytes withLong = {0x05, 0x0D, 0xFE, 0x04, 0x10, 0x09, 0x07,
                    0xA1, 0x01, 0x09, 0x02, 0xA1, 0x01, 0xC0};
  EXPECT_EQ(Parse(withLong), (std::vector<SUsagePair>{{0x02, 0x0D}}));
  // A long item with no data, then a reserved-type item whose two data
  // bytes would read as a collection.
  EXPECT_EQ(Parse({0xFE, 0x00, 0x20, 0x0E, 0xA1, 0x01, 0x05, 0x0D, 0x09, 0x02, 0xA1, 0x01}),
            (std::vector<SUsagePair>{{0x02, 0x0D}}));
}

TEST(HIDReportDescriptorTest, MalformedInputKeepsWhatCameBeforeAndReadsNoFurther) {
  EXPECT_TRUE(Parse({}).empty());
  // An item whose data runs past the end stops the reading.
  EXPECT_EQ(Parse({0x05, 0x0D, 0x09, 0x02, 0xA1, 0x01, 0xC0, 0x06, 0x00}),
            (std::vector<SUsagePair>{{0x02, 0x0D}}));
  // A collection whose usage is cut off is not reported with a guess.
  EXPECT_TRUE(Parse({0x05, 0x0D, 0x0B, 0x02, 0x00}).empty());
  // Long items cut in the header and in the data.
  EXPECT_EQ(Parse({0x09, 0x01, 0xA1, 0x01, 0xC0, 0xFE, 0x05}).size(), 1u);
  EXPECT_EQ(Parse({0x09, 0x01, 0xA1, 0x01, 0xC0, 0xFE, 0x05, 0x00, 0xA1, 0x01}).size(), 1u);

  // Every prefix of a real descriptor parses, and never yields more pairs
  // than the whole. The span is cut from a larger buffer whose tail would be
  // read as a collection if the parser overran it.
  Bytes padded = kTabletDescriptor;
  padded.insert(padded.end(), {0x09, 0x05, 0xA1, 0x01});
  for (size_t length = 0; length <= kTabletDescriptor.size(); ++length) {
    const auto pairs = TopLevelUsagePairs(std::span<const uint8_t>(padded.data(), length));
    EXPECT_LE(pairs.size(), 2u) << length;
  }
}
