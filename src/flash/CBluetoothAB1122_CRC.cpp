#include "flash/CBluetoothAB1122_CRC.h"

void CBluetoothAB1122_CRC::DataIn(uint8_t data_I) {
  // x[i] = c[i] xor d[7 - i]: the register is kept reversed, the data
  // enters most significant bit first.
  bool x[8];
  for (int i = 0; i < 8; ++i) x[i] = IsBitOn(mCrc, i) != IsBitOn(data_I, 7 - i);

  const bool next[8] = {
      static_cast<bool>(x[2] ^ x[4] ^ x[5]),
      static_cast<bool>(x[0] ^ x[3] ^ x[5] ^ x[6]),
      static_cast<bool>(x[0] ^ x[1] ^ x[4] ^ x[6] ^ x[7]),
      static_cast<bool>(x[0] ^ x[1] ^ x[4] ^ x[7]),
      static_cast<bool>(x[0] ^ x[1] ^ x[4]),
      static_cast<bool>(x[1] ^ x[2] ^ x[5]),
      static_cast<bool>(x[0] ^ x[2] ^ x[3] ^ x[6]),
      static_cast<bool>(x[1] ^ x[3] ^ x[4] ^ x[7]),
  };
  for (int bit = 7; bit >= 0; --bit) {
    if (next[bit]) {
      SetBitOn(mCrc, bit);
    } else {
      SetBitOff(mCrc, bit);
    }
  }
}
