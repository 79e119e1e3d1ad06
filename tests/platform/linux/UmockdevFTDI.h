#pragma once
// A lab FTDI bridge as umockdev shows it to libftdi1: a high-speed USB
// device (0403:6014, release 0x0900, one vendor interface with bulk
// endpoints 0x81 in and 0x02 out) behind a hub at the bridge's location,
// whose usbfs node the lab bridge answers. FTDI's vendor requests reach its
// reset, purge and bit mode; bulk OUT feeds its engine; bulk IN carries
// what the engine has, two modem-status bytes ahead of every 512-byte
// packet, as the chip sends it. Once the bridge has dropped off the lab bus
// the node answers ENODEV, as usbfs does for a disconnected device.
//
// The handler runs on umockdev's thread and touches only the lab bus,
// which has its own lock, and the claim, which has this one's.

#include <linux/ioctl.h>
#include <linux/usbdevice_fs.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "lab/CLabBus.h"
#include "lab/CLabFTDIBridge.h"
#include "platform/linux/CEmulatedUsbBus.h"

class UmockdevFTDI : public CEmulatedUsbBus {
 public:
  static constexpr size_t kPacketSize = 512;
  static constexpr uint8_t kModemStatus[2] = {0x32, 0x60};

  // Shows `bridge_I`, plugged into `bus_I`, at its location on bus 1.
  UmockdevFTDI(std::shared_ptr<CLabBus> bus_I, std::shared_ptr<CLabFTDIBridge> bridge_I)
      : mBus(std::move(bus_I)), mBridge(std::move(bridge_I)) {
    const uint32_t location = mBridge->GetLocationId();
    const std::string hubPort = std::to_string((location >> 20) & 0xF);
    const std::string port = hubPort + "." + std::to_string((location >> 16) & 0xF);
    const std::string root = AddRootHub(1);
    AddUsbfsDevice(root, hubPort, 2, 0x7A5D, 0x00F0, 0x0100, Configuration(0x09));
    const std::string hub = root + "/1-" + hubPort;
    mHandler = umockdev_ioctl_base_new();
    g_signal_connect(mHandler, "handle-ioctl", G_CALLBACK(&UmockdevFTDI::HandleIoctl), this);
    umockdev_testbed_attach_ioctl(GetTestbed(), "/dev/bus/usb/001/003", mHandler, nullptr);
    mPath = hub + "/1-" + port;
    AddUsbfsDevice(hub, port, 3, CLabFTDIBridge::kVendorId, CLabFTDIBridge::kProductId,
                   CLabFTDIBridge::kBridgeRelease, Configuration(0xFF, {0x81, 0x02}));
  }
  ~UmockdevFTDI() {
    Unplug();
    umockdev_testbed_detach_ioctl(GetTestbed(), "/dev/bus/usb/001/003", nullptr);
    g_object_unref(mHandler);
    std::lock_guard<std::mutex> guard(mLock);
    for (UMockdevIoctlData* urb : mReapable) umockdev_ioctl_data_unref(urb);
    if (mClaimed) mBus->Release(mBinding);
  }

  // Takes the bridge's device out of sysfs with its remove event, as the
  // kernel does once it has dropped off.
  void Unplug() {
    if (mPath.empty()) return;
    Remove(mPath);
    mPath.clear();
  }

 private:
  // Runs `work_I` on the claimed bridge; false once it is gone.
  bool OnBridge(const std::function<void(CLabFTDIBridge&)>& work_I) {
    CLabBus::SBinding binding;
    {
      std::lock_guard<std::mutex> guard(mLock);
      if (!mClaimed) return false;
      binding = mBinding;
    }
    return mBus->WithBoard(
        binding, [&](CLabBoard& board_I) { work_I(static_cast<CLabFTDIBridge&>(board_I)); });
  }

  static gboolean HandleIoctl(UMockdevIoctlBase*, UMockdevIoctlClient* client_I,
                              UmockdevFTDI* self_I) {
    const unsigned long request = umockdev_ioctl_client_get_request(client_I);
    UMockdevIoctlData* argument = umockdev_ioctl_client_get_arg(client_I);
    switch (request) {
      case USBDEVFS_GET_CAPABILITIES: {
        UMockdevIoctlData* data = umockdev_ioctl_data_resolve(argument, 0, 4, nullptr);
        *reinterpret_cast<guint32*>(data->data) =
            USBDEVFS_CAP_BULK_CONTINUATION | USBDEVFS_CAP_NO_PACKET_SIZE_LIM |
            USBDEVFS_CAP_REAP_AFTER_DISCONNECT | USBDEVFS_CAP_ZERO_PACKET;
        umockdev_ioctl_client_complete(client_I, 0, 0);
        umockdev_ioctl_data_unref(data);
        return TRUE;
      }
      case USBDEVFS_CLAIMINTERFACE: return self_I->Claim(client_I);
      case USBDEVFS_RELEASEINTERFACE: {
        std::lock_guard<std::mutex> guard(self_I->mLock);
        if (self_I->mClaimed) self_I->mBus->Release(self_I->mBinding);
        self_I->mClaimed = false;
        umockdev_ioctl_client_complete(client_I, 0, 0);
        return TRUE;
      }
      case USBDEVFS_GETDRIVER:
      case USBDEVFS_IOCTL: umockdev_ioctl_client_complete(client_I, -1, ENODATA); return TRUE;
      case USBDEVFS_SUBMITURB: return self_I->Submit(client_I, argument);
      case USBDEVFS_REAPURB:
      case USBDEVFS_REAPURBNDELAY: return self_I->Reap(client_I, argument);
      default: return FALSE;
    }
  }

