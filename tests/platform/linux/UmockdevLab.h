#pragma once
// Shows the lab's boards to the real Linux code through umockdev: each HID
// interface a board shows becomes a usb_device -> usb_interface -> hid ->
// hidraw tree, each vendor-class interface a usb_device with a usbfs node,
// and their ioctl handlers are answered by the same lab boards. When a
// board re-enumerates, Sync() removes its old tree (with remove uevents)
// and adds the new one, so that libudev and libusb find it as hardware.
//
// The handlers run on umockdev's thread; they only ever touch the bus,
// which has its own lock. Sync() runs on the test's thread.

#include <glib.h>
#include <linux/hidraw.h>
#include <linux/ioctl.h>
#include <linux/usbdevice_fs.h>
#include <umockdev.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "lab/CLabBus.h"
#include "platform/linux/CEmulatedUsbBus.h"

class UmockdevLab : private CEmulatedUsbBus {
 public:
  explicit UmockdevLab(std::shared_ptr<CLabBus> bus_I) : mBus(std::move(bus_I)) { Sync(); }
  ~UmockdevLab() {
    while (!mDevices.empty()) RemoveDevice(mDevices.front());
  }

  // Brings the emulated devices in line with what the bus lists.
  void Sync() {
    const std::vector<SLabInterface> listed = mBus->ListInterfaces();
    // Drop devices whose interfaces are no longer listed as they were.
    for (size_t i = 0; i < mDevices.size();) {
      if (!StillListed(*mDevices[i], listed)) {
        RemoveDevice(mDevices[i]);
        i = 0;
      } else {
        ++i;
      }
    }
    // Add one USB device per board location not yet shown.
    for (const SLabInterface& entry : listed) {
      bool shown = false;
      for (const auto& device : mDevices) {
        shown = shown || device->location == entry.info.locationId;
      }
      if (!shown) AddDevice(entry.info.locationId, listed);
    }
  }

  size_t HidrawCount() const {
    size_t count = 0;
    for (const auto& device : mDevices) count += device->nodes.size() - (device->usbfs ? 1 : 0);
    return count;
  }

 private:
  struct SNode {
    UmockdevLab* owner = nullptr;
    SLabInterface interface;
    CLabBus::SBinding binding;
    bool bound = false;
    bool usbfs = false;
    std::string devnode;
    UMockdevIoctlBase* handler = nullptr;
    // usbfs: finished URBs waiting to be reaped
    std::mutex lock;
    std::deque<UMockdevIoctlData*> reapable;
  };
  struct SDevice {
    uint32_t location = 0;
    std::vector<SLabInterface> interfaces;
    std::vector<std::string> syspaths;  // parent first
    std::vector<std::unique_ptr<SNode>> nodes;
    bool usbfs = false;
  };

  static bool StillListed(const SDevice& device_I, const std::vector<SLabInterface>& listed_I) {
    std::vector<SLabInterface> now;
    for (const SLabInterface& entry : listed_I) {
      if (entry.info.locationId == device_I.location) now.push_back(entry);
    }
    return now == device_I.interfaces;
  }

  static void Le16(std::vector<uint8_t>& bytes_IO, uint16_t value_I) {
    bytes_IO.push_back(static_cast<uint8_t>(value_I));
    bytes_IO.push_back(static_cast<uint8_t>(value_I >> 8));
  }

  SNode* Attach(SDevice& device_I, const SLabInterface& interface_I, const std::string& devnode_I,
                bool usbfs_I) {
    auto node = std::make_unique<SNode>();
    node->owner = this;
    node->interface = interface_I;
    node->usbfs = usbfs_I;
    node->devnode = devnode_I;
    node->handler = umockdev_ioctl_base_new();
    g_signal_connect(node->handler, "handle-ioctl", G_CALLBACK(&UmockdevLab::HandleIoctl),
                     node.get());
    umockdev_testbed_attach_ioctl(GetTestbed(), devnode_I.c_str(), node->handler, nullptr);
    device_I.nodes.push_back(std::move(node));
    return device_I.nodes.back().get();
  }

  static std::vector<unsigned> PortsOf(uint32_t location_I) {
    std::vector<unsigned> ports;
    for (int shift = 20; shift >= 0; shift -= 4) {
      const unsigned port = (location_I >> shift) & 0xF;
      if (port == 0) break;
      ports.push_back(port);
    }
    return ports;
  }

  static std::string Devpath(const std::vector<unsigned>& ports_I, size_t depth_I) {
    std::string devpath;
    for (size_t i = 0; i < depth_I; ++i) devpath += (i ? "." : "") + std::to_string(ports_I[i]);
    return devpath;
  }

