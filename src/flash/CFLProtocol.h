#pragma once
// The protocol type of the whole process and the report id of each loader
// command under it. Every interface asks this one object, so two interfaces
// can never speak different protocol types at one time.

#include <cstdint>
#include <memory>

#include "common/TavTypes.h"
#include "flash/FLProtocolTypes.h"

class CFLProtocol {
 public:
  static std::shared_ptr<CFLProtocol> GetInstance();

  void SetProtocolType(EFLProtocolType protocolType_I);
  EFLProtocolType GetProtocolType() const;
  // Any value other than the non-BL one counts as the loader protocol.
  bool IsNonBLProtocol() const;
  // The report id of a command; 0, with an assertion, for a command the
  // protocol type lacks or an unknown one.
  uint8_t GetCommand(EBLHIDCmdId command_I) const;

 private:
  CFLProtocol();

  static std::shared_ptr<CFLProtocol> mInstance;
  static int32_t mProtocolType;
};
