// The programming-report procedures end to end: Intel-hex images into the
// lab's touch controller, scalar binaries into its scalar, and both
// Bluetooth chips, each checking pages the way the chip does.

#include <gtest/gtest.h>

#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CScalarBinary.h"
#include "firmware/FirmwareFiles.h"
#include "lab/CLabBluetooth.h"
#include "lab/CLabHidNode.h"
#include "lab/CLabScalarHid.h"
#include "lab/CLabTouchHex.h"
#include "platform/linux/CLinuxHIDFLDeviceInterface.h"
#include "support/LabFixture.h"
#include "support/LabImages.h"
#include "support/RecordingNotifier.h"

namespace {

using Bytes = std::vector<uint8_t>;

// Bytes of a pattern that never holds 0xFF, so a blank byte is never data.
Bytes Pattern(size_t size_I, uint32_t seed_I) { return LabImages::Record(0, size_I, seed_I).data; }

// Intel-hex text of `data_I` from 0x8000, 16 bytes a record.
std::string IntelHexText(const Bytes& data_I) {
  std::string text;
  for (size_t at = 0; at < data_I.size(); at += 16) {
    const Bytes chunk(data_I.begin() + at, data_I.begin() + std::min(at + 16, data_I.size()));
    text += HexRecord(0, static_cast<uint16_t>(0x8000 + at), chunk) + "\r\n";
  }
  return text + ":00000001FF\r\n";
}

class ProgrammingReports : public LabFixture {
 protected:
  void SetUp() override {
    LabFixture::SetUp();
    CFLProtocol::GetInstance()->SetProtocolType(EFL_PROTOCOL_NON_BL);
  }

  std::unique_ptr<CLinuxHIDFLDeviceInterface> Connect(const CLabBoard& board_I,
                                                      EDataSourceFormat format_I) {
    auto interface = std::make_unique<CLinuxHIDFLDeviceInterface>(
        Listed(board_I), std::make_unique<CLabHidNode>(mBus));
    interface->RegisterCallback(&mNotifier);
    interface->SetIsFlashLoader(true);
    interface->SetDataSourceFormat(format_I);
    EXPECT_TRUE(interface->Open());
    return interface;
  }

  std::shared_ptr<CIntelHex> IntelHex(const Bytes& data_I) {
    auto hex = std::make_shared<CIntelHex>();
    EXPECT_TRUE(hex->Load(mFolder.Write("touch.hex", IntelHexText(data_I))));
    return hex;
  }
  std::shared_ptr<CBinaryAiroFlash> AiroFlash(const Bytes& data_I) {
    auto image = std::make_shared<CBinaryAiroFlash>();
    EXPECT_TRUE(image->Load(mFolder.Write("bt.airoflash", data_I)));
    return image;
  }

