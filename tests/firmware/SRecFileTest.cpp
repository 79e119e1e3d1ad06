#include <gtest/gtest.h>

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
  // The last dot of the whole path counts, also in a folder name.
  EXPECT_EQ(CSRec::ExtensionOf("v1.pen/firmware"), "pen/firmware");
  EXPECT_EQ(CSRec::ExtensionOf("a.b.PeN"), "pen");
  EXPECT_EQ(CSRec::ExtensionOf("noext"), "");

  CTempFolder folder;
  const std::string bin = folder.Write("scalar.bin", Bytes(4));
  LogCapture capture;
  CSRec source;
  EXPECT_FALSE(source.Load(bin, EBULK_INTERFACE));
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_UNKNOWN);
  EXPECT_EQ(source.GetUpdateFile(), bin);
  EXPECT_EQ(source.GetUpdateFileExt(), "bin");
  EXPECT_TRUE(capture.LogContains("[E] unrecognized file format for file: " + bin + "\n"));
  EXPECT_TRUE(capture.AssertionContains("failed assertion: \"unrecognized file format\""));
  EXPECT_TRUE(source.Load(bin, EHID_INTERFACE));
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_SCALAR_BINARY);
}

TEST(SRecFrontEnd, AssertsOnAMissingPathOrInterface) {
  LogCapture capture;
  CSRec source;
  source.SetDataSourceFormat(EHID_INTERFACE);
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_UNKNOWN);
  EXPECT_TRUE(capture.AssertionContains("failed assertion: \"firmware file not specified\""));
  EXPECT_FALSE(source.Load("fw.pen", EINVALID_INTERFACE));
  EXPECT_TRUE(capture.AssertionContains("failed assertion: interfaceType_I != EINVALID_INTERFACE"));
  // The assertion does not stop the choice: a pen file is still read.
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_SREC_PEN);
  EXPECT_TRUE(capture.LogContains("LoadSRecFile - FAILED to open with error: 2\n"));
}

TEST(SRecFrontEnd, KeepsParsersAndPathApartFromTheBlocks) {
  CTempFolder folder;
  LogCapture capture;
  CSRec source;
  // The scalar reader of a new front-end answers loaded, so nothing is
  // asked further and no error line is written.
  EXPECT_TRUE(source.IsLoaded());
  EXPECT_FALSE(capture.LogContains("[E]"));
  ASSERT_TRUE(source.Load(folder.Write("t.hex", HexRecord(0, 0x8000, Bytes(16)) + "\r\n" +
                                                    HexRecord(1, 0, {}) + "\r\n"),
                          EHID_INTERFACE));
  const std::string pen = folder.Write("p.pen", SRecLine('1', 0, Bytes(4)) + "\n");
  ASSERT_TRUE(source.Load(pen, EHID_INTERFACE));
  // The Intel hex image outlives the load of another format.
  EXPECT_TRUE(source.GetIntelHexData()->IsLoaded());
  EXPECT_EQ(source.GetSRecData().size(), 1u);
  source.Clear();
  EXPECT_TRUE(source.GetSRecData().empty());
  EXPECT_EQ(source.GetUpdateFile(), pen);
  EXPECT_EQ(source.GetDataSourceFormat(), EDS_SREC_PEN);
  EXPECT_TRUE(source.GetIntelHexData()->IsLoaded());
  // Copies share the parsers.
  EXPECT_EQ(CSRec(source).GetIntelHexData(), source.GetIntelHexData());
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
  EXPECT_EQ(source.GetSRecDataRef(), expected);
  EXPECT_TRUE(source.IsLoaded());
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

TEST(SRecReader, KeepsTheQuirksOfItsDigitsAndLines) {
  // Only the high digit is folded to upper case; nothing is refused and
  // nothing is cut to 8 bits.
  EXPECT_EQ(CSRec::ParseByte("3A", 0), 0x3A);
  EXPECT_EQ(CSRec::ParseByte("3a", 0), 90);
  EXPECT_EQ(CSRec::ParseByte("a3", 0), 0xA3);
  EXPECT_EQ(CSRec::ParseByte("xxFf", 2), 0xF0 + ('f' - 55));
  EXPECT_EQ(CSRec::ParseByte("G!", 0), 16 * 16 + 234);

  CTempFolder folder;
  CSRec source;
  const auto loads = [&](const std::string& text_I) {
    return source.Load(folder.Write("q.pen", text_I), EHID_INTERFACE);
  };
  // A lower-case low digit reads as 42 more than it says: with a checksum
  // made for that value the record loads, with the honest one it fails.
  ASSERT_TRUE(loads("S10400000aD1\n"));
  EXPECT_EQ(source.GetSRecData(), (CBlocks{{0, {0x2A}}}));
  EXPECT_FALSE(loads("S10400000aF1\n"));
  ASSERT_TRUE(loads("S10400000AF1\nS1040001a05A\n"));
  EXPECT_EQ(source.GetSRecData(), (CBlocks{{0, {0x0A, 0xA0}}}));

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

  // The length test counts a carriage return: nine characters fail, the
  // same nine with a carriage return pass and are then skipped.
  const std::string data = SRecLine('1', 0, Bytes(1)) + "\n";
  EXPECT_FALSE(loads("S5030001F\n" + data));
  EXPECT_TRUE(loads("S5030001F\r\n" + data));
}
