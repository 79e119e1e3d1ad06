#pragma once
// The AB1122's page CRC, one byte at a time in parallel form: each new
// register bit is an exclusive-or of old register bits and data bits. The
// register holds the delivered, bit-reversed form throughout.

#include "flash/CBluetooth_CRC.h"

class CBluetoothAB1122_CRC : public CBluetooth_CRC {
 public:
  virtual void DataIn(uint8_t data_I);
};
