#pragma once
// Where the background services are found: on Linux the system bus (the
// privileged helper) or the session bus (the data store), CLinuxServiceDirectory.
//
// Contract: neither operation throws; both return within the bus's own short
// time-out. HasService is true when the service runs or can be started on
// demand. Connect gives null when the directory itself cannot be reached.

#include <memory>
#include <string>

#include "host/CServiceConnection.h"

class CServiceDirectory {
 public:
  virtual ~CServiceDirectory() = default;
  virtual bool HasService(const std::string& service_I) = 0;
  // `serverProtocol_I` names what the service answers, `clientProtocol_I`
  // what this side answers to the service.
  virtual std::unique_ptr<CServiceConnection> Connect(const std::string& service_I,
                                                      const std::string& serverProtocol_I,
                                                      const std::string& clientProtocol_I) = 0;
};
