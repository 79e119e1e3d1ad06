#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>

#include "devices/CSupportedDeviceInfo.h"
#include "firmware/FirmwareFiles.h"
#include "settings/CSettingsArray.h"
#include "settings/CSettingsMap.h"
#include "support/LogCapture.h"

namespace {

namespace fs = std::filesystem;

std::shared_ptr<CSettingsArray> Products(const std::string& json_I) {
  auto array = CSettingsArray::CastToArray(CSettingsObject::ReadFromJSONBuffer(json_I), false);
  EXPECT_NE(array, nullptr) << json_I;
  return array;
}

// One board's identity in one line: vendor:product (hex), interface,
// topology, usage/page (hex), sectors (hex) and update file.
std::string BoardText(uint32_t vendor_I, uint32_t product_I, EINTERFACE_TYPE type_I,
                      unsigned topology_I, uint32_t usage_I, uint32_t page_I, uint32_t sectors_I,
                      const std::string& update_I) {
  static const char* const kTypes[] = {"INVALID", "HID", "BULK", "I2C", "FTDI"};
  char text[96];
  std::snprintf(text, sizeof(text), "%X:%X %s top%u %X/%X s%X ", vendor_I, product_I,
                kTypes[type_I], topology_I, usage_I, page_I, sectors_I);
  return text + ("'" + update_I + "'");
}
#define BOARD(device_I, Board)                                                         \
  BoardText((device_I).Get##Board##VendorId(), (device_I).Get##Board##ProductId(),     \
            (device_I).Get##Board##InterfaceType(), (device_I).Get##Board##Topology(), \
            (device_I).Get##Board##UsageId(), (device_I).Get##Board##UsagePage(),      \
            (device_I).Get##Board##FlashSectors(), (device_I).Get##Board##Update())

CDevice Product(const std::string& json_I) {
  CSupportedDeviceInfo info;
  return info.ParseBoards(
      CSettingsMap::CastToMap(CSettingsObject::ReadFromJSONBuffer(json_I), false));
}

// A configuration file in a folder of the test's own, removed afterwards.
struct ConfigFile : CTempFolder {
  void Write(const std::string& text_I) const { CTempFolder::Write("fw_loader.ini", text_I); }
  std::string Path() const { return CTempFolder::Path("fw_loader.ini"); }
};

}  // namespace

TEST(CSupportedDeviceInfoTest, BoardsLeftOutKeepTheDeviceDefaultsAndBoardsGivenTakeTheirOwn) {
  CDevice onlyPid = Product(R"({"name": "Slate", "penBoard": {"pid": "300"}})");
  EXPECT_EQ(onlyPid.GetDeviceName(), "Slate");
  EXPECT_EQ(BOARD(onlyPid, Pen), "7A5D:300 HID top1 0/0 s0 ''");
  EXPECT_TRUE(onlyPid.getPenIntoBLMode());
  EXPECT_FALSE(onlyPid.GetIsFlashLoader());
  // Boards left out are not supported and keep the device's zero identity.
  EXPECT_FALSE(onlyPid.GetTouchSupported());
  EXPECT_FALSE(onlyPid.GetScalarSupported());
  EXPECT_EQ(BOARD(onlyPid, Scalar), "0:0 INVALID top1 0/0 s0 ''");

  CDevice empties = Product(R"({"name": "Panel", "touchBoard": {}, "bluetoothBoard": {},
                                "scalarBoard": {}})");
  EXPECT_TRUE(empties.GetTouchSupported());
  EXPECT_TRUE(empties.GetScalarSupported());
  EXPECT_EQ(BOARD(empties, Touch), "7A5D:0 HID top1 0/0 s0 ''");
  EXPECT_EQ(BOARD(empties, Bluetooth), "7A5D:0 HID top1 0/0 s0 ''");
  EXPECT_EQ(BOARD(empties, Scalar), "5B27:0 FTDI top1 A/FF00 s0 ''");
  // No pen board: the pen members stay as a default device has them.
  EXPECT_EQ(BOARD(empties, Pen), "0:0 INVALID top1 0/0 s0 ''");

