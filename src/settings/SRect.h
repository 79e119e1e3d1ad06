#pragma once
// A rectangle in whole units. The edges are derived from origin and size;
// epsilon is the offset between the width and the inclusive right edge, so a
// pixel rectangle uses 1 and a geometric one 0.

#include <cstdint>

#include "settings/SPoint.h"

struct SRect {
  SPoint origin;
  int32_t width = 0;
  int32_t height = 0;
  int32_t epsilon = 0;

  SRect(SPoint origin_I, int32_t width_I, int32_t height_I, int32_t epsilon_I)
      : origin(origin_I), width(width_I), height(height_I), epsilon(epsilon_I) {}
  explicit SRect(int32_t epsilon_I) : epsilon(epsilon_I) {}

  static SRect FromEdges(int32_t left_I, int32_t top_I, int32_t right_I, int32_t bottom_I,
                         int32_t epsilon_I) {
    return SRect(SPoint(left_I, top_I), right_I - left_I + epsilon_I, bottom_I - top_I + epsilon_I,
                 epsilon_I);
  }

  // A rectangle smaller than its epsilon moves its top left edge by the sum
  // of size and epsilon, not by their difference.
  int32_t Top() const { return origin.y + (height < epsilon ? height + epsilon : 0); }
  int32_t Left() const { return origin.x + (width < epsilon ? width + epsilon : 0); }
  int32_t Bottom() const { return origin.y + (height - epsilon >= 0 ? height - epsilon : 0); }
  int32_t Right() const { return origin.x + (width - epsilon >= 0 ? width - epsilon : 0); }
  int32_t Width() const { return width; }

  bool operator==(const SRect&) const = default;
};
