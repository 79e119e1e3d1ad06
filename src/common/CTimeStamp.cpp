#include "common/CTimeStamp.h"

#include <sys/time.h>

CTimeStamp* CTimeStamp::mSelf = nullptr;

CTimeStamp* CTimeStamp::SharedInstance() {
  if (mSelf == nullptr) mSelf = new CTimeStamp();
  return mSelf;
}

void CTimeStamp::DisposeInstance() {
  delete mSelf;
  mSelf = nullptr;
}

double CTimeStamp::CurrentTimeInSeconds() { return SharedInstance()->GetCurrentSystemTime(); }

double CTimeStamp::GetCurrentSystemTime() {
  timeval now{};
  gettimeofday(&now, nullptr);
  return static_cast<double>(now.tv_sec);
}
