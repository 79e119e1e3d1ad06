// Writes the firmware files of the lab products into a folder, as the
// device configuration of the lab names them. Run at build time; the files
// are installed beside the configuration in its "Firmware" folder.
//
// Every image fits the lab board it is meant for: pen images cover the
// pen's unprotected blocks, the vendor-class touch image the unprotected
// blocks of its second CPU, the scalars behind an FTDI bridge take images
// of whole 64 KiB blocks of their serial flash, the others are plain images
// of a few pages. The bytes are a pattern with no 0xFF, so that every word
// is written.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

namespace {

using Bytes = std::vector<uint8_t>;

Bytes Pattern(size_t size_I, uint32_t seed_I) {
  Bytes data(size_I);
  uint32_t state = seed_I * 747796405u + 2891336453u;
  for (uint8_t& byte : data) {
    state = state * 1664525u + 1013904223u;
    byte = static_cast<uint8_t>((state >> 24) % 0xFF);
  }
  return data;
}

// The image names its release as the lab's boards read it: "TAVREL", then
// the release low byte first, a little way into the image.
Bytes Released(Bytes data_I, uint16_t release_I) {
  const uint8_t tag[] = {'T',
                         'A',
                         'V',
                         'R',
                         'E',
                         'L',
                         static_cast<uint8_t>(release_I & 0xFF),
                         static_cast<uint8_t>(release_I >> 8)};
  std::copy(std::begin(tag), std::end(tag), data_I.begin() + 16);
  return data_I;
}

std::string Hex2(unsigned value_I) {
  char text[3];
  std::snprintf(text, sizeof text, "%02X", value_I & 0xFFu);
  return text;
}

// S3 records of 32 bytes and an S7 end record.
std::string SRecordText(uint32_t start_I, const Bytes& data_I) {
  std::string text = "S00F00007461766C61622D696D616765A5\n";
  for (size_t at = 0; at < data_I.size(); at += 32) {
    const size_t count = std::min<size_t>(32, data_I.size() - at);
    const uint32_t address = start_I + static_cast<uint32_t>(at);
    unsigned sum = static_cast<unsigned>(count + 5);
    std::string line = "S3" + Hex2(static_cast<unsigned>(count + 5));
    for (int shift = 24; shift >= 0; shift -= 8) {
      line += Hex2(address >> shift);
      sum += (address >> shift) & 0xFFu;
    }
    for (size_t k = 0; k < count; ++k) {
      line += Hex2(data_I[at + k]);
      sum += data_I[at + k];
    }
    text += line + Hex2(~sum) + "\n";
  }
  unsigned sum = 5 + ((start_I >> 24) & 0xFF) + ((start_I >> 16) & 0xFF) + ((start_I >> 8) & 0xFF) +
                 (start_I & 0xFF);
  char end[32];
  std::snprintf(end, sizeof end, "S705%08X%02X\n", start_I, ~sum & 0xFFu);
  return text + end;
}

// Intel-hex data records of 16 bytes from 0x8000 and the end record.
std::string IntelHexText(const Bytes& data_I) {
  std::string text;
  for (size_t at = 0; at < data_I.size(); at += 16) {
    const size_t count = std::min<size_t>(16, data_I.size() - at);
    const uint32_t address = 0x8000 + static_cast<uint32_t>(at);
    unsigned sum = static_cast<unsigned>(count) + (address >> 8) + address;
    std::string line =
        ":" + Hex2(static_cast<unsigned>(count)) + Hex2(address >> 8) + Hex2(address) + "00";
    for (size_t k = 0; k < count; ++k) {
      line += Hex2(data_I[at + k]);
      sum += data_I[at + k];
    }
    text += line + Hex2(0x100 - (sum & 0xFF)) + "\r\n";
  }
  return text + ":00000001FF\r\n";
}

bool Write(const std::filesystem::path& path_I, const std::string& content_I) {
  std::ofstream out(path_I, std::ios::binary | std::ios::trunc);
  out << content_I;
  return static_cast<bool>(out);
}

std::string AsText(const Bytes& data_I) { return std::string(data_I.begin(), data_I.end()); }

// The pen's flash: 48 blocks of 4 KiB from 0x08000000, the first protected.
constexpr uint32_t kPenStart = 0x08000000 + 4096;
constexpr size_t kPenBytes = 47 * 4096;
// The vendor-class touch controller's firmware runs on its second CPU: 24
// blocks of 2 KiB from 0x00100000, the first protected.
constexpr uint32_t kTouchStart = 0x00100000 + 2048;
constexpr size_t kTouchBytes = 23 * 2048;
// The pen behind the I2C tunnel: 24 blocks of 1 KiB from 0, the first
// protected.
constexpr uint32_t kTunnelStart = 1024;
constexpr size_t kTunnelBytes = 23 * 1024;
// A scalar behind an FTDI bridge: four blocks of its serial flash.
constexpr size_t kBridgeScalarBytes = 4 * 65536;

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: %s OUTPUT_FOLDER\n", argv[0]);
    return 2;
  }
  const std::filesystem::path folder = argv[1];
  std::error_code error;
  std::filesystem::create_directories(folder, error);

  // Each a release newer than the board ships with: pens 1.20, the
  // vendor-class touch 2.10, the other boards and the tunnel's bridge 1.00.
  // The scalars behind an FTDI bridge ship with 1.00 too.
  bool ok = true;
  uint32_t seed = 1;
  for (const char* product :
       {"classic-tablet", "wireless-tablet", "wireless-tablet-1122", "display-hid", "display-ftdi",
        "display-ftdi-quanta", "display-ftdi-venus"}) {
    ok &= Write(folder / (std::string(product) + ".pen"),
                SRecordText(kPenStart, Released(Pattern(kPenBytes, seed++), 0x0130)));
  }
  ok &= Write(folder / "tunnel-tablet.pen",
              SRecordText(kTunnelStart, Released(Pattern(kTunnelBytes, seed++), 0x0110)));
  ok &= Write(folder / "classic-tablet.touch",
              SRecordText(kTouchStart, Released(Pattern(kTouchBytes, seed++), 0x0220)));
  ok &= Write(folder / "wireless-tablet.hex",
              IntelHexText(Released(Pattern(32 * 1024, seed++), 0x0110)));
  ok &=
      Write(folder / "display-hid.hex", IntelHexText(Released(Pattern(32 * 1024, seed++), 0x0110)));
  ok &= Write(folder / "wireless-tablet.airoflash2",
              AsText(Released(Pattern(40 * 1024, seed++), 0x0110)));
  ok &= Write(folder / "wireless-tablet-1122.airoflash",
              AsText(Released(Pattern(40 * 1024, seed++), 0x0110)));
  ok &= Write(folder / "display-hid.bin", AsText(Released(Pattern(8 * 1024, seed++), 0x0110)));
  for (const char* product : {"display-ftdi", "display-ftdi-quanta", "display-ftdi-venus"}) {
    ok &= Write(folder / (std::string(product) + ".bin"),
                AsText(Released(Pattern(kBridgeScalarBytes, seed++), 0x0110)));
  }
  return ok ? 0 : 1;
}
