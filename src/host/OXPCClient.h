#pragma once
// The common base of the clients of the family's background services. A
// call is made to look synchronous: the message goes out with a reply
// handler, and the caller polls a flag that the reply sets, through
// TavSleep, for a fixed number of short waits. A reply that comes later is
// dropped; nothing raises an error here.
//
// The connection options follow the original's: kPrivileged reaches the
// privileged side (on Linux the system bus), 0 the user's own (the session
// bus). Where no directory is installed for those options no service is
// found, and every call gives the empty reply at once.

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "host/CServiceDirectory.h"
#include "host/CXPCDictionary.h"

// What connectToService gives: domain "XPCClient", code 0 for success.
struct SXPCError {
  std::string domain;
  long code = 0;
  std::map<std::string, std::string> userInfo;
};

class OXPCClient {
 public:
  static constexpr unsigned long kPrivileged = 4096;
  // The key of a reply, or of an error's user information, that tells
  // success (0) from failure.
  static constexpr const char* kErrorCodeKey = "Error Code";
  // The connection went away under a call: the code of the error that goes
  // to the owner's handleFailedConnection.
  static constexpr long kConnectionInvalidCode = 4099;
  // Statuses of the exceptions the clients raise, which carry no name of
  // their own: "Unimplemented" and NSObjectNotAvailableException.
  static constexpr uint16_t kUnimplementedStatus = 0x5501;
  static constexpr uint16_t kObjectNotAvailableStatus = 0x5502;

  OXPCClient() = default;
  virtual ~OXPCClient() = default;
  OXPCClient(const OXPCClient&) = delete;
  OXPCClient& operator=(const OXPCClient&) = delete;

  static void SetServiceDirectory(unsigned long options_I,
                                  std::shared_ptr<CServiceDirectory> directory_I);
  static std::shared_ptr<CServiceDirectory> GetServiceDirectory(unsigned long options_I);

  // The owner that hears of a connection that failed; borrowed, may be null.
  void setClient(OXPCClient* client_I) { mClient = client_I; }
  OXPCClient* GetClient() const { return mClient; }

  SXPCError connectToService(const std::string& service_I, const std::string& serverProtocol_I,
                             const std::string& clientProtocol_I, unsigned long options_I);
  // Meant to be overridden: the base drops the connection and throws.
  virtual void finishConnection();
  virtual void disconnectFromService();
  virtual void handleFailedConnection(OXPCClient* /*client_I*/, const SXPCError& /*error_I*/) {}

 protected:
  // Sends the message and polls `polls_I` times `interval_I` seconds for the
  // reply: the service's dictionary, or an error's user information; null
  // on a time-out, with no connection, or with no reply at all.
  std::shared_ptr<CXPCDictionary> Call(const std::string& message_I,
                                       const std::shared_ptr<const CXPCDictionary>& argument_I,
                                       double interval_I, int polls_I);
  static SXPCError ServiceNotRunning();

  std::recursive_mutex mCallLock;

 private:
  OXPCClient* mClient = nullptr;
  std::unique_ptr<CServiceConnection> mServer;
};
