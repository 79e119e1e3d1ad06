#include <gtest/gtest.h>

#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CScalarBinary.h"
#include "firmware/CScalarRTDISP.h"
#include "firmware/FirmwareFiles.h"
#include "support/LogCapture.h"

template <typename TImage>
bool LoadAs(const std::string& path_I) {
  return TImage().Load(path_I);
}

TEST(FirmwareImages, MissingAndEmptyFilesAreRefusedWithTheirReason) {
  CTempFolder folder;
  const std::string missing = folder.Path("missing"), empty = folder.Write("empty", "");
  const std::string alloc = "\"CScalarBinary::Load - ERROR - could not alloc data buf\"";
  const std::tuple<const char*, bool (*)(const std::string&), std::string> kinds[] = {
      {"CBinaryAiroFlash", LoadAs<CBinaryAiroFlash>, "[E] CBinaryAiroFlash::Load: ERROR - empty"},
      {"CScalarRTDISP", LoadAs<CScalarRTDISP>, "[E] CScalarRTDISP::Load: ERROR - empty file: "},
      {"CScalarBinary", LoadAs<CScalarBinary>, "failed assertion: " + alloc},
      {"CIntelHex", LoadAs<CIntelHex>, "[E] CIntelHex::Load: ERROR - empty file: "}};
  for (const auto& [kind, load, emptyReason] : kinds) {
    LogCapture capture;
    EXPECT_FALSE(load(missing));
    EXPECT_TRUE(capture.LogContains(std::string("[E] ") + kind +
                                    "::Load: ERROR - couldn't open file: " + missing + "\n"));
    EXPECT_FALSE(load(empty));
    EXPECT_TRUE(capture.LogContains(emptyReason) || capture.AssertionContains(emptyReason)) << kind;
  }
}

TEST(BinaryAiroFlash, HoldsTheWholeFileFromStartAddressZero) {
  CTempFolder folder;
  CBinaryAiroFlash image;
  EXPECT_EQ(image.StartAddress(), CBinaryAiroFlash::kNotLoaded);

  LogCapture capture;
  ASSERT_TRUE(image.Load(folder.Write("bt.airoflash", Bytes(40))));
  EXPECT_EQ(image.StartAddress(), 0u);
  EXPECT_EQ(std::vector<uint8_t>(image.GetData(), image.GetData() + image.Size()), Bytes(40));
  // The dump: a header, 32 bytes a line, a last short line, an empty line.
  const std::vector<std::string> log = capture.Log();
  const std::vector<std::string> dump(log.end() - 5, log.end());
  EXPECT_EQ(dump[0], "[I] CBinaryAiroFlash flash data:\n");
  EXPECT_EQ(dump[1].substr(0, 13), "[I] 00 01 02 ");
  EXPECT_EQ(dump[1].size(), 4 + 32 * 3 + 1);
  EXPECT_EQ(dump[2], "[I] 20 21 22 23 24 25 26 27 \n");
  EXPECT_EQ(dump[3], "[I] \n");
  EXPECT_EQ(dump[4], "[I] CBinaryAiroFlash::Load: done!\n");

  // A refused file leaves the image and its marker.
  EXPECT_FALSE(image.Load(folder.Write("empty.airoflash", "")));
  EXPECT_TRUE(image.IsLoaded());
  EXPECT_EQ(image.GetData()[1], 1);
  image.ClearData();
  EXPECT_FALSE(image.IsLoaded());
  EXPECT_EQ(image.GetData(), nullptr);
}

