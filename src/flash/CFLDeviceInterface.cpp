// Identity, accessors, reporting, the guarded transfers and Init of the
// device interface base.

#include "flash/CFLDeviceInterface.h"

#include <numeric>

#include "common/CClock.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "flash/CFLProtocol.h"
#include "flash/FlashConstants.h"
#include "flash/FlashText.h"

bool __DUMP_WRITE_COMMAND__ = true;

namespace {
// Asks before a loader counts as one without block checksums.
constexpr int kChecksumSupportTries = 3;
}  // namespace

using FlashText::Dec;
using FlashText::Hex;

CFLDeviceInterface::CFLDeviceInterface() = default;

CFLDeviceInterface::CFLDeviceInterface(const std::string& path_I) : mPath(path_I) {}

CFLDeviceInterface::CFLDeviceInterface(EINTERFACE_TYPE interfaceType_I)
    : mInterfaceType(interfaceType_I) {}

CFLDeviceInterface::~CFLDeviceInterface() = default;

void CFLDeviceInterface::UpdateChecksums(uint32_t oldSum_I, uint32_t newSum_I, uint32_t fwSum_I) {
  mOldChecksum = oldSum_I;
  mNewChecksum = newSum_I;
  mFWChecksum = fwSum_I;
}

bool CFLDeviceInterface::GetMainDeviceInfo(uint16_t& info_O) {
  BL_HID_REP_GET_DEVICE_INFO info;
  if (!FLProtGetMainDeviceInfo(info)) return false;
  info_O = info.deviceInfo;
  return true;
}

void CFLDeviceInterface::SetPath(const std::string& path_I) { mPath = path_I; }
void CFLDeviceInterface::SetLocation(uint32_t location_I) { mPath = std::to_string(location_I); }
void CFLDeviceInterface::SetIsFlashLoader(bool isFlashLoader_I) {
  mIsFlashLoader = isFlashLoader_I;
}
void CFLDeviceInterface::SetDataSourceFormat(EDataSourceFormat format_I) {
  mDataSourceFormat = format_I;
}
std::string CFLDeviceInterface::GetPath() const { return mPath; }

uint32_t CFLDeviceInterface::GetLocation() const {
  try {
    return static_cast<uint32_t>(std::stoul(mPath, nullptr, 10));
  } catch (...) {
    return 0;
  }
}

bool CFLDeviceInterface::IsOpen() const { return mIsOpen; }
bool CFLDeviceInterface::GetIsFlashLoader() { return mIsFlashLoader; }
uint32_t CFLDeviceInterface::GetVendorId() const { return mVendorId; }
uint32_t CFLDeviceInterface::GetProductId() const { return mProductId; }
uint32_t CFLDeviceInterface::GetUsageId() const { return mUsageId; }
uint32_t CFLDeviceInterface::GetUsagePage() const { return mUsagePage; }
uint32_t CFLDeviceInterface::GetVersion() const { return mVersion; }
uint32_t CFLDeviceInterface::GetOldChecksum() const { return mOldChecksum; }
uint32_t CFLDeviceInterface::GetNewChecksum() const { return mNewChecksum; }
uint32_t CFLDeviceInterface::GetFWChecksum() const { return mFWChecksum; }
EINTERFACE_TYPE CFLDeviceInterface::GetInterfaceType() const { return mInterfaceType; }
BL_HID_REP_GET_BL_PARAMETERS CFLDeviceInterface::GetBLParamData() const { return mBLParams; }
BL_HID_REP_GET_FLASH_DESCRIPTOR CFLDeviceInterface::GetBLDescData() const { return mBLDesc; }
Flash CFLDeviceInterface::GetFlash() const { return mFlash; }
EDataSourceFormat CFLDeviceInterface::GetDataSourceFormat() const { return mDataSourceFormat; }
bool CFLDeviceInterface::GetChecksumsSupported() const { return mChecksumsSupported; }

