// Which front-end a run takes: the window where a display can be reached
// or a Qt platform is given, unless --headless; the terminal otherwise.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "app/CUpdateCommand.h"

namespace {

TEST(FrontEnd, WindowOnlyWithADisplayThatCanBeReachedAndWithoutHeadless) {
  const std::string wayland =
      (std::filesystem::temp_directory_path() / "front-end-wayland-0").string();
  std::ofstream(wayland) << "";  // stands in for the compositor's socket
  // --headless, WAYLAND_DISPLAY, DISPLAY, QT_QPA_PLATFORM, and the window?
  const std::vector<std::tuple<bool, const char*, const char*, const char*, bool>> rows = {
      {false, "", "", "", false},
      {false, "", "", "offscreen", true},
      {true, "", "", "offscreen", false},
      {false, wayland.c_str(), "", "", true},
      {false, "/nonexistent/wayland-9", "", "", false},
      {false, "", ":987", "", false},  // no X server has that socket
      {false, "", "otherhost:10.0", "", true},
  };
  for (const auto& [headless, waylandDisplay, display, platform, window] : rows) {
    SCOPED_TRACE(std::string(waylandDisplay) + "|" + display + "|" + platform);
    setenv("WAYLAND_DISPLAY", waylandDisplay, 1);
    setenv("DISPLAY", display, 1);
    setenv("QT_QPA_PLATFORM", platform, 1);
    EXPECT_EQ(CUpdateCommand::UsesWindow(headless), window);
  }
  std::filesystem::remove(wayland);
}

}  // namespace
