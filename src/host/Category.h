#pragma once
// A group of values kept in the data store under one key, the category's
// name, as one JSON object in a text. Every read fetches the whole object.
//
// deleteKey removes the key only from the dictionary it has just read and
// writes nothing back, so the key is still stored afterwards; setData
// writes. The asymmetry is the original's, and is kept.

#include <cstddef>
#include <memory>
#include <optional>
#include <string>

#include "settings/CSettingsMap.h"

class OPersistentDataStoreClient;

class Category {
 public:
  Category(OPersistentDataStoreClient& store_I, std::string name_I)
      : mStore(store_I), mName(std::move(name_I)) {}

  void SetName(const std::string& name_I) { mName = name_I; }
  const std::string& GetName() const { return mName; }

  // The stored object, or a new empty one when nothing usable is stored.
  std::shared_ptr<CSettingsMap> newDictionary();
  size_t count();
  bool hasKey(const std::string& key_I);
  std::optional<std::string> copyDataForKey(const std::string& key_I);
  bool deleteKey(const std::string& key_I);
  void setData(const std::string& data_I, const std::string& key_I);

 private:
  OPersistentDataStoreClient& mStore;
  std::string mName;
};
