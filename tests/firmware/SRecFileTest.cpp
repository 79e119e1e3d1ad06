#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"
#include "support/LogCapture.h"

namespace {

SContinuousDataBlock Block(uint32_t start_I, std::vector<uint8_t> data_I) {
  return SContinuousDataBlock{start_I, std::move(data_I)};
}

std::vector<uint8_t> Concat(std::vector<uint8_t> a_I, const std::vector<uint8_t>& b_I) {
  a_I.insert(a_I.end(), b_I.begin(), b_I.end());
  return a_I;
}

}  // namespace

TEST(SRecFrontEnd, ChoosesTheReaderFromExtensionAndInterface) {
  EXPECT_EQ(CSRec::FormatFor("fw/FW.HEX", EHID_INTERFACE), EDS_INTEL_HEX);
  EXPECT_EQ(CSRec::FormatFor("a.Pen", EBULK_INTERFACE), EDS_SREC_PEN);
  EXPECT_EQ(CSRec::FormatFor("a.TOUCH", EI2C_INTERFACE), EDS_SREC_TOUCH);
  EXPECT_EQ(CSRec::FormatFor("a.tav", EFTDI_INTERFACE), EDS_SREC_GENERIC);
  EXPECT_EQ(CSRec::FormatFor("bt.airoflash", EHID_INTERFACE), EDS_AIROFLASH);
  EXPECT_EQ(CSRec::FormatFor("bt.AiroFlash2", EHID_INTERFACE), EDS_AIROFLASH2);
  // Only "bin" asks the interface.
  EXPECT_EQ(CSRec::FormatFor("s.bin", EFTDI_INTERFACE), EDS_SCALAR_RTDISP);
  EXPECT_EQ(CSRec::FormatFor("s.BIN", EHID_INTERFACE), EDS_SCALAR_BINARY);
  EXPECT_EQ(CSRec::FormatFor("s.bin", EBULK_INTERFACE), EDS_UNKNOWN);
  EXPECT_EQ(CSRec::FormatFor("s.bin", EI2C_INTERFACE), EDS_UNKNOWN);
  EXPECT_EQ(CSRec::FormatFor("firmware", EHID_INTERFACE), EDS_UNKNOWN);
  EXPECT_EQ(CSRec::FormatFor("a.srec", EHID_INTERFACE), EDS_UNKNOWN);
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
  const std::vector<SContinuousDataBlock> expected{Block(0x1000, Bytes(6, 0x10)),
                                                   Block(0x123456, Bytes(3, 0xA0)),
                                                   Block(0x89ABCDEF, Bytes(2, 0xF0))};
  EXPECT_EQ(source.GetSRecData(), expected);
  EXPECT_EQ(source.GetSRecDataRef(), expected);
  EXPECT_TRUE(source.IsLoaded());
}

TEST(SRecReader, MergesRecordsAsTheyComeWithTheFirstDataWinning) {
  CTempFolder folder;
  CSRec source;
  // Descending addresses: every record goes in front of the one block.
  std::string text;
  for (int i = 4; i >= 0; --i) {
    text += SRecLine('1', static_cast<uint32_t>(i * 16), Bytes(16, static_cast<uint8_t>(i * 16))) +
            "\n";
  }
  ASSERT_TRUE(source.Load(folder.Write("down.pen", text), EHID_INTERFACE));
  EXPECT_EQ(source.GetSRecData(), std::vector<SContinuousDataBlock>{Block(0, Bytes(80))});

  // A record that fills the gap between two blocks joins the first of them;
  // the two blocks then touch and stay two.
  text = SRecLine('1', 0x00, Bytes(16, 0x00)) + "\n" + SRecLine('1', 0x20, Bytes(16, 0x20)) + "\n" +
         SRecLine('1', 0x10, Bytes(16, 0x10)) + "\n" + SRecLine('1', 0x1000, Bytes(4, 0x99)) + "\n";
  ASSERT_TRUE(source.Load(folder.Write("gap.pen", text), EHID_INTERFACE));
  EXPECT_EQ(source.GetSRecData(),
            (std::vector<SContinuousDataBlock>{Block(0x00, Bytes(32)), Block(0x20, Bytes(16, 0x20)),
                                               Block(0x1000, Bytes(4, 0x99))}));

  // A record with the address of another, or one starting inside a block
  // and running past its end, is dropped whole and without a word.
  LogCapture capture;
  text = SRecLine('3', 0x100, Bytes(16, 0x40)) + "\n" + SRecLine('3', 0x100, Bytes(16, 0x80)) +
         "\n" + SRecLine('3', 0x108, Bytes(16, 0xC0)) + "\n" +
         SRecLine('3', 0x110, Bytes(2, 0x50)) + "\n";
  ASSERT_TRUE(source.Load(folder.Write("dup.pen", text), EHID_INTERFACE));
  EXPECT_EQ(source.GetSRecData(), std::vector<SContinuousDataBlock>{
                                      Block(0x100, Concat(Bytes(16, 0x40), Bytes(2, 0x50)))});
  for (const std::string& line : capture.Log()) EXPECT_EQ(line.rfind("[E]", 0), std::string::npos);
}

