#include "lab/CLabTouchHex.h"

namespace {

SLabProgrammingDescription Describe(std::string name_I, const SLabBoardIds& ids_I) {
  SLabProgrammingDescription description;
  description.name = std::move(name_I);
  description.productId = 0x0321;
  description.loaderProductId = 0x0322;
  description.usage = {0xFF00, 0x00E4};
  description.target = 0;
  description.imageBase = CLabTouchHex::kImageBase;
  description.imageSize = 196608;
  ids_I.ApplyTo(description);
  return description;
}

}  // namespace

CLabTouchHex::CLabTouchHex(std::string name_I, const SLabBoardIds& ids_I)
    : CLabProgrammingBoard(Describe(std::move(name_I), ids_I)) {
  FactoryReset(0x4E78);
}

bool CLabTouchHex::TakeData(const std::vector<uint8_t>& report_I) {
  const uint32_t address = report_I[5] | (report_I[6] << 8) | (report_I[7] << 16) |
                           (static_cast<uint32_t>(report_I[8]) << 24);
  const bool inOrder = report_I[3] == 1 && report_I[4] == ((mNextChunk + 1) & 0xFF) &&
                       report_I[9] == 16 && address == kImageBase + kChunk * mNextChunk;
  if (!inOrder) {
    Violation("Intel-hex chunk out of order at " + std::to_string(address));
    return false;
  }
  ++mNextChunk;
  return Store(address, &report_I[10], kChunk);
}
