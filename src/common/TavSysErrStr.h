#pragma once
#include <string>

// The text of a system error number, for log lines.
std::string TavSysErrStr(int error_I);
