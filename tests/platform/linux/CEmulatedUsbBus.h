#pragma once
// A USB tree in umockdev's emulated sysfs: root hubs, hubs, devices, and HID
// interfaces with their hidraw nodes and report descriptors. It must be made
// before any udev monitor, as the testbed replaces the netlink socket.

#include <umockdev.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

class CEmulatedUsbBus {
 public:
  struct SHidNode {
    std::string usbSysPath;
    std::string interfaceSysPath;
    std::string hidSysPath;
    std::string hidrawSysPath;
    std::string nodePath;
  };

  CEmulatedUsbBus() : mTestbed(umockdev_testbed_new()) {}
  ~CEmulatedUsbBus() { g_object_unref(mTestbed); }
  CEmulatedUsbBus(const CEmulatedUsbBus&) = delete;
  CEmulatedUsbBus& operator=(const CEmulatedUsbBus&) = delete;

  // True when the preload library is in place; without it the code under
  // test would see the machine's real /sys.
  static bool IsEmulated() {
    const char* preload = std::getenv("LD_PRELOAD");
    return preload != nullptr && std::strstr(preload, "umockdev-preload") != nullptr;
  }

  UMockdevTestbed* GetTestbed() const { return mTestbed; }

  std::string AddRootHub(unsigned bus_I) {
    const std::string path = "/devices/pci0000:00/0000:00:14.0/usb" + std::to_string(bus_I);
    Add("P: " + path + "\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_device\n" +
        UsbAttributes(0x1D6B, 0x0002, 0x0606, bus_I, "0"));
    return path;
  }

  // A device or hub at `devpath_I` ("2", "2.3") below `parentPath_I`.
  std::string AddUsbDevice(const std::string& parentPath_I, unsigned bus_I,
                           const std::string& devpath_I, uint32_t vendorId_I, uint32_t productId_I,
                           uint16_t version_I) {
    const std::string path = parentPath_I + "/" + std::to_string(bus_I) + "-" + devpath_I;
    Add("P: " + path + "\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_device\n" +
        UsbAttributes(vendorId_I, productId_I, version_I, bus_I, devpath_I));
    return path;
  }

  // A device libusb can open: its usbfs node /dev/bus/usb/001/<devnum_I>,
  // its device descriptor and `config_I`, one configuration as
  // Configuration makes it. Returns the node.
  std::string AddUsbfsDevice(const std::string& parentPath_I, const std::string& devpath_I,
                             unsigned devnum_I, uint16_t vendorId_I, uint16_t productId_I,
                             uint16_t release_I, const std::vector<uint8_t>& config_I) {
    char node[32];
    std::snprintf(node, sizeof(node), "/dev/bus/usb/001/%03u", devnum_I);
    std::vector<uint8_t> descriptors{0x12, 0x01, 0x00, 0x02, 0x00, 0x00, 0x00, 0x40};
    for (uint16_t word : {vendorId_I, productId_I, release_I}) Le16(descriptors, word);
    descriptors.insert(descriptors.end(), {0x00, 0x00, 0x00, 0x01});
    descriptors.insert(descriptors.end(), config_I.begin(), config_I.end());
    const std::string number = std::to_string(devnum_I);
    Add("P: " + parentPath_I + "/1-" + devpath_I + "\nN: " + std::string(node + 5) +
        "=00\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_device\nE: DRIVER=usb\nE: BUSNUM=001\nE: DEVNAME=" +
        node + "\n" + UsbAttributes(vendorId_I, productId_I, release_I, 1, devpath_I) +
        "A: devnum=" + number + "\nA: speed=480\nA: bConfigurationValue=1\nA: dev=189:" + number +
        "\nH: descriptors=" + Hex(descriptors) + "\n");
    return node;
  }

  // One configuration with one interface of `class_I` and bulk endpoints
  // of 512-byte packets at the addresses `endpoints_I`.
  static std::vector<uint8_t> Configuration(uint8_t class_I,
                                            const std::vector<uint8_t>& endpoints_I = {}) {
    std::vector<uint8_t> bytes{0x09, 0x02};
    Le16(bytes, static_cast<uint16_t>(18 + 7 * endpoints_I.size()));
    bytes.insert(bytes.end(),
                 {0x01, 0x01, 0x00, 0x80, 0x32, 0x09, 0x04, 0x00, 0x00,
                  static_cast<uint8_t>(endpoints_I.size()), class_I, 0x00, 0x00, 0x00});
    for (uint8_t endpoint : endpoints_I) {
      bytes.insert(bytes.end(), {0x07, 0x05, endpoint, 0x02});
      Le16(bytes, 512);
      bytes.push_back(0x00);
    }
    return bytes;
  }

