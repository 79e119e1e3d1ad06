// The two Bluetooth page checksums against the published check value; the
// lab's chips check every programmed page with their own implementation.

#include <gtest/gtest.h>

#include <vector>

#include "flash/CBluetoothAB1122_CRC.h"
#include "flash/CBluetoothAB1555_CRC.h"

TEST(BluetoothCrc, BothFormsGiveTheCheckValue) {
  const std::vector<uint8_t> check{'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  CBluetoothAB1122_CRC parallel;
  for (uint8_t byte : check) parallel.DataIn(byte);
  EXPECT_EQ(parallel.Crc(), 0x45);
  EXPECT_EQ(CBluetoothAB1555_CRC().CRC8(check.data(), 9, 0x98), 0x45);
}