  CTempFolder mFolder;
  RecordingNotifier mNotifier;
};

TEST_F(ProgrammingReports, IntelHexChunksLandInOrder) {
  auto touch = std::make_shared<CLabTouchHex>();
  mBus->Plug(touch);
  const Bytes data = Pattern(3000, 1);
  auto interface = Connect(*touch, EDS_INTEL_HEX);
  interface->SetIntelHexData(IntelHex(data));
  ASSERT_TRUE(interface->ProgramBoard()) << mNotifier.errors.back();

  EXPECT_TRUE(touch->IsImageValid());
  EXPECT_EQ(touch->GetDataTaken(), 3072u / 128);
  const Bytes& image = touch->GetImage();
  EXPECT_TRUE(std::equal(data.begin(), data.end(), image.begin()));
  EXPECT_TRUE(std::all_of(image.begin() + 3000, image.begin() + 3072, [](uint8_t b) {
    return b == 0xFF;
  })) << "gaps read as blank";
  EXPECT_EQ(mNotifier.progress.back(), 100u);
  EXPECT_TRUE(touch->GetViolations().empty());
}

TEST_F(ProgrammingReports, ScalarBlocksAreCheckedByTheScalar) {
  auto scalar = std::make_shared<CLabScalarHid>();
  mBus->Plug(scalar);
  const Bytes data = Pattern(1000, 3);
  auto binary = std::make_shared<CScalarBinary>();
  ASSERT_TRUE(binary->Prepare(data));
  auto interface = Connect(*scalar, EDS_SCALAR_BINARY);
  interface->SetScalarBinaryData(binary);
  ASSERT_TRUE(interface->ProgramBoard()) << mNotifier.errors.back();
  EXPECT_TRUE(scalar->IsImageValid());
  EXPECT_TRUE(std::equal(data.begin(), data.end(), scalar->GetImage().begin()));
  EXPECT_EQ(scalar->GetImage()[1000], 0xFF);
  EXPECT_EQ(scalar->GetDataTaken(), 4u);

  // A block corrupted on the way is refused, and the image stays invalid.
  scalar->Faults().Add({ELabFaultKind::eBadCrc, 2, ""});
  EXPECT_FALSE(interface->ProgramBoard());
  EXPECT_EQ(mNotifier.errors.back(),
            "ProgramBoardScalarBinary: Programming error happens - device is busy");
  EXPECT_EQ(scalar->GetRefusals(), 1u);
  EXPECT_FALSE(scalar->IsImageValid());
}

TEST_F(ProgrammingReports, AB1122SkipsItsOwnRangeAndChecksEveryPage) {
  auto module = std::make_shared<CLabBluetooth>(CLabBluetooth::EChip::eAB1122);
  mBus->Plug(module);
  const Bytes data = Pattern(0x9000 + 1, 4);  // ends with a page of one byte
  auto interface = Connect(*module, EDS_AIROFLASH);
  interface->SetBinaryAiroFlashData(AiroFlash(data));
  ASSERT_TRUE(interface->ProgramBoard()) << mNotifier.errors.back();

  EXPECT_TRUE(module->IsImageValid());
  const Bytes& image = module->GetImage();
  EXPECT_TRUE(std::equal(data.begin(), data.begin() + 0x3000, image.begin()));
  EXPECT_TRUE(std::all_of(image.begin() + 0x3000, image.begin() + 0x8000,
                          [](uint8_t b) { return b == 0xFF; }));
  EXPECT_TRUE(std::equal(data.begin() + 0x8000, data.end(), image.begin() + 0x8000));
  EXPECT_EQ(image[0x9001], 0xFF);
  // 0x30 pages of 0x91 lie in the skipped range: progress tops out below 100.
  EXPECT_EQ(module->GetDataTaken(), 0x91u - 0x50u);
  EXPECT_LT(mNotifier.progress.back(), 100u);
  EXPECT_TRUE(module->GetViolations().empty());

  // An image of whole pages ends with its last page: no empty one after it.
  auto whole = std::make_shared<CLabBluetooth>(CLabBluetooth::EChip::eAB1122);
  mBus->Plug(whole);
  auto wholeInterface = Connect(*whole, EDS_AIROFLASH);
  wholeInterface->SetBinaryAiroFlashData(AiroFlash(Pattern(0x9000, 4)));
  ASSERT_TRUE(wholeInterface->ProgramBoard());
  EXPECT_EQ(whole->GetDataTaken(), 0x90u - 0x50u);

  module->Faults().Add({ELabFaultKind::eBadCrc, 5, ""});
  EXPECT_FALSE(interface->ProgramBoard());
  EXPECT_EQ(mNotifier.errors.back(), "ProgramBoardAiroHaBinary_AB1122: Programming error");
  EXPECT_FALSE(module->IsImageValid());
}

TEST_F(ProgrammingReports, AB1555SendsEveryPageInOrder) {
  auto module = std::make_shared<CLabBluetooth>(CLabBluetooth::EChip::eAB1555);
  mBus->Plug(module);
  const Bytes data = Pattern(5000, 5);
  auto interface = Connect(*module, EDS_AIROFLASH2);
  interface->SetBinaryAiroFlashData(AiroFlash(data));
  module->Faults().Add({ELabFaultKind::eBusy, 30, ""});
  const double before = mClock->GetTotalSlept();
  ASSERT_TRUE(interface->ProgramBoard()) << mNotifier.errors.back();
  // The long erase after the start and the busy answers are waited out.
  EXPECT_GT(mClock->GetTotalSlept() - before, 1.5 + 3.0);

  EXPECT_TRUE(module->IsImageValid());
  EXPECT_TRUE(std::equal(data.begin(), data.end(), module->GetImage().begin()));
  EXPECT_EQ(module->GetDataTaken(), 20u);
  EXPECT_EQ(mNotifier.progress.back(), 100u);
  EXPECT_TRUE(module->GetViolations().empty());

  // An image of whole pages ends with its last page: no empty one after it.
  auto whole = std::make_shared<CLabBluetooth>(CLabBluetooth::EChip::eAB1555);
  mBus->Plug(whole);
  auto wholeInterface = Connect(*whole, EDS_AIROFLASH2);
  wholeInterface->SetBinaryAiroFlashData(AiroFlash(Pattern(0x1400, 5)));
  ASSERT_TRUE(wholeInterface->ProgramBoard());
  EXPECT_EQ(whole->GetDataTaken(), 0x14u);

  module->Faults().Add({ELabFaultKind::eBadCrc, 7, ""});
  EXPECT_FALSE(interface->ProgramBoard());
  EXPECT_EQ(mNotifier.errors.back(), "ProgramBoardAiroHaBinary_AB1555: Programming error");
}

// Start, each piece and end cost a write and one read each; any further
// read is one the board forced by answering busy. Images of other sizes
// than the lab's own: a scalar block that ends short, an Intel-hex image
// that loads padded to 512 bytes.
TEST_F(ProgrammingReports, EachPieceCostsAWriteAndAReadBeyondBusyAnswers) {
  const struct {
    EDataSourceFormat format;
    size_t size;
    uint64_t pieces;
  } cases[] = {{EDS_INTEL_HEX, 1, 4},
               {EDS_INTEL_HEX, 513, 8},
               {EDS_SCALAR_BINARY, 1, 1},
               {EDS_SCALAR_BINARY, 4097, 17}};
  for (const auto& [format, size, pieces] : cases) {
    SCOPED_TRACE(std::to_string(format) + ", " + std::to_string(size) + " bytes");
    mBus = CLabBus::Create();
    std::shared_ptr<CLabBoard> board;
    std::unique_ptr<CLinuxHIDFLDeviceInterface> interface;
    if (format == EDS_INTEL_HEX) {
      board = std::make_shared<CLabTouchHex>();
      mBus->Plug(board);
      interface = Connect(*board, format);
      interface->SetIntelHexData(IntelHex(Pattern(size, 5)));
    } else {
      auto binary = std::make_shared<CScalarBinary>();
      ASSERT_TRUE(binary->Prepare(Pattern(size, 5)));
      board = std::make_shared<CLabScalarHid>();
      mBus->Plug(board);
      interface = Connect(*board, format);
      interface->SetScalarBinaryData(binary);
    }
    ASSERT_TRUE(interface->ProgramBoard()) << mNotifier.errors.back();
    EXPECT_GT(board->Faults().GetBusyAnswers(), 0u) << "the start erases";
    EXPECT_EQ(board->Faults().GetReportCount(), 2 * (pieces + 2) + board->Faults().GetBusyAnswers());
  }
}

TEST_F(ProgrammingReports, EachProcedureRefusesMissingData) {
  auto touch = std::make_shared<CLabTouchHex>();
  mBus->Plug(touch);
  auto interface = Connect(*touch, EDS_INTEL_HEX);
  const std::pair<EDataSourceFormat, bool (CFLDeviceInterface::*)()> cases[] = {
      {EDS_INTEL_HEX, &CFLDeviceInterface::ProgramBoardIntelHex},
      {EDS_SCALAR_BINARY, &CFLDeviceInterface::ProgramBoardScalarBinary},
      {EDS_AIROFLASH, &CFLDeviceInterface::ProgramBoardAiroHaBinary_AB1122},
      {EDS_AIROFLASH2, &CFLDeviceInterface::ProgramBoardAiroHaBinary_AB1555}};
  for (const auto& [format, program] : cases) {
    interface->SetDataSourceFormat(format);
    EXPECT_FALSE(((*interface).*program)());
    EXPECT_NE(mNotifier.errors.back().find(": No "), std::string::npos) << format;
  }
  interface->SetBinaryAiroFlashData(std::make_shared<CBinaryAiroFlash>());
  for (EDataSourceFormat format : {EDS_AIROFLASH, EDS_SCALAR_RTDISP, EDS_UNKNOWN}) {
    interface->SetDataSourceFormat(format);
    EXPECT_FALSE(interface->ProgramBoard()) << "data not loaded, or no procedure: " << format;
  }
  EXPECT_TRUE(touch->GetTrace().empty()) << "nothing reached the device";
}

}  // namespace
