// Discovery under umockdev-wrapper, on the test set-up of the umockdev
// tests: the real libudev registry watching a tablet that umockdev adds and
// removes, with a bare libudev monitor beside it that sees the same events;
// and the real program, without --lab, listing the end-to-end test's
// tablet, against --version under the same preload.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <libudev.h>
#include <poll.h>
#include <spawn.h>
#include <sys/eventfd.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <deque>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>

#include "CAttachWatcher.h"
#include "lab/CLabProducts.h"
#include "platform/linux/CEmulatedUsbBus.h"
#include "platform/linux/CLinuxDeviceRegistry.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "platform/linux/CLinuxHidNode.h"
#include "platform/linux/CLinuxUsbControl.h"
#include "platform/linux/CUmockdevLabHid.h"
#include "update/CLinuxUpdateController.h"

extern char** environ;

namespace {

// A libudev monitor on hidraw and nothing more, on a thread of its own:
// the moment each event comes out of udev_monitor_receive_device, which is
// all that umockdev's delivery costs before our code sees the event.
class CBareMonitor {
 public:
  CBareMonitor() : mUdev(udev_new()), mWake(eventfd(0, EFD_CLOEXEC)) {
    // The group the registry's watch takes, so that both hear one sender.
    mMonitor = udev_monitor_new_from_netlink(
        mUdev, access("/run/udev/control", F_OK) == 0 ? "udev" : "kernel");
    if (mWake < 0 || mMonitor == nullptr ||
        udev_monitor_filter_add_match_subsystem_devtype(mMonitor, "hidraw", nullptr) < 0 ||
        udev_monitor_enable_receiving(mMonitor) < 0) {
      return;
    }
    mThread = std::thread([this] { Run(); });
  }
  ~CBareMonitor() {
    if (mThread.joinable()) {
      const uint64_t one = 1;
      [[maybe_unused]] const ssize_t written = write(mWake, &one, sizeof(one));
      mThread.join();
    }
    if (mMonitor != nullptr) udev_monitor_unref(mMonitor);
    udev_unref(mUdev);
    if (mWake >= 0) close(mWake);
  }
  bool IsOpen() const { return mThread.joinable(); }

  // When the next event came, which must be `action_I`; false after 5 s.
  bool WaitFor(const std::string& action_I, Clock::time_point& at_O) {
    std::unique_lock<std::mutex> lock(mLock);
    if (!mArrived.wait_for(lock, std::chrono::seconds(5), [this] { return !mEvents.empty(); }))
      return false;
    const auto [action, at] = mEvents.front();
    mEvents.pop_front();
    at_O = at;
    return action == action_I;
  }

 private:
  void Run() {
    for (;;) {
      pollfd fds[2] = {{udev_monitor_get_fd(mMonitor), POLLIN, 0}, {mWake, POLLIN, 0}};
      if (poll(fds, 2, -1) < 0 && errno != EINTR) return;
      if (fds[1].revents != 0) return;
      while (udev_device* device = udev_monitor_receive_device(mMonitor)) {
        const Clock::time_point at = Clock::now();
        const char* action = udev_device_get_action(device);
        std::lock_guard<std::mutex> guard(mLock);
        mEvents.emplace_back(action != nullptr ? action : "", at);
        mArrived.notify_all();
        udev_device_unref(device);
      }
    }
  }

