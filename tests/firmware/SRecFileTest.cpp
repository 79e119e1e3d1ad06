#include <gtest/gtest.h>

#include <cstdio>

#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"
#include "support/LogCapture.h"

using CBlocks = std::vector<SContinuousDataBlock>;

TEST(SRecFrontEnd, ChoosesTheReaderFromExtensionAndInterface) {
  // Only "bin" asks the interface.
  const struct {
    const char* path;
    EINTERFACE_TYPE interface;
    EDataSourceFormat format;
  } cases[] = {// clang-format off
      {"fw/FW.HEX", EHID_INTERFACE, EDS_INTEL_HEX}, {"a.Pen", EBULK_INTERFACE, EDS_SREC_PEN},
      {"a.TOUCH", EI2C_INTERFACE, EDS_SREC_TOUCH}, {"a.tav", EFTDI_INTERFACE, EDS_SREC_GENERIC},
      {"bt.airoflash", EHID_INTERFACE, EDS_AIROFLASH}, {"bt.AiroFlash2", EHID_INTERFACE, EDS_AIROFLASH2},
      {"s.bin", EFTDI_INTERFACE, EDS_SCALAR_RTDISP}, {"s.BIN", EHID_INTERFACE, EDS_SCALAR_BINARY},
      {"s.bin", EBULK_INTERFACE, EDS_UNKNOWN}, {"a.srec", EHID_INTERFACE, EDS_UNKNOWN}};
  // clang-format on
  for (const auto& c : cases) EXPECT_EQ(CSRec::FormatFor(c.path, c.interface), c.format) << c.path;
  CTempFolder folder;
  const std::string bin = folder.Write("scalar.bin", Bytes(4));
  LogCapture capture;
  CSRec source;
  EXPECT_FALSE(source.Load(bin, EBULK_INTERFACE));
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_UNKNOWN);
  EXPECT_TRUE(source.Load(bin, EHID_INTERFACE));
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_SCALAR_BINARY);
}

TEST(SRecReader, ReadsDataRecordsOfEveryAddressWidth) {
  CTempFolder folder;
  const std::string text = "S00600004844521B\n" + SRecLine('1', 0x1000, Bytes(4, 0x10)) + "\n" +
                           SRecLine('2', 0x123456, Bytes(3, 0xA0)) + "\r\n" +
                           SRecLine('3', 0x89ABCDEF, Bytes(2, 0xF0)) + "\n" +
                           "S5030003XX\n"    // counts are not checked
                           "S9030000FC\n" +  // and the end does not end the reading
                           SRecLine('1', 0x1004, Bytes(2, 0x14)) +
                           "\n";
  CSRec source;
  ASSERT_TRUE(source.Load(folder.Write("fw.pen", text), EHID_INTERFACE));
  const CBlocks expected{
      {0x1000, Bytes(6, 0x10)}, {0x123456, Bytes(3, 0xA0)}, {0x89ABCDEF, Bytes(2, 0xF0)}};
  EXPECT_EQ(source.GetSRecData(), expected);
}

TEST(SRecReader, RefusesMalformedFilesWithTheirLineNumber) {
  const std::string good = SRecLine('1', 0x2000, Bytes(8)) + "\n";
  const std::string fail = "LoadSRecFile - FAILED on ";
  const std::pair<std::string, std::string> cases[] = {
      {"\n\n# build 1\n", "invalid record length, line 3\n"},
      {good + "SX0300FCFF\n", "invalid format, line 2\n"},
      {"S4030000FC\n", "invalid format, line 1\n"},
      {good + good + "S6030000FC\n", "invalid format, line 3\n"},
      {"S1020000FD\n", "bytes count, line 1\n"},
      {good + "S1050000010200\n", "invalid CRC, line 2\n"},
      // Too short to hold its own address: refused rather than read past.
      {"S305000012\n", "invalid record length, line 1\n"},
      {"S00600004844521B\nS9030000FC\n", "SRecData empty\n"},
      {SRecLine('1', 0x10, Bytes(16)) + "\n" + SRecLine('1', 0x08, Bytes(16)) + "\n",
       "data overlap, recCount: 1\n"},
      {good + SRecLine('1', 0x3010, Bytes(16)) + "\n" + SRecLine('1', 0x3008, Bytes(16)) + "\n",
       "data overlap, recCount: 2\n"}};
  CTempFolder folder;
  for (const auto& [text, message] : cases) {
    SCOPED_TRACE(text);
    CSRec source;
    ASSERT_TRUE(source.Load(folder.Write("ok.tav", good), EHID_INTERFACE));
    LogCapture capture;
    EXPECT_FALSE(source.Load(folder.Write("bad.tav", text), EHID_INTERFACE));
    EXPECT_TRUE(capture.LogContains("[E] " + fail + message));
    // A failed load leaves no data behind, not even that of the file before.
    EXPECT_TRUE(source.GetSRecData().empty());
  }
}

TEST(SRecReader, DecidesTheDataByTheLineAndSkipsWhatItDoesNotRead) {
  CTempFolder folder;
  CSRec source;
  const auto loads = [&](const std::string& text_I) {
    return source.Load(folder.Write("q.pen", text_I), EHID_INTERFACE);
  };
  // The count field only counts in the checksum: the line decides the data.
  std::string line = SRecLine('1', 0x40, Bytes(16));
  line.replace(2, 2, "03");
  line.replace(line.size() - 2, 2, HexBytes({uint8_t(~(0x03 + 0x40 + ByteSum(Bytes(16))))}));
  ASSERT_TRUE(loads(line + "\n"));
  EXPECT_EQ(source.GetSRecData(), (CBlocks{{0x40, Bytes(16)}}));

  // Skipped lines are not checked, and text lines long enough are ignored.
  ASSERT_TRUE(loads("S0garbage!!\nS5ZZZZZZZZZ\nS7nonsense!\nS8........\nthis is a comment line\n" +
                    SRecLine('2', 0x10, Bytes(2)) + "\n"));
  EXPECT_EQ(source.GetSRecData(), (CBlocks{{0x10, Bytes(2)}}));
}

// Long data fields are read many digits at a time where they are plain upper
// case: a character of any other kind, wherever it stands, must still read as
// the two digit rules say.
TEST(SRecReader, ReadsEveryDigitOfALongRecordByTheDigitRules) {
  CTempFolder folder;
  const std::string plain = SRecLine('3', 0x2000, Bytes(40, 0x9A));
  const struct {
    size_t at;  // in the data characters
    char with;
  } cases[] = {{0, 'a'},  {1, 'a'},  {7, 'f'},  {15, 'G'}, {16, '@'}, {17, ':'},
               {30, 'z'}, {31, '/'}, {47, 'F'}, {63, 'b'}, {79, 'e'}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.at);
    std::string line = plain.substr(0, plain.size() - 2);  // without its checksum
    line[12 + c.at] = c.with;
    std::vector<uint8_t> expected;
    unsigned sum = 0;
    for (size_t index = 2; index < line.size(); index += 2) {
      const uint8_t byte = static_cast<uint8_t>(CSRec::ParseByte(line, index));
      if (index >= 12) expected.push_back(byte);
      sum += byte;
    }
    char checksum[3];
    std::snprintf(checksum, sizeof checksum, "%02X", ~sum & 0xFF);
    CSRec source;
    ASSERT_TRUE(source.Load(folder.Write("long.tav", line + checksum + "\n"), EHID_INTERFACE));
    EXPECT_EQ(source.GetSRecData(), CBlocks({{0x2000, expected}}));
  }
}
