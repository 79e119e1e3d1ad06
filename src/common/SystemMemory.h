#pragma once
// Memory straight from the system, for the large buffers of a firmware file:
// zero-filled, and given back to the system the moment it is unmapped, so a
// file of many MiB does not leave the process that much bigger.

#include <cstddef>
#include <cstdint>

namespace SystemMemory {

// `size_I` bytes, aligned to `alignment_I` (a power of two) when it is not
// zero. Throws std::bad_alloc.
uint8_t* Map(size_t size_I, size_t alignment_I = 0);
void Unmap(uint8_t* base_I, size_t size_I);
// Only a wish: without huge pages the range is taken 4 KiB at a time.
void PreferHugePages(uint8_t* base_I, size_t size_I);

}  // namespace SystemMemory
