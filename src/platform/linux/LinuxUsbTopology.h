#pragma once
// The USB location id of a device from its place in the USB tree: the bus
// number in bits 31-24, then one 4-bit nibble per port of the device path
// from bit 23 down ("2.3" on bus 1 gives 0x01230000). The same for every
// interface of one device, and stable while it stays plugged in.

#include <cstdint>
#include <string>

// 0 when the bus number or the path does not fit: a bus above 255, more
// than six levels of ports, a port above 15, or a malformed path.
uint32_t LocationIdFromTopology(unsigned int busNumber_I, const std::string& devpath_I);
