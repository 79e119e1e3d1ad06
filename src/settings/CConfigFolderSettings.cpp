#include "settings/CConfigFolderSettings.h"

#include <filesystem>

#include "common/LinuxPaths.h"
#include "common/StringUtilities.h"
#include "common/TavLog.h"

namespace {

constexpr char kLegacyFolderName[] = ".tavik";
constexpr char kFileName[] = "tdc.xml";
// The texts the data-store service keeps booleans as.
constexpr char kTrueText[] = "YES";
constexpr char kFalseText[] = "NO";

}  // namespace

CConfigFolderSettings::CConfigFolderSettings() : CPersistentSettings(StoreFileIn(ConfigFolder())) {}

std::string CConfigFolderSettings::ConfigFolder() { return LinuxPaths::GetConfigFolderPath(); }

std::string CConfigFolderSettings::LegacyFolder() {
  return LinuxPaths::AppendPathComponent(LinuxPaths::GetUserFolderPath(), kLegacyFolderName);
}

std::string CConfigFolderSettings::StoreFileIn(const std::string& folder_I) {
  return (std::filesystem::path(folder_I) / kFileName).string();
}

const char* CConfigFolderSettings::BoolText(bool value_I) {
  return value_I ? kTrueText : kFalseText;
}

bool CConfigFolderSettings::IsTrueText(const std::string& text_I) {
  return StringUtilities::IEquals(text_I, kTrueText);
}

void CConfigFolderSettings::Init() {
  mFilePath = StoreFileIn(ConfigFolder());
  std::error_code error;
  if (std::filesystem::exists(mFilePath, error)) {
    CPersistentSettings::Init();
  } else {
    // A first start: nothing to read, and no parse error to report.
    TavLog::Info("CPersistentSettings::Init() : mFilePath: %s\n", mFilePath.c_str());
    mRoot = CSettingsMap::New();
    mLastStatus = ESTATUS_OK;
  }
  MoveInFile(StoreFileIn(LegacyFolder()));
}

void CConfigFolderSettings::MoveInFile(const std::string& path_I) {
  std::error_code error;
  if (!std::filesystem::exists(path_I, error)) return;

  std::string errorText;
  auto old = CSettingsMap::ReadFromXMLFile(path_I, errorText);
  if (!old) {
    // A bad file does not stop the start: nothing moves and the file stays.
    TavLog::Warning("CConfigFolderSettings: %s is unreadable and stays\n", path_I.c_str());
    return;
  }
  bool stored = MoveInMap(*old, "");
  for (const std::string& key : old->GetKeys()) {
    if (old->TypeNameForKeyOrEmpty(key) != CSettingsMap::GetClassTypeName()) continue;
    const auto category = old->ObjectForKeyWithDefault<CSettingsMap>(key, nullptr);
    if (category) stored = MoveInMap(*category, key) && stored;
  }
  // Even an empty file goes only when the store can be written.
  if (old->ObjectCount() == 0) stored = SaveFile();
  if (!stored) {
    TavLog::Error("CConfigFolderSettings: could not store the values of %s; it stays\n",
                  path_I.c_str());
    return;
  }
  std::filesystem::remove(path_I, error);
  if (error) {
    TavLog::Warning("CConfigFolderSettings: cannot remove %s: %s\n", path_I.c_str(),
                    error.message().c_str());
  }
}

bool CConfigFolderSettings::MoveInMap(const CSettingsMap& map_I, const std::string& category_I) {
  bool stored = true;
  for (const std::string& key : map_I.GetKeys()) {
    const std::string type = map_I.TypeNameForKeyOrEmpty(key);
    if (type == CSettingsBool::GetClassTypeName()) {
      stored = SetKeyAndBool(key, map_I.BoolForKeyWithDefault(key, false), category_I) && stored;
    } else if (type == CSettingsString::GetClassTypeName()) {
      stored = SetKeyAndString(key, map_I.StringForKeyWithDefault(key, ""), category_I) && stored;
    }
  }
  return stored;
}

void CConfigFolderSettings::NotifyIfLogging(const std::string& key_I, const std::string& category_I,
                                            bool value_I) {
  if (FormatKey(category_I).empty() && FormatKey(key_I) == kLoggingEnabledKey && mLoggingNotifier) {
    mLoggingNotifier(value_I);
  }
}

bool CConfigFolderSettings::SetKeyAndBool(const std::string& key_I, bool value_I,
                                          const std::string& category_I) {
  const bool saved = SetKeyAndString(key_I, BoolText(value_I), category_I);
  NotifyIfLogging(key_I, category_I, value_I);
  return saved;
}

bool CConfigFolderSettings::GetBoolForKey(const std::string& key_I, const std::string& category_I) {
  return IsTrueText(GetStringForKey(key_I, category_I));
}

bool CConfigFolderSettings::SaveFile() {
  const std::filesystem::path file(mFilePath);
  std::error_code error;
  std::filesystem::create_directories(file.parent_path(), error);
  if (error) {
    TavLog::Error("CConfigFolderSettings: cannot make %s: %s\n",
                  file.parent_path().string().c_str(), error.message().c_str());
    mLastStatus = ESTATUS_SAVE_FAILED;
    return false;
  }
  const std::filesystem::path partial = file.string() + ".new";
  bool saved = mRoot->SaveXMLToFile(partial.string());
  if (saved) {
    std::filesystem::rename(partial, file, error);
    saved = !error;
  }
  if (!saved) std::filesystem::remove(partial, error);
  mLastStatus = saved ? ESTATUS_OK : ESTATUS_SAVE_FAILED;
  return saved;
}
