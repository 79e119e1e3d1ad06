#pragma once
// The client of the user's shared data store, "com.tavik.DataStoreMgr", on
// Linux a D-Bus service on the session bus. Values are texts under keys;
// Category keeps a group of them under one key.
//
// What the store answers: a dictionary, or the user information of an
// error, with "Error Code" 0 when the key is there, and for
// getDataForKey: the text under "Data". Each call waits half a second; a
// call that gets no reply at all throws CTavException with the key as its
// message and kObjectNotAvailableStatus (the original's
// NSObjectNotAvailableException).

#include <memory>
#include <optional>
#include <string>

#include "host/OXPCClient.h"

class Category;

class OPersistentDataStoreClient : public OXPCClient {
 public:
  static constexpr const char* kServiceName = "com.tavik.DataStoreMgr";
  static constexpr const char* kServerProtocol = "OPersistentDataStoreServiceProtocol";
  static constexpr const char* kClientProtocol = "OPersistentDataStoreClientProtocol";

  // The client of a store that is there, or nothing.
  static std::shared_ptr<OPersistentDataStoreClient> client();

  // Tries up to 20 times, a tenth of a second apart, until the store reads.
  SXPCError connectToService();

  bool hasKey(const std::string& key_I);
  bool deleteKey(const std::string& key_I);
  // The text under the key; nothing when the reply had no "Data".
  std::optional<std::string> getDataForKey(const std::string& key_I);
  void setData(const std::string& data_I, const std::string& key_I);
  // Fire and forget.
  void stopService();

  std::unique_ptr<Category> newCategory(const std::string& name_I);

 private:
  std::shared_ptr<CXPCDictionary> CallForKey(const char* message_I, CXPCDictionary argument_I,
                                             const std::string& key_I);
};
