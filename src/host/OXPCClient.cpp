#include "host/OXPCClient.h"

#include "common/CClock.h"
#include "common/CTavException.h"
#include "common/TavLog.h"

namespace {

std::mutex gDirectoryLock;
std::map<unsigned long, std::shared_ptr<CServiceDirectory>> gDirectories;

// What a call shares with its reply handler. Held by both, so a reply
// that comes after the caller gave up lands here harmlessly.
struct SPendingCall {
  bool done = false;
  bool failed = false;
  std::shared_ptr<CXPCDictionary> reply;
};

}  // namespace

void OXPCClient::SetServiceDirectory(unsigned long options_I,
                                     std::shared_ptr<CServiceDirectory> directory_I) {
  std::lock_guard<std::mutex> guard(gDirectoryLock);
  gDirectories[options_I] = std::move(directory_I);
}

std::shared_ptr<CServiceDirectory> OXPCClient::GetServiceDirectory(unsigned long options_I) {
  std::lock_guard<std::mutex> guard(gDirectoryLock);
  const auto found = gDirectories.find(options_I);
  return found == gDirectories.end() ? nullptr : found->second;
}

SXPCError OXPCClient::ServiceNotRunning() {
  return SXPCError{"XPCClient", 1, {{"Error", "Service not running?"}}};
}

SXPCError OXPCClient::connectToService(const std::string& service_I,
                                       const std::string& serverProtocol_I,
                                       const std::string& clientProtocol_I,
                                       unsigned long options_I) {
  std::lock_guard<std::recursive_mutex> guard(mCallLock);
  const std::shared_ptr<CServiceDirectory> directory = GetServiceDirectory(options_I);
  mServer = directory ? directory->Connect(service_I, serverProtocol_I, clientProtocol_I) : nullptr;
  if (!mServer) return ServiceNotRunning();
  return SXPCError{"XPCClient", 0, {{"Error", "Connection Started."}}};
}

void OXPCClient::finishConnection() {
  {
    std::lock_guard<std::recursive_mutex> guard(mCallLock);
    mServer.reset();
  }
  throw CTavException(__FILE__, __LINE__, "finishConnection not overridden", kUnimplementedStatus);
}

void OXPCClient::disconnectFromService() {
  {
    std::lock_guard<std::recursive_mutex> guard(mCallLock);
    mServer.reset();
  }
  throw CTavException(__FILE__, __LINE__, "disconnectFromService not overridden",
                      kUnimplementedStatus);
}

std::shared_ptr<CXPCDictionary> OXPCClient::Call(
    const std::string& message_I, const std::shared_ptr<const CXPCDictionary>& argument_I,
    double interval_I, int polls_I) {
  std::lock_guard<std::recursive_mutex> guard(mCallLock);
  if (!mServer) return nullptr;
  auto call = std::make_shared<SPendingCall>();
  const bool sent = mServer->Send(message_I, argument_I,
                                  [call](std::shared_ptr<CXPCDictionary> reply_I, bool error_I) {
                                    call->reply = std::move(reply_I);
                                    call->failed = error_I && !call->reply;
                                    call->done = true;
                                  });
  if (!sent) return nullptr;
  CServiceConnection& server = *mServer;
  TavPollUntil(interval_I * polls_I, interval_I, [&server, &call] {
    server.Dispatch();
    return call->done;
  });
  if (!call->done) {
    TavLog::Info("%s: no reply\n", message_I.c_str());
  } else if (call->failed && mClient != nullptr) {
    mClient->handleFailedConnection(
        mClient, SXPCError{"XPCClient", kConnectionInvalidCode, {{"Error", message_I}}});
  }
  return call->reply;
}