  CDevice full = Product(R"({"name": "Full",
    "penBoard": {"vid": "1234", "pid": "56", "interface": "BULK", "sectors": 74565,
                 "init": true, "topology": 258, "usageId": "1", "usagePg": "FF0D",
                 "update": "full.pen"},
    "touchBoard": {"pid": "57", "interface": "I2C", "sectors": 9, "topology": 3,
                   "update": "full.hex"},
    "scalarBoard": {"vid": "0x1111", "pid": "1060", "interface": "HID", "sectors": 64,
                    "quantaScalarBoard": true, "qisdaVenusScalarBoard": true,
                    "update": "full.bin", "usageId": "2", "usagePg": "FF01"}})");
  // Sectors keep their low 16 bits (0x12345), the topology its low 8 (0x102).
  EXPECT_EQ(BOARD(full, Pen), "1234:56 BULK top2 1/FF0D s2345 'full.pen'");
  EXPECT_EQ(BOARD(full, Touch), "7A5D:57 I2C top3 0/0 s9 'full.hex'");
  EXPECT_EQ(BOARD(full, Scalar), "1111:1060 HID top1 2/FF01 s40 'full.bin'");
  EXPECT_TRUE(full.GetIsQuantaScalarBoard());
  EXPECT_TRUE(full.GetIsQisdaVenusScalarBoard());
}

TEST(CSupportedDeviceInfoTest, ValuesOfTheWrongJsonTypeWarnAndFallBackToTheBoardDefault) {
  LogCapture log;
  CDevice device = Product(R"({"name": "Slate",
    "penBoard": {"vid": 4660, "pid": 827, "interface": 1, "sectors": "12", "init": "yes",
                 "topology": 2.5, "usageId": 1, "update": 7, "intoBLMode": "no"},
    "scalarBoard": {"vid": 4660, "usagePg": 65281, "quantaScalarBoard": 1},
    "touchBoard": "not an object"})");
  EXPECT_EQ(BOARD(device, Pen), "7A5D:0 HID top1 0/0 s0 ''");
  EXPECT_TRUE(device.getPenIntoBLMode());
  EXPECT_EQ(BOARD(device, Scalar), "5B27:0 FTDI top1 A/FF00 s0 ''");
  EXPECT_FALSE(device.GetIsQuantaScalarBoard());
  // A board key holding no object is a board left out.
  EXPECT_FALSE(device.GetTouchSupported());
}

TEST(CSupportedDeviceInfoTest, EveryBoardTakesTheIntoBootloaderFlagOfThePenBoard) {
  // The touch board's own flag has no effect.
  CDevice touchOnly = Product(R"({"name": "A", "penBoard": {"pid": "1"},
                                  "touchBoard": {"pid": "2", "intoBLMode": false}})");
  EXPECT_EQ(touchOnly.GetProtocolType(), EFL_PROTOCOL_LOADER);
  CDevice penFalse = Product(R"({"name": "B", "penBoard": {"pid": "1", "intoBLMode": false},
                                 "touchBoard": {"pid": "2", "intoBLMode": true},
                                 "scalarBoard": {"pid": "3", "sectors": 5}})");
  EXPECT_FALSE(penFalse.CanGoIntoBootloaderMode());
  EXPECT_EQ(penFalse.GetProtocolType(), EFL_PROTOCOL_NON_BL);
  // No pen board to read it from: the other boards are read as able to go
  // into their loader, and nothing breaks.
  CDevice noPen = Product(R"({"name": "C", "touchBoard": {"pid": "2"},
                              "bluetoothBoard": {"pid": "3"}, "scalarBoard": {}})");
  EXPECT_TRUE(noPen.GetTouchSupported());
  EXPECT_TRUE(noPen.getPenIntoBLMode());
}

