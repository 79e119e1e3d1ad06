#pragma once
// The flash-loader device interface of one board. Everything above the
// transports holds it through a shared pointer. The base speaks the loader
// command set through the transport's Read and Write, wrapped in SafeRead
// and SafeWrite, and runs every programming procedure; a transport supplies
// Open, Close, Read, Write and the mode switches.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "common/TavTypes.h"
#include "firmware/SContinuousDataBlock.h"
#include "flash/CInterfaceNotifier.h"
#include "flash/FLProtocolTypes.h"
#include "flash/Flash.h"

class CIntelHex;
class CBinaryAiroFlash;
class CScalarBinary;

// When set, every SafeWrite logs the command's bytes first. Set from the
// start; nothing in the program clears it.
extern bool __DUMP_WRITE_COMMAND__;

class CFLDeviceInterface {
 public:
  virtual ~CFLDeviceInterface();
  CFLDeviceInterface(const CFLDeviceInterface&) = delete;
  CFLDeviceInterface& operator=(const CFLDeviceInterface&) = delete;

  // Transport operations.
  virtual bool Open() = 0;
  virtual void Close() = 0;
  // Every transport has its own; the defaults answer as an interface that
  // reaches no device, so that stand-ins for tests need not spell them out.
  virtual bool GetAttributes() { return false; }
  virtual std::string GetBasePath(uint8_t /*topology_I*/) { return mPath; }
  virtual bool SwitchToBLMode() = 0;
  virtual bool SwitchFromBLMode(bool save_I) = 0;
  virtual bool IsAlive() = 0;
  virtual bool InitEEPROM() { return false; }

  // Stores the three sums of an update; carries them from the loader
  // interface to the main interface after programming.
  virtual void UpdateChecksums(uint32_t oldSum_I, uint32_t newSum_I, uint32_t fwSum_I);
  // The first field of the main device's information.
  virtual bool GetMainDeviceInfo(uint16_t& info_O);

  virtual void SetPath(const std::string& path_I);
  // Sets the path to the location id in decimal.
  virtual void SetLocation(uint32_t location_I);
  virtual void SetIsFlashLoader(bool isFlashLoader_I);
  virtual void SetDataSourceFormat(EDataSourceFormat format_I);
  virtual std::string GetPath() const;
  // The path read as a decimal number; 0 where it does not start with one.
  virtual uint32_t GetLocation() const;
  virtual bool IsOpen() const;
  // Not const: a transport may have to ask the device.
  virtual bool GetIsFlashLoader();
  virtual uint32_t GetVendorId() const;
  virtual uint32_t GetProductId() const;
  virtual uint32_t GetUsageId() const;
  virtual uint32_t GetUsagePage() const;
  virtual uint32_t GetVersion() const;
  virtual uint32_t GetOldChecksum() const;
  virtual uint32_t GetNewChecksum() const;
  virtual uint32_t GetFWChecksum() const;
  virtual EINTERFACE_TYPE GetInterfaceType() const;
  virtual BL_HID_REP_GET_BL_PARAMETERS GetBLParamData() const;
  virtual BL_HID_REP_GET_FLASH_DESCRIPTOR GetBLDescData() const;
  virtual Flash GetFlash() const;
  // The CPU a firmware format is meant for.
  virtual uint8_t GetDataSourceCpu() const;
  virtual EDataSourceFormat GetDataSourceFormat() const;

  // Reads the loader's parameters and lays the S-record image over its
  // flash blocks.
  virtual bool Init(const std::vector<SContinuousDataBlock>& data_I);
  // Runs the programming procedure of the data source format.
  virtual bool ProgramBoard();
  // Makes the loader address the CPU that the firmware is for.
  virtual bool SyncSelectedCPU();
  virtual bool GetBLParams();
  virtual bool GetBLDesc();
  virtual bool GetChecksumsSupported() const;

  // The S-record procedure and its steps.
  virtual bool InitFlashVector();
  virtual bool LoadSRecData(const std::vector<SContinuousDataBlock>& data_I);
  virtual bool CalculateChecksums();
  virtual bool InitializeFlash();
  virtual bool WriteFlash();
  virtual bool WriteBlock(uint32_t index_I);
  virtual bool FinalizeFlash();

  // Takes effect for the whole process.
  virtual void SetProtocolType(EFLProtocolType protocolType_I);

  virtual void SetIntelHexData(std::shared_ptr<CIntelHex> data_I);
  virtual void SetBinaryAiroFlashData(std::shared_ptr<CBinaryAiroFlash> data_I);
  virtual void SetScalarBinaryData(std::shared_ptr<CScalarBinary> data_I);
  virtual std::shared_ptr<CIntelHex> GetIntelHexData() const;
  virtual std::shared_ptr<CBinaryAiroFlash> GetAiroFlashData() const;
  virtual std::shared_ptr<CScalarBinary> GetScalarBinaryData() const;

  virtual std::string ToString() const;

