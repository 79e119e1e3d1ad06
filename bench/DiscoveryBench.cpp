// From a hotplug event to the controller's DeviceAttach, on the lab and
// the real clock: a board is plugged into the lab bus, the device
// registry's watch thread hears it and hands its path to DeviceAttach, as
// the device thread of a run does. Beside it, the least any thread hop
// costs on this machine: one condition-variable hand-over between two
// threads, measured in the same loop. Medians, in microseconds.

#include <benchmark/benchmark.h>

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>

#include "CAttachWatcher.h"
#include "lab/CLabDeviceRegistry.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabPenController.h"
#include "lab/CLabUsbControl.h"
#include "platform/linux/CLinuxDiscovery.h"
#include "update/CLinuxUpdateController.h"

namespace {

// One hand-over to a waiting thread and the time it woke.
Clock::time_point HandOver(Clock::time_point& sent_O) {
  std::mutex lock;
  std::condition_variable wake;
  bool sent = false;
  Clock::time_point woke;
  std::thread waiter([&] {
    std::unique_lock<std::mutex> guard(lock);
    wake.wait(guard, [&] { return sent; });
    woke = Clock::now();
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(2));  // the waiter is asleep
  {
    std::lock_guard<std::mutex> guard(lock);
    sent = true;
    sent_O = Clock::now();
  }
  wake.notify_one();
  waiter.join();
  return woke;
}

void BM_HotplugToDeviceAttach(benchmark::State& state) {
  std::shared_ptr<CLabBus> bus = CLabBus::Create();
  auto registry = std::make_shared<CLabDeviceRegistry>(bus);
  auto discovery = std::make_unique<CLinuxDiscovery>(
      registry, [bus] { return std::make_unique<CLabHidNode>(bus); },
      [bus] { return std::make_unique<CLabUsbControl>(bus); });
  CLinuxUpdateController controller(std::move(discovery));
  CAttachWatcher watcher(controller);
  if (!registry->OpenWatch()) {
    state.SkipWithError("no watch");
    return;
  }
  std::thread deviceThread([&] { registry->RunWatch(watcher); });

  std::vector<double> attach, handOver;
  for (auto _ : state) {
    // A board with one usage, so that one plug gives one attach.
    SLabPenDescription description;
    description.usages = {{0xFF00, 0x0001}};
    auto pen = std::make_shared<CLabPenController>(description);
    const Clock::time_point plugged = Clock::now();
    bus->Plug(pen);
    Clock::time_point attached;
    if (!watcher.WaitForAttach(attached)) {
      state.SkipWithError("no attach");
      break;
    }
    attach.push_back(Microseconds(plugged, attached));
    Clock::time_point sent;
    const Clock::time_point woke = HandOver(sent);
    handOver.push_back(Microseconds(sent, woke));
  }
  registry->StopWatching();
  deviceThread.join();
  state.counters["attach_us"] = Median(attach);
  state.counters["handover_us"] = Median(handOver);
}
// Each plug takes the next port of the lab's root hub: 14 stay apart.
BENCHMARK(BM_HotplugToDeviceAttach)->Iterations(14)->Unit(benchmark::kMicrosecond);

}  // namespace
