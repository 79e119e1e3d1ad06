#pragma once
// The single front-end for firmware files: decides the format from the
// extension and the target interface, loads the file through the matching
// reader and hands the parsed data to the programming path.

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "common/TavTypes.h"
#include "firmware/CSRecBlockBuilder.h"
#include "firmware/SContinuousDataBlock.h"

class CIntelHex;
class CBinaryAiroFlash;
class CScalarRTDISP;
class CScalarBinary;
class CTextLineReader;

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
  // The same blocks without a copy, for readers that only look (a 16 MiB
  // image in small blocks would otherwise be held twice).
  const std::vector<SContinuousDataBlock>& GetSRecDataRef() const { return mSRecData; }
  std::shared_ptr<CIntelHex> GetIntelHexData() const { return mIntelHex; }
  std::shared_ptr<CBinaryAiroFlash> GetBinaryAiroFlashData() const { return mBinaryAiroFlash; }
  std::shared_ptr<CScalarRTDISP> GetScalarRtdIspData() const { return mScalarRtdIsp; }
  std::shared_ptr<CScalarBinary> GetScalarBinaryData() const { return mScalarBinary; }

  // The format a file of this path gets on this interface: the lower-cased
  // text after the path's last dot decides, and for "bin" the interface.
  static EDataSourceFormat FormatFor(const std::string& path_I, EINTERFACE_TYPE interfaceType_I);
  // The lower-cased text after the last dot anywhere in the path; empty
  // without a dot.
  static std::string ExtensionOf(const std::string& path_I);

  // Two hexadecimal characters at index_I and index_I + 1 to a number. Only
  // the first character is folded to upper case, so "3a" gives 90 and not
  // 58; the result is not reduced to 8 bits and no character is refused.
  static int ParseByte(std::string_view line_I, size_t index_I);
  static bool BlocksAscSorter(const SContinuousDataBlock& a_I, const SContinuousDataBlock& b_I);

 private:
  enum class ELineResult { eRead, eSkipped, eFailed };

  bool LoadSRecFile(const std::string& path_I);
  bool LoadIntelHexFile(const std::string& path_I);
  bool LoadAiroHaBinaryFile(const std::string& path_I);
  bool LoadScalarRtdIspFile(const std::string& path_I);
  bool LoadScalarBinaryFile(const std::string& path_I);

  bool ReadSRecLines(CTextLineReader& reader_IO);
  ELineResult ReadSRecLine(std::string_view line_I, int lineNumber_I,
                           SContinuousDataBlock& record_O);
  bool FinishSRecData();
  bool AddRecordToSRecData(const SContinuousDataBlock& record_I);

  std::vector<SContinuousDataBlock> mSRecData;
  std::string mUpdateFile;
  EDataSourceFormat mDataSourceFormat = EDS_UNKNOWN;
  std::shared_ptr<CIntelHex> mIntelHex;
  std::shared_ptr<CBinaryAiroFlash> mBinaryAiroFlash;
  std::shared_ptr<CScalarRTDISP> mScalarRtdIsp;
  std::shared_ptr<CScalarBinary> mScalarBinary;

  // Only while an S-record file is read: its records, merged into
  // mSRecData when the file has been read.
  CSRecBlockBuilder mBlockBuilder;
};
