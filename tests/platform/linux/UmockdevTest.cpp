// The Linux forms of the HID node and USB control seams against umockdev:
// real hidraw feature report ioctls and real libusb control transfers,
// answered by a handler the test scripts.

#include <gtest/gtest.h>
#include <linux/hidraw.h>
#include <linux/ioctl.h>
#include <linux/usbdevice_fs.h>

#include <cstddef>
#include <functional>
#include <mutex>

#include "platform/linux/CEmulatedUsbBus.h"
#include "platform/linux/CLinuxHidNode.h"
#include "platform/linux/CLinuxUsbControl.h"

namespace {

using Bytes = std::vector<uint8_t>;

// Answers the ioctls of one node: hidraw feature reports, or the usbfs calls
// libusb makes for a control transfer. `answer` gets each report, or each
// request as its setup packet and data, and gives an errno, 0 for success;
// what it leaves in the bytes is what a read returns. Runs on umockdev's
// thread.
class CIoctlNode {
 public:
  CIoctlNode(CEmulatedUsbBus& bus_I, std::string node_I, bool usbfs_I)
      : mBus(bus_I), mNode(std::move(node_I)), mUsbfs(usbfs_I) {
    g_signal_connect(mHandler, "handle-ioctl", G_CALLBACK(&CIoctlNode::Handle), this);
    umockdev_testbed_attach_ioctl(mBus.GetTestbed(), mNode.c_str(), mHandler, nullptr);
  }
  ~CIoctlNode() {
    umockdev_testbed_detach_ioctl(mBus.GetTestbed(), mNode.c_str(), nullptr);
    for (UMockdevIoctlData* urb : mReapable) umockdev_ioctl_data_unref(urb);
    g_object_unref(mHandler);
  }

  std::function<int(Bytes&)> answer = [](Bytes&) { return 0; };
  std::vector<Bytes> seen;

 private:
  static gboolean Handle(UMockdevIoctlBase*, UMockdevIoctlClient* client_I, CIoctlNode* self_I) {
    const unsigned long request = umockdev_ioctl_client_get_request(client_I);
    UMockdevIoctlData* argument = umockdev_ioctl_client_get_arg(client_I);
    if (!self_I->mUsbfs) return self_I->Hidraw(client_I, request, argument);
    switch (request) {
      case USBDEVFS_GET_CAPABILITIES: {
        UMockdevIoctlData* data = umockdev_ioctl_data_resolve(argument, 0, 4, nullptr);
        *reinterpret_cast<guint32*>(data->data) =
            USBDEVFS_CAP_BULK_CONTINUATION | USBDEVFS_CAP_NO_PACKET_SIZE_LIM |
            USBDEVFS_CAP_REAP_AFTER_DISCONNECT | USBDEVFS_CAP_ZERO_PACKET;
        umockdev_ioctl_data_unref(data);
        umockdev_ioctl_client_complete(client_I, 0, 0);
        return TRUE;
      }
      case USBDEVFS_CLAIMINTERFACE:
      case USBDEVFS_RELEASEINTERFACE: umockdev_ioctl_client_complete(client_I, 0, 0); return TRUE;
      case USBDEVFS_GETDRIVER:
      case USBDEVFS_IOCTL: umockdev_ioctl_client_complete(client_I, -1, ENODATA); return TRUE;
      case USBDEVFS_SUBMITURB: return self_I->Submit(client_I, argument);
      case USBDEVFS_REAPURB:
      case USBDEVFS_REAPURBNDELAY: return self_I->Reap(client_I, argument);
      default: return FALSE;
    }
  }

  gboolean Hidraw(UMockdevIoctlClient* client_I, unsigned long request_I,
                  UMockdevIoctlData* argument_I) {
    const bool set = _IOC_NR(request_I) == _IOC_NR(HIDIOCSFEATURE(0));
    if (_IOC_TYPE(request_I) != 'H' || (!set && _IOC_NR(request_I) != _IOC_NR(HIDIOCGFEATURE(0)))) {
      return FALSE;
    }
    const size_t length = _IOC_SIZE(request_I);
    UMockdevIoctlData* data = umockdev_ioctl_data_resolve(argument_I, 0, length, nullptr);
    Bytes report(data->data, data->data + length);
    seen.push_back(report);
    const int error = answer(report);
    if (error == 0 && !set) std::copy(report.begin(), report.end(), data->data);
    umockdev_ioctl_client_complete(client_I, error == 0 ? static_cast<glong>(length) : -1, error);
    umockdev_ioctl_data_unref(data);
    return TRUE;
  }

