#include <gtest/gtest.h>

#include <random>
#include <vector>

#include "flash/CBluetoothAB1122_CRC.h"
#include "flash/CBluetoothAB1555_CRC.h"

namespace {

uint8_t ParallelCrc(const std::vector<uint8_t>& data_I) {
  CBluetoothAB1122_CRC crc;
  for (uint8_t byte : data_I) crc.DataIn(byte);
  return crc.Crc();
}

uint8_t BitwiseCrc(const std::vector<uint8_t>& data_I) {
  CBluetoothAB1555_CRC crc;
  return crc.CRC8(data_I.data(), static_cast<uint32_t>(data_I.size()), 0x98);
}

TEST(BluetoothCrc, BothFormsDeliverTheSameFunction) {
  const std::vector<uint8_t> check{'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  EXPECT_EQ(ParallelCrc(check), 0x45);
  EXPECT_EQ(BitwiseCrc(check), 0x45);
  EXPECT_EQ(ParallelCrc(std::vector<uint8_t>(256, 0x00)), 0x00);
  EXPECT_EQ(ParallelCrc(std::vector<uint8_t>(256, 0xFF)),
            BitwiseCrc(std::vector<uint8_t>(256, 0xFF)));

  std::mt19937 random(12345);
  for (int round = 0; round < 300; ++round) {
    std::vector<uint8_t> data(random() % 300);
    for (uint8_t& byte : data) byte = static_cast<uint8_t>(random());
    ASSERT_EQ(ParallelCrc(data), BitwiseCrc(data)) << "length " << data.size();
  }
}

TEST(BluetoothCrc, HelpersAndDegenerateArguments) {
  CBluetoothAB1555_CRC crc;
  EXPECT_EQ(crc.GetMaxBitIndexOfOne(0), 255);
  EXPECT_EQ(crc.GetMaxBitIndexOfOne(1), 0);
  EXPECT_EQ(crc.GetMaxBitIndexOfOne(0x131), 8);
  EXPECT_EQ(crc.ReverseBits(0x01), 0x80);
  EXPECT_EQ(crc.ReverseBits(0xA2), 0x45);
  const uint8_t data[] = {0x12, 0x34};
  EXPECT_EQ(crc.CRC8(data, 0, 0x98), 0);
  // A polynomial of 0: generator 1, top bit 0, one reversal at the end.
  EXPECT_EQ(crc.CRC8(data, 2, 0x00), 0);
  // A polynomial byte of 0xFF: generator 0x1FF, still eight bits wide.
  uint8_t plain = 0;
  for (uint8_t byte : data) {
    plain ^= byte;
    for (int bit = 0; bit < 8; ++bit) {
      plain = static_cast<uint8_t>((plain & 0x80) ? (plain << 1) ^ 0xFF : plain << 1);
    }
  }
  EXPECT_EQ(crc.CRC8(data, 2, 0xFF), crc.ReverseBits(plain));

  CBluetoothAB1122_CRC bits;
  uint8_t value = 0;
  bits.SetBitOn(value, 3);
  EXPECT_EQ(value, 0x08);
  EXPECT_TRUE(bits.IsBitOn(value, 3));
  bits.SetBitOff(value, 3);
  EXPECT_EQ(value, 0);
}

}  // namespace
