#pragma once
// The services of one D-Bus bus: the system bus for the privileged helper,
// the session bus for the data store. A service is there when its name has
// an owner or the bus can start it on demand.

#include <memory>
#include <string>

#include "host/CServiceDirectory.h"

class CLinuxServiceDirectory : public CServiceDirectory {
 public:
  explicit CLinuxServiceDirectory(bool systemBus_I) : mSystemBus(systemBus_I) {}

  bool HasService(const std::string& service_I) override;
  std::unique_ptr<CServiceConnection> Connect(const std::string& service_I,
                                              const std::string& serverProtocol_I,
                                              const std::string& clientProtocol_I) override;

 private:
  bool mSystemBus;
};
