#include <gtest/gtest.h>

#include "firmware/CIntelHex.h"
#include "firmware/FirmwareFiles.h"
#include "support/LogCapture.h"

namespace {

const std::string kEnd = HexRecord(1, 0, {});

std::string Lines(const std::vector<std::string>& records_I, const std::string& end_I = "\r\n") {
  std::string text;
  for (const std::string& record : records_I) text += record + end_I;
  return text;
}

// The image CIntelHex holds, as a vector of Size() bytes.
std::vector<uint8_t> Image(const CIntelHex& hex_I) {
  return std::vector<uint8_t>(hex_I.GetData(), hex_I.GetData() + hex_I.Size());
}

uint32_t SignedSum16(const std::vector<uint8_t>& bytes_I) {
  int32_t sum = 0;
  for (uint8_t byte : bytes_I) sum += static_cast<int8_t>(byte);
  return static_cast<uint32_t>(sum) & 0xFFFF;
}

// The record with the low digit of its checksum changed.
std::string BadSum(std::string record_I) {
  record_I.back() = record_I.back() == '0' ? '1' : '0';
  return record_I;
}

}  // namespace

TEST(IntelHex, LoadsImagesThatStartAt0x8000) {
  CTempFolder folder;
  CIntelHex hex;
  // One record: 512 bytes, the rest erased, the signed 16-bit sum.
  ASSERT_TRUE(hex.Load(folder.Write(
      "one.hex", Lines({HexRecord(4, 0, {0, 0}), HexRecord(0, 0x8000, Bytes(16, 0x78)), kEnd}))));
  std::vector<uint8_t> expected = Bytes(16, 0x78);
  expected.resize(512, 0xFF);
  EXPECT_EQ(hex.StartAddress(), 0x8000u);
  EXPECT_EQ(Image(hex), expected);
  EXPECT_EQ(hex.Checksum(), SignedSum16(expected));

  // Bare line feeds, lower-case digits, text before the first record, more
  // records after the end record, and a later record over an earlier one.
  std::string lower = HexRecord(0, 0x8010, {0xAB, 0xCD});
  for (char& c : lower) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  ASSERT_TRUE(hex.Load(
      folder.Write("many.hex", "made by hand\n" + Lines({HexRecord(0, 0x8000, Bytes(16)), kEnd,
                                                         lower, HexRecord(0, 0x8000, {0x55})},
                                                        "\n"))));
  expected = Bytes(16);
  expected[0] = 0x55;
  expected.insert(expected.end(), {0xAB, 0xCD});
  expected.resize(512, 0xFF);
  EXPECT_EQ(Image(hex), expected);

  // The largest image the target takes: 180224 bytes over three segments.
  std::vector<std::string> records{HexRecord(4, 0, {0, 0})};
  std::vector<uint8_t> whole;
  for (uint32_t offset = 0; offset < CIntelHex::kMaxSize; offset += 16) {
    const uint32_t address = 0x8000 + offset;
    if (address % 0x10000 == 0) records.push_back(HexRecord(4, 0, {0, uint8_t(address >> 16)}));
    const std::vector<uint8_t> data = Bytes(16, static_cast<uint8_t>(offset >> 4));
    records.push_back(HexRecord(0, static_cast<uint16_t>(address), data));
    whole.insert(whole.end(), data.begin(), data.end());
  }
  records.push_back(kEnd);
  ASSERT_TRUE(hex.Load(folder.Write("max.hex", Lines(records))));
  EXPECT_EQ(hex.Size(), CIntelHex::kMaxSize);
  EXPECT_EQ(Image(hex), whole);
  EXPECT_EQ(hex.Checksum(), SignedSum16(whole));
}

