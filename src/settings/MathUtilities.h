#pragma once
// Number texts of the settings forms: the test for a plain decimal integer
// and the lenient conversions that read what they can and log the rest.

#include <cstdint>
#include <string>

namespace MathUtilities {

// Not empty, only "-0123456789", and a minus sign only in front.
bool IsInteger(const std::string& text_I);

// Trims, then converts in base 10 the way stoll does: "12abc" gives 12.
// A text that does not convert, or is out of range, logs and gives default_I.
int64_t StringToInteger(const std::string& text_I, int64_t default_I);

// The same with the conversion of stod.
double StringToDouble(const std::string& text_I, double default_I);

}  // namespace MathUtilities
