// Feeds arbitrary text to the common readers and checks the properties that
// must hold for any input: Base64 decoding of an encoding gives the bytes
// back, a decoded text accounts for all its characters, every decoded UTF-8 point
// encodes back to the same bytes, and version parsing never reads past its
// text (ASan watches that).
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "common/FileVersion.h"
#include "common/LinuxPaths.h"
#include "common/StringUtilities.h"

namespace {

void Require(bool condition_I) {
  if (!condition_I) std::abort();
}

void CheckBase64(const std::string& text_I) {
  using namespace StringUtilities;
  const std::vector<uint8_t> bytes(text_I.begin(), text_I.end());
  Require(GetBytesFromBase64(GetBase64(bytes)) == bytes);
  const std::vector<uint8_t> decoded = GetBytesFromBase64(text_I);
  if (!decoded.empty()) {
    // Every character counted: only a lone last one gives no byte.
    const size_t used = text_I.size() - (text_I.size() % 4 == 1 ? 1 : 0);
    Require(GetBase64(decoded).size() == used);
  }
}

void CheckUTF8(const std::string& text_I) {
  using namespace StringUtilities;
  size_t position = 0;
  uint32_t point = 0;
  while (position < text_I.size()) {
    const size_t start = position;
    if (!DecodeUTF8ToUnicodePoint(text_I, position, point)) {
      Require(!IsValidUTF8(text_I));
      return;
    }
    Require(EncodeUnicodePointToUTF8(point) == text_I.substr(start, position - start));
  }
  Require(IsValidUTF8(text_I));
}

void CheckVersion(const std::string& text_I) {
  for (bool web : {false, true}) {
    FileVersion version(text_I, web);
    for (int style = 0; style <= 6; ++style) {
      (void)version.AsString(static_cast<FileVersion::EVersionStyle>(style));
    }
    Require(!version.Greater(version) && version.Equals(version));
    version.OldStyleToSimpleShort();
  }
}

void CheckPath(const std::string& text_I) {
  using namespace LinuxPaths;
  (void)AppendPathComponent(text_I, text_I);
  (void)DeletePathExtension(text_I);
  (void)PathExtension(text_I);
  Require(DeleteLastPathComponent(text_I).size() <= text_I.size());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::string text(reinterpret_cast<const char*>(data_I), size_I);
  CheckBase64(text);
  CheckUTF8(text);
  CheckVersion(text);
  CheckPath(text);
  (void)StringUtilities::Tokenize(text, ":. ", size_I % 2 == 0);
  return 0;
}
