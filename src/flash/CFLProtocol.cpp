#include "flash/CFLProtocol.h"

#include <array>

#include "common/TavAssert.h"

namespace {

struct SCommandIds {
  uint8_t loader;  // 0: the command does not exist under the loader protocol
  uint8_t nonBL;
};

// Indexed by EBLHIDCmdId. Reset with and without saving share one loader id
// and differ only in the report's length and content.
constexpr std::array<SCommandIds, 22> kCommandIds = {{
    {0x01, 0xD0},  // not used
    {0x10, 0xD1},  // read data
    {0x11, 0xD2},  // write block
    {0x12, 0xD3},  // erase block
    {0x13, 0xD4},  // set read address
    {0x14, 0xD5},  // get status
    {0x15, 0xD6},  // reset CPU, save
    {0x15, 0xCD},  // reset CPU
    {0x16, 0xD7},  // write word
    {0x17, 0xD8},  // get loader parameters
    {0x18, 0xD9},  // get flash descriptor
    {0x19, 0xDA},  // get checksums
    {0x1A, 0xDB},  // set block checksum
    {0x1B, 0xDC},  // calculate and set block checksum
    {0x1C, 0xDD},  // set magic word
    {0x1D, 0xDE},  // write checksums to ROM
    {0x1E, 0xDF},  // get device info
    {0x1F, 0xE0},  // get loader start reason
    {0x20, 0xE1},  // set current CPU
    {0x21, 0xE2},  // get current CPU
    {0x22, 0xE3},  // get total CPUs
    {0x00, 0xE4},  // programming
}};

}  // namespace

std::shared_ptr<CFLProtocol> CFLProtocol::mInstance;
int32_t CFLProtocol::mProtocolType = EFL_PROTOCOL_LOADER;

CFLProtocol::CFLProtocol() { mProtocolType = EFL_PROTOCOL_LOADER; }

std::shared_ptr<CFLProtocol> CFLProtocol::GetInstance() {
  if (!mInstance) mInstance = std::shared_ptr<CFLProtocol>(new CFLProtocol());
  return mInstance;
}

void CFLProtocol::SetProtocolType(EFLProtocolType protocolType_I) {
  mProtocolType = protocolType_I;
}

EFLProtocolType CFLProtocol::GetProtocolType() const {
  return static_cast<EFLProtocolType>(mProtocolType);
}

bool CFLProtocol::IsNonBLProtocol() const { return mProtocolType == EFL_PROTOCOL_NON_BL; }

uint8_t CFLProtocol::GetCommand(EBLHIDCmdId command_I) const {
  if (command_I >= kCommandIds.size()) {
    TAVASSERT_TEXT("Oops - unknown command ID");
    return 0;
  }
  if (IsNonBLProtocol()) return kCommandIds[command_I].nonBL;
  if (command_I == eBL_HID_REP_PROGRAMMING_ID) {
    TAVASSERT_TEXT("eBL_HID_REP_PROGRAMMING_ID NOT SUPPORTED FOR CURRENT PROTOCOL");
    return 0;
  }
  return kCommandIds[command_I].loader;
}
