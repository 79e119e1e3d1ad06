#include "devices/CSupportedDeviceInfo.h"

#include <exception>
#include <sstream>

#include "common/TavLog.h"
#include "settings/CSettingsArray.h"
#include "settings/CSettingsMap.h"
#include "settings/CSettingsObject.h"

namespace {

// Boards of the family answer under this vendor id unless the document says
// otherwise; display scalars come from another vendor and sit behind a bridge.
constexpr uint32_t kFamilyVendorId = 0x7A5D;
constexpr uint32_t kScalarVendorId = 0x5B27;
// The vendor-defined collection a display scalar is reached through over HID.
constexpr uint32_t kScalarUsageId = 0xA;
constexpr uint32_t kScalarUsagePage = 0xFF00;

// The setters of one board's members, so pen, touch, Bluetooth and the
// loader identity are read by one routine.
struct SBoardSetters {
  void (CDevice::*setVendorId)(uint32_t);
  void (CDevice::*setProductId)(uint32_t);
  void (CDevice::*setInterfaceType)(EINTERFACE_TYPE);
  void (CDevice::*setFlashSectors)(uint32_t);
  void (CDevice::*setInitEEPROM)(bool);
  void (CDevice::*setTopology)(uint8_t);
  void (CDevice::*setUsageId)(uint32_t);
  void (CDevice::*setUsagePage)(uint32_t);
  void (CDevice::*setUpdate)(const std::string&);
  void (CDevice::*setIntoBLMode)(bool);
};

constexpr SBoardSetters kPenSetters{&CDevice::SetPenVendorId,      &CDevice::SetPenProductId,
                                    &CDevice::SetPenInterfaceType, &CDevice::SetPenFlashSectors,
                                    &CDevice::SetPenInitEEPROM,    &CDevice::SetPenTopology,
                                    &CDevice::SetPenUsageId,       &CDevice::SetPenUsagePage,
                                    &CDevice::SetPenUpdate,        &CDevice::SetPenIntoBLMode};
constexpr SBoardSetters kTouchSetters{
    &CDevice::SetTouchVendorId,     &CDevice::SetTouchProductId,  &CDevice::SetTouchInterfaceType,
    &CDevice::SetTouchFlashSectors, &CDevice::SetTouchInitEEPROM, &CDevice::SetTouchTopology,
    &CDevice::SetTouchUsageId,      &CDevice::SetTouchUsagePage,  &CDevice::SetTouchUpdate,
    &CDevice::SetTouchIntoBLMode};
constexpr SBoardSetters kBluetoothSetters{
    &CDevice::SetBluetoothVendorId,      &CDevice::SetBluetoothProductId,
    &CDevice::SetBluetoothInterfaceType, &CDevice::SetBluetoothFlashSectors,
    &CDevice::SetBluetoothInitEEPROM,    &CDevice::SetBluetoothTopology,
    &CDevice::SetBluetoothUsageId,       &CDevice::SetBluetoothUsagePage,
    &CDevice::SetBluetoothUpdate,        &CDevice::SetBluetoothIntoBLMode};

uint32_t ReadHex(const CSettingsMap& board_I, const char* key_I, uint32_t default_I) {
  return CSupportedDeviceInfo::ConvertHexParam(board_I.StringForKeyWithDefault(key_I, ""),
                                               default_I);
}

EINTERFACE_TYPE ReadInterface(const CSettingsMap& board_I, EINTERFACE_TYPE default_I) {
  return CSupportedDeviceInfo::ConvertInterfaceParam(
      board_I.StringForKeyWithDefault("interface", ""), default_I);
}

uint32_t ReadSectors(const CSettingsMap& board_I) {
  return static_cast<uint32_t>(board_I.IntegerForKeyWithDefault("sectors", int64_t{0}) & 0xFFFF);
}

uint8_t ReadTopology(const CSettingsMap& board_I) {
  return static_cast<uint8_t>(board_I.IntegerForKeyWithDefault("topology", int64_t{1}) & 0xFF);
}

// Every board takes the pen board's flag. A product described without a pen
// board can still be put into its loader.
bool ReadIntoBLMode(const std::shared_ptr<CSettingsMap>& penBoard_I) {
  return penBoard_I ? penBoard_I->BoolForKeyWithDefault("intoBLMode", true) : true;
}

// The identity keys, shared by the boards and the loader identity.
void ReadIdentity(CDevice& device_IO, const CSettingsMap& board_I, const SBoardSetters& set_I) {
  (device_IO.*set_I.setVendorId)(ReadHex(board_I, "vid", kFamilyVendorId));
  (device_IO.*set_I.setProductId)(ReadHex(board_I, "pid", 0));
  (device_IO.*set_I.setInterfaceType)(ReadInterface(board_I, EHID_INTERFACE));
  (device_IO.*set_I.setFlashSectors)(ReadSectors(board_I));
  (device_IO.*set_I.setInitEEPROM)(board_I.BoolForKeyWithDefault("init", false));
  (device_IO.*set_I.setTopology)(ReadTopology(board_I));
  (device_IO.*set_I.setUsageId)(ReadHex(board_I, "usageId", 0));
  (device_IO.*set_I.setUsagePage)(ReadHex(board_I, "usagePg", 0));
}

void ReadBoard(CDevice& device_IO, const CSettingsMap& board_I, const SBoardSetters& set_I,
               const std::shared_ptr<CSettingsMap>& penBoard_I) {
  ReadIdentity(device_IO, board_I, set_I);
  (device_IO.*set_I.setUpdate)(board_I.StringForKeyWithDefault("update", ""));
  (device_IO.*set_I.setIntoBLMode)(ReadIntoBLMode(penBoard_I));
}

void ReadScalarBoard(CDevice& device_IO, const CSettingsMap& board_I,
                     const std::shared_ptr<CSettingsMap>& penBoard_I) {
  device_IO.SetScalarVendorId(ReadHex(board_I, "vid", kScalarVendorId));
  device_IO.SetScalarProductId(ReadHex(board_I, "pid", 0));
  device_IO.SetScalarInterfaceType(ReadInterface(board_I, EFTDI_INTERFACE));
  device_IO.SetScalarFlashSectors(ReadSectors(board_I));
  device_IO.SetIsQuantaScalarBoard(board_I.BoolForKeyWithDefault("quantaScalarBoard", false));
  device_IO.SetIsQisdaVenusScalarBoard(
      board_I.BoolForKeyWithDefault("qisdaVenusScalarBoard", false));
  device_IO.SetScalarUpdate(board_I.StringForKeyWithDefault("update", ""));
  device_IO.SetScalarTopology(ReadTopology(board_I));
  device_IO.SetScalarUsageId(ReadHex(board_I, "usageId", kScalarUsageId));
  device_IO.SetScalarUsagePage(ReadHex(board_I, "usagePg", kScalarUsagePage));
  device_IO.SetScalarIntoBLMode(ReadIntoBLMode(penBoard_I));
}

// Null when the key is missing or holds no object.
std::shared_ptr<CSettingsMap> BoardObject(const CSettingsMap& product_I, const char* key_I) {
  return product_I.ObjectForKey<CSettingsMap>(key_I);
}

}  // namespace

