#pragma once
// The helper's log: the journal where there is one, else stderr (a helper
// started by hand, or on a machine without journald).

#include <syslog.h>

namespace HelperLog {

void Print(int priority_I, const char* format_I, ...) __attribute__((format(printf, 2, 3)));

}  // namespace HelperLog
