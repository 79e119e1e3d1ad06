#pragma once
// The MPSSE engine of the lab's FTDI bridge. It takes the command bytes the
// host writes, in any split across writes (a command waits until all its
// bytes are there), drives ADBUS0 (SCL) and ADBUS1 (SDA out) onto the I2C
// bus, and queues what it reads for the host. ADBUS2 (data in) is wired to
// SDA, as on every I2C adapter of this bridge.
//
// Commands understood:
//   0x80 v d, 0x82 v d   ADBUS, ACBUS value and direction (1 = output)
//   0x81, 0x83           read ADBUS, ACBUS pins
//   0x11 lo hi data      bytes out, MSB first, data changing on the falling edge
//   0x13 n data          n+1 bits out, the same way
//   0x24 lo hi, 0x20     bytes in, MSB first, sampled while SCL is high
//   0x22 n               n+1 bits in, sampled on the rising edge, the last
//                        bit read in bit 0 of the byte returned
//   0x87                 send immediate
//   0x84, 0x85           loopback on (data in reads the data out pin), off
//   0x86 lo hi           clock divisor
//   0x8A/0x8B, 0x97/0x96, 0x8D/0x8C   divide-by-5, adaptive, 3-phase off/on
//   0x9E lo hi           drive-only-low masks: a pin whose bit is set drives
//                        low for 0 and lets go for 1, as an open-drain output
// Any other opcode is answered with 0xFA and the opcode, and the engine goes
// on with the next byte.
//
// Bytes read are handed to the host at once: the bridge's latency timer
// sends a partial buffer on its own, so 0x87 only matters for timing, and
// the lab keeps no time inside a transfer.

#include <cstdint>
#include <vector>

#include "lab/CLabI2CBus.h"

class CLabMpsse {
 public:
  explicit CLabMpsse(CLabI2CBus& bus_I) : mBus(bus_I) {}

  // As after FT_SetBitMode: every pin an input, the engine's settings back
  // to their power-on values. Bytes waiting for the host stay.
  void Reset();
  // Command bytes from the host.
  void Write(const uint8_t* data_I, size_t size_I);
  // Takes up to `size_I` bytes the host may read.
  size_t Read(uint8_t* data_O, size_t size_I);
  size_t Pending() const { return mOut.size(); }
  // FT_Purge: bytes for the host (rx), command bytes not yet run (tx).
  void Purge(bool rx_I, bool tx_I);

  uint16_t GetDivisor() const { return mDivisor; }
  bool GetLoopback() const { return mLoopback; }
  bool GetDivideBy5() const { return mDivideBy5; }

 private:
  // How many bytes the command at `command_I` needs, of which `available_I`
  // are there; 0 while unknown.
  static size_t CommandLength(const uint8_t* command_I, size_t available_I);
  // Runs the whole commands at the front; returns the bytes they took.
  size_t RunCommands(const uint8_t* data_I, size_t size_I);
  void Run(const uint8_t* command_I, size_t length_I);
  void SetLow(uint8_t value_I, uint8_t direction_I);
  void Apply();
  CLabI2CBus::EDrive PinDrive(int bit_I) const;
  void ClockOut(uint8_t byte_I, int bits_I);
  uint8_t ClockIn(int bits_I);
  bool DataIn() const;

  CLabI2CBus& mBus;
  // A command split across writes, waiting for the rest.
  std::vector<uint8_t> mIn;
  std::vector<uint8_t> mOut;
  uint8_t mLowValue = 0;
  uint8_t mLowDirection = 0;
  uint8_t mHighValue = 0;
  uint8_t mHighDirection = 0;
  uint8_t mOpenDrainLow = 0;
  uint8_t mOpenDrainHigh = 0;
  uint16_t mDivisor = 0;
  bool mLoopback = false;
  bool mDivideBy5 = true;
  bool mAdaptive = false;
  bool mThreePhase = false;
};
