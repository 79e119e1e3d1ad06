#pragma once
// The top-level usage pairs of a HID report descriptor: one pair (usage
// page, usage) for each application collection at the outermost level, in
// order. A device registry lists one interface per pair.

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

// Parses the short and long items of `descriptor_I`. A truncated item ends
// the parse; what was found before it stands.
std::vector<std::pair<uint16_t, uint16_t>> HidTopLevelUsages(const uint8_t* descriptor_I,
                                                            size_t size_I);