uint8_t CFLDeviceInterface::GetDataSourceCpu() const {
  switch (mDataSourceFormat) {
    case EDS_SREC_PEN: return 0;
    case EDS_SREC_TOUCH: return 1;
    case EDS_SREC_GENERIC: return 0;
    case EDS_INTEL_HEX: return 1;
    case EDS_AIROFLASH: return 2;
    case EDS_SCALAR_RTDISP: return 5;
    case EDS_SCALAR_BINARY: return 4;
    case EDS_AIROFLASH2: return 2;
    default: return 5;
  }
}

bool CFLDeviceInterface::ValidBlockIndex(uint32_t index_I) const {
  return index_I < FlashConstants::kSummedPenTouchBlocks || mDataSourceFormat > EDS_SREC_TOUCH;
}

void CFLDeviceInterface::SetProtocolType(EFLProtocolType protocolType_I) {
  CFLProtocol::GetInstance()->SetProtocolType(protocolType_I);
}

void CFLDeviceInterface::SetIntelHexData(std::shared_ptr<CIntelHex> data_I) {
  mIntelHexData = std::move(data_I);
}
void CFLDeviceInterface::SetBinaryAiroFlashData(std::shared_ptr<CBinaryAiroFlash> data_I) {
  mAiroFlashData = std::move(data_I);
}
void CFLDeviceInterface::SetScalarBinaryData(std::shared_ptr<CScalarBinary> data_I) {
  mScalarBinaryData = std::move(data_I);
}
std::shared_ptr<CIntelHex> CFLDeviceInterface::GetIntelHexData() const { return mIntelHexData; }
std::shared_ptr<CBinaryAiroFlash> CFLDeviceInterface::GetAiroFlashData() const {
  return mAiroFlashData;
}
std::shared_ptr<CScalarBinary> CFLDeviceInterface::GetScalarBinaryData() const {
  return mScalarBinaryData;
}

std::string CFLDeviceInterface::ToString() const {
  const char* interfaceName = "INVALID";
  switch (mInterfaceType) {
    case EHID_INTERFACE: interfaceName = "HID"; break;
    case EBULK_INTERFACE: interfaceName = "BULK"; break;
    case EI2C_INTERFACE: interfaceName = "I2C"; break;
    default: break;
  }
  std::string text;
  text += "\tVendor ID = 0x" + Hex(mVendorId) + "\n";
  text += "\tProduct ID = 0x" + Hex(mProductId) + "\n";
  text += std::string("\tFirmware Loader = ") + (mIsFlashLoader ? "YES" : "NO") + "\n";
  text += std::string("\tIs Open = ") + (mIsOpen ? "YES" : "NO") + "\n";
  text += std::string("\tInterface = ") + interfaceName + "\n";
  text += "\tPath = " + mPath + "\n";
  text += "\tUsagePage (Actual) = " + Hex(mUsagePage) + "\n";
  text += "\tUsage (Actual) = " + Hex(mUsageId) + "\n";
  text += "\tVersion = " + Hex(mVersion) + "\n";
  return text;
}

std::string CFLDeviceInterface::PathFromInfo(const DeviceInfo& info_I) {
  return Dec(info_I.vendorId) + ":" + Dec(info_I.productId) + ":" + Dec(info_I.locationId) + ":" +
         Dec(info_I.usage) + ":" + Dec(info_I.usagePage);
}

void CFLDeviceInterface::SetIdentity(const DeviceInfo& info_I) {
  mVendorId = info_I.vendorId;
  mProductId = info_I.productId;
  mLocationId = info_I.locationId;
  mUsageId = info_I.usage;
  mUsagePage = info_I.usagePage;
  mPath = PathFromInfo(info_I);
}

DeviceInfo CFLDeviceInterface::RebuildInfo() const {
  return DeviceInfo{mVendorId, mProductId, mLocationId, mUsageId, mUsagePage};
}

void CFLDeviceInterface::ReportLog(const std::string& text_I) {
  if (mNotifier != nullptr) {
    mNotifier->InterfaceLog(text_I);
  } else {
    TavLog::Info("Log: %s\n", text_I.c_str());
  }
}

