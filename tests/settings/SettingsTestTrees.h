#pragma once
// Trees shared by the tests of the forms.

#include <memory>

#include "settings/CSettingsMap.h"

namespace SettingsTestTrees {

// Every class but the null, which no comparison can match, with texts that
// need escaping in the text forms.
inline std::shared_ptr<CSettingsMap> EveryClass() {
  auto list = CSettingsArray::New();
  list->AddBool(true);
  list->AddInteger(-12);
  list->AddString("second & <third>");
  auto nested = CSettingsMap::New();
  nested->SetKeyAndDouble("ratio", 0.125);
  nested->SetKeyAndObject("empty", CSettingsMap::New());
  nested->SetKeyAndObject("none", CSettingsArray::New());
  auto tree = CSettingsMap::New();
  tree->SetKeyAndString("Name", "Pen \"display\" 'x'");
  tree->SetKeyAndInteger("Count", INT64_MIN);
  tree->SetKeyAndObject("Blob", CSettingsBytes::New({0, 1, 2, 0xFE, 0xFF}));
  tree->SetKeyAndObject("List", list);
  tree->SetKeyAndObject("Nested", nested);
  tree->SetKeyAndKEString("Secret", "a]]>b]c");
  tree->SetKeyAndBool("Off", false);
  tree->SetKeyAndString("Unicode", "\xC3\xA9\xE2\x82\xAC");
  return tree;
}

// A configuration-sized tree of about entries_I leaves: boards with a few
// typed values each, as the device configuration holds them.
inline std::shared_ptr<CSettingsMap> Configuration(int entries_I) {
  auto boards = CSettingsArray::New();
  const int perBoard = 10;
  for (int i = 0; i < entries_I / perBoard; ++i) {
    auto board = CSettingsMap::New();
    board->SetKeyAndString("Name", "Board " + std::to_string(i));
    board->SetKeyAndString("Interface", i % 3 == 0 ? "HID" : "I2C");
    board->SetKeyAndInteger("VendorId", 0x2D1F);
    board->SetKeyAndInteger("ProductId", 0x0100 + i);
    board->SetKeyAndInteger("Address", 0x08000000 + 0x800 * i);
    board->SetKeyAndDouble("Delay", 0.25 * (i % 8));
    board->SetKeyAndBool("Reset", i % 2 == 0);
    board->SetKeyAndString("File", "firmware_" + std::to_string(i) + ".pen");
    board->SetKeyAndObject("Key", CSettingsBytes::New({1, 2, 3, static_cast<unsigned char>(i)}));
    auto modes = CSettingsArray::New();
    modes->AddString("normal");
    board->SetKeyAndObject("Modes", modes);
    boards->AddObject(board);
  }
  auto root = CSettingsMap::New();
  root->SetKeyAndObject("Boards", boards);
  root->SetKeyAndInteger("Version", 3);
  return root;
}

}  // namespace SettingsTestTrees
