#pragma once
// A named lock for many readers or one writer. Every operation answers 0, or
// 65535 after the assertion "aStatus == 0" when the underlying lock refused.

#include <memory>

class CTavReaderWriterSemaphore {
 public:
  static constexpr int kFailed = 65535;

  virtual ~CTavReaderWriterSemaphore() = default;

  // The platform's form. On Linux this is CLinuxReaderWriterSemaphore.
  static std::shared_ptr<CTavReaderWriterSemaphore> New(const char* name_I);

  virtual int Init() = 0;
  virtual int RequestReader() = 0;
  virtual int ReleaseReader() = 0;
  virtual int RequestWriter() = 0;
  virtual int ReleaseWriter() = 0;
};
