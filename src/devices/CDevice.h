#pragma once
// One physical tablet or pen display with up to four boards: pen, touch,
// Bluetooth and scalar. Both the description of a supported product and,
// with interfaces attached, the record of one attached product.

#include <cstdint>
#include <memory>
#include <string>

#include "common/TavTypes.h"

class CFLDeviceInterface;

class CDevice {
 public:
  using InterfacePtr = std::shared_ptr<CFLDeviceInterface>;

  CDevice() = default;
  CDevice(const CDevice& other_I);
  // Transfers every member but the scalar flash sectors and the scalar
  // into-bootloader flag, which the target keeps.
  CDevice& operator=(const CDevice& other_I);

  bool IsValid() const { return !mDeviceName.empty(); }
  void Close();
  bool CanGoIntoBootloaderMode() const { return mPen.intoBLMode; }
  EFLProtocolType GetProtocolType() const {
    return mPen.intoBLMode ? EFL_PROTOCOL_LOADER : EFL_PROTOCOL_NON_BL;
  }
  std::string ToString() const;

  const std::string& GetDeviceName() const { return mDeviceName; }
  void SetDeviceName(const std::string& name_I) { mDeviceName = name_I; }
  bool GetIsFlashLoader() const { return mIsFlashLoader; }
  void SetIsFlashLoader(bool isFlashLoader_I) { mIsFlashLoader = isFlashLoader_I; }

#define TAV_BOARD_ACCESSORS(Board, member)                                            \
  const std::string& Get##Board##Update() const { return member.update; }             \
  void Set##Board##Update(const std::string& v_I) { member.update = v_I; }            \
  uint32_t Get##Board##VendorId() const { return member.vendorId; }                   \
  void Set##Board##VendorId(uint32_t v_I) { member.vendorId = v_I; }                  \
  uint32_t Get##Board##ProductId() const { return member.productId; }                 \
  void Set##Board##ProductId(uint32_t v_I) { member.productId = v_I; }                \
  EINTERFACE_TYPE Get##Board##InterfaceType() const { return member.interfaceType; }  \
  void Set##Board##InterfaceType(EINTERFACE_TYPE v_I) { member.interfaceType = v_I; } \
  uint8_t Get##Board##Topology() const { return member.topology; }                    \
  void Set##Board##Topology(uint8_t v_I) { member.topology = v_I; }                   \
  uint32_t Get##Board##FlashSectors() const { return member.flashSectors; }           \
  void Set##Board##FlashSectors(uint32_t v_I) { member.flashSectors = v_I; }          \
  uint32_t Get##Board##UsageId() const { return member.usageId; }                     \
  void Set##Board##UsageId(uint32_t v_I) { member.usageId = v_I; }                    \
  uint32_t Get##Board##UsagePage() const { return member.usagePage; }                 \
  void Set##Board##UsagePage(uint32_t v_I) { member.usagePage = v_I; }                \
  InterfacePtr Get##Board##Interface() const { return member.interface; }             \
  void Set##Board##Interface(InterfacePtr v_I) { member.interface = std::move(v_I); } \
  void Set##Board##IntoBLMode(bool v_I) { member.intoBLMode = v_I; }

  TAV_BOARD_ACCESSORS(Pen, mPen)
  TAV_BOARD_ACCESSORS(Touch, mTouch)
  TAV_BOARD_ACCESSORS(Bluetooth, mBluetooth)
  TAV_BOARD_ACCESSORS(Scalar, mScalar)
#undef TAV_BOARD_ACCESSORS

  // The pen's into-bootloader flag keeps its historical lower-case name.
  bool getPenIntoBLMode() const { return mPen.intoBLMode; }

  void SetPenInitEEPROM(bool v_I) { mPen.initEEPROM = v_I; }
  void SetTouchInitEEPROM(bool v_I) { mTouch.initEEPROM = v_I; }
  void SetBluetoothInitEEPROM(bool v_I) { mBluetooth.initEEPROM = v_I; }

  bool GetTouchSupported() const { return mTouch.supported; }
  void SetTouchSupported(bool v_I) { mTouch.supported = v_I; }
  bool GetBluetoothSupported() const { return mBluetooth.supported; }
  void SetBluetoothSupported(bool v_I) { mBluetooth.supported = v_I; }
  bool GetScalarSupported() const { return mScalar.supported; }
  void SetScalarSupported(bool v_I) { mScalar.supported = v_I; }

  bool GetIsQuantaScalarBoard() const { return mIsQuantaScalarBoard; }
  void SetIsQuantaScalarBoard(bool v_I) { mIsQuantaScalarBoard = v_I; }
  bool GetIsQisdaVenusScalarBoard() const { return mIsQisdaVenusScalarBoard; }
  void SetIsQisdaVenusScalarBoard(bool v_I) { mIsQisdaVenusScalarBoard = v_I; }

 private:
  struct SBoard {
    std::string update;
    uint32_t vendorId = 0;
    uint32_t productId = 0;
    EINTERFACE_TYPE interfaceType = EINVALID_INTERFACE;
    uint8_t topology = 1;
    uint32_t flashSectors = 0;
    uint32_t usageId = 0;
    uint32_t usagePage = 0;
    bool initEEPROM = false;
    InterfacePtr interface;
    bool supported = false;
    bool intoBLMode = true;
  };

  std::string mDeviceName;
  SBoard mPen;
  SBoard mTouch;
  SBoard mBluetooth;
  SBoard mScalar;
  bool mIsFlashLoader = false;
  bool mIsQuantaScalarBoard = false;
  bool mIsQisdaVenusScalarBoard = false;
};
