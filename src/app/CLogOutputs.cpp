#include "app/CLogOutputs.h"

#include "common/TavLog.h"

CLogOutputs::~CLogOutputs() {
  for (int handle : mHandles) TavLog::RemoveOutput(handle);
  if (mFile != nullptr) std::fclose(mFile);
}

void CLogOutputs::AttachStandardError() {
  mHandles.push_back(TavLog::AddOutput([](const std::string& text_I) {
    std::fputs(text_I.c_str(), stderr);
    // Lines are complete only when their text says so; a Debug piece may
    // continue on the next call.
    std::fflush(stderr);
  }));
}

bool CLogOutputs::AttachFile(const std::string& path_I) {
  if (mFile != nullptr) return true;
  mFile = std::fopen(path_I.c_str(), "a");
  if (mFile == nullptr) return false;
  FILE* file = mFile;
  mHandles.push_back(TavLog::AddOutput([file](const std::string& text_I) {
    std::fputs(text_I.c_str(), file);
    std::fflush(file);
  }));
  return true;
}