TEST(IntelHex, KeepsItsSizeRulesAndNarrowChecksums) {
  CTempFolder folder;
  CIntelHex hex;
  // The image is whole pages of 512 bytes.
  ASSERT_TRUE(hex.Load(folder.Write("edge.hex", Lines({HexRecord(0, 0x8000, Bytes(16)),
                                                       HexRecord(0, 0x81F0, Bytes(17)), kEnd}))));
  EXPECT_EQ(hex.Size(), 1024u);  // max_address 512

  // Types 3, 4 and 5 test only the low four bits of their sum.
  const auto badHigh = [](std::string record_I) {
    char& high = record_I[record_I.size() - 2];
    high = high == '0' ? '1' : '0';
    return record_I;
  };
  EXPECT_TRUE(hex.Load(folder.Write("narrow.hex", Lines({badHigh(HexRecord(4, 0, {0, 0})),
                                                         badHigh(HexRecord(5, 0, {0, 0, 0x80, 0})),
                                                         HexRecord(0, 0x8000, {1}), kEnd}))));
  // A type 3 record moves the base although it names an entry point.
  EXPECT_FALSE(hex.Load(folder.Write(
      "start.hex", Lines({HexRecord(3, 0, {0, 0, 0, 1}), HexRecord(0, 0x8000, {1}), kEnd}))));
}

TEST(IntelHex, RefusesWithTheReasonInItsLog) {
  const std::string data = HexRecord(0, 0x8000, Bytes(16));
  const std::string start = "start_address exceeds 32768\n", exceeded = "exceeded 196608\n";
  std::string badEnd = kEnd;
  badEnd.back() = '0';
  std::string badSegment = HexRecord(2, 0, {0, 0});
  badSegment.replace(badSegment.size() - 2, 1, "1");
  const std::pair<std::string, std::string> cases[] = {
      {Lines({HexRecord(0, 0x8010, Bytes(16)), kEnd}), start},
      {Lines({HexRecord(4, 0, {0, 1}), HexRecord(0, 0, Bytes(16)), kEnd}), start},
      {Lines({kEnd}), start},
      {Lines({data, HexRecord(4, 0, {0, 3}), HexRecord(0, 0x4000, Bytes(16)), kEnd}),
       "max_address exceeds 180224\n"},
      {Lines({data, HexRecord(4, 0, {0, 3}), HexRecord(0, 0x7FF8, Bytes(16)), kEnd}), exceeded},
      {Lines({data, HexRecord(0, 0x7FF0, Bytes(16)), kEnd}), exceeded},
      {data + "\r\n" + kEnd, "read error; expected 56 bytes, read 57 bytes\n"},
      {Lines({HexRecord(6, 0, {}), kEnd}), "unknown record_type: 6\n"},
      {Lines({BadSum(data), kEnd}), "checksum error in case 0:\n"},
      {Lines({data, badEnd}), "checksum error in case 1:\n"},
      {Lines({badSegment, data, kEnd}), "checksum error in case 2:\n"},
      {Lines({data + "00", kEnd}), "parsing error looking for carriage return\n"}};
  CTempFolder folder;
  for (const auto& [text, message] : cases) {
    SCOPED_TRACE(text.substr(0, 80));
    CIntelHex hex;
    LogCapture capture;
    EXPECT_FALSE(hex.Load(folder.Write("bad.hex", text)));
    EXPECT_TRUE(capture.LogContains("[E] CIntelHex::Load: ERROR - " + message));
    EXPECT_FALSE(hex.IsLoaded());
  }
}

TEST(IntelHex, KeepsAnEarlierImageUntilALoadSucceeds) {
  CTempFolder folder;
  CIntelHex hex;
  ASSERT_TRUE(hex.Load(folder.Write("a.hex", Lines({HexRecord(0, 0x8000, Bytes(16, 1)), kEnd}))));
  const std::vector<uint8_t> first = Image(hex);
  EXPECT_FALSE(hex.Load(folder.Write("b.hex", Lines({HexRecord(0, 0x9000, Bytes(4)), kEnd}))));
  EXPECT_TRUE(hex.IsLoaded());
  EXPECT_EQ(Image(hex), first);
  // A failed load leaves its file open; the next load starts afresh.
  ASSERT_TRUE(hex.Load(folder.Write("c.hex", Lines({HexRecord(0, 0x8000, Bytes(2, 9)), kEnd}))));
  EXPECT_EQ(hex.GetData()[0], 9);
}
