#pragma once
// Runs a function only when the flag it was built from was true, so that
// trace lines cost nothing in normal runs:
//   ConditionalFunction(g_DebugTrace != 0)([&] { TavLog::Debug(...); });
// The call operator gives the object back, so calls can be chained.

#include <utility>

class ConditionalFunction {
 public:
  explicit ConditionalFunction(bool run_I) : mRun(run_I) {}

  template <class F>
  const ConditionalFunction& operator()(F&& function_I) const {
    if (mRun) std::forward<F>(function_I)();
    return *this;
  }

 private:
  bool mRun;
};
