#include "settings/CPersistentSettings.h"

#include <algorithm>

#include "common/TavLog.h"
#include "settings/CConfigFolderSettings.h"

namespace {

CPersistentSettings::Factory& RegisteredFactory() {
  static CPersistentSettings::Factory factory;
  return factory;
}

}  // namespace

void CPersistentSettings::SetFactory(Factory factory_I) {
  RegisteredFactory() = std::move(factory_I);
}

CPersistentSettings* CPersistentSettings::SharedInstance() {
  static CPersistentSettings* instance = [] {
    const Factory& factory = RegisteredFactory();
    std::unique_ptr<CPersistentSettings> created =
        factory ? factory() : std::make_unique<CConfigFolderSettings>();
    created->Init();
    return created.release();
  }();
  return instance;
}

CPersistentSettings::CPersistentSettings(std::string filePath_I)
    : mFilePath(std::move(filePath_I)), mRoot(CSettingsMap::New()) {}

void CPersistentSettings::Init() {
  TavLog::Info("CPersistentSettings::Init() : mFilePath: %s\n", mFilePath.c_str());
  std::string errorText;
  mRoot = CSettingsMap::ReadFromXMLFile(mFilePath, errorText);
  mLastStatus = ESTATUS_OK;
  if (!mRoot) {
    TavLog::Warning("CPersistentSettings::Init() - XML file was no help\n");
    mRoot = CSettingsMap::New();
    mLastStatus = ESTATUS_READ_FAILED;
  }
}

std::shared_ptr<CSettingsMap> CPersistentSettings::GetCategory(const std::string& category_I) {
  const std::string name = FormatKey(category_I);
  if (name.empty()) return mRoot;
  if (!mRoot->IsKeyPresent(name)) mRoot->SetKeyAndObject(name, CSettingsMap::New());
  return mRoot->ObjectForKeyWithDefault<CSettingsMap>(name, CSettingsMap::New());
}

std::string CPersistentSettings::FormatKey(const std::string& name_I) {
  std::string formatted = name_I;
  formatted.erase(std::remove(formatted.begin(), formatted.end(), ' '), formatted.end());
  return formatted;
}

bool CPersistentSettings::IsKeyPresent(const std::string& key_I, const std::string& category_I) {
  return GetCategory(category_I)->IsKeyPresent(FormatKey(key_I));
}

size_t CPersistentSettings::CountKeys(const std::string& category_I) {
  return GetCategory(category_I)->ObjectCount();
}

bool CPersistentSettings::DeleteKey(const std::string& key_I, const std::string& category_I) {
  auto category = GetCategory(category_I);
  const std::string key = FormatKey(key_I);
  if (!category->IsKeyPresent(key)) return false;
  category->RemoveObjectForKey(key);
  SaveFile();
  return true;
}

bool CPersistentSettings::DeleteCategory(const std::string& category_I) {
  return DeleteKey(category_I, "");
}

bool CPersistentSettings::SetKeyAndBool(const std::string& key_I, bool value_I,
                                        const std::string& category_I) {
  GetCategory(category_I)->SetKeyAndBool(FormatKey(key_I), value_I);
  return SaveFile();
}

bool CPersistentSettings::SetKeyAndString(const std::string& key_I, const std::string& value_I,
                                          const std::string& category_I) {
  GetCategory(category_I)->SetKeyAndString(FormatKey(key_I), value_I);
  return SaveFile();
}

bool CPersistentSettings::GetBoolForKey(const std::string& key_I, const std::string& category_I) {
  return GetCategory(category_I)->BoolForKeyWithDefault(FormatKey(key_I), false);
}

std::string CPersistentSettings::GetStringForKey(const std::string& key_I,
                                                 const std::string& category_I) {
  return GetCategory(category_I)->StringForKeyWithDefault(FormatKey(key_I), "");
}

bool CPersistentSettings::SaveFile() {
  const bool saved = mRoot->SaveXMLToFile(mFilePath);
  mLastStatus = saved ? ESTATUS_OK : ESTATUS_SAVE_FAILED;
  return saved;
}
