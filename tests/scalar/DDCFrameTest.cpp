#include <gtest/gtest.h>

#include <tuple>

#include "scalar/DDCFrame.h"

namespace {

using Bytes = std::vector<uint8_t>;

TEST(DDCFrame, EveryRequestIsSentByteForByteWithItsWaitSizeAndRetries) {
  // clang-format off
  const std::vector<std::tuple<const char*, DDCFrame::SRequest, Bytes, unsigned long, int, double>>
      rows = {
          {"EDID at 0x0120", DDCFrame::ReadEDID(0x0120),
           {0x6E, 0x51, 0x84, 0xE2, 0xC3, 0x01, 0x20, 0x6E ^ 0x51 ^ 0x84 ^ 0xE2 ^ 0xC3 ^ 0x01 ^ 0x20},
           37, 1, 0.05},
          {"EDID block 15", DDCFrame::ReadEDIDGreyOwl24(15),
           {0x6E, 0x51, 0x84, 0x01, 0xF2, 0x00, 0x0F, 0x6E ^ 0x51 ^ 0x84 ^ 0x01 ^ 0xF2 ^ 0x0F}, 37, 1,
           0.05},
          {"display information", DDCFrame::ReadDisplayInformation(),
           {0x6E, 0x51, 0x82, 0x01, 0xF2, 0x6E ^ 0x51 ^ 0x82 ^ 0x01 ^ 0xF2}, 64, 1, 0.01},
          {"display information 16R", DDCFrame::ReadDisplayInfoGreyOwl16R(),
           {0x6E, 0x51, 0x84, 0x01, 0xF2, 0x00, 0x00, 0x6E ^ 0x51 ^ 0x84 ^ 0x01 ^ 0xF2}, 64, 1, 0.05},
          {"capabilities Linnet", DDCFrame::CapabilitiesStringLinnet(0x0203),
           {0x6E, 0x51, 0x84, 0xE2, 0xF3, 0x02, 0x03, 0x6E ^ 0x51 ^ 0x84 ^ 0xE2 ^ 0xF3 ^ 0x02 ^ 0x03},
           37, 1, 0.05},
          {"capabilities GreyOwl", DDCFrame::CapabilitiesStringGreyowl(0x0010),
           {0x6E, 0x51, 0x83, 0xF3, 0x00, 0x10, 0x6E ^ 0x51 ^ 0x83 ^ 0xF3 ^ 0x10}, 37, 1, 0.05},
          {"firmware version", DDCFrame::FWVersion(),
           {0x6E, 0x51, 0x82, 0x01, 0xC9, 0x6E ^ 0x51 ^ 0x82 ^ 0x01 ^ 0xC9}, 38, 1, 0.07},
          {"reset", DDCFrame::ScalarReset(), {0xEE, 0x05, 0x11, 0x00, 0x00, 0xEA}, 38, 0, 0.07},
          {"save settings", DDCFrame::SaveSettingsToScalar(),
           {0x6E, 0x51, 0x81, 0x0C, 0x6E ^ 0x51 ^ 0x81 ^ 0x0C}, 38, 0, 0.22},
      };
  // clang-format on
  for (const auto& [name, request, bytes, sizeHint, depth, delay] : rows) {
    SCOPED_TRACE(name);
    EXPECT_EQ(request.bytes, bytes);
    EXPECT_EQ(request.sizeHint, sizeHint);
    EXPECT_EQ(request.depth, depth);
    EXPECT_DOUBLE_EQ(request.delay, delay);
  }
}

TEST(DDCFrame, AReplyIsGoodWhenItsSumSeededWith0x50IsZero) {
  // clang-format off
  const std::vector<std::tuple<Bytes, bool>> rows = {
      {DDCFrame::NullReply(), true},
      {{0x6E, 0x82, 0x10, 0x20, 0x50 ^ 0x6E ^ 0x82 ^ 0x10 ^ 0x20}, true},
      {{0x6E, 0x82, 0x10, 0x20, 0x6E ^ 0x82 ^ 0x10 ^ 0x20}, false},  // summed without the seed
      {{0x6E, 0x82, 0x10, 0x21, 0x50 ^ 0x6E ^ 0x82 ^ 0x10 ^ 0x20}, false},
  };
  // clang-format on
  for (const auto& [reply, good] : rows) EXPECT_EQ(DDCFrame::IsChecksumGood(reply), good);
}

}  // namespace
