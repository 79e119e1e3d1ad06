#include "lab/CLabProducts.h"

#include <algorithm>

#include "lab/CLabBluetooth.h"
#include "lab/CLabFTDIBridge.h"
#include "lab/CLabI2CMaster.h"
#include "lab/CLabPenController.h"
#include "lab/CLabScalarHid.h"
#include "lab/CLabTouchBulk.h"
#include "lab/CLabTouchHex.h"

namespace {

constexpr uint16_t kFamilyVendorId = 0x7A5D;
// The collection every board takes its updates on.
constexpr std::pair<uint16_t, uint16_t> kUpdateUsage{0xFF00, 0x0001};
constexpr std::pair<uint16_t, uint16_t> kDigitizerUsage{0x000D, 0x0002};

// Hub ports of the boards of a product.
constexpr unsigned kPenPort = 1;
constexpr unsigned kTouchPort = 2;
constexpr unsigned kBluetoothPort = 3;
constexpr unsigned kScalarPort = 4;
constexpr unsigned kBridgePort = 5;

// The name a pen display gives in its EDID and display information.
constexpr const char* kPanelName = "Lab Display";

std::shared_ptr<CLabBoard> Pen(const std::string& product_I, uint16_t productId_I,
                               ELabProtocol protocol_I) {
  SLabPenDescription description;
  description.name = product_I + "-pen";
  description.vendorId = kFamilyVendorId;
  description.productId = productId_I;
  description.loaderProductId = productId_I + 1;
  description.protocol = protocol_I;
  description.usages = {kDigitizerUsage, kUpdateUsage};
  description.loaderUsages = {kUpdateUsage};
  description.deviceInfo = productId_I;
  return std::make_shared<CLabPenController>(description);
}

// The modules of the non-BL generation come back from an interrupted update
// under their own id: their boot code answers the same reports.
SLabBoardIds ModuleIds(uint16_t productId_I) {
  return SLabBoardIds{kFamilyVendorId, productId_I, productId_I, kUpdateUsage};
}

std::shared_ptr<CLabBoard> TouchHex(const std::string& product_I, uint16_t productId_I) {
  return std::make_shared<CLabTouchHex>(product_I + "-touch", ModuleIds(productId_I));
}

std::shared_ptr<CLabBoard> Bluetooth(const std::string& product_I, CLabBluetooth::EChip chip_I,
                                     uint16_t productId_I) {
  return std::make_shared<CLabBluetooth>(chip_I, product_I + "-bluetooth", ModuleIds(productId_I));
}

// The scalar board behind a pen display's FTDI bridge. `scalarProductId_I`
// is the scalar's id in the device configuration, which the panel's EDID
// carries as its product code.
std::shared_ptr<CLabBoard> Bridge(const std::string& product_I, ELabScalarVariant variant_I,
                                  uint16_t scalarProductId_I, const char* serial_I) {
  SLabFTDIDescription description;
  description.name = product_I + "-scalar";
  description.variant = variant_I;
  description.panel.connector = "lab-" + product_I;
  description.panel.productCode = scalarProductId_I;
  description.panel.name = kPanelName;
  description.panel.serial = serial_I;
  return std::make_shared<CLabFTDIBridge>(description);
}

struct SPlacedBoard {
  unsigned hubPort;
  std::shared_ptr<CLabBoard> board;
};

std::vector<SPlacedBoard> Build(const std::string& name_I) {
  using EChip = CLabBluetooth::EChip;
  if (name_I == "classic-tablet") {
    SLabTouchBulkDescription touch;
    touch.name = name_I + "-touch";
    touch.vendorId = kFamilyVendorId;
    touch.productId = 0x0311;
    touch.loaderProductId = 0x0312;
    touch.loaderUsages = {kUpdateUsage};
    touch.deviceInfo = 0x0311;
    return {{kPenPort, Pen(name_I, 0x0301, ELabProtocol::eLoader)},
            {kTouchPort, std::make_shared<CLabTouchBulk>(touch)}};
  }
  if (name_I == "wireless-tablet") {
    return {{kPenPort, Pen(name_I, 0x0401, ELabProtocol::eNonBL)},
            {kTouchPort, TouchHex(name_I, 0x0411)},
            {kBluetoothPort, Bluetooth(name_I, EChip::eAB1555, 0x0421)}};
  }
  if (name_I == "wireless-tablet-1122") {
    return {{kPenPort, Pen(name_I, 0x0501, ELabProtocol::eNonBL)},
            {kBluetoothPort, Bluetooth(name_I, EChip::eAB1122, 0x0521)}};
  }
  if (name_I == "display-hid") {
    return {{kPenPort, Pen(name_I, 0x0601, ELabProtocol::eNonBL)},
            {kTouchPort, TouchHex(name_I, 0x0611)},
            {kScalarPort, std::make_shared<CLabScalarHid>(name_I + "-scalar", ModuleIds(0x0631))}};
  }
  if (name_I == "display-ftdi") {
    return {{kPenPort, Pen(name_I, 0x0701, ELabProtocol::eLoader)},
            {kBridgePort, Bridge(name_I, ELabScalarVariant::ePlain, 0x1060, "LABFT0701")}};
  }
  if (name_I == "display-ftdi-quanta") {
    return {{kPenPort, Pen(name_I, 0x0711, ELabProtocol::eLoader)},
            {kBridgePort, Bridge(name_I, ELabScalarVariant::eQuanta, 0x1061, "LABFQ0711")}};
  }
  if (name_I == "display-ftdi-venus") {
    return {{kPenPort, Pen(name_I, 0x0721, ELabProtocol::eLoader)},
            {kBridgePort, Bridge(name_I, ELabScalarVariant::eQisdaVenus, 0x1062, "LABFV0721")}};
  }
  if (name_I == "tunnel-tablet") {
    SLabI2CDescription master;
    master.name = name_I + "-pen";
    master.vendorId = kFamilyVendorId;
    master.productId = 0x0801;
    master.usage = kUpdateUsage;
    master.deviceInfo = 0x0801;
    return {{kPenPort, std::make_shared<CLabI2CMaster>(master)}};
  }
  return {};
}

}  // namespace

