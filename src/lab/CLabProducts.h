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

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "lab/CLabBoard.h"
#include "lab/CLabBus.h"

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
};
