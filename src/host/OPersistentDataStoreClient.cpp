#include "host/OPersistentDataStoreClient.h"

#include "common/CClock.h"
#include "common/CTavException.h"
#include "host/Category.h"

namespace {

// Half a second in all.
constexpr double kPollSeconds = 0.00025;
constexpr int kPolls = 2000;
// A store that is being started on demand gets two seconds to answer.
constexpr int kConnectTries = 20;
constexpr double kConnectPauseSeconds = 0.1;
// The key read to see whether the store answers.
constexpr const char* kProbeKey = "NULL";

}  // namespace

std::shared_ptr<OPersistentDataStoreClient> OPersistentDataStoreClient::client() {
  static std::mutex lock;
  static std::shared_ptr<OPersistentDataStoreClient> instance;
  const std::shared_ptr<CServiceDirectory> directory = GetServiceDirectory(0);
  if (!directory || !directory->HasService(kServiceName)) return nullptr;
  std::lock_guard<std::mutex> guard(lock);
  if (!instance) instance = std::make_shared<OPersistentDataStoreClient>();
  return instance;
}

SXPCError OPersistentDataStoreClient::connectToService() {
  for (int attempt = 0; attempt < kConnectTries; ++attempt) {
    OXPCClient::connectToService(kServiceName, kServerProtocol, kClientProtocol, 0);
    try {
      if (getDataForKey(kProbeKey))
        return SXPCError{"XPCClient", 0, {{"Error", "Connection Started."}}};
    } catch (const CTavException&) {
      // Not up yet.
    }
    TavSleep(kConnectPauseSeconds);
  }
  return ServiceNotRunning();
}

std::shared_ptr<CXPCDictionary> OPersistentDataStoreClient::CallForKey(const char* message_I,
                                                                       CXPCDictionary argument_I,
                                                                       const std::string& key_I) {
  std::shared_ptr<CXPCDictionary> reply =
      Call(message_I, std::make_shared<const CXPCDictionary>(std::move(argument_I)), kPollSeconds,
           kPolls);
  if (!reply) throw CTavException(__FILE__, __LINE__, key_I.c_str(), kObjectNotAvailableStatus);
  return reply;
}

bool OPersistentDataStoreClient::hasKey(const std::string& key_I) {
  return CallForKey("hasKey:withReply:", {{"Key", key_I}}, key_I)->GetInteger(kErrorCodeKey, -1) ==
         0;
}

bool OPersistentDataStoreClient::deleteKey(const std::string& key_I) {
  return CallForKey("deleteKey:withReply:", {{"Key", key_I}}, key_I)
             ->GetInteger(kErrorCodeKey, -1) == 0;
}

std::optional<std::string> OPersistentDataStoreClient::getDataForKey(const std::string& key_I) {
  const auto reply = CallForKey("getDataForKey:withReply:", {{"Key", key_I}}, key_I);
  const std::string* data = reply->Get<std::string>("Data");
  if (data == nullptr) return std::nullopt;
  return *data;
}

void OPersistentDataStoreClient::setData(const std::string& data_I, const std::string& key_I) {
  CallForKey("setDataForKey:withReply:", {{"Key", key_I}, {"Data", data_I}}, key_I);
}

void OPersistentDataStoreClient::stopService() {
  const auto junk =
      std::make_shared<const CXPCDictionary>(CXPCDictionary{{"junk", std::string("data")}});
  Call("stopService:withReply:", junk, kPollSeconds, 0);
}

std::unique_ptr<Category> OPersistentDataStoreClient::newCategory(const std::string& name_I) {
  return std::make_unique<Category>(*this, name_I);
}