  static std::string UsbPath(const std::vector<unsigned>& ports_I, size_t depth_I) {
    std::string path = "/devices/usb1";
    for (size_t depth = 1; depth <= depth_I; ++depth) path += "/1-" + Devpath(ports_I, depth);
    return path;
  }

  // The hubs a device hangs behind, each added once and kept to the end.
  void AddHubs(const std::vector<unsigned>& ports_I) {
    for (size_t depth = 1; depth < ports_I.size(); ++depth) {
      const std::string path = UsbPath(ports_I, depth);
      if (std::find(mHubs.begin(), mHubs.end(), path) != mHubs.end()) continue;
      mHubs.push_back(path);
      Add("P: " + path + "\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_device\nE: DRIVER=usb\n" +
          "A: idVendor=7a5d\\n\nA: idProduct=00f0\\n\nA: bcdDevice=0100\\n\n" +
          "A: bDeviceClass=09\\n\nA: busnum=1\\n\nA: devpath=" + Devpath(ports_I, depth) + "\\n\n");
    }
  }

  void AddDevice(uint32_t location_I, const std::vector<SLabInterface>& listed_I) {
    auto device = std::make_shared<SDevice>();
    device->location = location_I;
    for (const SLabInterface& entry : listed_I) {
      if (entry.info.locationId == location_I) device->interfaces.push_back(entry);
    }
    const SLabInterface& first = device->interfaces.front();
    device->usbfs = first.link == ELabLink::eUsbVendor;
    // The location's port nibbles give the device's place: "2", or "2.3"
    // behind a hub on root port 2.
    const std::vector<unsigned> ports = PortsOf(location_I);
    const std::string devpath = Devpath(ports, ports.size());
    AddHubs(ports);
    const unsigned devnum = mNextDevnum++;
    char buffer[512];
    std::snprintf(buffer, sizeof(buffer), "/dev/bus/usb/001/%03u", devnum);
    const std::string usbNode = buffer;
    const std::string usbPath = UsbPath(ports, ports.size());

    // Device descriptor, one configuration, one interface per usage (HID
    // class 3) or one vendor-class interface (0xFF, subclass 0).
    const uint16_t vendor = static_cast<uint16_t>(first.info.vendorId);
    const uint16_t product = static_cast<uint16_t>(first.info.productId);
    const uint8_t interfaces = static_cast<uint8_t>(device->interfaces.size());
    std::vector<uint8_t> descriptors{0x12, 0x01, 0x00, 0x02, 0x00, 0x00, 0x00, 0x40};
    for (uint16_t word : {vendor, product, first.release}) Le16(descriptors, word);
    descriptors.insert(descriptors.end(), {0x01, 0x02, 0x00, 0x01, 0x09, 0x02});
    Le16(descriptors, static_cast<uint16_t>(9 + 9 * interfaces));
    descriptors.insert(descriptors.end(), {interfaces, 0x01, 0x00, 0x80, 0x32});
    for (uint8_t i = 0; i < interfaces; ++i) {
      const uint8_t interfaceClass = device->usbfs ? 0xFF : 0x03;
      descriptors.insert(descriptors.end(), {0x09, 0x04, i, 0, 0, interfaceClass, 0, 0, 0});
    }

    if (device->usbfs) Attach(*device, first, usbNode, true);
    std::snprintf(buffer, sizeof(buffer),
                  "P: %s\nN: bus/usb/001/%03u=00\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_device\n"
                  "E: DRIVER=usb\nE: BUSNUM=001\nE: DEVNUM=%03u\nE: DEVNAME=%s\n"
                  "A: idVendor=%04x\\n\nA: idProduct=%04x\\n\nA: bcdDevice=%04x\\n\n"
                  "A: busnum=1\\n\nA: devnum=%u\\n\nA: devpath=%s\\n\nA: speed=480\\n\n"
                  "A: bConfigurationValue=1\\n\nA: dev=189:%u\nH: descriptors=",
                  usbPath.c_str(), devnum, devnum, usbNode.c_str(), vendor, product, first.release,
                  devnum, devpath.c_str(), devnum);
    Add(std::string(buffer) + Hex(descriptors) + "\n");
    device->syspaths.push_back(usbPath);

    if (!device->usbfs) {
      for (size_t i = 0; i < device->interfaces.size(); ++i) {
        const SLabInterface& entry = device->interfaces[i];
        const std::string interfacePath = usbPath + "/1-" + devpath + ":1." + std::to_string(i);
        Add("P: " + interfacePath +
            "\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_interface\nA: bInterfaceClass=03\\n\n"
            "A: bInterfaceNumber=0" +
            std::to_string(i) + "\\n\n");
        const unsigned hidIndex = mNextHid++;
        std::snprintf(buffer, sizeof(buffer), "%s/0003:%04X:%04X.%04X", interfacePath.c_str(),
                      vendor, product, hidIndex);
        const std::string hidPath = buffer;
        std::vector<uint8_t> report{0x06};
        Le16(report, static_cast<uint16_t>(entry.info.usagePage));
        report.push_back(0x0A);
        Le16(report, static_cast<uint16_t>(entry.info.usage));
        report.insert(report.end(), {0xA1, 0x01, 0xC0});
        Add("P: " + hidPath + "\nE: SUBSYSTEM=hid\nH: report_descriptor=" + Hex(report) + "\n");
        const unsigned hidraw = mNextHidraw++;
        const std::string name = "hidraw" + std::to_string(hidraw);
        Attach(*device, entry, "/dev/" + name, false);
        const std::string hidrawPath = hidPath + "/hidraw/" + name;
        Add("P: " + hidrawPath + "\nN: " + name + "=00\nE: SUBSYSTEM=hidraw\nE: DEVNAME=/dev/" +
            name + "\nA: dev=247:" + std::to_string(hidraw) + "\n");
        device->syspaths.push_back(interfacePath);
        device->syspaths.push_back(hidPath);
        device->syspaths.push_back(hidrawPath);
      }
    }
    mDevices.push_back(device);
  }

