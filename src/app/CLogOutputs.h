#pragma once
// Attaches the outputs that the user asked for to the log sink, and takes
// them off again when it goes.

#include <cstdio>
#include <string>
#include <vector>

class CLogOutputs {
 public:
  CLogOutputs() = default;
  ~CLogOutputs();
  CLogOutputs(const CLogOutputs&) = delete;
  CLogOutputs& operator=(const CLogOutputs&) = delete;

  void AttachStandardError();
  // Returns false when the file cannot be opened for appending.
  bool AttachFile(const std::string& path_I);

 private:
  std::vector<int> mHandles;
  FILE* mFile = nullptr;
};