TEST(CSupportedDeviceInfoTest, LoaderBoardReplacesThePenIdentityButNotItsFileOrFlag) {
  CDevice alone = Product(R"({"name": "Slate", "loaderBoard": {"pid": "95"}})");
  EXPECT_TRUE(alone.GetIsFlashLoader());
  EXPECT_EQ(BOARD(alone, Pen), "7A5D:95 HID top1 0/0 s0 ''");

  CDevice beside = Product(R"({"name": "Slate",
    "penBoard": {"pid": "300", "interface": "HID", "sectors": 12, "topology": 2,
                 "usageId": "1", "usagePg": "FF0D", "update": "slate.pen",
                 "intoBLMode": false},
    "loaderBoard": {"pid": "95", "interface": "BULK", "update": "ignored.pen"}})");
  EXPECT_TRUE(beside.GetIsFlashLoader());
  // Every identity key is overwritten, by its default where the loader
  // leaves it out; the file and the into-bootloader flag are the pen board's.
  EXPECT_EQ(BOARD(beside, Pen), "7A5D:95 BULK top1 0/0 s0 'slate.pen'");
  EXPECT_FALSE(beside.getPenIntoBLMode());
}

TEST(CSupportedDeviceInfoTest, ProductsAreStoredUnderThePlainSumOfEachBoardsIdsLaterOnesWinning) {
  LogCapture log;
  CSupportedDeviceInfo info;
  CSupportedDeviceInfo::DeviceMap devices = info.ParseDevices(Products(R"([
    {"name": "Tablet", "penBoard": {"pid": "300"}, "touchBoard": {"pid": "301"},
     "bluetoothBoard": {"pid": "302"}},
    {"name": "Shared", "penBoard": {"vid": "7A00", "pid": "5D"},
     "touchBoard": {"vid": "7A5D", "pid": "0"}, "bluetoothBoard": {"vid": "7A5C", "pid": "1"}},
    {"name": "Display", "penBoard": {"pid": "400"}, "scalarBoard": {"pid": "1060"}},
    {"name": "Display2", "penBoard": {"pid": "401", "usagePg": "FF00"},
     "scalarBoard": {"pid": "1063"}},
    {"name": "Nameless board"},
    {"name": "Loader", "loaderBoard": {"pid": "95"}},
    {"name": "Later", "penBoard": {"pid": "300"}, "scalarBoard": {"pid": "1", "sectors": 64}}
  ])"));

  EXPECT_EQ(devices[0x7A5D + 0x300].GetDeviceName(), "Later");
  EXPECT_EQ(devices[0x7A5D + 0x301].GetDeviceName(), "Tablet");
  EXPECT_EQ(devices[0x7A5D + 0x302].GetDeviceName(), "Tablet");
  // Each key holds the whole product.
  EXPECT_EQ(devices[0x7A5D + 0x302].GetTouchProductId(), 0x301u);

  // Identities that sum to the pen key add no key of their own.
  EXPECT_EQ(devices[0x7A5D].GetDeviceName(), "Shared");

  // A scalar on another usage page than the pen has the page in its key.
  EXPECT_EQ(devices.count(0x5B27 + 0x1060), 0u);
  EXPECT_EQ(devices[0x5B27 + 0x1060 + 0xFF00].GetDeviceName(), "Display");
  EXPECT_EQ(devices[0x5B27 + 0x1063].GetDeviceName(), "Display2");

  // An element with neither pen nor loader board lands on key 0.
  EXPECT_EQ(devices[0].GetDeviceName(), "Nameless board");
  EXPECT_TRUE(devices[0x7A5D + 0x95].GetIsFlashLoader());
  // Stored by assignment: the scalar sectors of a map entry stay as they were.
  EXPECT_EQ(devices[0x7A5D + 0x300].GetScalarFlashSectors(), 0u);
  EXPECT_EQ(devices[0x5B27 + 1 + 0xFF00].GetScalarFlashSectors(), 0u);
  EXPECT_EQ(devices.size(), 11u);
  EXPECT_TRUE(info.ParseDevices(nullptr).empty());
}

