// Which front-end a run gets from its environment: the window only where a
// display can really be opened, and never with --headless.

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <optional>
#include <string>
#include <tuple>

#include "app/CUpdateCommand.h"

namespace {

namespace fs = std::filesystem;

// A listening socket where a display server keeps its own.
class CSocketFile {
 public:
  explicit CSocketFile(const fs::path& path_I) : mPath(path_I) {
    fs::create_directories(path_I.parent_path());
    mFd = socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::snprintf(address.sun_path, sizeof address.sun_path, "%s", path_I.c_str());
    bound = bind(mFd, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0;
  }
  ~CSocketFile() {
    close(mFd);
    fs::remove(mPath);
  }
  bool bound = false;

 private:
  fs::path mPath;
  int mFd = -1;
};

void SetOrUnset(const char* name_I, const std::optional<std::string>& value_I) {
  if (value_I) {
    setenv(name_I, value_I->c_str(), 1);
  } else {
    unsetenv(name_I);
  }
}

TEST(CUpdateCommand, TheWindowOpensOnlyOnADisplayThatIsThereAndNotHeadless) {
  const fs::path runtime = fs::temp_directory_path() / "front-end-runtime";
  CSocketFile wayland(runtime / "wayland-test");
  ASSERT_TRUE(wayland.bound);
  setenv("XDG_RUNTIME_DIR", runtime.c_str(), 1);
  using Env = std::optional<std::string>;
  // WAYLAND_DISPLAY, DISPLAY, QT_QPA_PLATFORM, headless, window
  const std::vector<std::tuple<Env, Env, Env, bool, bool>> rows = {
      {std::nullopt, std::nullopt, std::nullopt, false, false},
      {"wayland-test", std::nullopt, std::nullopt, false, true},
      {"wayland-test", std::nullopt, std::nullopt, true, false},
      {"wayland-gone", std::nullopt, std::nullopt, false, false},
      {std::nullopt, ":4711", std::nullopt, false, false},  // no X socket for it
      {std::nullopt, "otherhost:0", std::nullopt, false, true},
      {std::nullopt, "", "offscreen", false, true},
      {std::nullopt, std::nullopt, "offscreen", true, false},
  };
  for (const auto& [wayland_I, display_I, platform_I, headless, window] : rows) {
    SCOPED_TRACE(wayland_I.value_or("-") + " " + display_I.value_or("-") + " " +
                 platform_I.value_or("-") + (headless ? " headless" : ""));
    SetOrUnset("WAYLAND_DISPLAY", wayland_I);
    SetOrUnset("DISPLAY", display_I);
    SetOrUnset("QT_QPA_PLATFORM", platform_I);
    EXPECT_EQ(CUpdateCommand::UsesWindow(headless), window);
  }
  for (const char* name : {"WAYLAND_DISPLAY", "DISPLAY", "QT_QPA_PLATFORM", "XDG_RUNTIME_DIR"})
    unsetenv(name);
}

}  // namespace
