#pragma once
// A point in whole units; freezes into a map with the keys "x" and "y".

#include <cstdint>

struct SPoint {
  int32_t x = 0;
  int32_t y = 0;

  SPoint() = default;
  SPoint(int32_t x_I, int32_t y_I) : x(x_I), y(y_I) {}
  bool operator==(const SPoint&) const = default;
};
