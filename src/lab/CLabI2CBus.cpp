#include "lab/CLabI2CBus.h"

void CLabI2CBus::Drive(EDrive scl_I, EDrive sda_I) {
  // The bus settles after every change, so the same drive again is no event,
  // and where one line changes the order of the two does not matter.
  if (scl_I == mMasterScl && sda_I == mMasterSda) return;
  if (scl_I == mMasterScl || sda_I == mMasterSda) {
    mMasterScl = scl_I;
    mMasterSda = sda_I;
    Settle();
    return;
  }
  const bool sclRises = !mScl && scl_I != EDrive::eLow;
  if (sclRises) {
    mMasterSda = sda_I;
    Settle();
    mMasterScl = scl_I;
  } else {
    mMasterScl = scl_I;
    Settle();
    mMasterSda = sda_I;
  }
  Settle();
}

void CLabI2CBus::Reset() {
  mMasterScl = mMasterSda = EDrive::eReleased;
  mSlaveLow = false;
  mScl = mSda = true;
  mPhase = EPhase::eIdle;
  mDevice = nullptr;
  mRefused = mReported = mPulseOpen = mContended = false;
  mAddressByte = true;
  mBits = 0;
  mShift = 0;
}

void CLabI2CBus::Settle() {
  while (true) {
    const bool contended = mMasterSda == EDrive::eHigh && mSlaveLow;
    if (contended && !mContended) Report("the bridge drove SDA high while a device held it low");
    mContended = contended;
    const bool scl = mMasterScl != EDrive::eLow;
    const bool sda = mMasterSda != EDrive::eLow && !mSlaveLow;
    if (scl != mScl) {
      mScl = scl;
      scl ? OnSclRise() : OnSclFall();
    } else if (sda != mSda) {
      mSda = sda;
      if (mScl) OnStartOrStop(!mSda);
    } else {
      return;
    }
  }
}

void CLabI2CBus::OnStartOrStop(bool start_I) {
  const bool inByte =
      mPhase == EPhase::eAddress || mPhase == EPhase::eWrite || mPhase == EPhase::eRead;
  const std::string condition = start_I ? "START" : "STOP";
  if (inByte && mBits > 0) {
    Report(condition + " after " + std::to_string(mBits) + " bits of a byte");
  }
  const bool inAcknowledge = mPhase == EPhase::eSlaveAck || mPhase == EPhase::eMasterAck;
  if (inAcknowledge && mPulseOpen) Report(condition + " during an acknowledge");
  EndTransaction();
  mPulseOpen = false;
  mPhase = start_I ? EPhase::eAddress : EPhase::eIdle;
}

void CLabI2CBus::EndTransaction() {
  if (mDevice != nullptr) mDevice->OnEnd(mRefused);
  mDevice = nullptr;
  mRefused = false;
  mReported = false;
  mSlaveLow = false;
  mAddressByte = true;
  mBits = 0;
  mShift = 0;
}

void CLabI2CBus::OnSclRise() {
  mPulseOpen = true;
  mSample = mSda;
  mHostHeldSda = mMasterSda == EDrive::eLow;
}

void CLabI2CBus::SendBit() { mSlaveLow = ((mOut >> (7 - mBits)) & 1) == 0; }

void CLabI2CBus::OnSclFall() {
  // A fall that ends a START or STOP's high clock is no bit.
  if (!mPulseOpen) return;
  mPulseOpen = false;
  switch (mPhase) {
    case EPhase::eIdle: Report("a clock pulse outside any transaction"); break;
    case EPhase::eAddress:
    case EPhase::eWrite:
      mShift = static_cast<uint8_t>((mShift << 1) | (mSample ? 1 : 0));
      if (++mBits == 8) TakeByte();
      break;
    case EPhase::eSlaveAck:
      mSlaveLow = false;
      mBits = 0;
      mShift = 0;
      if (mAddressByte) {
        mAddressByte = false;
        if (mReadTransfer) {
          mPhase = mDevice != nullptr ? EPhase::eRead : EPhase::eNoDevice;
          if (mDevice != nullptr) {
            mOut = mDevice->OnRead();
            SendBit();
          }
          break;
        }
      }
      mPhase = EPhase::eWrite;
      break;
    case EPhase::eRead:
      if (mHostHeldSda && ((mOut >> (7 - mBits)) & 1) != 0) {
        Report("the bridge held SDA low while a device was sending");
      }
      if (++mBits == 8) {
        mSlaveLow = false;
        mPhase = EPhase::eMasterAck;
      } else {
        SendBit();
      }
      break;
    case EPhase::eMasterAck:
      if (mSample) {
        mPhase = EPhase::eRefusedRead;
        break;
      }
      mPhase = EPhase::eRead;
      mBits = 0;
      mOut = mDevice->OnRead();
      SendBit();
      break;
    case EPhase::eRefusedRead:
    case EPhase::eNoDevice:
      if (!mReported) {
        Report(mPhase == EPhase::eNoDevice ? "a read with no device addressed"
                                           : "a read clocked on after the host refused a byte");
      }
      mReported = true;
      break;
  }
}

void CLabI2CBus::TakeByte() {
  const uint8_t byte = mShift;
  const bool refuse = mRefuseHook && mRefuseHook();
  if (mAddressByte) {
    mReadTransfer = (byte & 1) != 0;
    mDevice = nullptr;
    for (CLabI2CDevice* device : mDevices) {
      if (refuse) break;
      if (device->OnAddress(byte)) {
        mDevice = device;
        break;
      }
    }
    mAcknowledge = mDevice != nullptr;
  } else {
    mAcknowledge = mDevice != nullptr && !mRefused && !refuse && mDevice->OnWrite(byte);
    if (mDevice != nullptr && !mAcknowledge) mRefused = true;
  }
  mPhase = EPhase::eSlaveAck;
  mSlaveLow = mAcknowledge;
}
