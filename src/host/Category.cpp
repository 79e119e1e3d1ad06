#include "host/Category.h"

#include "host/OPersistentDataStoreClient.h"

std::shared_ptr<CSettingsMap> Category::newDictionary() {
  const std::optional<std::string> stored = mStore.getDataForKey(mName);
  if (stored && !stored->empty()) {
    try {
      std::shared_ptr<CSettingsMap> parsed =
          CSettingsMap::CastToMap(CSettingsObject::ReadFromJSONBuffer(*stored), false);
      if (parsed) return parsed;
    } catch (const std::exception&) {
      // A text that is no JSON object holds nothing of this category.
    }
  }
  return CSettingsMap::New();
}

size_t Category::count() { return newDictionary()->ObjectCount(); }

bool Category::hasKey(const std::string& key_I) { return newDictionary()->IsKeyPresent(key_I); }

std::optional<std::string> Category::copyDataForKey(const std::string& key_I) {
  const std::shared_ptr<CSettingsMap> dictionary = newDictionary();
  if (!dictionary->IsKeyPresent(key_I)) return std::nullopt;
  return dictionary->StringForKeyWithDefault(key_I, std::string());
}

bool Category::deleteKey(const std::string& key_I) {
  const std::shared_ptr<CSettingsMap> dictionary = newDictionary();
  if (!dictionary->IsKeyPresent(key_I)) return false;
  dictionary->RemoveObjectForKey(key_I);
  return true;
}

void Category::setData(const std::string& data_I, const std::string& key_I) {
  const std::shared_ptr<CSettingsMap> dictionary = newDictionary();
  dictionary->SetKeyAndString(key_I, data_I);
  // Level -1: no indentation.
  mStore.setData(dictionary->CreateJSONNode(-1), mName);
}