  SHidNode AddHidInterface(const std::string& usbPath_I, unsigned interface_I,
                           unsigned hidrawIndex_I, const std::vector<uint8_t>& descriptor_I) {
    SHidNode node;
    node.usbSysPath = usbPath_I;
    const std::string usbName = usbPath_I.substr(usbPath_I.rfind('/') + 1);
    node.interfaceSysPath = usbPath_I + "/" + usbName + ":1." + std::to_string(interface_I);
    char hidName[32];
    std::snprintf(hidName, sizeof(hidName), "0003:0000:0000.%04X", ++mHidCount);
    node.hidSysPath = node.interfaceSysPath + "/" + hidName;
    const std::string hidraw = "hidraw" + std::to_string(hidrawIndex_I);
    node.hidrawSysPath = node.hidSysPath + "/hidraw/" + hidraw;
    node.nodePath = "/dev/" + hidraw;
    Add("P: " + node.interfaceSysPath + "\nE: SUBSYSTEM=usb\nE: DEVTYPE=usb_interface\n");
    AddHidAndNode(node, hidrawIndex_I, descriptor_I);
    return node;
  }

  // A HID interface on a bus other than USB, as an I2C touch panel has,
  // with the HID_ID the kernel gives it.
  SHidNode AddNonUsbHidInterface(unsigned hidrawIndex_I, const std::vector<uint8_t>& descriptor_I) {
    SHidNode node;
    node.hidSysPath = "/devices/platform/i2c-0/0018:7A5D:0001.00" + std::to_string(++mHidCount);
    node.hidrawSysPath = node.hidSysPath + "/hidraw/hidraw" + std::to_string(hidrawIndex_I);
    node.nodePath = "/dev/hidraw" + std::to_string(hidrawIndex_I);
    AddHidAndNode(node, hidrawIndex_I, descriptor_I, "E: HID_ID=0018:00007A5D:00000001\n");
    return node;
  }

  // Unplugs the interface and the USB device above it, leaf first, with
  // the removal events a kernel sends.
  void Unplug(const SHidNode& node_I) {
    for (const std::string* path : {&node_I.hidrawSysPath, &node_I.hidSysPath,
                                    &node_I.interfaceSysPath, &node_I.usbSysPath}) {
      if (!path->empty()) Remove(*path);
    }
  }

  void Remove(const std::string& path_I) {
    const std::string sysPath = "/sys" + path_I;
    umockdev_testbed_uevent(mTestbed, sysPath.c_str(), "remove");
    umockdev_testbed_remove_device(mTestbed, sysPath.c_str());
  }

  static std::string Hex(const std::vector<uint8_t>& bytes_I) {
    std::string text;
    char pair[3];
    for (uint8_t byte : bytes_I) {
      std::snprintf(pair, sizeof(pair), "%02X", byte);
      text += pair;
    }
    return text;
  }

  void Add(const std::string& text_I) {
    GError* error = nullptr;
    if (!umockdev_testbed_add_from_string(mTestbed, text_I.c_str(), &error)) {
      std::fprintf(stderr, "umockdev: %s\n", error != nullptr ? error->message : "?");
      if (error != nullptr) g_error_free(error);
      std::abort();
    }
  }

 private:
  static void Le16(std::vector<uint8_t>& bytes_IO, uint16_t value_I) {
    bytes_IO.push_back(static_cast<uint8_t>(value_I));
    bytes_IO.push_back(static_cast<uint8_t>(value_I >> 8));
  }

  // An empty descriptor leaves the attribute out, as if it could not be read.
  void AddHidAndNode(const SHidNode& node_I, unsigned hidrawIndex_I,
                     const std::vector<uint8_t>& descriptor_I, const std::string& more_I = "") {
    const std::string hidraw = "hidraw" + std::to_string(hidrawIndex_I);
    Add("P: " + node_I.hidSysPath + "\nE: SUBSYSTEM=hid\n" + more_I +
        (descriptor_I.empty() ? std::string()
                              : "H: report_descriptor=" + Hex(descriptor_I) + "\n"));
    Add("P: " + node_I.hidrawSysPath + "\nE: SUBSYSTEM=hidraw\nE: DEVNAME=" + node_I.nodePath +
        "\nA: dev=247:" + std::to_string(hidrawIndex_I) + "\nN: " + hidraw + "=00\n");
  }

  static std::string UsbAttributes(uint32_t vendorId_I, uint32_t productId_I, uint16_t version_I,
                                   unsigned bus_I, const std::string& devpath_I) {
    char text[160];
    std::snprintf(text, sizeof(text),
                  "A: idVendor=%04x\nA: idProduct=%04x\nA: bcdDevice=%04x\nA: busnum=%u\n"
                  "A: devpath=%s\n",
                  vendorId_I, productId_I, version_I, bus_I, devpath_I.c_str());
    return text;
  }

  UMockdevTestbed* mTestbed;
  unsigned mHidCount = 0;
};
