// S-record programming end to end against the lab's pen controller: the
// flash afterwards holds exactly the image, the sums are those of the
// image, and the order keeps the device recoverable.

#include <gtest/gtest.h>

#include <algorithm>

#include "lab/CLabPenController.h"
#include "support/LabFixture.h"
#include "support/LabImages.h"
#include "support/LabSRecUpdate.h"

namespace {

using LabImages::Record;

class SRecProgramming : public LabFixture {
 protected:
  void Plug(const SLabPenDescription& description_I) {
    mPen = std::make_shared<CLabPenController>(description_I);
    mBus->Plug(mPen);
  }

  DeviceInfo NormalInfo() const { return {0x7A71, 0x0301, mPen->GetLocationId(), 2, 0x000D}; }
  DeviceInfo LoaderInfo() const { return {0x7A71, 0x0302, mPen->GetLocationId(), 1, 0xFF00}; }

  // Runs the update and checks what every S-record update must leave.
  LabSRecUpdate::SResult Update(const std::vector<SContinuousDataBlock>& image_I,
                                EFLProtocolType protocol_I, EDataSourceFormat format_I,
                                size_t cpu_I = 0) {
    const CLabFlash before = mPen->GetLoader().GetCpu(cpu_I);
    LabSRecUpdate update(mBus, NormalInfo(), LoaderInfo());
    update.SetProtocol(protocol_I);
    update.SetFormat(format_I);
    LabSRecUpdate::SResult result = update.Run(image_I);
    mProgress = update.Notifier().progress;
    mErrors = update.Notifier().errors;

    EXPECT_TRUE(result.programmed) << (mErrors.empty() ? "" : mErrors.back());
    EXPECT_TRUE(result.backToNormal);
    EXPECT_EQ(mPen->GetMode(), CLabLoaderBoard::EMode::eNormal);
    EXPECT_TRUE(mPen->GetLoader().IsImageValid());
    const CLabFlash& after = mPen->GetLoader().GetCpu(cpu_I);
    const auto expected = LabImages::Expected(before, image_I);
    for (uint32_t i = 0; i < after.GetBlockCount(); ++i) {
      EXPECT_EQ(after.GetBlockContent(i), expected[i]) << "block " << i;
    }
    for (const std::string& violation : mPen->GetViolations()) ADD_FAILURE() << violation;
    EXPECT_TRUE(std::is_sorted(mProgress.begin(), mProgress.end()));

    // The old sum is what the device stored for the blocks the image
    // touches; the image's sum and the device's new sum agree.
    const std::vector<bool> touched = LabImages::Touched(before, image_I);
    uint32_t oldSum = 0;
    for (uint32_t i = 0; i < before.GetBlockCount(); ++i) {
      if (touched[i] && Summed(i, format_I, before)) oldSum += before.GetRomChecksum(i);
    }
    EXPECT_EQ(result.oldChecksum, oldSum);
    EXPECT_EQ(result.fwChecksum, LabImages::WordSum(expected, touched, [&](size_t i) {
                return Summed(static_cast<uint32_t>(i), format_I, before);
              }));
    EXPECT_EQ(result.newChecksum, result.fwChecksum);
    return result;
  }

  static bool Summed(uint32_t index_I, EDataSourceFormat format_I, const CLabFlash& flash_I) {
    if (flash_I.GetLayout().blocks[index_I].isProtected) return false;
    return index_I < 39 || format_I > EDS_SREC_TOUCH;
  }

