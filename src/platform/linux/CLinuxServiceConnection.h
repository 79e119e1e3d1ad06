#pragma once
// A connection to one of the family's services over sd-bus.
//
// The service "com.tavik.UpdateHelper" serves the object
// "/com/tavik/UpdateHelper" with the interface named after its protocol in
// the service's namespace, "com.tavik.UpdateHelperProtocol". A remote
// message becomes the method of its first selector part, without a
// trailing "WithReply": "stopProcess:withReply:" is stopProcess,
// "findLoggedInUsersWithReply:" is findLoggedInUsers. The argument
// dictionary is the one a{sv} argument; the reply is one a{sv}, or an error
// whose text is followed by the service's user information as a{sv}.
//
// The client's own protocol is served on this connection under the same
// object path; its messages do nothing and answer an empty dictionary.
//
// Replies are taken in only by Dispatch(), on the caller's thread: the bus
// object is never shared between threads.

#include <systemd/sd-bus.h>

#include <memory>
#include <string>

#include "host/CServiceConnection.h"

class CLinuxServiceConnection : public CServiceConnection {
 public:
  // Null when the bus cannot be reached.
  static std::unique_ptr<CLinuxServiceConnection> Open(bool systemBus_I,
                                                       const std::string& service_I,
                                                       const std::string& serverProtocol_I,
                                                       const std::string& clientProtocol_I);
  ~CLinuxServiceConnection() override;
  CLinuxServiceConnection(const CLinuxServiceConnection&) = delete;
  CLinuxServiceConnection& operator=(const CLinuxServiceConnection&) = delete;

  bool Send(const std::string& message_I, const std::shared_ptr<const CXPCDictionary>& argument_I,
            ReplyHandler handler_I) override;
  void Dispatch() override;

  static std::string MemberFor(const std::string& message_I);
  static std::string ObjectPathFor(const std::string& service_I);
  static std::string InterfaceFor(const std::string& service_I, const std::string& protocol_I);
  // The system or the session bus, as sd-bus finds them (the standard
  // DBUS_SYSTEM_BUS_ADDRESS and DBUS_SESSION_BUS_ADDRESS override them).
  static int OpenBus(bool systemBus_I, sd_bus** bus_O);

 private:
  CLinuxServiceConnection(sd_bus* bus_I, std::string service_I, std::string interface_I,
                          std::string clientInterface_I);
  static int OnReply(sd_bus_message* reply_I, void* handler_I, sd_bus_error* error_O);
  static int OnClientMessage(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O);

  sd_bus* mBus;
  sd_bus_slot* mExported = nullptr;
  std::string mService;
  std::string mPath;
  std::string mInterface;
  std::string mClientInterface;
};
