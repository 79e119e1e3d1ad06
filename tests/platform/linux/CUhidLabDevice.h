#pragma once
// A lab board shown to the real kernel through /dev/uhid: while the board
// is attached to its lab bus, its HID interfaces are one uhid device (bus
// USB, the board's ids and release, one top-level collection per usage
// pair), whose feature reports the board answers. When the board drops off
// the bus the device is destroyed, and it is created again, under whatever
// ids the board then shows, when the board comes back.
//
// uhid passes no length with a get report, so the reply has the length the
// board declares for that report id; a board error goes back as EIO, the
// only error uhid knows. Reports are served on a thread of this object's.

#include <fcntl.h>
#include <linux/uhid.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <memory>
#include <thread>
#include <vector>

#include "lab/CLabBus.h"

class CUhidLabDevice {
 public:
  CUhidLabDevice(std::shared_ptr<CLabBus> bus_I, std::shared_ptr<CLabBoard> board_I)
      : mBus(std::move(bus_I)),
        mBoard(std::move(board_I)),
        mFd(::open("/dev/uhid", O_RDWR | O_CLOEXEC)),
        mWake(eventfd(0, EFD_CLOEXEC)) {
    if (mFd < 0) return;
    mListener = mBus->AddListener([this](const SLabInterface&, bool) { Wake(); });
    mThread = std::thread([this] { Serve(); });
  }
  ~CUhidLabDevice() {
    if (mFd >= 0) {
      mBus->RemoveListener(mListener);
      mStop = true;
      Wake();
      mThread.join();
      Destroy();
      ::close(mFd);
    }
    ::close(mWake);
  }
  CUhidLabDevice(const CUhidLabDevice&) = delete;
  CUhidLabDevice& operator=(const CUhidLabDevice&) = delete;

  bool IsOpen() const { return mFd >= 0; }

  // The report descriptor of `interfaces_I`: per usage pair one application
  // collection holding one 8-bit feature field.
  static std::vector<uint8_t> Descriptor(const std::vector<SLabInterface>& interfaces_I) {
    std::vector<uint8_t> bytes;
    for (const SLabInterface& entry : interfaces_I) {
      const uint32_t page = entry.info.usagePage;
      const uint32_t usage = entry.info.usage;
      bytes.insert(bytes.end(), {0x06, uint8_t(page),  uint8_t(page >> 8),
                                 0x0A, uint8_t(usage), uint8_t(usage >> 8),
                                 0xA1, 0x01,           0x09,
                                 0x01, 0x15,           0x00,
                                 0x26, 0xFF,           0x00,
                                 0x75, 0x08,           0x95,
                                 0x01, 0xB1,           0x02,
                                 0xC0});
    }
    return bytes;
  }

 private:
  void Wake() {
    const uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = ::write(mWake, &one, sizeof(one));
  }

  void Serve() {
    Sync();
    while (!mStop) {
      pollfd fds[2] = {{mFd, POLLIN, 0}, {mWake, POLLIN, 0}};
      if (::poll(fds, 2, -1) < 0 && errno != EINTR) return;
      if (fds[1].revents & POLLIN) {
        uint64_t count = 0;
        [[maybe_unused]] const ssize_t got = ::read(mWake, &count, sizeof(count));
        Sync();
      }
      if (fds[0].revents & POLLIN) Answer();
    }
  }

  // The board's HID interfaces as the bus lists them now.
  std::vector<SLabInterface> Shown() const {
    std::vector<SLabInterface> shown;
    for (const SLabInterface& entry : mBus->ListInterfaces()) {
      if (entry.info.locationId == mBoard->GetLocationId() && entry.link == ELabLink::eHid)
        shown.push_back(entry);
    }
    return shown;
  }

  void Sync() {
    const std::vector<SLabInterface> now = Shown();
    if (mShowing && (now != mInterfaces || !mBus->IsCurrent(mBinding))) Destroy();
    if (mShowing || now.empty()) return;
    // Reports go to the vendor collection, as the boards answer them there.
    DeviceInfo target = now.front().info;
    for (const SLabInterface& entry : now) {
      if (entry.info.usagePage >= 0xFF00) target = entry.info;
    }
    if (mBus->OpenHid(target, mBinding) != EHidStatus::eSuccess) return;
    uhid_event event{};
    event.type = UHID_CREATE2;
    auto& create = event.u.create2;
    std::strncpy(reinterpret_cast<char*>(create.name), mBoard->GetName().c_str(),
                 sizeof(create.name) - 1);
    std::strncpy(reinterpret_cast<char*>(create.phys), "lab", sizeof(create.phys) - 1);
    const std::vector<uint8_t> descriptor = Descriptor(now);
    create.rd_size = static_cast<uint16_t>(descriptor.size());
    std::memcpy(create.rd_data, descriptor.data(), descriptor.size());
    create.bus = 0x03;  // BUS_USB
    create.vendor = now.front().info.vendorId;
    create.product = now.front().info.productId;
    create.version = now.front().release;
    if (::write(mFd, &event, sizeof(event)) != sizeof(event)) {
      mBus->Release(mBinding);
      return;
    }
    mInterfaces = now;
    mShowing = true;
  }

  void Destroy() {
    if (!mShowing) return;
    uhid_event event{};
    event.type = UHID_DESTROY;
    [[maybe_unused]] const ssize_t written = ::write(mFd, &event, sizeof(event));
    mBus->Release(mBinding);
    mShowing = false;
  }

  void Answer() {
    uhid_event request{};
    if (::read(mFd, &request, sizeof(request)) <= 0) return;
    uhid_event reply{};
    if (request.type == UHID_GET_REPORT) {
      const auto& get = request.u.get_report;
      reply.type = UHID_GET_REPORT_REPLY;
      reply.u.get_report_reply.id = get.id;
      size_t length = 0;
      mBus->WithBoard(mBinding,
                      [&](CLabBoard& board_I) { length = board_I.GetFeatureLength(get.rnum); });
      std::vector<uint8_t> report(std::max<size_t>(length, 1), 0);
      report[0] = get.rnum;
      const bool ok = length > 0 && mBus->GetFeature(mBinding, report) == EHidStatus::eSuccess;
      reply.u.get_report_reply.err = ok ? 0 : EIO;
      reply.u.get_report_reply.size = ok ? static_cast<uint16_t>(report.size()) : 0;
      if (ok) std::memcpy(reply.u.get_report_reply.data, report.data(), report.size());
    } else if (request.type == UHID_SET_REPORT) {
      const auto& set = request.u.set_report;
      reply.type = UHID_SET_REPORT_REPLY;
      reply.u.set_report_reply.id = set.id;
      const std::vector<uint8_t> report(set.data, set.data + set.size);
      reply.u.set_report_reply.err =
          mBus->SetFeature(mBinding, report) == EHidStatus::eSuccess ? 0 : EIO;
    } else {
      return;  // start, stop, open, close and output reports need no answer
    }
    [[maybe_unused]] const ssize_t written = ::write(mFd, &reply, sizeof(reply));
  }

  std::shared_ptr<CLabBus> mBus;
  std::shared_ptr<CLabBoard> mBoard;
  int mFd;
  int mWake;
  int mListener = 0;
  std::thread mThread;
  std::atomic<bool> mStop{false};
  // The serving thread's, once it runs.
  bool mShowing = false;
  std::vector<SLabInterface> mInterfaces;
  CLabBus::SBinding mBinding;
};
