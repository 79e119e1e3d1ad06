#include <gtest/gtest.h>

#include <string>
#include <tuple>

#include "scalar/Connector.h"
#include "scalar/HelperUtils.h"

namespace {

using Bytes = std::vector<uint8_t>;

Bytes Concat(std::initializer_list<Bytes> parts_I) {
  Bytes all;
  for (const Bytes& part : parts_I) all.insert(all.end(), part.begin(), part.end());
  return all;
}
Bytes Text(const std::string& text_I) { return Bytes(text_I.begin(), text_I.end()); }

const Bytes kSerialTag{0x00, 0x00, 0xFF, 0x00};
const Bytes kNameTag{0x00, 0x00, 0xFC, 0x00};

TEST(EDIDSearch, SerialAndNameComeFromTheirDescriptors) {
  // edid, ExtractSerialNumber, ExtractMonitorName, findEDIDValue serial
  // clang-format off
  const std::vector<std::tuple<const char*, Bytes, std::string, std::string, std::string>> rows = {
      {"no descriptors", Text("abcdefgh"), "", "", ""},
      {"serial ended by a line feed and blanks",
       Concat({{0x12}, kSerialTag, Text("A1b2C3\n   "), {0x00}}), "A1b2C3", "", "A1b2C3"},
      {"name ended by a line feed, blanks and a zero",
       Concat({kNameTag, Text("Pen 13\n  "), {0x00}, Text("zz")}), "", "Pen 13", ""},
      {"name with no zero runs on, unprintable bytes and all",
       Concat({kNameTag, Text("Pen"), {0x01}, Text("tail")}), "", "Pen\x01tail", ""},
      {"both, serial first", Concat({kSerialTag, Text("SN9 "), kNameTag, Text("Disp"), {0x00}}),
       "SN9", "Disp", "SN9"},
      {"pattern at the very end", kSerialTag, "", "", ""},
  };
  // clang-format on
  for (const auto& [name, edid, serial, monitor, foundSerial] : rows) {
    SCOPED_TRACE(name);
    EXPECT_EQ(ExtractSerialNumber(edid), serial);
    EXPECT_EQ(ExtractMonitorName(edid), monitor);
    EXPECT_EQ(findEDIDValue(edid, kSerialTag), foundSerial);
  }
}

TEST(CapabilitiesString, KeepsTheTextUpToTheParenthesisClosingTheFirst) {
  // clang-format off
  const std::vector<std::tuple<std::string, std::string>> rows = {
      {"(abc)xyz", "(abc)"},
      {"(prot(monitor)type(lcd))(junk)", "(prot(monitor)type(lcd))"},
      {"(unclosed(", "(unclosed("},
      {"abc(d)", "a"},
  };
  // clang-format on
  for (const auto& [text, kept] : rows) {
    EXPECT_EQ(Connector::ValidateCapabilitiesString(Text(text)), kept) << text;
  }
}

}  // namespace