void CFLDeviceInterface::ReportError(const std::string& text_I) {
  if (mNotifier != nullptr) {
    mNotifier->InterfaceError(text_I);
  } else {
    TavLog::Error("Error: %s\n", text_I.c_str());
  }
}

void CFLDeviceInterface::ReportProgress(uint32_t percent_I) {
  // The receiver takes 0 as "not started"; any report means started.
  if (mNotifier != nullptr) mNotifier->InterfaceProgress(percent_I == 0 ? 1 : percent_I);
}

bool CFLDeviceInterface::LoaderReady() { return IsOpen() && GetIsFlashLoader(); }

bool CFLDeviceInterface::ProgramBoard() {
  switch (mDataSourceFormat) {
    case EDS_SREC_PEN:
    case EDS_SREC_TOUCH:
    case EDS_SREC_GENERIC: return ProgramBoardSRec();
    case EDS_INTEL_HEX: return ProgramBoardIntelHex();
    case EDS_AIROFLASH: return ProgramBoardAiroHaBinary_AB1122();
    case EDS_SCALAR_BINARY: return ProgramBoardScalarBinary();
    case EDS_AIROFLASH2: return ProgramBoardAiroHaBinary_AB1555();
    default: TAVASSERT_TEXT("Unsupported data source format"); return false;
  }
}

bool CFLDeviceInterface::GetBLParams() {
  if (!LoaderReady()) return false;
  return FLProtGetBLParameters(mBLParams);
}

bool CFLDeviceInterface::GetBLDesc() {
  if (!LoaderReady()) return false;
  return FLProtGetFlashDescriptor(mBLDesc);
}

bool CFLDeviceInterface::SyncSelectedCPU() {
  if (!LoaderReady()) return false;
  uint32_t currentCpu = 0;
  uint32_t totalCpus = 1;
  if (!FLProtGetCurrentCPU(currentCpu)) return false;
  if (!FLProtGetTotalCPUs(totalCpus)) return false;
  if (totalCpus == 1) return true;

  // Only the low byte takes part, and the log shows it as one raw
  // character, as the loader's own tools always have.
  uint8_t cpu = static_cast<uint8_t>(currentCpu);
  const uint8_t sourceCpu = GetDataSourceCpu();
  if (sourceCpu == 5 || sourceCpu == cpu) {
    ReportLog(std::string("NOTE: Resetting currentCpu: [") + static_cast<char>(cpu) + "]");
  } else {
    ReportLog(std::string("WARNING: Setting currentCpu: [") + static_cast<char>(cpu) +
              "] to dataSourceCpu: [" + static_cast<char>(sourceCpu) + "]");
    cpu = sourceCpu;
  }
  return FLProtSetCurrentCPU(cpu);
}

