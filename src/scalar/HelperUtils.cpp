#include "scalar/HelperUtils.h"

#include <algorithm>
#include <cctype>

#include "common/TavAssert.h"
#include "scalar/ScalarTrace.h"

namespace {

void TrimEnd(std::string& text_IO) {
  while (!text_IO.empty() && std::isspace(static_cast<unsigned char>(text_IO.back()))) {
    text_IO.pop_back();
  }
}

bool IsPrintable(uint8_t byte_I) { return byte_I >= 0x20 && byte_I <= 0x7E; }

std::string EDIDValue(const std::vector<uint8_t>& edid_I, const std::vector<uint8_t>& pattern_I,
                      bool assert_I) {
  auto loc = std::search(edid_I.begin(), edid_I.end(), pattern_I.begin(), pattern_I.end());
  for (uint8_t t : pattern_I) {
    if (loc == edid_I.end()) return {};
    if (*loc != t && assert_I) TAVASSERT_TEXT("*loc == t");
    ++loc;
  }
  std::string value;
  for (; loc != edid_I.end() && *loc != 0 && IsPrintable(*loc); ++loc) {
    value.push_back(static_cast<char>(*loc));
  }
  TrimEnd(value);
  return value;
}

}  // namespace

long PosOfPatternInBuffer(const std::vector<uint8_t>& buffer_I,
                          const std::vector<uint8_t>& pattern_I) {
  const auto found =
      std::search(buffer_I.begin(), buffer_I.end(), pattern_I.begin(), pattern_I.end());
  if (found == buffer_I.end()) return -1;
  return static_cast<long>(found - buffer_I.begin());
}

std::string ExtractSerialNumber(const std::vector<uint8_t>& edid_I) {
  const long pos = PosOfPatternInBuffer(edid_I, HelperUtils::kSerialNumberPattern);
  if (pos < 0) {
    SCALAR_TRACE(Debug, "ExtractSerialNumber: no serial number descriptor\n");
    return {};
  }
  auto begin = edid_I.begin() + pos + static_cast<long>(HelperUtils::kSerialNumberPattern.size());
  const auto end = std::find_if_not(begin, edid_I.end(), IsPrintable);
  std::string serial(begin, end);
  TrimEnd(serial);
  SCALAR_TRACE(Debug, "Serial Number %s\n", serial.c_str());
  return serial;
}

std::string ExtractMonitorName(const std::vector<uint8_t>& edid_I) {
  const long pos = PosOfPatternInBuffer(edid_I, HelperUtils::kMonitorNamePattern);
  if (pos < 0) {
    SCALAR_TRACE(Debug, "ExtractMonitorName: no monitor name descriptor\n");
    return {};
  }
  auto begin = edid_I.begin() + pos + static_cast<long>(HelperUtils::kMonitorNamePattern.size());
  const auto end = std::find(begin, edid_I.end(), uint8_t{0});
  std::string name(begin, end);
  TrimEnd(name);
  SCALAR_TRACE(Debug, "Monitor Name %s\n", name.c_str());
  return name;
}

std::string FindEDIDValue(const std::vector<uint8_t>& edid_I,
                          const std::vector<uint8_t>& pattern_I) {
  return EDIDValue(edid_I, pattern_I, true);
}

std::string findEDIDValue(const std::vector<uint8_t>& edid_I,
                          const std::vector<uint8_t>& pattern_I) {
  return EDIDValue(edid_I, pattern_I, false);
}
