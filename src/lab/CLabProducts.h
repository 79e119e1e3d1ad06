#pragma once
// The lab's products: fictional tablets and pen displays built from the
// lab's boards. Each product sits behind a hub of its own, so that its
// boards share a parent on the bus as the boards of a real product do:
// root port p gives the hub, hub port q a board (location 0x01000000 |
// p << 20 | q << 16). Their device configuration is the fw_loader.ini
// installed with the program; the ids below and the ids there go together.
//
// Two generations: boards of a product whose pen goes into a loader speak
// the loader protocol and re-enumerate under a loader id; boards of a
// product whose pen does not speak the non-BL protocol and stay where they
// are. Every board answers its updates on the vendor collection (0xFF00,
// 0x0001); pens also show their digitizer collection.
//
// A pen display with its scalar behind an FTDI bridge has the bridge on
// hub port 5 (CLabFTDIBridge): display-ftdi with the plain scalar board,
// display-ftdi-quanta with the Quanta board, display-ftdi-venus with the
// Qisda Venus board. Each panel's EDID carries the scalar's product id of
// the device configuration (0x1060, 0x1061, 0x1062) and the serial the
// scalar gives in its display information.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "lab/CLabBoard.h"
#include "lab/CLabBus.h"
#include "seams/CDisplays.h"

struct SLabProduct {
  std::string name;     // the short name of --lab NAME
  std::string summary;  // one line for --lab list
};

class CLabProducts {
 public:
  static const std::vector<SLabProduct>& All();
  static const char* DefaultName() { return "wireless-tablet"; }
  static bool IsKnown(const std::string& name_I);

  // Plugs the product's boards in behind a hub on root port `rootPort_I`
  // (1 to 15). Returns the boards, pen first; empty for an unknown name.
  static std::vector<std::shared_ptr<CLabBoard>> Plug(CLabBus& bus_I, const std::string& name_I,
                                                      unsigned rootPort_I = 1);
  static uint32_t HubLocation(unsigned rootPort_I);
  // The product's displays that are not the panel of a bridge's scalar
  // board (CLabDisplays lists those): display-hid's, which gives no EDID.
  static std::vector<SDisplay> OtherDisplays(const std::string& name_I);
};