TEST(ScalarRTDISP, CountsAsLoadedWhileImageAndSizeAgree) {
  CTempFolder folder;
  CScalarRTDISP image;
  // Nothing loaded and nothing expected: 0 equals 0.
  EXPECT_TRUE(image.IsLoaded());
  LogCapture capture;
  ASSERT_TRUE(image.Load(folder.Write("s.bin", Bytes(300, 7))));
  EXPECT_TRUE(image.IsLoaded());
  EXPECT_EQ(image.GetData(), Bytes(300, 7));
  EXPECT_TRUE(capture.LogContains("[I] CScalarRTDISP flash data:\n"));
  EXPECT_TRUE(capture.LogContains("[I] CScalarRTDISP::Load: done!\n"));
  // The size of a refused file is taken before the refusal.
  EXPECT_FALSE(image.Load(folder.Write("e.bin", "")));
  EXPECT_EQ(image.Size(), 0u);
  EXPECT_FALSE(image.IsLoaded());
  image.ClearData();
  EXPECT_TRUE(image.GetData().empty());
}

TEST(ScalarBinary, CutsTheImageIntoCheckedBlocks) {
  const uint8_t check[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  EXPECT_EQ(CScalarBinary::CRC8_ATM(check, 9, 0), 0xF4);
  EXPECT_EQ(CScalarBinary::CRC8_ATM(check, 0, 0x5A), 0);
  EXPECT_EQ(CScalarBinary::CRC8_ATM(check, -1, 0x5A), 0);
  const auto offset = [](const BLOCKDATA_SCALAR* block_I) {
    return block_I->offset[0] << 16 | block_I->offset[1] << 8 | block_I->offset[2];
  };

  CTempFolder folder;
  CScalarBinary image;
  EXPECT_FALSE(image.IsLoaded());
  ASSERT_TRUE(image.Load(folder.Write("one.bin", std::vector<uint8_t>{0x42})));
  ASSERT_EQ(image.NumBlocks(), 1u);
  const BLOCKDATA_SCALAR* block = image.BlockPtr(0);
  ASSERT_NE(block, nullptr);
  EXPECT_EQ(offset(block), 0);
  EXPECT_EQ(std::vector<uint8_t>(block->data, block->data + 256), [] {
    std::vector<uint8_t> erased(256, 0xFF);
    erased[0] = 0x42;
    return erased;
  }());
  EXPECT_EQ(block->crc, CScalarBinary::CRC8_ATM(block->data, 256, 0));
  EXPECT_EQ(image.BlockPtr(1), nullptr);
  EXPECT_EQ(image.Size(), 1u);

  ASSERT_TRUE(image.Load(folder.Write("full.bin", Bytes(256))));
  EXPECT_EQ(image.NumBlocks(), 1u);
  ASSERT_TRUE(image.Load(folder.Write("more.bin", Bytes(257))));
  ASSERT_EQ(image.NumBlocks(), 2u);
  // On the wire: a three-byte offset, the checksum, then the data.
  const uint8_t* second = reinterpret_cast<const uint8_t*>(image.BlockPtr(1));
  EXPECT_EQ(std::vector<uint8_t>(second, second + 5),
            (std::vector<uint8_t>{0x00, 0x01, 0x00, image.BlockPtr(1)->crc, 0x00}));

  // Offsets have 24 bits: past 16 MiB they start again.
  ASSERT_TRUE(image.Prepare(std::vector<uint8_t>(size_t{16} << 20 | 1, 0)));
  ASSERT_EQ(image.NumBlocks(), 65537u);
  EXPECT_EQ(offset(image.BlockPtr(65535)), 0xFFFF00);
  EXPECT_EQ(offset(image.BlockPtr(65536)), 0);
  EXPECT_FALSE(image.Prepare({}));
  EXPECT_EQ(image.NumBlocks(), 0u);
}

TEST(ScalarBinary, KeepsTheBlocksOfAnEarlierFileAfterAnEmptyOne) {
  CTempFolder folder;
  CScalarBinary image;
  ASSERT_TRUE(image.Load(folder.Write("a.bin", Bytes(10))));
  LogCapture capture;
  EXPECT_FALSE(image.Load(folder.Write("empty.bin", "")));
  // The blocks of the earlier file stay; the size is the new file's.
  EXPECT_TRUE(image.IsLoaded());
  EXPECT_EQ(image.Size(), 0u);
  image.Clear();
  EXPECT_FALSE(image.IsLoaded());
  EXPECT_EQ(image.NumBlocks(), 0u);
}