TEST(CSupportedDeviceInfoTest, HexTextsFollowTheStreamRulesAndInterfaceWordsAreExact) {
  const std::pair<const char*, uint32_t> hex[] = {
      {"7A5D", 0x7A5D}, {"0x7a5d", 0x7A5D},       {"0X7A5D", 0x7A5D}, {" 1f", 0x1F},
      {"12zz", 0x12},   {"FFFFFFFF", 0xFFFFFFFF}, {"zz", 0},  // no leading digit reads as 0
      {"", 0x5B27},     {"   ", 0x5B27}};                     // nothing at all keeps the default
  for (const auto& [text, value] : hex) {
    EXPECT_EQ(CSupportedDeviceInfo::ConvertHexParam(text, 0x5B27), value) << '"' << text << '"';
  }
  const struct {
    const char* text;
    EINTERFACE_TYPE fallback, expected;
  } words[] = {
      {"HID", EFTDI_INTERFACE, EHID_INTERFACE},    {"BULK", EHID_INTERFACE, EBULK_INTERFACE},
      {"I2C", EHID_INTERFACE, EI2C_INTERFACE},     {"FTDI", EHID_INTERFACE, EFTDI_INTERFACE},
      {"", EFTDI_INTERFACE, EFTDI_INTERFACE},      {"hid", EHID_INTERFACE, EINVALID_INTERFACE},
      {"HID ", EHID_INTERFACE, EINVALID_INTERFACE}};
  for (const auto& word : words) {
    EXPECT_EQ(CSupportedDeviceInfo::ConvertInterfaceParam(word.text, word.fallback), word.expected)
        << '"' << word.text << '"';
  }
}

TEST(CSupportedDeviceInfoTest, OnlyAnArrayOfProductsParsesAndEachParseStartsFromNothing) {
  LogCapture log;
  ConfigFile file;
  CSupportedDeviceInfo info;
  info.SetConfigPath(file.Path());
  EXPECT_FALSE(info.ParseConfig());  // missing
  for (const char* text :
       {"[{\"name\": \"Slate\", ", "[]", R"({"name": "Slate", "penBoard": {"pid": "300"}})"}) {
    file.Write(text);
    EXPECT_FALSE(info.ParseConfig()) << text;
  }
  EXPECT_FALSE(info.IsValid());

  // Elements that are no objects are skipped, and reach no key. Lookups
  // compare only the sum, and every key is listed in order.
  file.Write(R"([42, "text", null, [], {"name": "Slate", "penBoard": {"pid": "0x300",
    "update": "slate.pen"}}, {"name": "Easel", "penBoard": {"pid": "301"},
    "touchBoard": {"pid": "302"}}])");
  ASSERT_TRUE(info.ParseConfig());
  EXPECT_EQ(info.FindDevice(0x7A5D, 0x300).GetPenUpdate(), "slate.pen");
  EXPECT_EQ(info.FindDevice(0x7A5D + 0x300, 0).GetDeviceName(), "Slate");
  EXPECT_EQ(info.FindDevice(0x7A5D, 0x302).GetDeviceName(), "Easel");
  EXPECT_FALSE(info.FindDevice(0x7A5D, 0x303).IsValid());
  EXPECT_FALSE(info.FindDevice(0, 0).IsValid());
  std::vector<std::string> names;
  for (const CDevice& device : info.GetAllDevices()) names.push_back(device.GetDeviceName());
  EXPECT_EQ(names, (std::vector<std::string>{"Slate", "Easel", "Easel"}));

  // A failed read afterwards empties the map.
  fs::remove(file.Path());
  EXPECT_FALSE(info.ParseConfig());
  EXPECT_FALSE(info.IsValid());
}
