#include "lab/CLabBluetooth.h"

#include <algorithm>

#include "lab/LabCrc.h"

namespace {

constexpr uint8_t kAB1122Header[] = {0x02, 0x00, 0x0F, 0x06, 0x01, 0x08, 0x01};
constexpr uint32_t kReservedStart = 0x3000;
constexpr uint32_t kReservedEnd = 0x8000;

SLabProgrammingDescription Describe(CLabBluetooth::EChip chip_I, std::string name_I,
                                    const SLabBoardIds& ids_I) {
  SLabProgrammingDescription description;
  description.name = std::move(name_I);
  const bool ab1122 = chip_I == CLabBluetooth::EChip::eAB1122;
  description.productId = ab1122 ? 0x0341 : 0x0343;
  description.loaderProductId = ab1122 ? 0x0342 : 0x0344;
  description.usage = {0xFF00, 0x00B7};
  description.target = ab1122 ? 1 : 6;
  description.imageBase = 0;
  description.imageSize = 256 * 1024;
  // The AB1555 erases for a good while after the start.
  description.startBusy = ab1122 ? 0.3 : 1.5;
  description.endBusy = ab1122 ? 0.2 : 1.0;
  ids_I.ApplyTo(description);
  return description;
}

}  // namespace

CLabBluetooth::CLabBluetooth(EChip chip_I, std::string name_I, const SLabBoardIds& ids_I)
    : CLabProgrammingBoard(Describe(chip_I, std::move(name_I), ids_I)), mChip(chip_I) {
  FactoryReset(chip_I == EChip::eAB1122 ? 0xB122 : 0xB555);
}

std::pair<size_t, size_t> CLabBluetooth::Payload() const {
  return mChip == EChip::eAB1122 ? std::pair<size_t, size_t>{14, 14 + kPage}
                                 : std::pair<size_t, size_t>{10, 10 + kPage};
}

bool CLabBluetooth::TakeData(const std::vector<uint8_t>& report_I) {
  const auto [begin, end] = Payload();
  const uint8_t* page = &report_I[begin];
  if (mChip == EChip::eAB1122) {
    if (!std::equal(std::begin(kAB1122Header), std::end(kAB1122Header), &report_I[3])) {
      Violation("AB1122 data report with another header");
      return false;
    }
    const uint32_t address = (report_I[10] << 16) | (report_I[11] << 8) | report_I[12];
    if (address >= kReservedStart && address < kReservedEnd) {
      Violation("AB1122 page sent into the chip's own range");
      return false;
    }
    if (LabCrc::BluetoothPage(page, kPage) != report_I[13]) return false;
    return Store(address, page, kPage);
  }
  if (report_I[3] != 0 || report_I[4] != 1 ||
      !std::all_of(&report_I[6], &report_I[10], [](uint8_t b) { return b == 0; })) {
    Violation("AB1555 data report with another header");
    return false;
  }
  if (LabCrc::BluetoothPage(page, kPage) != report_I[5]) return false;
  const uint32_t address = mNextPage * kPage;
  if (!Store(address, page, kPage)) return false;
  ++mNextPage;
  return true;
}
