// The binary readers: what each refuses, and how an image is cut into the
// scalar's blocks. Their bytes on the wire are checked by the lab's boards
// in ProgrammingReportTest; what each reader holds, by the images the
// inspect command writes in FirmwareReportCommandTest.

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

TEST(BinaryAiroFlash, HoldsTheWholeFileAndRefusesAReadThatFailsMidway) {
  CTempFolder folder;
  CBinaryAiroFlash image;
  ASSERT_TRUE(image.Load(folder.Write("bt.airoflash", Bytes(40))));
  EXPECT_EQ(image.StartAddress(), 0u);
  EXPECT_EQ(std::vector<uint8_t>(image.GetData(), image.GetData() + image.Size()), Bytes(40));
  // A refused file leaves the image of the earlier one.
  EXPECT_FALSE(image.Load(folder.Write("empty.airoflash", "")));
  EXPECT_TRUE(image.IsLoaded());
  EXPECT_EQ(image.GetData()[1], 1);

  // A sysfs attribute claims a page, but reading it fails before the end:
  // the image is refused, not taken as what was read.
  const std::string unreadable = "/sys/class/net/lo/speed";
  if (std::ifstream(unreadable).fail()) GTEST_SKIP() << "no " << unreadable;
  LogCapture capture;
  EXPECT_FALSE(image.Load(unreadable));
  EXPECT_TRUE(capture.LogContains("[E] CBinaryAiroFlash::Load: ERROR - read failed\n"));
  EXPECT_FALSE(image.IsLoaded()) << "the size read is larger than the image kept";
}

TEST(ScalarBinary, CutsTheImageIntoBlocksOf256Bytes) {
  CTempFolder folder;
  const uint8_t check[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  EXPECT_EQ(CScalarBinary::CRC8_ATM(check, 9, 0), 0xF4);
  CScalarBinary image;
  ASSERT_TRUE(image.Load(folder.Write("one.bin", std::vector<uint8_t>{0x42})));
  ASSERT_EQ(image.NumBlocks(), 1u);
  std::vector<uint8_t> erased(256, 0xFF);
  erased[0] = 0x42;
  EXPECT_EQ(std::vector<uint8_t>(image.BlockPtr(0)->data, image.BlockPtr(0)->data + 256), erased);
  EXPECT_EQ(image.BlockPtr(1), nullptr);
  ASSERT_TRUE(image.Load(folder.Write("full.bin", Bytes(256))));
  EXPECT_EQ(image.NumBlocks(), 1u);
  ASSERT_TRUE(image.Load(folder.Write("more.bin", Bytes(257))));
  EXPECT_EQ(image.NumBlocks(), 2u);
  EXPECT_FALSE(image.Prepare({}));
  EXPECT_EQ(image.NumBlocks(), 0u);
}
