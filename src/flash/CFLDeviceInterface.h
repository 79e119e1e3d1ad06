#pragma once
// The flash-loader device interface of one board. Everything above the
// transports holds it through a shared pointer.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "common/TavTypes.h"
#include "firmware/SContinuousDataBlock.h"
#include "flash/CInterfaceNotifier.h"
#include "flash/FLProtocolTypes.h"

class CIntelHex;
class CBinaryAiroFlash;
class CScalarBinary;

class CFLDeviceInterface {
 public:
  virtual ~CFLDeviceInterface() = default;

  // Transport operations.
  virtual bool Open() = 0;
  virtual void Close() = 0;
  virtual bool SwitchToBLMode() = 0;
  virtual bool SwitchFromBLMode(bool save_I) = 0;
  virtual bool IsAlive() = 0;

  virtual void RegisterCallback(CInterfaceNotifier* notifier_I) { mNotifier = notifier_I; }
  virtual void UnregisterCallback() { mNotifier = nullptr; }

  virtual void SetIsFlashLoader(bool isFlashLoader_I) { mIsFlashLoader = isFlashLoader_I; }
  virtual bool GetIsFlashLoader() const { return mIsFlashLoader; }
  virtual void SetDataSourceFormat(EDataSourceFormat format_I) { mDataSourceFormat = format_I; }
  virtual EDataSourceFormat GetDataSourceFormat() const { return mDataSourceFormat; }
  virtual void SetProtocolType(EFLProtocolType protocolType_I) = 0;
  virtual EINTERFACE_TYPE GetInterfaceType() const { return mInterfaceType; }
  virtual void SetPath(const std::string& path_I) { mPath = path_I; }
  virtual std::string GetPath() const { return mPath; }
  virtual uint32_t GetVersion() const { return mVersion; }
  virtual std::string ToString() const = 0;

  // Reads the loader's parameters and lays the S-record image over its
  // flash blocks.
  virtual bool Init(const std::vector<SContinuousDataBlock>& data_I) = 0;
  virtual BL_HID_REP_GET_BL_PARAMETERS GetBLParamData() const { return mBLParams; }

  virtual void SetIntelHexData(std::shared_ptr<CIntelHex> data_I) { mIntelHexData = std::move(data_I); }
  virtual void SetBinaryAiroFlashData(std::shared_ptr<CBinaryAiroFlash> data_I) {
    mAiroFlashData = std::move(data_I);
  }
  virtual void SetScalarBinaryData(std::shared_ptr<CScalarBinary> data_I) {
    mScalarBinaryData = std::move(data_I);
  }

  virtual bool ProgramBoard() = 0;

  virtual uint32_t GetOldChecksum() const { return mOldChecksum; }
  virtual uint32_t GetNewChecksum() const { return mNewChecksum; }
  virtual uint32_t GetFWChecksum() const { return mFWChecksum; }
  virtual void UpdateChecksums(uint32_t oldSum_I, uint32_t newSum_I, uint32_t fwSum_I) {
    mOldChecksum = oldSum_I;
    mNewChecksum = newSum_I;
    mFWChecksum = fwSum_I;
  }

 protected:
  explicit CFLDeviceInterface(EINTERFACE_TYPE interfaceType_I) : mInterfaceType(interfaceType_I) {}

  CInterfaceNotifier* mNotifier = nullptr;  // borrowed
  EINTERFACE_TYPE mInterfaceType = EINVALID_INTERFACE;
  std::string mPath;
  uint32_t mVersion = 0;
  bool mIsFlashLoader = false;
  EDataSourceFormat mDataSourceFormat = EDS_UNKNOWN;
  BL_HID_REP_GET_BL_PARAMETERS mBLParams{};
  uint32_t mOldChecksum = 0;
  uint32_t mNewChecksum = 0;
  uint32_t mFWChecksum = 0;
  std::shared_ptr<CIntelHex> mIntelHexData;
  std::shared_ptr<CBinaryAiroFlash> mAiroFlashData;
  std::shared_ptr<CScalarBinary> mScalarBinaryData;
};
