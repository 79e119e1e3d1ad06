#pragma once
// A rectangle in fractional units, with the same edge rules as SRect.

#include "settings/SDoublePoint.h"

struct SDoubleRect {
  SDoublePoint origin;
  double width = 0.0;
  double height = 0.0;
  double epsilon = 0.0;

  SDoubleRect(SDoublePoint origin_I, double width_I, double height_I, double epsilon_I)
      : origin(origin_I), width(width_I), height(height_I), epsilon(epsilon_I) {}
  explicit SDoubleRect(double epsilon_I) : epsilon(epsilon_I) {}

  static SDoubleRect FromEdges(double left_I, double top_I, double right_I, double bottom_I,
                               double epsilon_I) {
    return SDoubleRect(SDoublePoint(left_I, top_I), right_I - left_I + epsilon_I,
                       bottom_I - top_I + epsilon_I, epsilon_I);
  }

  double Top() const { return origin.y + (height < epsilon ? height + epsilon : 0.0); }
  double Left() const { return origin.x + (width < epsilon ? width + epsilon : 0.0); }
  double Bottom() const { return origin.y + (height - epsilon >= 0.0 ? height - epsilon : 0.0); }
  double Right() const { return origin.x + (width - epsilon >= 0.0 ? width - epsilon : 0.0); }
  double Width() const { return width; }

  bool operator==(const SDoubleRect&) const = default;
};
