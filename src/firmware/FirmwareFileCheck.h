#pragma once
// Why a firmware file cannot be loaded, in plain words, found before it is
// read: a path that is missing, unreadable or no regular file (a FIFO would
// block the reader), an extension no firmware file has, or a binary image
// larger than any board of the family takes (it would be read whole into
// memory). The readers' own log texts stay as they are; this is what the
// user is told beside them.

#include <cstdint>
#include <string>

#include "common/TavTypes.h"

namespace FirmwareFileCheck {

// The largest binary image: scalar blocks address 24 bits.
constexpr uint64_t kMaxBinaryBytes = 16u * 1024 * 1024;

// Empty when the file may be loaded; what stands in the way otherwise.
std::string Problem(const std::string& path_I, EINTERFACE_TYPE interfaceType_I);

// True where reading would do harm or only raise an assertion: no regular
// file, an unknown extension, an oversized binary. A missing or unreadable
// file is safe to try: the reader fails at once and logs why.
bool KeepsReaderAway(const std::string& path_I, EINTERFACE_TYPE interfaceType_I);

// ".pen, .touch, .tav, .hex, .airoflash, .airoflash2, .bin"
std::string AcceptedExtensions();

}  // namespace FirmwareFileCheck
