#include "platform/linux/LinuxUsbTopology.h"

uint32_t LocationIdFromTopology(unsigned int busNumber_I, const std::string& devpath_I) {
  if (busNumber_I == 0 || busNumber_I > 0xFF || devpath_I.empty()) return 0;
  uint32_t location = busNumber_I << 24;
  int shift = 20;
  unsigned int port = 0;
  bool digits = false;
  for (size_t i = 0; i <= devpath_I.size(); ++i) {
    const char c = i < devpath_I.size() ? devpath_I[i] : '.';
    if (c >= '0' && c <= '9') {
      port = port * 10 + static_cast<unsigned int>(c - '0');
      digits = true;
      if (port > 15) return 0;
      continue;
    }
    if (c != '.' || !digits || port == 0 || shift < 0) return 0;
    location |= port << shift;
    shift -= 4;
    port = 0;
    digits = false;
  }
  return location;
}
