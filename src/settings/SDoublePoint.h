#pragma once
// A point in fractional units; freezes into a map with the keys "x" and "y".

struct SDoublePoint {
  double x = 0.0;
  double y = 0.0;

  SDoublePoint() = default;
  SDoublePoint(double x_I, double y_I) : x(x_I), y(y_I) {}
  bool operator==(const SDoublePoint&) const = default;
};
