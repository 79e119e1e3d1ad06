#pragma once
// The client of the privileged helper service that stops and starts the
// tablet driver's system services. On Linux the service is the D-Bus
// service "com.tavik.UpdateHelper" on the system bus.
//
// This build has no binding to that service yet: client() finds no service
// and gives nothing, which the update flow handles as the original does
// without its helper (it stops and starts the driver's applications
// itself). A binding registers itself with SetFactory.

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

class OUpdaterClient {
 public:
  // Keys "LaunchAgents", "User" and "BundleID", each a list of texts.
  using Request = std::map<std::string, std::vector<std::string>>;
  using Factory = std::function<std::shared_ptr<OUpdaterClient>()>;

  virtual ~OUpdaterClient() = default;

  // The client of a service that answers, or nothing.
  static std::shared_ptr<OUpdaterClient> client();
  static void SetFactory(Factory factory_I);

  virtual bool connectToService() = 0;
  virtual void stopLaunchDProcess(const Request& request_I) = 0;
  virtual void stopProcess(const Request& request_I) = 0;
  virtual void startLaunchDProcess(const Request& request_I) = 0;
};
