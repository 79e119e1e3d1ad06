#pragma once
// A named lock that one thread may take several times (it must release it
// as often). Every operation answers 0, or 65535 after the assertion
// "aStatus == 0" when the underlying lock refused; callers need not read the
// code, the assertion is the report.

#include <memory>

class CTavSemaphore {
 public:
  static constexpr int kFailed = 65535;

  virtual ~CTavSemaphore() = default;

  // The platform's form. On Linux this is CLinuxSemaphore.
  static std::shared_ptr<CTavSemaphore> New(const char* name_I);

  virtual int Init() = 0;
  virtual int RequestSemaphore() = 0;
  virtual int ReleaseSemaphore() = 0;
};
