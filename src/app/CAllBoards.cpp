#include "app/CAllBoards.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>

#include "common/LinuxPaths.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/CScalarBinary.h"
#include "firmware/CScalarRTDISP.h"
#include "firmware/FirmwareFileCheck.h"
#include "lab/LabRelease.h"

namespace {

const char* OptionOf(const std::string& board_I) {
  if (board_I == "pen") return "-p";
  if (board_I == "touch") return "-t";
  if (board_I == "bluetooth") return "-b";
  return "-s";
}

// How the updater loads the file: a scalar's by its own interface, every
// other board's as HID.
EINTERFACE_TYPE LoadTypeOf(const CListCommand::SBoardLine& board_I) {
  if (board_I.board != "scalar") return EHID_INTERFACE;
  if (board_I.interface == "FTDI") return EFTDI_INTERFACE;
  if (board_I.interface == "I2C") return EI2C_INTERFACE;
  if (board_I.interface == "BULK") return EBULK_INTERFACE;
  return EHID_INTERFACE;
}

std::optional<uint16_t> ReleaseIn(const CSRec& source_I) {
  std::optional<uint16_t> found;
  const auto search = [&found](const uint8_t* data_I, size_t size_I) {
    if (!found && data_I != nullptr) found = FindLabRelease(data_I, size_I);
  };
  switch (source_I.GetDataSourceFormat()) {
    case EDS_SREC_PEN:
    case EDS_SREC_TOUCH:
    case EDS_SREC_GENERIC:
      for (const SContinuousDataBlock& block : source_I.GetSRecDataRef()) {
        search(block.data.data(), block.data.size());
      }
      break;
    case EDS_INTEL_HEX:
      search(source_I.GetIntelHexData()->GetData(), source_I.GetIntelHexData()->Size());
      break;
    case EDS_AIROFLASH:
    case EDS_AIROFLASH2:
      search(source_I.GetBinaryAiroFlashData()->GetData(),
             source_I.GetBinaryAiroFlashData()->Size());
      break;
    case EDS_SCALAR_RTDISP: {
      const std::vector<uint8_t> image = source_I.GetScalarRtdIspData()->GetData();
      search(image.data(), image.size());
      break;
    }
    case EDS_SCALAR_BINARY: {
      const CScalarBinary& binary = *source_I.GetScalarBinaryData();
      for (unsigned long i = 0; i < binary.NumBlocks(); ++i) {
        search(binary.BlockPtr(i)->data, CScalarBinary::kBlockDataSize);
      }
      break;
    }
    default: break;
  }
  return found;
}

// A scalar behind a bridge tells its version in three parts ("1.10.0"),
// a USB board in two ("1.10"): trailing zero parts say nothing.
std::vector<unsigned long> VersionParts(const std::string& text_I) {
  std::vector<unsigned long> parts;
  size_t start = 0;
  while (start <= text_I.size()) {
    const size_t dot = std::min(text_I.find('.', start), text_I.size());
    parts.push_back(std::strtoul(text_I.substr(start, dot - start).c_str(), nullptr, 10));
    start = dot + 1;
  }
  while (!parts.empty() && parts.back() == 0) parts.pop_back();
  return parts;
}

}  // namespace

bool CAllBoards::SameVersion(const std::string& a_I, const std::string& b_I) {
  return !a_I.empty() && !b_I.empty() && VersionParts(a_I) == VersionParts(b_I);
}

std::optional<std::string> CAllBoards::FileRelease(const std::string& path_I,
                                                   EINTERFACE_TYPE interface_I) {
  CSRec source;
  if (FirmwareFileCheck::KeepsReaderAway(path_I, interface_I) ||
      !source.Load(path_I, interface_I)) {
    return std::nullopt;
  }
  const std::optional<uint16_t> release = ReleaseIn(source);
  if (!release) return std::nullopt;
  // As the registry shows a board's release.
  char text[16];
  std::snprintf(text, sizeof text, "%x.%02x", *release >> 8, *release & 0xFF);
  return std::string(text);
}

CAllBoards::SPlan CAllBoards::Plan(const std::vector<CListCommand::SProductLine>& products_I,
                                   const std::string& configPath_I) {
  SPlan plan;
  plan.productCount = products_I.size();
  const std::string folder = LinuxPaths::AppendPathComponent(
      LinuxPaths::DeleteLastPathComponent(configPath_I), "Firmware");
  for (const CListCommand::SProductLine& product : products_I) {
    for (const CListCommand::SBoardLine& board : product.boards) {
      if (board.firmware.empty() || board.path.empty()) continue;
      const std::string file = LinuxPaths::AppendPathComponent(folder, board.firmware);
      const std::optional<std::string> release = FileRelease(file, LoadTypeOf(board));
      if (release && SameVersion(*release, board.version)) {
        SBoardResult skipped;
        skipped.kind = board.board;
        skipped.value = board.path;
        skipped.product = product.name;
        skipped.vendorId = product.vendorId;
        skipped.productId = product.productId;
        skipped.path = board.path;
        skipped.file = file;
        skipped.versionBefore = board.version;
        skipped.versionAfter = board.version;
        skipped.reason = "already at version " + board.version + ", the version of " + file;
        plan.skipped.push_back(skipped);
        continue;
      }
      plan.arguments.push_back(OptionOf(board.board));
      plan.arguments.push_back(board.path);
    }
  }
  return plan;
}