  udev* mUdev;
  udev_monitor* mMonitor = nullptr;
  int mWake;
  std::thread mThread;
  std::mutex mLock;
  std::condition_variable mArrived;
  std::deque<std::pair<std::string, Clock::time_point>> mEvents;
};

// umockdev's client waits for each answer with usleep(0), a real sleep
// under the default timer slack; threads and children made after this
// inherit the setting, as in the end-to-end test.
bool PrepareUmockdev(benchmark::State& state_IO) {
  if (!CEmulatedUsbBus::IsEmulated()) {
    state_IO.SkipWithError("run under umockdev-wrapper");
    return false;
  }
  prctl(PR_SET_TIMERSLACK, 1UL);
  return true;
}

// A vendor collection and nothing else, so that one add gives one attach.
const std::vector<uint8_t> kVendorCollection = {0x06, 0x00, 0xFF, 0x09, 0x01, 0xA1, 0x01, 0xC0};

void BM_UmockdevHotplugToDeviceAttach(benchmark::State& state) {
  if (!PrepareUmockdev(state)) return;
  // The testbed before any monitor: it stands in for the netlink socket.
  CEmulatedUsbBus bus;
  const std::string root = bus.AddRootHub(1);
  auto registry = std::make_shared<CLinuxDeviceRegistry>();
  auto discovery = std::make_unique<CLinuxDiscovery>(
      registry, [] { return std::make_unique<CLinuxHidNode>(); },
      [] { return std::make_unique<CLinuxUsbControl>(); });
  CLinuxUpdateController controller(std::move(discovery));
  CAttachWatcher watcher(controller);
  CBareMonitor bare;
  if (!bare.IsOpen() || !registry->OpenWatch()) {
    state.SkipWithError("no watch");
    return;
  }
  std::thread deviceThread([&] { registry->RunWatch(watcher); });

  std::vector<double> attach, delivered, ours;
  for (auto _ : state) {
    // Timed from the start of the interface's add: its USB interface, HID
    // device and hidraw node, each with its event, as the kernel makes them.
    const std::string usb = bus.AddUsbDevice(root, 1, "2", 0x7A5D, 0x0301, 0x0100);
    const Clock::time_point added = Clock::now();
    const CEmulatedUsbBus::SHidNode node = bus.AddHidInterface(usb, 0, 0, kVendorCollection);
    Clock::time_point attached, seen, gone;
    if (!watcher.WaitForAttach(attached) || !bare.WaitFor("add", seen)) {
      state.SkipWithError("add not delivered");
      break;
    }
    attach.push_back(Microseconds(added, attached));
    delivered.push_back(Microseconds(added, seen));
    ours.push_back(Microseconds(seen, attached));
    // Both have taken the removal in before the next add is timed.
    bus.Unplug(node);
    if (!watcher.WaitForRemoval() || !bare.WaitFor("remove", gone)) {
      state.SkipWithError("remove not delivered");
      break;
    }
  }
  registry->StopWatching();
  deviceThread.join();
  state.counters["attach_us"] = Median(attach);
  state.counters["delivered_us"] = Median(delivered);
  // Event by event, so that what both wait for drops out.
  state.counters["ours_us"] = Median(ours);
}
BENCHMARK(BM_UmockdevHotplugToDeviceAttach)->Iterations(21)->Unit(benchmark::kMicrosecond);

struct SProgramRun {
  double wallMs = 0;
  double cpuMs = 0;  // user and system of the child
  std::string output;
  int status = -1;
};

// The program from exec to exit, its output (standard error with it) in a
// file of `folder_I`, and its settings and state there too.
SProgramRun RunProgram(const std::string& argument_I, const std::string& folder_I) {
  std::vector<std::string> texts;
  for (const char* name : {"CONFIG", "STATE", "DATA"})
    texts.push_back(std::string("XDG_") + name + "_HOME=" + folder_I + "/" + name);
  // The first of two same names is the one read: ours stand alone.
  for (char** entry = environ; *entry != nullptr; ++entry) {
    const std::string text = *entry;
    if (text.rfind("XDG_", 0) != 0 || text.find("_HOME=") == std::string::npos)
      texts.push_back(text);
  }
  std::vector<char*> environment;
  for (std::string& text : texts) environment.push_back(text.data());
  environment.push_back(nullptr);
  std::string program = TAV_PROGRAM, argument = argument_I;
  char* argv[] = {program.data(), argument.data(), nullptr};

  const std::string log = folder_I + "/output";
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
  posix_spawn_file_actions_addopen(&actions, 1, log.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
  posix_spawn_file_actions_adddup2(&actions, 1, 2);
  SProgramRun run;
  const Clock::time_point start = Clock::now();
  pid_t child = -1;
  const int spawned = posix_spawn(&child, argv[0], &actions, nullptr, argv, environment.data());
  posix_spawn_file_actions_destroy(&actions);
  if (spawned != 0) return run;
  int status = 0;
  rusage usage{};
  if (wait4(child, &status, 0, &usage) != child) return run;
  run.wallMs = Microseconds(start, Clock::now()) / 1e3;
  run.cpuMs = (usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) * 1e3 +
              (usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e3;
  run.status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
  std::ifstream in(log);
  std::stringstream text;
  text << in.rdbuf();
  run.output = text.str();
  return run;
}

// The real program, without --lab, lists the end-to-end test's tablet that
// umockdev shows it; --version under the same preload is its floor. The
// two alternate, each going first every other time.
void BM_UmockdevList(benchmark::State& state) {
  if (!PrepareUmockdev(state)) return;
  std::shared_ptr<CLabBus> bus = CLabBus::Create();
  CUmockdevLabHid usb(bus);
  CLabProducts::Plug(*bus, "classic-tablet");
  usb.Sync();
  const char* tmp = std::getenv("TMPDIR");
  std::string folder = std::string(tmp != nullptr ? tmp : "/tmp") + "/list-bench.XXXXXX";
  if (mkdtemp(folder.data()) == nullptr) {
    state.SkipWithError("no folder");
    return;
  }

  std::vector<double> list, listCpu, version, versionCpu;
  bool listFirst = true;
  for (auto _ : state) {
    for (const bool listing : {listFirst, !listFirst}) {
      const SProgramRun run = RunProgram(listing ? "--list" : "--version", folder);
      if (run.status != 0 || run.output.find(listing ? "Lab Classic Tablet" : "tavik-fwupdater") ==
                                 std::string::npos) {
        state.SkipWithError(("unexpected run: " + run.output).c_str());
        break;
      }
      (listing ? list : version).push_back(run.wallMs);
      (listing ? listCpu : versionCpu).push_back(run.cpuMs);
    }
    if (state.error_occurred()) break;
    listFirst = !listFirst;
  }
  std::filesystem::remove_all(folder);
  state.counters["list_ms"] = Median(list);
  state.counters["list_cpu_ms"] = Median(listCpu);
  state.counters["version_ms"] = Median(version);
  state.counters["version_cpu_ms"] = Median(versionCpu);
}
BENCHMARK(BM_UmockdevList)->Iterations(7)->Unit(benchmark::kMillisecond);

}  // namespace
