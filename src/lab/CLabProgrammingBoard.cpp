#include "lab/CLabProgrammingBoard.h"

#include "lab/LabRelease.h"

void SLabBoardIds::ApplyTo(SLabProgrammingDescription& description_IO) const {
  if (vendorId != 0) description_IO.vendorId = vendorId;
  if (productId != 0) description_IO.productId = productId;
  if (loaderProductId != 0) description_IO.loaderProductId = loaderProductId;
  if (usage != std::pair<uint16_t, uint16_t>{0, 0}) description_IO.usage = usage;
}

CLabProgrammingBoard::CLabProgrammingBoard(SLabProgrammingDescription description_I)
    : CLabBoard(description_I.name),
      mDescription(std::move(description_I)),
      mImage(mDescription.imageSize, 0xFF) {}

void CLabProgrammingBoard::FactoryReset(uint32_t seed_I) {
  uint32_t state = seed_I * 2246822519u + 7;
  for (uint8_t& byte : mImage) {
    state = state * 1103515245u + 12345u;
    byte = static_cast<uint8_t>(state >> 16);
  }
  ++mImageRevision;
  mStoredSum = ImageSum();
  mSumStored = true;
  PowerOn();
}

uint32_t CLabProgrammingBoard::ImageSum() const {
  uint32_t sum = 0;
  for (uint8_t byte : mImage) sum += byte;
  return sum;
}

bool CLabProgrammingBoard::IsImageValid() const { return mSumStored && mStoredSum == ImageSum(); }

std::vector<SLabInterface> CLabProgrammingBoard::GetInterfaces() const {
  SLabIdentity identity;
  identity.vendorId = mDescription.vendorId;
  identity.productId =
      mMode == EMode::eNormal ? mDescription.productId : mDescription.loaderProductId;
  identity.link = ELabLink::eHid;
  identity.usages = {mDescription.usage};
  identity.release = mMode == EMode::eNormal ? mRelease : mDescription.release;
  return identity.Interfaces();
}

void CLabProgrammingBoard::PowerOn() {
  mMode = IsImageValid() ? EMode::eNormal : EMode::eLoader;
  mRelease = FindLabRelease(mImage.data(), mImage.size()).value_or(mDescription.release);
  mSession = false;
  mStatus = kStatusReady;
  mLastPhase = 0;
  mBusyUntil = 0.0;
}

bool CLabProgrammingBoard::Store(uint32_t address_I, const uint8_t* data_I, size_t size_I) {
  if (address_I < mDescription.imageBase ||
      size_t{address_I - mDescription.imageBase} + size_I > mImage.size()) {
    Violation("data at " + std::to_string(address_I) + " outside the image");
    return false;
  }
  std::copy(data_I, data_I + size_I, mImage.begin() + (address_I - mDescription.imageBase));
  ++mImageRevision;
  return true;
}

bool CLabProgrammingBoard::IsFrame(const std::vector<uint8_t>& report_I) const {
  return report_I.size() == kReportSize && report_I[0] == 0xE4 &&
         report_I[1] == mDescription.target;
}

bool CLabProgrammingBoard::OnSetFeature(const DeviceInfo&, const std::vector<uint8_t>& report_I) {
  // The host asks every main interface to go to its loader and checks it is
  // alive; a board with no loader refuses those reports as unknown ones.
  const bool modeOrProbe = (report_I.size() == 3 && (report_I[0] == 0xCC || report_I[0] == 0xCD)) ||
                           (report_I.size() == 2 && report_I[0] == 0x02);
  if (modeOrProbe) return false;
  if (!IsFrame(report_I)) {
    Violation("not a programming report of this target");
    return false;
  }
  const double now = Now();
  const uint8_t phase = report_I[2];
  if (phase != 1 && (!mSession || now < mBusyUntil)) {
    Violation(std::string(mSession ? "report while busy" : "report before the start") + ", phase " +
              std::to_string(phase));
    mStatus = kStatusBadFrame;
    return true;
  }
  switch (phase) {
    case 1:
      std::fill(mImage.begin(), mImage.end(), 0xFF);
      ++mImageRevision;
      mSumStored = false;
      mStoredSum = 0;
      mSession = true;
      mRefusedSinceStart = false;
      mStatus = kStatusReady;
      mBusyUntil = now + mDescription.startBusy;
      OnStart();
      break;
    case 2:
      if (TakeData(report_I)) {
        ++mDataTaken;
      } else {
        ++mRefusals;
        mRefusedSinceStart = true;
        mStatus = kStatusRefused;
      }
      mBusyUntil = now + mDescription.dataBusy;
      break;
    case 3:
      if (!mRefusedSinceStart) {
        mStoredSum = ImageSum();
        mSumStored = true;
        // The module restarts in place into the image it now holds; one
        // that came up in its boot code after a cut-off update leaves it
        // too: under its own identity again, re-enumerating only where the
        // two identities differ.
        mRelease = FindLabRelease(mImage.data(), mImage.size()).value_or(mDescription.release);
        if (mMode == EMode::eLoader) {
          if (mDescription.loaderProductId == mDescription.productId) {
            mMode = EMode::eNormal;
          } else {
            Reenumerate([this] { mMode = EMode::eNormal; });
          }
        }
      }
      mSession = false;
      mBusyUntil = now + mDescription.endBusy;
      break;
    default: Violation("unknown phase " + std::to_string(phase)); return false;
  }
  mLastPhase = phase;
  return true;
}

bool CLabProgrammingBoard::OnGetFeature(const DeviceInfo&, std::vector<uint8_t>& report_IO) {
  if (report_IO.size() != kReportSize || report_IO[0] != 0xE4) return false;
  std::fill(report_IO.begin(), report_IO.end(), 0);
  report_IO[0] = 0xE4;
  report_IO[1] = mDescription.target;
  report_IO[2] = mLastPhase;
  const bool busy = Now() < mBusyUntil || Faults().TakeBusy();
  if (busy) Faults().NoteBusyAnswer();
  report_IO[3] = busy ? kStatusBusy : mStatus;
  return true;
}

std::pair<size_t, size_t> CLabProgrammingBoard::DataRange(
    const std::vector<uint8_t>& report_I) const {
  if (!IsFrame(report_I) || report_I[2] != 2) return {0, 0};
  return Payload();
}

void CLabProgrammingBoard::Save(CLabStateFile& state_IO) const {
  state_IO.PutBytes("image", mImage, mImageRevision);
  state_IO.PutNumber("sum", mStoredSum);
  state_IO.PutNumber("sum-stored", mSumStored ? 1 : 0);
  state_IO.PutNumber("mode", mMode == EMode::eLoader ? 1 : 0);
}

void CLabProgrammingBoard::Load(const CLabStateFile& state_I, bool powerCycled_I) {
  std::vector<uint8_t> image;
  if (state_I.GetBytes("image", image) && image.size() == mImage.size()) mImage = image;
  ++mImageRevision;
  mStoredSum = static_cast<uint32_t>(state_I.GetNumber("sum", 0));
  mSumStored = state_I.GetNumber("sum-stored", 0) != 0;
  PowerOn();
  if (!powerCycled_I && state_I.GetNumber("mode", 0) == 1) mMode = EMode::eLoader;
}
