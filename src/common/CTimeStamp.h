#pragma once
// The program's wall clock in whole seconds.

class CTimeStamp {
 public:
  virtual ~CTimeStamp() = default;

  static CTimeStamp* SharedInstance();
  static void DisposeInstance();
  static double CurrentTimeInSeconds();

  // Seconds of gettimeofday; the microseconds are left out.
  virtual double GetCurrentSystemTime();

 private:
  static CTimeStamp* mSelf;
};