  void RemoveDevice(std::shared_ptr<SDevice> device_I) {
    // Leaf first, each with its remove event.
    for (auto path = device_I->syspaths.rbegin(); path != device_I->syspaths.rend(); ++path) {
      Remove(*path);
    }
    for (auto& node : device_I->nodes) {
      umockdev_testbed_detach_ioctl(GetTestbed(), node->devnode.c_str(), nullptr);
      if (node->bound) mBus->Release(node->binding);
      {
        std::lock_guard<std::mutex> guard(node->lock);
        for (UMockdevIoctlData* data : node->reapable) umockdev_ioctl_data_unref(data);
        node->reapable.clear();
      }
      g_object_unref(node->handler);
    }
    std::erase(mDevices, device_I);
  }

  // Binds the node to its board on first use.
  static bool Bind(SNode& node_I) {
    if (node_I.bound) return true;
    if (node_I.usbfs) {
      node_I.bound = node_I.owner->mBus->OpenUsb(node_I.interface.info, node_I.binding) ==
                     EUsbStatus::eSuccess;
    } else {
      node_I.bound = node_I.owner->mBus->OpenHid(node_I.interface.info, node_I.binding) ==
                     EHidStatus::eSuccess;
    }
    return node_I.bound;
  }

  static int ErrnoOf(EHidStatus status_I) {
    switch (status_I) {
      case EHidStatus::eSuccess: return 0;
      case EHidStatus::eStall: return EPIPE;
      case EHidStatus::eBusy: return EBUSY;
      case EHidStatus::eGone: return ENODEV;
      case EHidStatus::eTimeout: return ETIMEDOUT;
      case EHidStatus::eDenied: return EACCES;
      case EHidStatus::eOther: return EIO;
    }
    return EIO;
  }

  static int UrbStatusOf(EUsbStatus status_I) {
    switch (status_I) {
      case EUsbStatus::eSuccess: return 0;
      case EUsbStatus::eStall: return -EPIPE;
      case EUsbStatus::eGone: return -ENODEV;
      case EUsbStatus::eTimeout: return -ETIMEDOUT;
      default: return -EPROTO;
    }
  }

  static gboolean HandleIoctl(UMockdevIoctlBase*, UMockdevIoctlClient* client_I, SNode* node_I) {
    const unsigned long request = umockdev_ioctl_client_get_request(client_I);
    UMockdevIoctlData* argument = umockdev_ioctl_client_get_arg(client_I);
    return node_I->usbfs ? HandleUsbfs(*node_I, client_I, request, argument)
                         : HandleHidraw(*node_I, client_I, request, argument);
  }

  static gboolean HandleHidraw(SNode& node_I, UMockdevIoctlClient* client_I,
                               unsigned long request_I, UMockdevIoctlData* argument_I) {
    if (_IOC_TYPE(request_I) != 'H') return FALSE;
    const bool set = _IOC_NR(request_I) == _IOC_NR(HIDIOCSFEATURE(0));
    const bool get = _IOC_NR(request_I) == _IOC_NR(HIDIOCGFEATURE(0));
    if (!set && !get) return FALSE;
    const size_t length = _IOC_SIZE(request_I);
    UMockdevIoctlData* data = umockdev_ioctl_data_resolve(argument_I, 0, length, nullptr);
    std::vector<uint8_t> report(data->data, data->data + length);
    EHidStatus status = EHidStatus::eGone;
    if (Bind(node_I)) {
      status = set ? node_I.owner->mBus->SetFeature(node_I.binding, report)
                   : node_I.owner->mBus->GetFeature(node_I.binding, report);
    }
    if (status == EHidStatus::eSuccess) {
      if (get) std::copy(report.begin(), report.end(), data->data);
      umockdev_ioctl_client_complete(client_I, static_cast<glong>(length), 0);
    } else {
      umockdev_ioctl_client_complete(client_I, -1, ErrnoOf(status));
    }
    umockdev_ioctl_data_unref(data);
    return TRUE;
  }