  // A control URB is finished at once and waits to be reaped.
  gboolean Submit(UMockdevIoctlClient* client_I, UMockdevIoctlData* argument_I) {
    UMockdevIoctlData* urbData =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(usbdevfs_urb), nullptr);
    auto* urb = reinterpret_cast<usbdevfs_urb*>(urbData->data);
    UMockdevIoctlData* buffer = umockdev_ioctl_data_resolve(
        urbData, offsetof(usbdevfs_urb, buffer), static_cast<gsize>(urb->buffer_length), nullptr);
    Bytes request(buffer->data, buffer->data + urb->buffer_length);
    seen.push_back(request);
    const int error = answer(request);
    const bool in = (request[0] & 0x80) != 0;
    if (error == 0 && in) std::copy(request.begin() + 8, request.end(), buffer->data + 8);
    urb->status = -error;
    urb->actual_length = error != 0 ? 0 : static_cast<int>(request.size() - 8);
    {
      std::lock_guard<std::mutex> guard(mLock);
      mReapable.push_back(urbData);
    }
    umockdev_ioctl_client_complete(client_I, 0, 0);
    umockdev_ioctl_data_unref(buffer);
    return TRUE;
  }

  gboolean Reap(UMockdevIoctlClient* client_I, UMockdevIoctlData* argument_I) {
    std::unique_lock<std::mutex> guard(mLock);
    if (mReapable.empty()) {
      umockdev_ioctl_client_complete(client_I, -1, EAGAIN);
      return TRUE;
    }
    UMockdevIoctlData* urb = mReapable.front();
    mReapable.erase(mReapable.begin());
    guard.unlock();
    UMockdevIoctlData* pointer =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(gpointer), nullptr);
    umockdev_ioctl_data_set_ptr(pointer, 0, urb);
    umockdev_ioctl_client_complete(client_I, 0, 0);
    umockdev_ioctl_data_unref(pointer);
    umockdev_ioctl_data_unref(urb);
    return TRUE;
  }

  CEmulatedUsbBus& mBus;
  std::string mNode;
  bool mUsbfs;
  UMockdevIoctlBase* mHandler = umockdev_ioctl_base_new();
  std::mutex mLock;
  std::vector<UMockdevIoctlData*> mReapable;
};

class Umockdev : public ::testing::Test {
 protected:
  void SetUp() override {
    // Without the preload library the real /sys would answer: refuse.
    ASSERT_TRUE(CEmulatedUsbBus::IsEmulated()) << "run under umockdev-wrapper";
    mRootHub = mBus.AddRootHub(1);
  }

  CEmulatedUsbBus mBus;
  std::string mRootHub;
};