  // The loader commands. Each builds one whole report and sends it through
  // SafeWrite or SafeRead. Unless told otherwise each needs an open
  // interface in loader mode, and returns false at once without one.
  virtual bool FLProtReadData(std::vector<uint8_t>& data_O, uint32_t count_I);
  virtual bool FLProtWriteBlock(const std::vector<uint8_t>& data_I, uint32_t address_I);
  virtual bool FLProtEraseBlock(uint32_t block_I);
  virtual bool FLProtSetReadAddr(uint32_t address_I);
  virtual bool FLProtGetStatus(uint32_t& status_O);
  virtual bool FLProtResetCPU(bool save_I);
  virtual bool FLProtWriteWord(const std::vector<uint8_t>& data_I, uint32_t address_I);
  virtual bool FLProtGetBLParameters(BL_HID_REP_GET_BL_PARAMETERS& params_O);
  virtual bool FLProtGetFlashDescriptor(BL_HID_REP_GET_FLASH_DESCRIPTOR& descriptor_O);
  virtual bool FLProtGetChecksums(FLASH_CHECKSUM_STRUC& checksums_O);
  virtual bool FLProtSetBlockChecksum(uint16_t block_I, uint32_t checksum_I);
  virtual bool FLProtCalcSetBlockChecksum(uint16_t block_I);
  virtual bool FLProtSetMagicWord(uint32_t value_I);
  virtual bool FLProtWriteChecksumsToROM();
  virtual bool FLProtGetMainDeviceInfo(BL_HID_REP_GET_DEVICE_INFO& info_O);
  virtual bool FLProtGetBLStartReason(uint32_t& reason_O);
  virtual bool FLProtSetCurrentCPU(uint32_t cpu_I);
  virtual bool FLProtGetCurrentCPU(uint32_t& cpu_O);
  virtual bool FLProtGetTotalCPUs(uint32_t& count_O);

  // The programming procedures that ProgramBoard dispatches to.
  virtual bool ProgramBoardSRec();
  virtual bool ProgramBoardIntelHex();
  virtual bool ProgramBoardAiroHaBinary_AB1122();
  virtual bool ProgramBoardAiroHaBinary_AB1555();
  virtual bool ProgramBoardScalarBinary();

  // One report to or from the device, as the transport moves it.
  virtual bool Write(std::vector<uint8_t>& /*data_IO*/) { return false; }
  virtual bool Read(std::vector<uint8_t>& /*data_IO*/) { return false; }
  // Read and Write with 100 tries, growing waits, and one reopen.
  virtual bool SafeRead(std::vector<uint8_t>& data_IO);
  virtual bool SafeWrite(std::vector<uint8_t>& data_IO);
  virtual void DumpCmd(std::vector<uint8_t> data_I);
  // The byte sum of a piece of image; for the log only.
  virtual uint32_t CalculateBlockChecksum(const std::vector<uint8_t>& data_I);
  // Pen and touch S-record files have only their first 39 blocks summed.
  virtual bool ValidBlockIndex(uint32_t index_I) const;

  // The interface path of a DeviceInfo: its five numbers in decimal,
  // joined by ":".
  static std::string PathFromInfo(const DeviceInfo& info_I);
  // The interface's identity: kept in its five fields, with the path made
  // from them; RebuildInfo gives it back as one DeviceInfo.
  void SetIdentity(const DeviceInfo& info_I);
  DeviceInfo RebuildInfo() const;

  void ReportLog(const std::string& text_I);
  void ReportError(const std::string& text_I);
  void ReportProgress(uint32_t percent_I);
  virtual void RegisterCallback(CInterfaceNotifier* notifier_I) { mNotifier = notifier_I; }
  virtual void UnregisterCallback() { mNotifier = nullptr; }

 protected:
  CFLDeviceInterface();
  explicit CFLDeviceInterface(const std::string& path_I);
  // For stand-ins that are no transport of their own.
  explicit CFLDeviceInterface(EINTERFACE_TYPE interfaceType_I);

  // Open and in loader mode: the precondition of the loader commands.
  bool LoaderReady();
  // The busy poll and the write step of the programming-report procedures.
  bool BusyPoll(std::vector<uint8_t>& report_IO, unsigned int limit_I);
  bool WriteStep(std::vector<uint8_t>& report_IO, unsigned int furtherWrites_I,
                 unsigned int countedWrites_I);

  std::string mPath;
  bool mIsOpen = false;
  bool mIsFlashLoader = false;
  bool mChecksumsSupported = false;
  uint32_t mVendorId = 0;
  uint32_t mProductId = 0;
  uint32_t mUsageId = 0;
  uint32_t mUsagePage = 0;
  uint32_t mLocationId = 0;
  uint32_t mVersion = 0;
  uint32_t mOldChecksum = 0;
  uint32_t mNewChecksum = 0;
  uint32_t mFWChecksum = 0;
  EINTERFACE_TYPE mInterfaceType = EINVALID_INTERFACE;
  EDataSourceFormat mDataSourceFormat = EDS_UNKNOWN;
  BL_HID_REP_GET_BL_PARAMETERS mBLParams{};
  BL_HID_REP_GET_FLASH_DESCRIPTOR mBLDesc{};
  Flash mFlash;
  std::shared_ptr<CIntelHex> mIntelHexData;
  std::shared_ptr<CBinaryAiroFlash> mAiroFlashData;
  std::shared_ptr<CScalarBinary> mScalarBinaryData;
  CInterfaceNotifier* mNotifier = nullptr;  // borrowed; receives every message

 private:
  bool GuardedTransfer(bool& entered_IO, bool isWrite_I, std::vector<uint8_t>& data_IO);
};
