#include "settings/CLinuxPersistentSettings.h"

#include <filesystem>

#include "common/LinuxPaths.h"
#include "common/StringUtilities.h"
#include "common/TavLog.h"

namespace {

constexpr char kLegacyFolderName[] = ".tavik";
constexpr char kFileName[] = "tdc.xml";
// The texts the data-store service kept booleans as.
constexpr char kTrueText[] = "YES";
constexpr char kFalseText[] = "NO";
constexpr char kLoggingEnabledKey[] = "LOGGING_ENABLED";

}  // namespace

CLinuxPersistentSettings::CLinuxPersistentSettings()
    : CPersistentSettings((std::filesystem::path(ConfigFolder()) / kFileName).string()) {}

std::string CLinuxPersistentSettings::ConfigFolder() { return LinuxPaths::GetConfigFolderPath(); }

std::string CLinuxPersistentSettings::LegacyFolder() {
  return LinuxPaths::AppendPathComponent(LinuxPaths::GetUserFolderPath(), kLegacyFolderName);
}

void CLinuxPersistentSettings::Init() {
  mFilePath = (std::filesystem::path(ConfigFolder()) / kFileName).string();
  std::error_code error;
  if (std::filesystem::exists(mFilePath, error)) {
    CPersistentSettings::Init();
  } else {
    // A first start: nothing to read, and no parse error to report.
    TavLog::Info("CPersistentSettings::Init() : mFilePath: %s\n", mFilePath.c_str());
    mRoot = CSettingsMap::New();
    mLastStatus = ESTATUS_OK;
  }
  MigrateLegacyFile();
}

void CLinuxPersistentSettings::MigrateLegacyFile() {
  const std::filesystem::path legacyFile = std::filesystem::path(LegacyFolder()) / kFileName;
  std::error_code error;
  if (!std::filesystem::exists(legacyFile, error)) return;

  std::string errorText;
  auto legacy = CSettingsMap::ReadFromXMLFile(legacyFile.string(), errorText);
  if (!legacy) {
    // A bad file does not stop the start: nothing moves and the file stays.
    TavLog::Warning("CLinuxPersistentSettings: %s is unreadable and stays\n",
                    legacyFile.string().c_str());
    return;
  }
  bool saved = true;
  for (const std::string& key : legacy->GetKeys()) {
    const std::string type = legacy->TypeNameForKeyOrEmpty(key);
    if (type == CSettingsBool::GetClassTypeName()) {
      saved = SetKeyAndBool(key, legacy->BoolForKeyWithDefault(key, false), "") && saved;
    } else if (type == CSettingsString::GetClassTypeName()) {
      saved = SetKeyAndString(key, legacy->StringForKeyWithDefault(key, ""), "") && saved;
    }
  }
  if (legacy->ObjectCount() == 0) saved = SaveFile();
  // The old file goes only once its values are safely in the new one.
  if (!saved) {
    TavLog::Error("CLinuxPersistentSettings: could not write %s; %s stays\n", mFilePath.c_str(),
                  legacyFile.string().c_str());
    return;
  }
  std::filesystem::remove(legacyFile, error);
  if (error) {
    TavLog::Warning("CLinuxPersistentSettings: cannot remove %s: %s\n", legacyFile.string().c_str(),
                    error.message().c_str());
  }
}

bool CLinuxPersistentSettings::SetKeyAndBool(const std::string& key_I, bool value_I,
                                             const std::string& category_I) {
  const bool saved = SetKeyAndString(key_I, value_I ? kTrueText : kFalseText, category_I);
  if (FormatKey(category_I).empty() && FormatKey(key_I) == kLoggingEnabledKey && mLoggingNotifier) {
    mLoggingNotifier(value_I);
  }
  return saved;
}

bool CLinuxPersistentSettings::GetBoolForKey(const std::string& key_I,
                                             const std::string& category_I) {
  return StringUtilities::IEquals(GetStringForKey(key_I, category_I), kTrueText);
}

bool CLinuxPersistentSettings::SaveFile() {
  const std::filesystem::path file(mFilePath);
  std::error_code error;
  std::filesystem::create_directories(file.parent_path(), error);
  if (error) {
    TavLog::Error("CLinuxPersistentSettings: cannot make %s: %s\n",
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
