#pragma once
// Where a lab firmware image names its release: the six bytes "TAVREL" and
// then the release as the USB descriptor shows it (bcdDevice), low byte
// first. A board in normal mode shows the release its image names, taken
// when it starts; an image that names none (the factory image) runs the
// release the board shipped with. The lab's firmware files name a newer
// release than their boards ship with, so an update visibly moves it.

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>

constexpr uint8_t kLabReleaseMarker[] = {'T', 'A', 'V', 'R', 'E', 'L'};

inline std::optional<uint16_t> FindLabRelease(const uint8_t* data_I, size_t size_I) {
  const uint8_t* end = data_I + size_I;
  const uint8_t* at =
      std::search(data_I, end, std::begin(kLabReleaseMarker), std::end(kLabReleaseMarker));
  if (end - at < static_cast<std::ptrdiff_t>(sizeof kLabReleaseMarker + 2)) return std::nullopt;
  at += sizeof kLabReleaseMarker;
  return static_cast<uint16_t>(at[0] | (at[1] << 8));
}
