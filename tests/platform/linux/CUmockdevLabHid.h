#pragma once
// The HID boards of a lab bus as umockdev shows them to another process:
// each attached board is a USB device at its lab location (bus 1, behind
// its product's hub) with one HID interface whose hidraw node the board
// answers, through umockdev's socket, on umockdev's thread. Sync() brings
// the testbed in line with the bus, with the remove and add events a
// kernel sends, so that a board that re-enumerates into its loader and back
// is seen doing so; call it from one thread only.

#include <linux/hidraw.h>
#include <linux/ioctl.h>

#include <cerrno>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "lab/CLabBus.h"
#include "platform/linux/CEmulatedUsbBus.h"
#include "platform/linux/CUhidLabDevice.h"

class CUmockdevLabHid : public CEmulatedUsbBus {
 public:
  explicit CUmockdevLabHid(std::shared_ptr<CLabBus> bus_I)
      : mBus(std::move(bus_I)), mRoot(AddRootHub(1)) {}
  ~CUmockdevLabHid() {
    for (auto& [location, node] : mShown) {
      Hide(*node);
      Detach(*node);
    }
    for (auto& node : mHidden) Detach(*node);
  }

  void Sync() {
    std::map<uint32_t, std::vector<SLabInterface>> now;
    for (const SLabInterface& entry : mBus->ListInterfaces()) {
      if (entry.link == ELabLink::eHid) now[entry.info.locationId].push_back(entry);
    }
    for (auto it = mShown.begin(); it != mShown.end();) {
      const auto found = now.find(it->first);
      if (found != now.end() && found->second == it->second->interfaces &&
          mBus->IsCurrent(it->second->binding)) {
        ++it;
        continue;
      }
      Hide(*it->second);
      mHidden.push_back(std::move(it->second));
      it = mShown.erase(it);
    }
    for (const auto& [location, interfaces] : now) {
      if (mShown.count(location) == 0) Show(location, interfaces);
    }
  }

 private:
  struct SNode {
    CLabBus* bus = nullptr;
    std::vector<SLabInterface> interfaces;
    CLabBus::SBinding binding;
    SHidNode sysfs;
    UMockdevIoctlBase* handler = nullptr;
  };

  std::string HubOf(uint32_t location_I) {
    const unsigned port = (location_I >> 20) & 0xF;
    auto hub = mHubs.find(port);
    if (hub != mHubs.end()) return hub->second;
    return mHubs[port] = AddUsbDevice(mRoot, 1, std::to_string(port), 0x7A5D, 0x00F0, 0x0100);
  }

  void Show(uint32_t location_I, const std::vector<SLabInterface>& interfaces_I) {
    auto node = std::make_unique<SNode>();
    node->bus = mBus.get();
    node->interfaces = interfaces_I;
    // Reports go to the vendor collection, as the boards answer them there.
    DeviceInfo target = interfaces_I.front().info;
    for (const SLabInterface& entry : interfaces_I) {
      if (entry.info.usagePage >= 0xFF00) target = entry.info;
    }
    if (mBus->OpenHid(target, node->binding) != EHidStatus::eSuccess) return;
    const std::string devpath =
        std::to_string((location_I >> 20) & 0xF) + "." + std::to_string((location_I >> 16) & 0xF);
    const SLabInterface& first = interfaces_I.front();
    const std::string usb = AddUsbDevice(HubOf(location_I), 1, devpath, first.info.vendorId,
                                         first.info.productId, first.release);
    // A new minor each time, so a handler never meets a node of another board.
    const unsigned minor = mNextMinor++;
    node->handler = umockdev_ioctl_base_new();
    g_signal_connect(node->handler, "handle-ioctl", G_CALLBACK(&CUmockdevLabHid::Handle),
                     node.get());
    const std::string path = "/dev/hidraw" + std::to_string(minor);
    umockdev_testbed_attach_ioctl(GetTestbed(), path.c_str(), node->handler, nullptr);
    node->sysfs = AddHidInterface(usb, 0, minor, CUhidLabDevice::Descriptor(interfaces_I));
    mShown[location_I] = std::move(node);
  }

  // The node leaves sysfs, but its handler stays until the end: a client
  // may still hold it open, and then gets ENODEV from the released binding,
  // as from a node whose device is gone.
  void Hide(SNode& node_IO) {
    if (node_IO.handler == nullptr) return;
    Unplug(node_IO.sysfs);
    // A copy: the handler may be reading the node's binding right now.
    CLabBus::SBinding binding = node_IO.binding;
    mBus->Release(binding);
  }

  void Detach(SNode& node_IO) {
    umockdev_testbed_detach_ioctl(GetTestbed(), node_IO.sysfs.nodePath.c_str(), nullptr);
    g_object_unref(node_IO.handler);
    node_IO.handler = nullptr;
  }

  static int ErrnoOf(EHidStatus status_I) {
    switch (status_I) {
      case EHidStatus::eSuccess: return 0;
      case EHidStatus::eStall: return EPIPE;
      case EHidStatus::eBusy: return EBUSY;
      case EHidStatus::eGone: return ENODEV;
      case EHidStatus::eTimeout: return ETIMEDOUT;
      default: return EIO;
    }
  }

  // umockdev's thread: the lab bus has its own lock, the binding stays as
  // Show made it until Hide, which detaches this handler first.
  static gboolean Handle(UMockdevIoctlBase*, UMockdevIoctlClient* client_I, SNode* node_I) {
    const unsigned long request = umockdev_ioctl_client_get_request(client_I);
    const bool set = _IOC_NR(request) == _IOC_NR(HIDIOCSFEATURE(0));
    if (_IOC_TYPE(request) != 'H' || (!set && _IOC_NR(request) != _IOC_NR(HIDIOCGFEATURE(0)))) {
      return FALSE;
    }
    const size_t length = _IOC_SIZE(request);
    UMockdevIoctlData* data =
        umockdev_ioctl_data_resolve(umockdev_ioctl_client_get_arg(client_I), 0, length, nullptr);
    std::vector<uint8_t> report(data->data, data->data + length);
    const int error = ErrnoOf(set ? node_I->bus->SetFeature(node_I->binding, report)
                                  : node_I->bus->GetFeature(node_I->binding, report));
    if (error == 0 && !set) std::copy(report.begin(), report.end(), data->data);
    umockdev_ioctl_client_complete(client_I, error == 0 ? static_cast<glong>(length) : -1, error);
    umockdev_ioctl_data_unref(data);
    return TRUE;
  }

  std::shared_ptr<CLabBus> mBus;
  std::string mRoot;
  std::map<unsigned, std::string> mHubs;
  std::map<uint32_t, std::unique_ptr<SNode>> mShown;
  std::vector<std::unique_ptr<SNode>> mHidden;
  unsigned mNextMinor = 0;
};
