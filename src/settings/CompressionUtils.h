#pragma once
// zlib behind the compressed settings form.

#include <cstddef>
#include <vector>

namespace CompressionUtils {

// The output buffer tried for n bytes: a little more than n, as zlib needs
// for data that does not compress.
size_t AdjustedBufferSize(size_t size_I);

// zlib data of the bytes; empty for empty input or a zlib error.
std::vector<unsigned char> Compress(const std::vector<unsigned char>& bytes_I);

// The bytes that zlib data expands to, given the size they had. Empty for
// empty input, a size of 0, a size that zlib data of this length cannot
// reach, or data that does not expand.
std::vector<unsigned char> Expand(const std::vector<unsigned char>& bytes_I, size_t expectedSize_I);

unsigned int CRC32(unsigned int seed_I, const std::vector<unsigned char>& bytes_I);

}  // namespace CompressionUtils
