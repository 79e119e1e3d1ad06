#include "lab/CLabScalarHid.h"

#include "lab/LabCrc.h"

namespace {

SLabProgrammingDescription Describe(std::string name_I, const SLabBoardIds& ids_I) {
  SLabProgrammingDescription description;
  description.name = std::move(name_I);
  description.productId = 0x0351;
  description.loaderProductId = 0x0352;
  description.usage = {0xFF00, 0x0005};
  description.target = 4;
  description.imageBase = 0;
  description.imageSize = 512 * 1024;
  ids_I.ApplyTo(description);
  return description;
}

}  // namespace

CLabScalarHid::CLabScalarHid(std::string name_I, const SLabBoardIds& ids_I)
    : CLabProgrammingBoard(Describe(std::move(name_I), ids_I)) {
  FactoryReset(0x5CA1);
}

bool CLabScalarHid::TakeData(const std::vector<uint8_t>& report_I) {
  const uint32_t offset = (report_I[3] << 16) | (report_I[4] << 8) | report_I[5];
  if (LabCrc::ScalarBlock(&report_I[7], 256) != report_I[6]) return false;
  return Store(offset, &report_I[7], 256);
}
