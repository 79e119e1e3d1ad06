#include "platform/linux/CLinuxDisplays.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>

namespace {

std::vector<uint8_t> ReadBytes(const std::filesystem::path& path_I) {
  std::ifstream in(path_I, std::ios::binary);
  return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), {});
}

bool IsConnected(const std::filesystem::path& connector_I) {
  std::ifstream in(connector_I / "status");
  std::string status;
  return std::getline(in, status) && status == "connected";
}

}  // namespace

std::vector<SDisplay> CLinuxDisplays::List() const {
  std::vector<SDisplay> displays;
  std::error_code error;
  // A missing folder (no DRM driver) or an entry that vanishes meanwhile
  // leaves what was read so far.
  for (std::filesystem::directory_iterator entry(mClassFolder, error), end; !error && entry != end;
       entry.increment(error)) {
    // Cards and render nodes have no status: only connectors do.
    if (!IsConnected(entry->path())) continue;
    SDisplay display;
    display.connector = entry->path().filename().string();
    display.edid = ReadBytes(entry->path() / "edid");
    displays.push_back(std::move(display));
  }
  std::sort(displays.begin(), displays.end(),
            [](const SDisplay& a, const SDisplay& b) { return a.connector < b.connector; });
  return displays;
}