const std::vector<SLabProduct>& CLabProducts::All() {
  static const std::vector<SLabProduct> products{
      {"classic-tablet",
       "tablet: pen controller with its own loader id, touch controller on a vendor-class USB "
       "interface"},
      {"wireless-tablet", "tablet: pen, touch (Intel hex) and an AB1555 Bluetooth module"},
      {"wireless-tablet-1122", "tablet: pen and an AB1122 Bluetooth module"},
      {"display-hid", "pen display: pen, touch and a scalar programmed over HID"},
      {"display-ftdi", "pen display: pen and a scalar behind an FTDI bridge"},
      {"display-ftdi-quanta", "pen display: pen and a Quanta scalar board behind an FTDI bridge"},
      {"display-ftdi-venus",
       "pen display: pen and a Qisda Venus scalar board behind an FTDI bridge"},
      {"tunnel-tablet", "tablet: pen controller reached through an I2C tunnel"},
  };
  return products;
}

bool CLabProducts::IsKnown(const std::string& name_I) {
  const auto& all = All();
  return std::any_of(all.begin(), all.end(),
                     [&](const SLabProduct& product) { return product.name == name_I; });
}

uint32_t CLabProducts::HubLocation(unsigned rootPort_I) {
  return 0x01000000u | ((rootPort_I & 0xFu) << 20);
}

std::vector<std::shared_ptr<CLabBoard>> CLabProducts::Plug(CLabBus& bus_I,
                                                           const std::string& name_I,
                                                           unsigned rootPort_I) {
  std::vector<std::shared_ptr<CLabBoard>> boards;
  for (const SPlacedBoard& placed : Build(name_I)) {
    bus_I.Plug(placed.board, HubLocation(rootPort_I) | ((placed.hubPort & 0xFu) << 16));
    boards.push_back(placed.board);
  }
  return boards;
}

std::vector<SDisplay> CLabProducts::OtherDisplays(const std::string& name_I) {
  if (name_I != "display-hid") return {};
  // Its display stack gives no EDID, only what it knows of the monitor.
  SDisplay display;
  display.connector = "lab-display-hid";
  display.manufacturerId = kLabDisplayManufacturer;
  display.productId = 0x0631;
  display.serialNumber = "LABHD0601";
  display.productName = kPanelName;
  return {display};
}
