#include "settings/CompressionUtils.h"

#include <zlib.h>

#include <algorithm>

#include "common/TavLog.h"

namespace CompressionUtils {

namespace {

// Deflate cannot expand by more than about 1032 to 1; a size claimed beyond
// that comes from a damaged or hostile document, and honouring it would only
// allocate memory that no data can fill.
constexpr size_t kMaxExpansionRatio = 1032;
constexpr size_t kExpansionSlack = 64;

size_t MaxExpandedSize(size_t compressedSize_I) {
  return compressedSize_I * kMaxExpansionRatio + kExpansionSlack;
}

}  // namespace

size_t AdjustedBufferSize(size_t size_I) {
  return static_cast<size_t>(static_cast<double>(size_I) * 1.01 + 12.0);
}

std::vector<unsigned char> Compress(const std::vector<unsigned char>& bytes_I) {
  if (bytes_I.empty()) return {};
  std::vector<unsigned char> out(AdjustedBufferSize(bytes_I.size()));
  for (;;) {
    uLongf outSize = out.size();
    const int result = compress(out.data(), &outSize, bytes_I.data(), bytes_I.size());
    if (result == Z_OK) {
      out.resize(outSize);
      return out;
    }
    if (result != Z_BUF_ERROR) return {};
    out.resize(AdjustedBufferSize(out.size()));
  }
}

std::vector<unsigned char> Expand(const std::vector<unsigned char>& bytes_I,
                                  size_t expectedSize_I) {
  if (expectedSize_I == 0 || bytes_I.empty()) return {};
  const size_t limit = MaxExpandedSize(bytes_I.size());
  if (expectedSize_I > limit) {
    TavLog::Warning("CompressionUtils::Expand: %zu bytes cannot expand to %zu\n", bytes_I.size(),
                    expectedSize_I);
    return {};
  }
  std::vector<unsigned char> out(expectedSize_I);
  for (;;) {
    uLongf outSize = out.size();
    const int result = uncompress(out.data(), &outSize, bytes_I.data(), bytes_I.size());
    if (result == Z_OK) {
      out.resize(outSize);
      return out;
    }
    if (result != Z_BUF_ERROR || out.size() >= limit) return {};
    out.resize(std::min(AdjustedBufferSize(out.size()), limit));
  }
}

unsigned int CRC32(unsigned int seed_I, const std::vector<unsigned char>& bytes_I) {
  return static_cast<unsigned int>(crc32_z(seed_I, bytes_I.data(), bytes_I.size()));
}

}  // namespace CompressionUtils
