#pragma once
// The lab scalar's MCU as the I2C bus sees it at 0x94 (write) and 0x95
// (read): 256 eight-bit registers, the first byte of a write naming the
// register. Writes to ordinary registers go on to the next register; the
// data port 0x70 and the indirect port 0xF5 stay where they are; a read
// gives the named register and stays there.
//
// In-system programming, with ISP mode (0x6F bit 7) on:
//   0x60  flash instruction control. A value with bit 0 clear arms, the same
//         value with bit 0 set starts: bits 4-3 are how many bytes of
//         0x64-0x66 go out after the opcode in 0x61, bits 2-1 how many come
//         back into 0x67-0x69, bit 5 sends a write enable first. Bit 0 reads
//         as busy: kInstructionBusyReads reads after an instruction,
//         kEraseBusyReads after a block erase.
//   0x6F  bit 7 ISP mode; writing bit 5 programs the page buffer at the
//         address in 0x64-0x66 (opcode 0x6D must be 2), which then moves on
//         by the bytes programmed, and reads back set for
//         kProgramBusyReads reads; bit 4 reads set while the buffer is empty
//         and no program runs; writing bit 2 starts the CRC engine over the
//         flash from 0x64-0x66 to 0x72-0x74, both included, result in 0x75,
//         bit 2 reading set for kCrcBusyReads reads. Writing 0x6F with bit 7
//         clear leaves ISP mode.
//   0x70  the page buffer, at most 256 bytes, emptied by each program.
//   0xEE  set to 2, leaves ISP mode and restarts the scalar from its flash.
//   0xF4/0xF5  indirect access to the board's registers: 0xF4 takes a
//         sub-address, 0xF5 reads or writes there within the page selected
//         by writing 0xF5 at the page-select sub-address (0x9F on the plain
//         and Quanta boards, 0x95 on the Qisda Venus board).
//
// The flash's write-protect pin is a board line, high only when the
// variant's own setting is in place:
//   plain        page 0x10 sub 0x38 low three bits 1, page 0xFE sub 0x28 = 1
//   Quanta       (a 16-inch board: page 0 sub 0x00 reads 0xCF, sub 0x0F 0x21)
//                page 0x10 sub 0x36 low three bits 1, page 0xFE sub 0x26 = 1
//   Qisda Venus  page 0x10 subs 0xD4, 0xD8, 0xEE = 1, and registers
//                0xCD = 0, 0xA0 = 1, 0xD7 = 1
// Power-on leaves every variant's pin low. The Quanta board's flash has
// three status registers.

#include <array>
#include <cstdint>
#include <functional>
#include <map>
#include <vector>

#include "lab/CLabFaults.h"
#include "lab/CLabI2CBus.h"
#include "lab/CLabSerialFlash.h"

enum class ELabScalarVariant { ePlain, eQuanta, eQisdaVenus };

class CLabScalarMcu : public CLabI2CDevice {
 public:
  static constexpr int kInstructionBusyReads = 2;
  static constexpr int kEraseBusyReads = 5;
  static constexpr int kProgramBusyReads = 1;
  static constexpr int kCrcBusyReads = 2;

  CLabScalarMcu(ELabScalarVariant variant_I, CLabSerialFlash& flash_I, CLabFaults& faults_I,
                LabViolationSink sink_I, std::function<void()> restart_I);

  // Registers and board lines as at power-on; ISP mode off.
  void PowerOn();
  bool IsInIsp() const { return mIsp; }
  bool IsProtectPinHigh() const;

  bool OnAddress(uint8_t address_I) override;
  bool OnWrite(uint8_t byte_I) override;
  uint8_t OnRead() override;
  void OnEnd(bool refused_I) override;

 private:
  void WriteRegister(uint8_t register_I, uint8_t value_I);
  uint8_t ReadRegister(uint8_t register_I);
  void StartInstruction(uint8_t control_I);
  void WriteControl(uint8_t value_I);
  uint32_t AddressAt(uint8_t first_I) const;
  uint8_t PageSelect() const;
  uint8_t Indirect(uint8_t page_I, uint8_t sub_I) const;
  static bool Counts(int& reads_IO);

  ELabScalarVariant mVariant;
  CLabSerialFlash& mFlash;
  CLabFaults& mFaults;
  LabViolationSink mViolation;
  std::function<void()> mRestart;

  std::array<uint8_t, 256> mRegisters{};
  std::map<uint16_t, uint8_t> mIndirect;  // (page << 8) | sub
  uint8_t mSub = 0;
  uint8_t mPage = 0;
  bool mIsp = false;
  int mArmed = -1;
  int mInstructionBusy = 0;
  int mProgramBusy = 0;
  int mCrcBusy = 0;
  std::vector<uint8_t> mBuffer;

  // The transaction under way.
  bool mReading = false;
  bool mHavePointer = false;
  uint8_t mPointer = 0;
};