  gboolean Claim(UMockdevIoctlClient* client_I) {
    std::lock_guard<std::mutex> guard(mLock);
    int error = 0;
    if (mClaimed) {
      error = EBUSY;
    } else {
      const DeviceInfo info{CLabFTDIBridge::kVendorId, CLabFTDIBridge::kProductId,
                            mBridge->GetLocationId(), 0, 0};
      const EUsbStatus status = mBus->OpenUsb(info, mBinding);
      mClaimed = status == EUsbStatus::eSuccess;
      error = mClaimed ? 0 : status == EUsbStatus::eBusy ? EBUSY : ENODEV;
    }
    umockdev_ioctl_client_complete(client_I, error == 0 ? 0 : -1, error);
    return TRUE;
  }

  gboolean Submit(UMockdevIoctlClient* client_I, UMockdevIoctlData* argument_I) {
    UMockdevIoctlData* urbData =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(usbdevfs_urb), nullptr);
    auto* urb = reinterpret_cast<usbdevfs_urb*>(urbData->data);
    UMockdevIoctlData* buffer = umockdev_ioctl_data_resolve(
        urbData, offsetof(usbdevfs_urb, buffer), static_cast<gsize>(urb->buffer_length), nullptr);
    const bool answered = urb->type == USBDEVFS_URB_TYPE_CONTROL ? Control(*urb, buffer->data)
                                                                 : Bulk(*urb, buffer->data);
    umockdev_ioctl_data_unref(buffer);
    if (!answered) {
      umockdev_ioctl_data_unref(urbData);
      umockdev_ioctl_client_complete(client_I, -1, ENODEV);
      return TRUE;
    }
    {
      std::lock_guard<std::mutex> guard(mLock);
      mReapable.push_back(urbData);
    }
    umockdev_ioctl_client_complete(client_I, 0, 0);
    return TRUE;
  }

  // FTDI's vendor requests that reach the engine; the serial port's
  // settings (baud rate, latency, characters) are taken and change nothing.
  bool Control(usbdevfs_urb& urb_IO, uint8_t* buffer_IO) {
    const uint8_t request = buffer_IO[1];
    const uint16_t value = static_cast<uint16_t>(buffer_IO[2] | (buffer_IO[3] << 8));
    const uint16_t length = static_cast<uint16_t>(buffer_IO[6] | (buffer_IO[7] << 8));
    urb_IO.status = 0;
    urb_IO.actual_length = length;
    return OnBridge([&](CLabFTDIBridge& bridge_I) {
      if (request == 0x00 && value == 0) bridge_I.ResetDevice();
      if (request == 0x00 && value == 1) bridge_I.Purge(FT_PURGE_TX);
      if (request == 0x00 && value == 2) bridge_I.Purge(FT_PURGE_RX);
      if (request == 0x0B) bridge_I.SetBitMode(value & 0xFF, value >> 8);
    });
  }

  bool Bulk(usbdevfs_urb& urb_IO, uint8_t* buffer_IO) {
    const size_t length = static_cast<size_t>(urb_IO.buffer_length);
    // A transfer the bridge fails ends as one that lost its handshake.
    FT_STATUS status = FT_OK;
    if ((urb_IO.endpoint & 0x80) == 0) {
      uint32_t written = 0;
      const bool answered = OnBridge([&](CLabFTDIBridge& bridge_I) {
        status = bridge_I.Write(buffer_IO, static_cast<uint32_t>(length), written);
      });
      urb_IO.status = status == FT_OK ? 0 : -EPROTO;
      urb_IO.actual_length = static_cast<int>(written);
      return answered;
    }
    // As much as fits behind the status bytes of the packets the buffer holds.
    const size_t room = length / kPacketSize * (kPacketSize - 2) +
                        (length % kPacketSize > 2 ? length % kPacketSize - 2 : 0);
    std::vector<uint8_t> data(room);
    uint32_t read = 0;
    const bool answered = OnBridge([&](CLabFTDIBridge& bridge_I) {
      status = bridge_I.Read(data.data(), static_cast<uint32_t>(room), read);
    });
    urb_IO.status = status == FT_OK ? 0 : -EPROTO;
    size_t at = 0;
    size_t taken = 0;
    do {
      const size_t piece = std::min<size_t>(kPacketSize - 2, read - taken);
      std::copy_n(kModemStatus, 2, buffer_IO + at);
      std::copy_n(data.begin() + static_cast<std::ptrdiff_t>(taken), piece, buffer_IO + at + 2);
      at += piece + 2;
      taken += piece;
    } while (taken < read);
    urb_IO.actual_length = static_cast<int>(at);
    return answered;
  }

  gboolean Reap(UMockdevIoctlClient* client_I, UMockdevIoctlData* argument_I) {
    UMockdevIoctlData* urb = nullptr;
    {
      std::lock_guard<std::mutex> guard(mLock);
      if (!mReapable.empty()) {
        urb = mReapable.front();
        mReapable.pop_front();
      }
    }
    if (urb == nullptr) {
      umockdev_ioctl_client_complete(client_I, -1, EAGAIN);
      return TRUE;
    }
    UMockdevIoctlData* pointer =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(gpointer), nullptr);
    umockdev_ioctl_data_set_ptr(pointer, 0, urb);
    umockdev_ioctl_client_complete(client_I, 0, 0);
    umockdev_ioctl_data_unref(pointer);
    umockdev_ioctl_data_unref(urb);
    return TRUE;
  }

  std::shared_ptr<CLabBus> mBus;
  std::shared_ptr<CLabFTDIBridge> mBridge;
  std::string mPath;
  UMockdevIoctlBase* mHandler = nullptr;
  std::mutex mLock;
  bool mClaimed = false;
  CLabBus::SBinding mBinding;
  std::deque<UMockdevIoctlData*> mReapable;
};