  static gboolean HandleUsbfs(SNode& node_I, UMockdevIoctlClient* client_I, unsigned long request_I,
                              UMockdevIoctlData* argument_I) {
    switch (request_I) {
      case USBDEVFS_GET_CAPABILITIES: {
        UMockdevIoctlData* data = umockdev_ioctl_data_resolve(argument_I, 0, 4, nullptr);
        *reinterpret_cast<guint32*>(data->data) =
            USBDEVFS_CAP_BULK_CONTINUATION | USBDEVFS_CAP_NO_PACKET_SIZE_LIM |
            USBDEVFS_CAP_REAP_AFTER_DISCONNECT | USBDEVFS_CAP_ZERO_PACKET;
        umockdev_ioctl_client_complete(client_I, 0, 0);
        umockdev_ioctl_data_unref(data);
        return TRUE;
      }
      case USBDEVFS_CLAIMINTERFACE:
      case USBDEVFS_RELEASEINTERFACE:
      case USBDEVFS_CLEAR_HALT:
      case USBDEVFS_RESET:
      case USBDEVFS_RESETEP: umockdev_ioctl_client_complete(client_I, 0, 0); return TRUE;
      case USBDEVFS_GETDRIVER:
      case USBDEVFS_IOCTL: umockdev_ioctl_client_complete(client_I, -1, ENODATA); return TRUE;
      case USBDEVFS_SUBMITURB: return SubmitUrb(node_I, client_I, argument_I);
      case USBDEVFS_REAPURB:
      case USBDEVFS_REAPURBNDELAY: {
        UMockdevIoctlData* urb = nullptr;
        {
          std::lock_guard<std::mutex> guard(node_I.lock);
          if (!node_I.reapable.empty()) {
            urb = node_I.reapable.front();
            node_I.reapable.pop_front();
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
      default: return FALSE;
    }
  }

  // A control URB is answered at once: libusb polls for its completion.
  static gboolean SubmitUrb(SNode& node_I, UMockdevIoctlClient* client_I,
                            UMockdevIoctlData* argument_I) {
    UMockdevIoctlData* urbData =
        umockdev_ioctl_data_resolve(argument_I, 0, sizeof(usbdevfs_urb), nullptr);
    auto* urb = reinterpret_cast<usbdevfs_urb*>(urbData->data);
    if (urb->type != USBDEVFS_URB_TYPE_CONTROL || urb->buffer_length < 8) {
      umockdev_ioctl_data_unref(urbData);
      return FALSE;
    }
    UMockdevIoctlData* buffer = umockdev_ioctl_data_resolve(
        urbData, offsetof(usbdevfs_urb, buffer), static_cast<gsize>(urb->buffer_length), nullptr);
    const uint8_t* setup = buffer->data;
    const uint8_t requestType = setup[0];
    const uint8_t request = setup[1];
    const uint16_t value = static_cast<uint16_t>(setup[2] | (setup[3] << 8));
    const uint16_t index = static_cast<uint16_t>(setup[4] | (setup[5] << 8));
    const uint16_t length = static_cast<uint16_t>(setup[6] | (setup[7] << 8));
    std::vector<uint8_t> data(buffer->data + 8, buffer->data + 8 + length);
    size_t transferred = 0;
    EUsbStatus status = EUsbStatus::eGone;
    if (Bind(node_I)) {
      status = node_I.owner->mBus->Control(node_I.binding, requestType, request, value, index, data,
                                           transferred);
    }
    if ((requestType & 0x80) != 0 && status == EUsbStatus::eSuccess) {
      std::copy(data.begin(), data.begin() + static_cast<long>(transferred), buffer->data + 8);
    } else if (status == EUsbStatus::eSuccess) {
      transferred = length;
    }
    urb->status = UrbStatusOf(status);
    urb->actual_length = static_cast<int>(transferred);
    {
      std::lock_guard<std::mutex> guard(node_I.lock);
      node_I.reapable.push_back(urbData);
    }
    umockdev_ioctl_client_complete(client_I, 0, 0);
    umockdev_ioctl_data_unref(buffer);
    return TRUE;
  }

  std::shared_ptr<CLabBus> mBus;
  std::vector<std::shared_ptr<SDevice>> mDevices;
  std::vector<std::string> mHubs;
  unsigned mNextDevnum = 2;
  unsigned mNextHid = 1;
  unsigned mNextHidraw = 0;
};
