#pragma once
// The client of the privileged helper service that stops and starts the
// tablet driver: "com.tavik.UpdateHelper", on Linux a D-Bus service on the
// system bus. Where no such service is installed client() gives nothing,
// and the update flow stops and starts the driver's applications itself.
//
// Every operation sends one remote message and waits half a second for its
// reply, LoadDriverKext five. A reply is the helper's dictionary, or the
// user information of its error, with "Error Code" 0 for success; null
// when none came in time.

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "host/OXPCClient.h"

class OUpdaterClient : public OXPCClient {
 public:
  // Keys "LaunchAgents", "User" and "BundleID", each a list of texts.
  using Request = std::map<std::string, std::vector<std::string>>;
  using Reply = std::shared_ptr<CXPCDictionary>;

  static constexpr const char* kServiceName = "com.tavik.UpdateHelper";
  static constexpr const char* kServerProtocol = "UpdateHelperProtocol";
  static constexpr const char* kClientProtocol = "TavikXPCApplicationProtocol";
  // LoadDriverKext's answer when the helper did not reply in time.
  static constexpr int64_t kKextTimedOut = 5;

  // The client of a helper that is installed, or nothing.
  static std::shared_ptr<OUpdaterClient> client();

  SXPCError connectToService();

  int64_t LoadDriverKext();
  Reply performInstall(const CXPCDictionary& request_I);
  Reply performRemove(const CXPCDictionary& request_I);
  Reply removePrefs(const CXPCDictionary& request_I);
  Reply verifyInstallation();
  Reply startProcess(const CXPCDictionary& request_I);
  Reply stopProcess(const CXPCDictionary& request_I);
  // Starts again only what stopped: a stop whose reply has "Error Code" 0.
  // A stop that got no reply counts as one, as the original's empty error
  // has code 0.
  Reply restartProcess(const CXPCDictionary& request_I);
  Reply wakeSystem();
  Reply stopService();
  Reply startLaunchDProcess(const CXPCDictionary& request_I);
  Reply stopLaunchDProcess(const CXPCDictionary& request_I);
  Reply getProcessList(const CXPCDictionary& request_I);
  Reply getCurrentUsers();
  Reply getRunningApplication(const std::string& /*bundleId_I*/) { return nullptr; }

  // The application's driver requests, each key a list of texts.
  static CXPCDictionary ToDictionary(const Request& request_I);
  Reply stopLaunchDProcess(const Request& request_I) {
    return stopLaunchDProcess(ToDictionary(request_I));
  }
  Reply stopProcess(const Request& request_I) { return stopProcess(ToDictionary(request_I)); }
  Reply startLaunchDProcess(const Request& request_I) {
    return startLaunchDProcess(ToDictionary(request_I));
  }

 private:
  Reply CallHelper(const char* message_I, const CXPCDictionary* argument_I);
};
