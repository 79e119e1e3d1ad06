#pragma once
// An interface that never touches hardware: a path, a loader flag and a
// fixed text, for tests of what is built around interfaces.

#include <memory>
#include <string>

#include "flash/CFLDeviceInterface.h"

class CFakeInterface : public CFLDeviceInterface {
 public:
  explicit CFakeInterface(const std::string& path_I, EINTERFACE_TYPE type_I = EHID_INTERFACE)
      : CFLDeviceInterface(type_I) {
    SetPath(path_I);
  }

  static std::shared_ptr<CFakeInterface> Make(const std::string& path_I,
                                              EINTERFACE_TYPE type_I = EHID_INTERFACE) {
    return std::make_shared<CFakeInterface>(path_I, type_I);
  }

  bool Open() override { return false; }
  void Close() override {}
  bool SwitchToBLMode() override { return false; }
  bool SwitchFromBLMode(bool) override { return false; }
  bool IsAlive() override { return false; }
  void SetProtocolType(EFLProtocolType) override {}
  std::string ToString() const override { return "\t<" + GetPath() + ">\n"; }
  bool Init(const std::vector<SContinuousDataBlock>&) override { return false; }
  bool ProgramBoard() override { return false; }
};
