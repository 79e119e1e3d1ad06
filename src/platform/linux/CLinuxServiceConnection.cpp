#include "platform/linux/CLinuxServiceConnection.h"

#include "common/TavLog.h"
#include "common/TavSysErrStr.h"
#include "platform/linux/BusDictionary.h"

namespace {

// Longer than any wait of the clients, so that a late reply is still taken
// in, and dropped, rather than left pending.
constexpr uint64_t kCallTimeoutUsec = 10 * 1000 * 1000;

void FreeHandler(void* handler_I) {
  delete static_cast<CServiceConnection::ReplyHandler*>(handler_I);
}

}  // namespace

int CLinuxServiceConnection::OpenBus(bool systemBus_I, sd_bus** bus_O) {
  return systemBus_I ? sd_bus_open_system(bus_O) : sd_bus_open_user(bus_O);
}

std::string CLinuxServiceConnection::MemberFor(const std::string& message_I) {
  std::string member = message_I.substr(0, message_I.find(':'));
  const std::string suffix = "WithReply";
  if (member.size() > suffix.size() &&
      member.compare(member.size() - suffix.size(), suffix.size(), suffix) == 0) {
    member.erase(member.size() - suffix.size());
  }
  return member;
}

std::string CLinuxServiceConnection::ObjectPathFor(const std::string& service_I) {
  std::string path = "/" + service_I;
  for (char& c : path) {
    if (c == '.') c = '/';
  }
  return path;
}

std::string CLinuxServiceConnection::InterfaceFor(const std::string& service_I,
                                                  const std::string& protocol_I) {
  return service_I.substr(0, service_I.rfind('.') + 1) + protocol_I;
}

std::unique_ptr<CLinuxServiceConnection> CLinuxServiceConnection::Open(
    bool systemBus_I, const std::string& service_I, const std::string& serverProtocol_I,
    const std::string& clientProtocol_I) {
  sd_bus* bus = nullptr;
  const int status = OpenBus(systemBus_I, &bus);
  if (status < 0) {
    TavLog::Info("%s: no %s bus: %s\n", service_I.c_str(), systemBus_I ? "system" : "session",
                 TavSysErrStr(-status).c_str());
    return nullptr;
  }
  return std::unique_ptr<CLinuxServiceConnection>(
      new CLinuxServiceConnection(bus, service_I, InterfaceFor(service_I, serverProtocol_I),
                                  InterfaceFor(service_I, clientProtocol_I)));
}

CLinuxServiceConnection::CLinuxServiceConnection(sd_bus* bus_I, std::string service_I,
                                                 std::string interface_I,
                                                 std::string clientInterface_I)
    : mBus(bus_I),
      mService(std::move(service_I)),
      mPath(ObjectPathFor(mService)),
      mInterface(std::move(interface_I)),
      mClientInterface(std::move(clientInterface_I)) {
  sd_bus_add_object(mBus, &mExported, mPath.c_str(), &CLinuxServiceConnection::OnClientMessage,
                    this);
}

CLinuxServiceConnection::~CLinuxServiceConnection() {
  sd_bus_slot_unref(mExported);
  sd_bus_flush_close_unref(mBus);
}

int CLinuxServiceConnection::OnClientMessage(sd_bus_message* message_I, void* self_I,
                                             sd_bus_error* /*error_O*/) {
  auto* self = static_cast<CLinuxServiceConnection*>(self_I);
  if (!sd_bus_message_is_method_call(message_I, self->mClientInterface.c_str(), nullptr)) return 0;
  sd_bus_message* reply = nullptr;
  int status = sd_bus_message_new_method_return(message_I, &reply);
  if (status >= 0) status = BusDictionary::Append(reply, CXPCDictionary());
  if (status >= 0) status = sd_bus_send(nullptr, reply, nullptr);
  sd_bus_message_unref(reply);
  return status < 0 ? status : 1;
}

bool CLinuxServiceConnection::Send(const std::string& message_I,
                                   const std::shared_ptr<const CXPCDictionary>& argument_I,
                                   ReplyHandler handler_I) {
  sd_bus_message* call = nullptr;
  int status = sd_bus_message_new_method_call(mBus, &call, mService.c_str(), mPath.c_str(),
                                              mInterface.c_str(), MemberFor(message_I).c_str());
  if (status >= 0 && argument_I) status = BusDictionary::Append(call, *argument_I);
  sd_bus_slot* slot = nullptr;
  auto* handler = new ReplyHandler(std::move(handler_I));
  if (status >= 0) {
    status = sd_bus_call_async(mBus, &slot, call, &CLinuxServiceConnection::OnReply, handler,
                               kCallTimeoutUsec);
  }
  sd_bus_message_unref(call);
  if (status < 0) {
    delete handler;
    TavLog::Info("%s %s: not sent: %s\n", mService.c_str(), message_I.c_str(),
                 TavSysErrStr(-status).c_str());
    return false;
  }
  // The slot lives until the reply or the bus's time-out, and frees the
  // handler with it.
  sd_bus_slot_set_destroy_callback(slot, &FreeHandler);
  sd_bus_slot_set_floating(slot, 1);
  sd_bus_slot_unref(slot);
  return true;
}

int CLinuxServiceConnection::OnReply(sd_bus_message* reply_I, void* handler_I,
                                     sd_bus_error* /*error_O*/) {
  auto& handler = *static_cast<ReplyHandler*>(handler_I);
  if (!sd_bus_message_is_method_error(reply_I, nullptr)) {
    std::shared_ptr<CXPCDictionary> reply = BusDictionary::Read(reply_I);
    handler(reply ? reply : std::make_shared<CXPCDictionary>(), false);
    return 0;
  }
  // The service's user information follows the error's text; an error the
  // bus made up carries none.
  std::shared_ptr<CXPCDictionary> userInfo;
  if (sd_bus_message_skip(reply_I, "s") >= 0) userInfo = BusDictionary::Read(reply_I);
  if (!userInfo) {
    const sd_bus_error* error = sd_bus_message_get_error(reply_I);
    TavLog::Info("No reply: %s\n",
                 error != nullptr && error->message != nullptr ? error->message : "failed");
  }
  handler(userInfo, true);
  return 0;
}

void CLinuxServiceConnection::Dispatch() {
  while (sd_bus_process(mBus, nullptr) > 0) {
  }
}