TEST_F(Umockdev, HidrawNodesAreFoundLockedAndSpokenToThroughIoctls) {
  const std::string usb = mBus.AddUsbDevice(mRootHub, 1, "2", 0x7A71, 0x0301, 0x0120);
  mBus.AddHidInterface(usb, 0, 0, {0x05, 0x0D, 0x09, 0x02, 0xA1, 0x01, 0xC0});
  CIoctlNode ioctls(mBus, "/dev/hidraw0", false);
  const DeviceInfo pen{0x7A71, 0x0301, 0x01200000, 0x0002, 0x000D};
  DeviceInfo elsewhere = pen;
  elsewhere.locationId = 0x01300000;

  CLinuxHidNode hid;
  ASSERT_EQ(hid.Open(pen), EHidStatus::eSuccess);
  EXPECT_EQ(hid.GetReleaseNumber(), 0x0120);
  CLinuxHidNode second;
  EXPECT_EQ(second.Open(pen), EHidStatus::eBusy) << "held by the first";
  EXPECT_EQ(second.Open(elsewhere), EHidStatus::eGone);

  EXPECT_EQ(hid.SetFeatureReport({0x02, 0x00}), EHidStatus::eSuccess);
  ioctls.answer = [](Bytes& report_IO) {
    report_IO = {0x14, 1, 2, 3, 4};
    return 0;
  };
  Bytes read{0x14, 0, 0, 0, 0};
  EXPECT_EQ(hid.GetFeatureReport(read), EHidStatus::eSuccess);
  EXPECT_EQ(read, (Bytes{0x14, 1, 2, 3, 4}));
  EXPECT_EQ(ioctls.seen, (std::vector<Bytes>{{0x02, 0x00}, {0x14, 0, 0, 0, 0}}));

  const std::pair<int, EHidStatus> errors[] = {
      {EPIPE, EHidStatus::eStall},       {EBUSY, EHidStatus::eBusy},    {ENODEV, EHidStatus::eGone},
      {ETIMEDOUT, EHidStatus::eTimeout}, {EACCES, EHidStatus::eDenied}, {EIO, EHidStatus::eOther}};
  for (const auto& [error, status] : errors) {
    ioctls.answer = [error](Bytes&) { return error; };
    EXPECT_EQ(hid.SetFeatureReport({0x55, 1}), status) << error;
    EXPECT_EQ(hid.GetFeatureReport(read), status) << error;
  }
  hid.Close();
  EXPECT_EQ(second.Open(pen), EHidStatus::eSuccess) << "closing lets go";
}

TEST_F(Umockdev, ControlTransfersGoThroughLibusbToTheVendorInterface) {
  const std::string node = mBus.AddUsbfsDevice(mRootHub, "3", 0x0311, 2, 0xFF);
  CIoctlNode ioctls(mBus, node, true);
  CIoctlNode hidOnlyIoctls(mBus, mBus.AddUsbfsDevice(mRootHub, "4", 0x0312, 3, 0x03), true);
  ioctls.answer = [](Bytes& request_IO) {
    if (request_IO[1] == 0x77) return EPIPE;
    if (request_IO[0] & 0x80) {
      request_IO.resize(8);  // two bytes back, whatever was asked for
      request_IO.resize(10, 0x5A);
    }
    return 0;
  };

  CLinuxUsbControl usb;
  EXPECT_EQ(usb.Open({0x7A71, 0x0311, 0x01400000, 0, 0}), EUsbStatus::eGone);
  ASSERT_EQ(usb.Open({0x7A71, 0x0311, 0x01300000, 0, 0}), EUsbStatus::eSuccess);
  EXPECT_EQ(usb.GetReleaseNumber(), 0x0210);
  ASSERT_EQ(usb.ClaimVendorInterface(), EUsbStatus::eSuccess);

  Bytes data(4, 0);
  size_t transferred = 9;
  ASSERT_EQ(usb.ControlTransfer(0xC1, 0x01, 0x0203, 0x0405, data, transferred),
            EUsbStatus::eSuccess);
  EXPECT_EQ(transferred, 2u);
  EXPECT_EQ(data, (Bytes{0x5A, 0x5A, 0, 0}));
  EXPECT_EQ(ioctls.seen.back(),
            (Bytes{0xC1, 0x01, 0x03, 0x02, 0x05, 0x04, 0x04, 0x00, 0, 0, 0, 0}));
  data = {0xAA};
  EXPECT_EQ(usb.ControlTransfer(0x41, 0xF5, 0xFFFF, 0, data, transferred), EUsbStatus::eSuccess);
  EXPECT_EQ(transferred, 1u);
  EXPECT_EQ(ioctls.seen.back(), (Bytes{0x41, 0xF5, 0xFF, 0xFF, 0, 0, 1, 0, 0xAA}));
  EXPECT_EQ(usb.ControlTransfer(0x41, 0x77, 0, 0, data, transferred), EUsbStatus::eStall);

  // A device with only a HID interface has nothing to claim.
  CLinuxUsbControl hidOnly;
  ASSERT_EQ(hidOnly.Open({0x7A71, 0x0312, 0x01400000, 0, 0}), EUsbStatus::eSuccess);
  EXPECT_EQ(hidOnly.ClaimVendorInterface(), EUsbStatus::eOther);
}

}  // namespace
