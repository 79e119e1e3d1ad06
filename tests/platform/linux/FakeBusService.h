#pragma once
// A stand-in service on the private bus: one object served under one name,
// answered on a thread of its own, or not at all for a service that hangs.
// Its handlers note what they were asked in Record.

#include <systemd/sd-bus.h>

#include <atomic>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

class CFakeBusService {
 public:
  CFakeBusService(const char* name_I, const char* path_I, const char* interface_I,
                  const sd_bus_vtable* vtable_I, void* handlers_I, bool answers_I = true) {
    if (sd_bus_open_system(&mBus) < 0) return;
    sd_bus_add_object_vtable(mBus, nullptr, path_I, interface_I, vtable_I, handlers_I);
    mReady = sd_bus_request_name(mBus, name_I, 0) >= 0;
    if (!answers_I) return;
    mThread = std::thread([this] {
      while (!mStop) {
        if (sd_bus_process(mBus, nullptr) > 0) continue;
        sd_bus_wait(mBus, 20 * 1000);
      }
    });
  }
  ~CFakeBusService() {
    mStop = true;
    if (mThread.joinable()) mThread.join();
    sd_bus_flush_close_unref(mBus);
  }
  CFakeBusService(const CFakeBusService&) = delete;
  CFakeBusService& operator=(const CFakeBusService&) = delete;

  bool IsReady() const { return mReady; }
  void Record(const std::string& what_I) {
    std::lock_guard<std::mutex> guard(mLock);
    mRecords.push_back(what_I);
  }
  std::vector<std::string> Records() {
    std::lock_guard<std::mutex> guard(mLock);
    return mRecords;
  }

 private:
  sd_bus* mBus = nullptr;
  bool mReady = false;
  std::atomic<bool> mStop{false};
  std::thread mThread;
  std::mutex mLock;
  std::vector<std::string> mRecords;
};
