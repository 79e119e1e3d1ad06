#pragma once
// The CRC-8 of a Bluetooth module's flash page: polynomial x^8+x^5+x^4+1,
// register from 0, bytes entering most significant bit first, no final
// exclusive-or, delivered with its bit order reversed. The two chips'
// classes reach that one function in different ways.

#include <cstdint>

class CBluetooth_CRC {
 public:
  virtual ~CBluetooth_CRC() = default;

  virtual uint8_t Crc() { return mCrc; }
  virtual bool IsBitOn(uint8_t value_I, int bit_I) { return ((value_I >> bit_I) & 1) != 0; }
  virtual void SetBitOn(uint8_t& value_IO, int bit_I) {
    value_IO = static_cast<uint8_t>(value_IO | (1u << bit_I));
  }
  virtual void SetBitOff(uint8_t& value_IO, int bit_I) {
    value_IO = static_cast<uint8_t>(value_IO & ~(1u << bit_I));
  }

 protected:
  uint8_t mCrc = 0;
};