bool CFLDeviceInterface::Init(const std::vector<SContinuousDataBlock>& data_I) {
  ReportLog("Initializing data for Programming...");
  if (!SyncSelectedCPU()) {
    ReportError("Unable to set the current CPU");
    return false;
  }
  if (!GetBLParams()) {
    ReportError("Can't get Loader Parameters");
    return false;
  }
  ReportLog("Device Loader Parameters loaded:\n\tBlocks: " + Dec(mBLParams.numFlashBlocks) +
            "\n\tRead Size: " + Dec(mBLParams.readSize) + "\n\tBlock Size: " +
            Dec(mBLParams.blockSize) + "\n\tWord Size: " + Dec(mBLParams.wordSize));
  if (!GetBLDesc()) {
    ReportError("Can't get Loader Description");
    return false;
  }
  std::string description = "Device Loader Description loaded";
  for (uint32_t i = 0; i < mBLParams.numFlashBlocks && i < kMaxFlashBlocks; ++i) {
    const BL_FLASH_BLOCK_DESCRIPTOR& block = mBLDesc.blocks[i];
    description += "\n\tBlock " + Dec(i) + "\t(" + Hex(block.startAddress) + " - " +
                   Hex(block.startAddress + block.size - 1) + ") size (" + Hex(block.size) + ")";
    if ((block.flags & kFlashBlockProtectedBit) != 0) description += " [PROTECTED]";
  }
  ReportLog(description);

  // A loader without checksums refuses the request every time; one failed
  // read (the tunnel asks the loader's mode afresh for each command) must
  // not pass for that, or programming would leave the old sums in place
  // and report success over an image that will not start.
  FLASH_CHECKSUM_STRUC checksums;
  mChecksumsSupported = false;
  for (int attempt = 0; attempt < kChecksumSupportTries && !mChecksumsSupported; ++attempt) {
    mChecksumsSupported = FLProtGetChecksums(checksums);
  }
  ReportLog(std::string("Checksum Support: ") + (mChecksumsSupported ? "Yes" : "No"));

  if (!InitFlashVector()) {
    ReportError("Unable to initialize Flash Vector");
    return false;
  }
  ReportLog("Flash Vector Initialized");
  if (!LoadSRecData(data_I)) {
    ReportError("Failed to load SRec data to flash");
    return false;
  }
  ReportLog("Update SRec file loaded");
  return true;
}

void CFLDeviceInterface::DumpCmd(std::vector<uint8_t> data_I) {
  static const char kDigits[] = "0123456789ABCDEF";
  std::string text = "cmd: \n";
  text.reserve(text.size() + data_I.size() * 3 + data_I.size() / 32 + 1);
  for (size_t i = 0; i < data_I.size(); ++i) {
    text += kDigits[data_I[i] >> 4];
    text += kDigits[data_I[i] & 0xF];
    text += ' ';
    if ((i + 1) % 32 == 0) text += '\n';
  }
  ReportLog(text);
}

uint32_t CFLDeviceInterface::CalculateBlockChecksum(const std::vector<uint8_t>& data_I) {
  return std::accumulate(data_I.data(), data_I.data() + data_I.size(), uint32_t{0});
}

bool CFLDeviceInterface::SafeRead(std::vector<uint8_t>& data_IO) {
  static bool entered = false;
  return GuardedTransfer(entered, false, data_IO);
}

bool CFLDeviceInterface::SafeWrite(std::vector<uint8_t>& data_IO) {
  static bool entered = false;
  if (__DUMP_WRITE_COMMAND__) DumpCmd(data_IO);
  return GuardedTransfer(entered, true, data_IO);
}

// The `entered` flags are shared by every interface: a transfer started
// from inside another (a reopen that probes the device) makes one plain
// attempt instead of a second retry loop.
bool CFLDeviceInterface::GuardedTransfer(bool& entered_IO, bool isWrite_I,
                                         std::vector<uint8_t>& data_IO) {
  auto attempt = [&]() { return isWrite_I ? Write(data_IO) : Read(data_IO); };
  if (entered_IO) {
    ReportLog(isWrite_I ? "Prevent SafeWrite from recursing... returning immediately."
                        : "Prevent SafeRead from recursing... returning immediately.");
    return attempt();
  }
  entered_IO = true;
  const std::string errorWord = isWrite_I ? "Write error: " : "Read error: ";
  for (int i = 1; i <= FlashConstants::kSafeTries; ++i) {
    if (attempt()) {
      entered_IO = false;
      return true;
    }
    ReportLog(errorWord + Dec(i) + "/" + Dec(FlashConstants::kSafeTries) + " - retrying...");
    TavSleep(FlashConstants::kSafeWaitBase + FlashConstants::kSafeWaitStep * i);
  }
  ReportLog("Attempting to reopen connection.");
  Open();
  TavSleep(FlashConstants::kSafeReopenWait);
  const bool succeeded = attempt();
  if (!succeeded) ReportLog(isWrite_I ? "Write failed." : "Read failed.");
  entered_IO = false;
  return succeeded;
}
