#pragma once
// Command bytes of the bridge's MPSSE engine and the pins of the I2C lines,
// as the link sends them.

#include <cstdint>

inline constexpr uint8_t LOOPBACK_ENABLE = 0x84;  // TDI to TDO inside the engine
inline constexpr uint8_t LOOPBACK_DISABLE = 0x85;
inline constexpr uint8_t DISABLE_CLK_DIVIDE_BY_5 = 0x8A;  // 60 MHz master clock
inline constexpr uint8_t DISABLE_ADAPTIVE_CLOCKING = 0x97;
inline constexpr uint8_t DISABLE_3_PHASE_DATA_CLOCKING = 0x8D;
// Open-drain outputs; then a low-byte mask and a high-byte mask.
inline constexpr uint8_t ONLY_DRIVE_LOW_TRISTATE_HIGH = 0x9E;
// Then value and direction of ADBUS.
inline constexpr uint8_t SET_DATA_BITS_LOW_BYTE = 0x80;
// Then value and direction of ACBUS.
inline constexpr uint8_t SET_DATA_BITS_HIGH_BYTE = 0x82;
// Then the divisor, low byte first.
inline constexpr uint8_t SET_CLK_DIVISOR = 0x86;
// Then length-1, low then high, then the data.
inline constexpr uint8_t MSB_FALLING_EDGE_CLOCK_BYTE_OUT = 0x11;
// Then the number of bits less one.
inline constexpr uint8_t MSB_RISING_EDGE_CLOCK_BIT_IN = 0x22;
// Then length-1, low then high.
inline constexpr uint8_t MSB_FALLING_EDGE_CLOCK_BYTE_IN = 0x24;
// Then the number of bits less one, then the data.
inline constexpr uint8_t MSB_FALLING_EDGE_CLOCK_BIT_OUT = 0x13;
// Flushes the engine's read buffer to the host.
inline constexpr uint8_t SEND_ANSWER_BACK_IMMEDIATE = 0x87;
// No opcode: the engine answers 0xFA and the byte, which proves it listens.
inline constexpr uint8_t BAD_COMMAND = 0xAA;
inline constexpr uint8_t BAD_COMMAND_ANSWER = 0xFA;

inline constexpr uint8_t SCL = 0x01;    // ADBUS0
inline constexpr uint8_t SDA_O = 0x02;  // ADBUS1
inline constexpr uint8_t BOTH_LINES = SCL | SDA_O;

// Clock divisors of the 60 MHz master clock.
enum FT_I2C_SPEED : uint16_t {
  FT_I2C_SPEED_100KHZ = 299,
};
