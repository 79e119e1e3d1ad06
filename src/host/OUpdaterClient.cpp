#include "host/OUpdaterClient.h"

namespace {

// Half a second in all, in waits short enough not to add to a quick reply.
constexpr double kPollSeconds = 0.00005;
constexpr int kPolls = 10000;
// Loading the driver takes longer: five seconds in all.
constexpr double kKextPollSeconds = 0.0025;
constexpr int kKextPolls = 2000;

}  // namespace

std::shared_ptr<OUpdaterClient> OUpdaterClient::client() {
  static std::mutex lock;
  static std::shared_ptr<OUpdaterClient> instance;
  const std::shared_ptr<CServiceDirectory> directory = GetServiceDirectory(kPrivileged);
  if (!directory || !directory->HasService(kServiceName)) return nullptr;
  std::lock_guard<std::mutex> guard(lock);
  if (!instance) instance = std::make_shared<OUpdaterClient>();
  return instance;
}

SXPCError OUpdaterClient::connectToService() {
  return OXPCClient::connectToService(kServiceName, kServerProtocol, kClientProtocol, kPrivileged);
}

CXPCDictionary OUpdaterClient::ToDictionary(const Request& request_I) {
  CXPCDictionary dictionary;
  for (const auto& [key, texts] : request_I) dictionary.Set(key, texts);
  return dictionary;
}

OUpdaterClient::Reply OUpdaterClient::CallHelper(const char* message_I,
                                                 const CXPCDictionary* argument_I) {
  std::shared_ptr<const CXPCDictionary> argument;
  if (argument_I != nullptr) argument = std::make_shared<const CXPCDictionary>(*argument_I);
  return Call(message_I, argument, kPollSeconds, kPolls);
}

int64_t OUpdaterClient::LoadDriverKext() {
  const Reply reply = Call("loadDriverKext:", nullptr, kKextPollSeconds, kKextPolls);
  if (!reply) return kKextTimedOut;
  const auto* data = reply->Get<std::shared_ptr<CXPCDictionary>>("Data");
  return data != nullptr && *data ? (*data)->GetInteger("KextError", 0) : 0;
}

OUpdaterClient::Reply OUpdaterClient::performInstall(const CXPCDictionary& request_I) {
  return CallHelper("performInstall:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::performRemove(const CXPCDictionary& request_I) {
  return CallHelper("performRemove:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::removePrefs(const CXPCDictionary& request_I) {
  return CallHelper("removePrefs:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::verifyInstallation() {
  return CallHelper("verifyInstallationWithReply:", nullptr);
}

OUpdaterClient::Reply OUpdaterClient::startProcess(const CXPCDictionary& request_I) {
  return CallHelper("startProcess:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::stopProcess(const CXPCDictionary& request_I) {
  return CallHelper("stopProcess:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::restartProcess(const CXPCDictionary& request_I) {
  const Reply stopped = stopProcess(request_I);
  if (stopped && stopped->GetInteger(kErrorCodeKey, 0) != 0) return stopped;
  return startProcess(request_I);
}

OUpdaterClient::Reply OUpdaterClient::wakeSystem() {
  return CallHelper("wakeSystemWithReply:", nullptr);
}

OUpdaterClient::Reply OUpdaterClient::stopService() {
  const CXPCDictionary junk{{"junk", std::string("data")}};
  return CallHelper("stopService:withReply:", &junk);
}

OUpdaterClient::Reply OUpdaterClient::startLaunchDProcess(const CXPCDictionary& request_I) {
  return CallHelper("startLaunchDProcess:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::stopLaunchDProcess(const CXPCDictionary& request_I) {
  return CallHelper("stopLaunchDProcess:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::getProcessList(const CXPCDictionary& request_I) {
  return CallHelper("findAllProcessesInList:withReply:", &request_I);
}

OUpdaterClient::Reply OUpdaterClient::getCurrentUsers() {
  return CallHelper("findLoggedInUsersWithReply:", nullptr);
}
