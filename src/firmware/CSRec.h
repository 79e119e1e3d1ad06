#pragma once
// The single front-end for firmware files: decides the format from the
// extension and the target interface, loads the file through the matching
// reader and hands the parsed data to the programming path.

#include <memory>
#include <string>
#include <vector>

#include "common/TavTypes.h"
#include "firmware/SContinuousDataBlock.h"

class CIntelHex;
class CBinaryAiroFlash;
class CScalarRTDISP;
class CScalarBinary;

class CSRec {
 public:
  CSRec();
  ~CSRec();
  CSRec(const CSRec&) = default;
  CSRec& operator=(const CSRec&) = default;

  bool Load(const std::string& path_I, EINTERFACE_TYPE interfaceType_I);
  void SetDataSourceFormat(EINTERFACE_TYPE interfaceType_I);
  EDataSourceFormat GetDataSourceFormat() const { return mDataSourceFormat; }
  std::string GetUpdateFile() const { return mUpdateFile; }
  std::string GetUpdateFileExt() const;

  bool IsLoaded() const;
  void Clear();

  std::vector<SContinuousDataBlock> GetSRecData() const { return mSRecData; }
  std::shared_ptr<CIntelHex> GetIntelHexData() const { return mIntelHex; }
  std::shared_ptr<CBinaryAiroFlash> GetBinaryAiroFlashData() const { return mBinaryAiroFlash; }
  std::shared_ptr<CScalarRTDISP> GetScalarRtdIspData() const { return mScalarRtdIsp; }
  std::shared_ptr<CScalarBinary> GetScalarBinaryData() const { return mScalarBinary; }

 private:
  std::vector<SContinuousDataBlock> mSRecData;
  std::string mUpdateFile;
  EDataSourceFormat mDataSourceFormat = EDS_UNKNOWN;
  std::shared_ptr<CIntelHex> mIntelHex;
  std::shared_ptr<CBinaryAiroFlash> mBinaryAiroFlash;
  std::shared_ptr<CScalarRTDISP> mScalarRtdIsp;
  std::shared_ptr<CScalarBinary> mScalarBinary;
};