bool CSupportedDeviceInfo::ParseConfig() {
  mRead = false;
  try {
    Clear();
    std::shared_ptr<CSettingsArray> products =
        CSettingsArray::CastToArray(CSettingsObject::ReadFromJSONFile(mConfigPath), true);
    if (!products) return false;
    mRead = true;
    mSupportedDevices = ParseDevices(products);
    return IsValid();
  } catch (const std::exception&) {
    return false;
  } catch (...) {
    return false;
  }
}

CSupportedDeviceInfo::DeviceMap CSupportedDeviceInfo::ParseDevices(
    std::shared_ptr<CSettingsArray> array_I) {
  TavLog::Info("ParseDevices...\n");
  DeviceMap devices;
  if (!array_I) return devices;

  for (size_t index = 0; index < array_I->ObjectCount(); ++index) {
    std::shared_ptr<CSettingsMap> product =
        CSettingsMap::CastToMap(array_I->ObjectForIndex(index), true);
    // An element that is no object describes nothing.
    if (!product) continue;
    const CDevice device = ParseBoards(product);
    const char* name = device.GetDeviceName().c_str();

    const uint32_t penKey = device.GetPenVendorId() + device.GetPenProductId();
    const uint32_t touchKey = device.GetTouchVendorId() + device.GetTouchProductId();
    const uint32_t bluetoothKey = device.GetBluetoothVendorId() + device.GetBluetoothProductId();

    TavLog::Info("ParseDevices: adding board for pen: %s; pid: 0x%X\n", name,
                 device.GetPenProductId());
    devices[penKey] = device;

    if (device.GetTouchSupported() && touchKey != penKey) {
      TavLog::Info("ParseDevices: adding board for touch: %s; pid: 0x%X\n", name,
                   device.GetTouchProductId());
      devices[touchKey] = device;
    }
    if (device.GetBluetoothSupported() && bluetoothKey != penKey) {
      TavLog::Info("ParseDevices: adding board for bluetooth: %s; pid: 0x%X\n", name,
                   device.GetBluetoothProductId());
      devices[bluetoothKey] = device;
    }
    if (device.GetScalarSupported()) {
      TavLog::Info("ParseDevices: adding board for scalar: %s; pid: 0x%X\n", name,
                   device.GetScalarProductId());
      uint32_t scalarKey = device.GetScalarVendorId() + device.GetScalarProductId();
      // A scalar reached on the pen's own collection would collide with it.
      if (device.GetScalarUsagePage() != device.GetPenUsagePage()) {
        scalarKey += device.GetScalarUsagePage();
      }
      devices[scalarKey] = device;
    }
  }
  return devices;
}

