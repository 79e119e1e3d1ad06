#pragma once
// Searches of an EDID block for the texts of its display descriptors: the
// serial number behind 00 00 FF 00 and the monitor name behind 00 00 FC 00.

#include <cstdint>
#include <string>
#include <vector>

namespace HelperUtils {

inline const std::vector<uint8_t> kSerialNumberPattern{0x00, 0x00, 0xFF, 0x00};
inline const std::vector<uint8_t> kMonitorNamePattern{0x00, 0x00, 0xFC, 0x00};

}  // namespace HelperUtils

// The first position of `pattern_I` in `buffer_I`, or -1.
long PosOfPatternInBuffer(const std::vector<uint8_t>& buffer_I,
                          const std::vector<uint8_t>& pattern_I);

// The printable run after the serial pattern, trailing blanks gone; empty
// when the pattern is absent.
std::string ExtractSerialNumber(const std::vector<uint8_t>& edid_I);
// Everything after the name pattern up to the first zero byte, trailing
// white space gone; empty when the pattern is absent. Unlike the serial it
// is not stopped by the 0x0A that ends a descriptor text, only trimmed.
std::string ExtractMonitorName(const std::vector<uint8_t>& edid_I);

// The printable text behind `pattern_I`, trailing white space gone.
// FindEDIDValue also asserts that the bytes found are the pattern's.
std::string FindEDIDValue(const std::vector<uint8_t>& edid_I,
                          const std::vector<uint8_t>& pattern_I);
std::string findEDIDValue(const std::vector<uint8_t>& edid_I,
                          const std::vector<uint8_t>& pattern_I);