TEST(SRecReader, RefusesMalformedFilesWithTheirLineNumber) {
  struct SCase {
    std::string text;
    std::string message;
  };
  const std::string good = SRecLine('1', 0x2000, Bytes(8)) + "\n";
  const std::vector<SCase> cases{
      {"\n\n# build 1\n", "LoadSRecFile - FAILED on invalid record length, line 3\n"},
      {good + "S903\n", "LoadSRecFile - FAILED on invalid record length, line 2\n"},
      {good + "SX0300FCFF\n", "LoadSRecFile - FAILED on invalid format, line 2\n"},
      {"S4030000FC\n", "LoadSRecFile - FAILED on invalid format, line 1\n"},
      {good + good + "S6030000FC\n", "LoadSRecFile - FAILED on invalid format, line 3\n"},
      {"S1020000FD\n", "LoadSRecFile - FAILED on bytes count, line 1\n"},
      {good + "S1050000010200\n", "LoadSRecFile - FAILED on invalid CRC, line 2\n"},
      // Too short to hold its own address: refused rather than read past.
      {"S305000012\n", "LoadSRecFile - FAILED on invalid record length, line 1\n"},
      {"S00600004844521B\nS9030000FC\n", "LoadSRecFile - FAILED on SRecData empty\n"},
      {SRecLine('1', 0x10, Bytes(16)) + "\n" + SRecLine('1', 0x08, Bytes(16)) + "\n",
       "LoadSRecFile - FAILED on data overlap, recCount: 1\n"},
      {good + SRecLine('1', 0x3010, Bytes(16)) + "\n" + SRecLine('1', 0x3008, Bytes(16)) + "\n",
       "LoadSRecFile - FAILED on data overlap, recCount: 2\n"},
  };
  CTempFolder folder;
  for (const SCase& test : cases) {
    SCOPED_TRACE(test.text);
    CSRec source;
    ASSERT_TRUE(source.Load(folder.Write("ok.tav", good), EHID_INTERFACE));
    LogCapture capture;
    EXPECT_FALSE(source.Load(folder.Write("bad.tav", test.text), EHID_INTERFACE));
    EXPECT_TRUE(capture.LogContains("[E] " + test.message));
    // A failed load leaves no data behind, not even that of the file before.
    EXPECT_TRUE(source.GetSRecData().empty());
  }
}

TEST(SRecReader, KeepsTheQuirksOfItsDigitsAndLines) {
  // Only the high digit is folded to upper case.
  EXPECT_EQ(CSRec::ParseByte("3A", 0), 0x3A);
  EXPECT_EQ(CSRec::ParseByte("3a", 0), 90);
  EXPECT_EQ(CSRec::ParseByte("a3", 0), 0xA3);
  EXPECT_EQ(CSRec::ParseByte("xxFf", 2), 0xF0 + ('f' - 55));
  // Nothing is refused and nothing is cut to 8 bits.
  EXPECT_EQ(CSRec::ParseByte("G!", 0), 16 * 16 + 234);

  CTempFolder folder;
  CSRec source;
  const auto loads = [&](const std::string& text_I) {
    return source.Load(folder.Write("q.pen", text_I), EHID_INTERFACE);
  };
  // A lower-case low digit reads as 42 more than it says: with a checksum
  // made for that value the record loads, with the honest one it fails.
  ASSERT_TRUE(loads("S10400000aD1\n"));
  EXPECT_EQ(source.GetSRecData(), std::vector<SContinuousDataBlock>{Block(0, {0x2A})});
  EXPECT_FALSE(loads("S10400000aF1\n"));
  ASSERT_TRUE(loads("S10400000AF1\nS1040001a05A\n"));
  EXPECT_EQ(source.GetSRecData(), std::vector<SContinuousDataBlock>{Block(0, {0x0A, 0xA0})});

  // The count field only counts in the checksum: the line decides the data.
  std::string line = SRecLine('1', 0x40, Bytes(16));
  line.replace(2, 2, "03");
  unsigned sum = 0x03 + 0x00 + 0x40;
  for (uint8_t byte : Bytes(16)) sum += byte;
  line.replace(line.size() - 2, 2, HexBytes({static_cast<uint8_t>(~sum)}));
  ASSERT_TRUE(loads(line + "\n"));
  EXPECT_EQ(source.GetSRecData(), std::vector<SContinuousDataBlock>{Block(0x40, Bytes(16))});

  // Skipped lines are not checked, and text lines long enough are ignored.
  ASSERT_TRUE(
      loads("S0garbage!!\nS5ZZZZZZZZZ\nS7nonsense!\nS8........\n"
            "this is a comment line\n" +
            SRecLine('2', 0x10, Bytes(2)) + "\n"));
  EXPECT_EQ(source.GetSRecData(), std::vector<SContinuousDataBlock>{Block(0x10, Bytes(2))});

  // The length test counts a carriage return: nine characters fail, the
  // same nine with a carriage return pass and are then skipped.
  const std::string data = SRecLine('1', 0, Bytes(1)) + "\n";
  EXPECT_FALSE(loads("S5030001F\n" + data));
  EXPECT_TRUE(loads("S5030001F\r\n" + data));
}

TEST(SRecFrontEnd, KeepsParsersAndPathApartFromTheBlocks) {
  CTempFolder folder;
  LogCapture capture;
  CSRec source;
  // The scalar reader of a new front-end answers loaded, so nothing is
  // asked further and no error line is written.
  EXPECT_TRUE(source.IsLoaded());
  EXPECT_FALSE(capture.LogContains("[E]"));

  const std::string hex = folder.Write(
      "t.hex", HexRecord(0, 0x8000, Bytes(16)) + "\r\n" + HexRecord(1, 0, {}) + "\r\n");
  ASSERT_TRUE(source.Load(hex, EHID_INTERFACE));
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
  const CSRec copy = source;
  EXPECT_EQ(copy.GetIntelHexData(), source.GetIntelHexData());
}