CDevice CSupportedDeviceInfo::ParseBoards(std::shared_ptr<CSettingsMap> map_I) {
  CDevice device;
  if (!map_I) return device;

  std::shared_ptr<CSettingsMap> penBoard = BoardObject(*map_I, "penBoard");
  std::shared_ptr<CSettingsMap> touchBoard = BoardObject(*map_I, "touchBoard");
  std::shared_ptr<CSettingsMap> bluetoothBoard = BoardObject(*map_I, "bluetoothBoard");
  std::shared_ptr<CSettingsMap> scalarBoard = BoardObject(*map_I, "scalarBoard");
  std::shared_ptr<CSettingsMap> loaderBoard = BoardObject(*map_I, "loaderBoard");

  device.SetDeviceName(map_I->StringForKeyWithDefault("name", ""));

  if (penBoard) ReadBoard(device, *penBoard, kPenSetters, penBoard);
  if (touchBoard) {
    ReadBoard(device, *touchBoard, kTouchSetters, penBoard);
    device.SetTouchSupported(true);
  }
  if (bluetoothBoard) {
    ReadBoard(device, *bluetoothBoard, kBluetoothSetters, penBoard);
    device.SetBluetoothSupported(true);
  }
  if (scalarBoard) {
    ReadScalarBoard(device, *scalarBoard, penBoard);
    device.SetScalarSupported(true);
  }
  // The identity the pen controller takes in its loader replaces the pen's.
  if (loaderBoard) {
    device.SetIsFlashLoader(true);
    ReadIdentity(device, *loaderBoard, kPenSetters);
  }
  return device;
}

uint32_t CSupportedDeviceInfo::ConvertHexParam(const std::string& text_I, uint32_t default_I) {
  if (text_I.empty()) return default_I;
  // The stream's own rules: an optional 0x, stop at the first non-digit, 0
  // for a text with no leading digit, untouched for blanks alone.
  uint32_t value = default_I;
  std::istringstream in(text_I);
  in >> std::hex >> value;
  return value;
}

EINTERFACE_TYPE CSupportedDeviceInfo::ConvertInterfaceParam(const std::string& text_I,
                                                            EINTERFACE_TYPE default_I) {
  if (text_I.empty()) return default_I;
  if (text_I == "HID") return EHID_INTERFACE;
  if (text_I == "BULK") return EBULK_INTERFACE;
  if (text_I == "I2C") return EI2C_INTERFACE;
  if (text_I == "FTDI") return EFTDI_INTERFACE;
  return EINVALID_INTERFACE;
}

CDevice CSupportedDeviceInfo::FindDevice(uint32_t vendorId_I, uint32_t productId_I) const {
  auto found = mSupportedDevices.find(vendorId_I + productId_I);
  if (found == mSupportedDevices.end()) return CDevice();
  return found->second;
}

std::vector<CDevice> CSupportedDeviceInfo::GetAllDevices() const {
  std::vector<CDevice> devices;
  devices.reserve(mSupportedDevices.size());
  for (const auto& entry : mSupportedDevices) devices.push_back(entry.second);
  return devices;
}

std::string CSupportedDeviceInfo::ToString() const {
  std::ostringstream out;
  for (const auto& [key, device] : mSupportedDevices) {
    out << "[" << key << "]: " << device.ToString();
  }
  return out.str();
}
