#include "firmware/CScalarRTDISP.h"

#include <memory>
#include <new>

#include "common/TavLog.h"
#include "firmware/HexDumpLog.h"

CScalarRTDISP::~CScalarRTDISP() {
  ClearData();
  CloseFile();
}

bool CScalarRTDISP::Load(const std::string& path_I) {
  if (!OpenFile(path_I)) {
    TavLog::Error("CScalarRTDISP::Load: ERROR - couldn't open file: %s\n", path_I.c_str());
    return false;
  }
  TavLog::Info("CScalarRTDISP::Load: - opened file: %s\n", path_I.c_str());

  const uint64_t fileSize = FileSize();
  mSize = static_cast<uint32_t>(fileSize);
  if (mSize == 0) {
    TavLog::Error("CScalarRTDISP::Load: ERROR - empty file: %s\n", path_I.c_str());
    return false;
  }
  std::unique_ptr<char[]> buffer;
  if (fileSize <= UINT32_MAX) buffer.reset(new (std::nothrow) char[mSize]);
  if (!buffer) {
    TavLog::Error("CScalarRTDISP::Load: ERROR - could not alloc data buf\n");
    return false;
  }
  mStream.read(buffer.get(), mSize);
  if (mStream.bad() || (mStream.fail() && !mStream.eof())) {
    TavLog::Error("CScalarRTDISP::Load: ERROR - read failed\n");
    return false;
  }

  CloseFile();
  mData.assign(buffer.get(), buffer.get() + mSize);
  DumpData();
  TavLog::Info("CScalarRTDISP::Load: done!\n");
  return true;
}

bool CScalarRTDISP::OpenFile(const std::string& path_I) {
  // A failed load leaves its stream open; a new load starts afresh.
  CloseFile();
  mStream.clear();
  mStream.open(path_I, std::ios::in | std::ios::binary);
  if (mStream.is_open()) mFileName = path_I;
  return mStream.is_open();
}

void CScalarRTDISP::CloseFile() {
  if (mStream.is_open()) mStream.close();
}

uint64_t CScalarRTDISP::FileSize() {
  if (!mStream.is_open()) return 0;
  mStream.seekg(0, std::ios::end);
  const std::streamoff end = mStream.tellg();
  mStream.seekg(0, std::ios::beg);
  return end > 0 ? static_cast<uint64_t>(end) : 0;
}

void CScalarRTDISP::ClearData() { mData.clear(); }

void CScalarRTDISP::DumpData() const {
  HexDumpLog::Write("CScalarRTDISP flash data:\n", mData.data(), mData.size());
}
