#pragma once
// The controller of a run on Linux. The discovery comes from the caller:
// only the application chooses between the Linux device registry and the
// lab bus, so the controller takes whichever discovery the run was given.
// Stopping and starting the driver is the application's work, so both do
// nothing here.

#include <memory>
#include <string>

#include "update/CUpdateController.h"

class CLinuxUpdateController : public CUpdateController {
 public:
  explicit CLinuxUpdateController(std::unique_ptr<CDiscovery> discovery_I);
  ~CLinuxUpdateController() override;

  bool StopDriver() override { return true; }
  bool StartDriver() override { return true; }

  void setConfigPath(const std::string& path_I);
  std::string getConfigPath() const;
  // False when the configuration could not be read at the last device list.
  bool configurationRead() const;
};