  std::shared_ptr<CLabPenController> mPen;
  std::vector<unsigned int> mProgress;
  std::vector<std::string> mErrors;
};

TEST_F(SRecProgramming, LoaderProtocolImageLandsExactly) {
  Plug(SLabPenDescription());
  // Out of order; one record runs across three blocks with blank bytes at
  // its head; one ends in words short of a whole write block; one has
  // blank words inside and at its tail.
  SContinuousDataBlock gappy = Record(0x0800C000, 1024, 3);
  std::fill(gappy.data.begin() + 256, gappy.data.begin() + 300, 0xFF);
  std::fill(gappy.data.end() - 200, gappy.data.end(), 0xFF);
  std::vector<SContinuousDataBlock> image{Record(0x0800A000, 100, 2), gappy,
                                          Record(0x08001010, 0x2EF0, 1)};
  Update(image, EFL_PROTOCOL_LOADER, EDS_SREC_PEN);

  EXPECT_EQ(mProgress.front(), 1u) << "progress starts at 1, never 0";
  EXPECT_LT(mProgress.back(), 100u) << "the controller, not the interface, reports 100";
  EXPECT_EQ(mProgress.size(), 48u);
  const CLabFlash& flash = mPen->GetLoader().GetCpu(0);
  for (uint32_t block : {1u, 2u, 3u, 10u, 12u}) EXPECT_EQ(flash.GetEraseCount(block), 1u);
  EXPECT_EQ(flash.GetEraseCount(4), 0u) << "blocks without data are not touched";
  EXPECT_EQ(flash.GetEraseCount(0), 0u) << "the protected block is never erased";
  EXPECT_EQ(mPen->GetEEPROMInits(), 0u);
}

TEST_F(SRecProgramming, NonBLProtocolChecksEachBlockAndRewritesACorruptedOne) {
  SLabPenDescription description;
  description.protocol = ELabProtocol::eNonBL;
  Plug(description);
  mPen->Faults().Add({ELabFaultKind::eBadCrc, 3, ""});
  std::vector<SContinuousDataBlock> image{Record(0x08003000, 0x2100, 4), Record(0x08010004, 8, 5)};
  Update(image, EFL_PROTOCOL_NON_BL, EDS_SREC_GENERIC);
  EXPECT_EQ(mPen->GetLoader().GetCpu(0).GetEraseCount(3), 2u) << "the bad block went twice";
  // Each programmed block was checked and its expected sum set by the host.
  size_t calcs = 0;
  for (const SLabTraceEntry& entry : mPen->GetLoader().GetTrace()) calcs += entry.bytes[0] == 0xDC;
  EXPECT_EQ(calcs, 5u + 48u) << "one per written block, then one per block at the end";
}

// Nothing beyond the sequence: a whole block and one that ends in a write
// block and two words. Loader protocol: the two switch reports; CPU, CPU
// count, parameters, descriptor and checksums; the checksums again; the
// magic word, 48 block checksums and the commit; an erase and 16 writes,
// an erase, a write and two words; 48 calculations, the commit and the
// checksums; the reset. The non-BL pen switches in place, and checks each
// block it wrote with a calculation, a read and a set.
TEST_F(SRecProgramming, AnUpdateSendsOnlyWhatItsSequenceCallsFor) {
  const std::vector<SContinuousDataBlock> image{Record(0x08001000, 4096 + 256 + 8, 7)};
  for (const auto& [protocol, reports] :
       {std::pair{EFL_PROTOCOL_LOADER, 2 + 5 + 1 + 50 + 17 + 4 + 50 + 1},
        std::pair{EFL_PROTOCOL_NON_BL, 5 + 1 + 50 + (17 + 3) + (4 + 3) + 50 + 1}}) {
    SCOPED_TRACE(protocol);
    mBus = CLabBus::Create();
    SLabPenDescription description;
    if (protocol == EFL_PROTOCOL_NON_BL) description.protocol = ELabProtocol::eNonBL;
    Plug(description);
    Update(image, protocol, EDS_SREC_GENERIC);
    EXPECT_EQ(mPen->GetReportCount(), static_cast<uint64_t>(reports));
  }
}

TEST_F(SRecProgramming, PenFilesSumOnlyTheFirst39Blocks) {
  Plug(SLabPenDescription());
  std::vector<SContinuousDataBlock> image{Record(0x08026000, 3 * 4096, 6)};  // blocks 38-40
  const LabSRecUpdate::SResult pen = Update(image, EFL_PROTOCOL_LOADER, EDS_SREC_PEN);
  const LabSRecUpdate::SResult generic = Update(image, EFL_PROTOCOL_LOADER, EDS_SREC_GENERIC);
  EXPECT_NE(pen.fwChecksum, generic.fwChecksum);
}

TEST_F(SRecProgramming, TouchFirmwareGoesToTheSecondCpu) {
  SLabPenDescription description;
  description.cpus = {SLabFlashLayout::Uniform(0x08000000, 4096, 8, 1),
                      SLabFlashLayout::Uniform(0x00200000, 1024, 12, 2, 128, 8)};
  Plug(description);
  const std::vector<uint8_t> cpu0Block = mPen->GetLoader().GetCpu(0).GetBlockContent(3);
  Update({Record(0x00200C00, 3000, 7)}, EFL_PROTOCOL_LOADER, EDS_SREC_TOUCH, 1);
  EXPECT_EQ(mPen->GetLoader().GetCpu(0).GetBlockContent(3), cpu0Block);
  EXPECT_EQ(mPen->GetLoader().GetCpu(0).GetEraseCount(3), 0u);
}

TEST_F(SRecProgramming, AnImageOutsideTheFlashIsRefusedBeforeAnythingIsErased) {
  Plug(SLabPenDescription());
  LabSRecUpdate update(mBus, NormalInfo(), LoaderInfo());
  const LabSRecUpdate::SResult result =
      update.Run({Record(0x08001000, 16, 1), Record(0x09000000, 16, 2)});
  EXPECT_FALSE(result.programmed);
  EXPECT_EQ(update.Notifier().errors.front(),
            "Address space from SREC file does not correspond to that of the connected CPU!");
  for (uint32_t i = 0; i < 48; ++i) EXPECT_EQ(mPen->GetLoader().GetCpu(0).GetEraseCount(i), 0u);
  // Nothing was invalidated: the board goes back to its old image.
  TavSleep(1.0);
  EXPECT_EQ(mPen->GetMode(), CLabLoaderBoard::EMode::eNormal);
}

TEST_F(SRecProgramming, TransientFaultsAreRetriedAway) {
  Plug(SLabPenDescription());
  for (ELabFaultKind kind : {ELabFaultKind::eFailWrite, ELabFaultKind::eFailRead,
                             ELabFaultKind::eBusy, ELabFaultKind::eStall}) {
    mPen->Faults().Add({kind, 3, ""});
  }
  Update({Record(0x08002000, 5000, 8)}, EFL_PROTOCOL_LOADER, EDS_SREC_PEN);
  EXPECT_TRUE(mPen->Faults().Empty());
}

TEST_F(SRecProgramming, UnderTheLoaderProtocolOnlyTheSumsShowACorruptedBlock) {
  Plug(SLabPenDescription());
  mPen->Faults().Add({ELabFaultKind::eBadCrc, 3, ""});
  LabSRecUpdate update(mBus, NormalInfo(), LoaderInfo());
  const LabSRecUpdate::SResult result = update.Run({Record(0x08004000, 4096, 10)});
  // The loader protocol has the device sum what it holds; the host does
  // not compare, so the update "succeeds" with a new sum unlike the image's.
  EXPECT_TRUE(result.programmed);
  EXPECT_NE(result.newChecksum, result.fwChecksum);
}

}  // namespace
