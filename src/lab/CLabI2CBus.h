#pragma once
// The I2C bus behind the lab's FTDI bridge, decoded from the levels of its
// two lines as the bridge's pins drive them. SCL and SDA are open-drain
// lines with pull-ups: a line is low when anyone drives it low. The bus
// tells START and STOP conditions, bytes and acknowledges apart, hands
// bytes to the devices on it and lets the addressed device drive SDA.
//
// When one pin command changes both lines, SDA is taken to change first
// when SCL rises and last when SCL falls: one command is one instant, and
// a device sees set-up and hold kept.
//
// What it records as violations: a START or STOP after some but not all
// bits of a byte or while an acknowledge is clocked (SDA changing while SCL
// is high where no condition belongs), a clock pulse outside any transaction, a read clocked on
// with no device addressed or after the host refused the last byte, the
// bridge holding SDA low while a device sends, and the bridge driving SDA
// high against a device that holds it low.

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

using LabViolationSink = std::function<void(const std::string& text_I)>;

// A device on the bus. Addresses are the 8-bit forms, read bit included.
class CLabI2CDevice {
 public:
  virtual ~CLabI2CDevice() = default;
  // True to acknowledge the address, and with it take the transaction.
  virtual bool OnAddress(uint8_t address_I) = 0;
  // A byte written to it; true to acknowledge.
  virtual bool OnWrite(uint8_t byte_I) = 0;
  // The next byte it sends.
  virtual uint8_t OnRead() = 0;
  // The transaction ended, by STOP or by another START. `refused_I`: a
  // byte of it was not acknowledged, so the host gave it up.
  virtual void OnEnd(bool refused_I) = 0;
};

class CLabI2CBus {
 public:
  // How the bridge drives a line.
  enum class EDrive { eReleased, eLow, eHigh };

  explicit CLabI2CBus(LabViolationSink sink_I) : mViolation(std::move(sink_I)) {}

  // Devices are borrowed; they outlive the bus.
  void Attach(CLabI2CDevice* device_I) { mDevices.push_back(device_I); }
  // Asked before each byte the host writes (address bytes too): true
  // refuses it, as a device that does not acknowledge.
  void SetRefuseHook(std::function<bool()> hook_I) { mRefuseHook = std::move(hook_I); }

  // The bridge's drive of both lines, after one pin change.
  void Drive(EDrive scl_I, EDrive sda_I);
  bool GetScl() const { return mScl; }
  bool GetSda() const { return mSda; }
  // No transaction open: none started since power-on or the last STOP.
  bool IsIdle() const { return mPhase == EPhase::eIdle; }
  // Back to an idle bus, with no transaction open (power-on).
  void Reset();

 private:
  enum class EPhase {
    eIdle,
    eAddress,
    eWrite,
    eSlaveAck,
    eRead,
    eMasterAck,
    eRefusedRead,
    eNoDevice
  };

  void Settle();
  void OnSdaChange();
  void OnSclRise();
  void OnSclFall();
  void OnStartOrStop(bool start_I);
  void TakeByte();
  void EndTransaction();
  // Drives the device's current bit of `mOut` onto SDA.
  void SendBit();
  void Report(const std::string& text_I) { mViolation(text_I); }

  LabViolationSink mViolation;
  std::vector<CLabI2CDevice*> mDevices;
  std::function<bool()> mRefuseHook;

  EDrive mMasterScl = EDrive::eReleased;
  EDrive mMasterSda = EDrive::eReleased;
  bool mSlaveLow = false;
  bool mScl = true;
  bool mSda = true;

  EPhase mPhase = EPhase::eIdle;
  CLabI2CDevice* mDevice = nullptr;
  bool mRefused = false;
  bool mAddressByte = true;
  bool mReadTransfer = false;
  bool mAcknowledge = false;
  bool mPulseOpen = false;    // SCL rose since the last fall, START or STOP
  bool mSample = true;        // SDA at that rise
  bool mHostHeldSda = false;  // the bridge drove SDA low at that rise
  bool mReported = false;     // one read violation per transaction
  bool mContended = false;
  int mBits = 0;
  uint8_t mShift = 0;  // the byte coming in
  uint8_t mOut = 0;    // the byte a device sends
};
