#include "host/CLinuxPersistentSettings.h"

#include "common/CClock.h"
#include "common/TavLog.h"
#include "host/Category.h"
#include "host/LoggingEnable.h"
#include "host/OPersistentDataStoreClient.h"
#include "host/OProcessUtils.h"

namespace {

// Rounds of the client's own twenty tries before the store counts as
// absent. A store that is listed but never answers would keep a start
// waiting for hours through all of them, so the rounds also end once this
// much clock time has gone by; one started on demand is up long before.
constexpr int kConnectRounds = 1000;
constexpr double kConnectSeconds = 30.0;

void PostLoggingEnabled(bool enable_I) {
  const std::shared_ptr<CDesktop> desktop = OProcessUtils::GetDesktop();
  if (!desktop) return;
  desktop->PostNotification({CConfigFolderSettings::kLoggingEnabledKey,
                             "",
                             {{"Enable", static_cast<int32_t>(enable_I ? 1 : 0)}}});
}

// A store call that did not come back: the caller's default, and a line.
template <typename T, typename Call>
T Guarded(const char* operation_I, const std::string& key_I, T default_I, Call call_I) {
  try {
    return call_I();
  } catch (const std::exception& exception) {
    TavLog::Warning("CLinuxPersistentSettings::%s(%s): the data store did not answer: %s\n",
                    operation_I, key_I.c_str(), exception.what());
    return default_I;
  }
}

}  // namespace

CLinuxPersistentSettings::CLinuxPersistentSettings() { SetLoggingNotifier(&PostLoggingEnabled); }

CLinuxPersistentSettings::~CLinuxPersistentSettings() = default;

std::shared_ptr<OPersistentDataStoreClient> CLinuxPersistentSettings::ConnectToStore() {
  std::shared_ptr<OPersistentDataStoreClient> client = OPersistentDataStoreClient::client();
  if (!client) return nullptr;
  SXPCError result;
  int tries = 0;
  const double giveUpAt = CClock::Get()->Now() + kConnectSeconds;
  while (tries < kConnectRounds) {
    ++tries;
    result = client->connectToService();
    if (result.code == 0 || CClock::Get()->Now() >= giveUpAt) break;
  }
  if (result.code != 0) {
    TavLog::Error(
        "CMacPersistentSettings::Init(): [OPersistentDataStoreClient client] connectToService "
        "failed with error code %ld.\n",
        result.code);
    return nullptr;
  }
  TavLog::Info(
      "CMacPersistentSettings::Init(): [OPersistentDataStoreClient client] connectToService "
      "successful after %d tries.\n",
      tries);
  return client;
}

void CLinuxPersistentSettings::Init() {
  mStore = ConnectToStore();
  if (mStore) {
    TavLog::Info("CLinuxPersistentSettings: values kept in the data store %s\n",
                 OPersistentDataStoreClient::kServiceName);
    mFilePath = StoreFileIn(ConfigFolder());
    mRoot = CSettingsMap::New();
    mLastStatus = ESTATUS_OK;
    // The older file first, so that where both hold a key the newer wins.
    MoveInFile(StoreFileIn(LegacyFolder()));
    MoveInFile(mFilePath);
  } else {
    CConfigFolderSettings::Init();
    TavLog::Info("CLinuxPersistentSettings: no data store answers; values kept in %s\n",
                 mFilePath.c_str());
  }
  RegisterForLogging();
}

void CLinuxPersistentSettings::RegisterForLogging() {
  if (mLoggingEnabler) return;
  mLoggingEnabler = std::make_shared<LoggingEnable>();
  OProcessUtils::GetInstance()->addObserver(
      kLoggingEnabledKey, [enabler = mLoggingEnabler](const SNotification& notification_I) {
        enabler->enableLogging(notification_I);
      });
}

std::unique_ptr<Category> CLinuxPersistentSettings::OpenCategory(const std::string& category_I) {
  const std::string name = FormatKey(category_I);
  return name.empty() ? nullptr : mStore->newCategory(name);
}

bool CLinuxPersistentSettings::IsKeyPresent(const std::string& key_I,
                                            const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::IsKeyPresent(key_I, category_I);
  const std::string key = FormatKey(key_I);
  try {
    const std::unique_ptr<Category> category = OpenCategory(category_I);
    return category ? category->hasKey(key) : mStore->hasKey(key);
  } catch (const std::exception& exception) {
    TavLog::Warning("CMacPersistentSettings::IsKeyPresent() caught exception named %s\n",
                    exception.what());
    return false;
  }
}

size_t CLinuxPersistentSettings::CountKeys(const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::CountKeys(category_I);
  return Guarded("CountKeys", category_I, size_t{0}, [&] {
    const std::unique_ptr<Category> category = OpenCategory(category_I);
    return category ? category->count() : size_t{0};
  });
}

bool CLinuxPersistentSettings::DeleteKey(const std::string& key_I, const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::DeleteKey(key_I, category_I);
  const std::string key = FormatKey(key_I);
  return Guarded("DeleteKey", key, false, [&] {
    const std::unique_ptr<Category> category = OpenCategory(category_I);
    return category ? category->deleteKey(key) : mStore->deleteKey(key);
  });
}

bool CLinuxPersistentSettings::SetKeyAndBool(const std::string& key_I, bool value_I,
                                             const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::SetKeyAndBool(key_I, value_I, category_I);
  const bool stored = SetKeyAndString(key_I, BoolText(value_I), category_I);
  NotifyIfLogging(key_I, category_I, value_I);
  return stored;
}

bool CLinuxPersistentSettings::SetKeyAndString(const std::string& key_I, const std::string& value_I,
                                               const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::SetKeyAndString(key_I, value_I, category_I);
  const std::string key = FormatKey(key_I);
  return Guarded("SetKeyAndString", key, false, [&] {
    const std::unique_ptr<Category> category = OpenCategory(category_I);
    if (category) {
      category->setData(value_I, key);
    } else {
      mStore->setData(value_I, key);
    }
    return true;
  });
}

std::string CLinuxPersistentSettings::ReadText(const std::string& key_I,
                                               const std::string& category_I) {
  const std::string key = FormatKey(key_I);
  return Guarded("GetStringForKey", key, std::string(), [&] {
    const std::unique_ptr<Category> category = OpenCategory(category_I);
    const std::optional<std::string> text =
        category ? category->copyDataForKey(key) : mStore->getDataForKey(key);
    return text.value_or(std::string());
  });
}

bool CLinuxPersistentSettings::GetBoolForKey(const std::string& key_I,
                                             const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::GetBoolForKey(key_I, category_I);
  return IsTrueText(ReadText(key_I, category_I));
}

std::string CLinuxPersistentSettings::GetStringForKey(const std::string& key_I,
                                                      const std::string& category_I) {
  if (!mStore) return CConfigFolderSettings::GetStringForKey(key_I, category_I);
  return ReadText(key_I, category_I);
}

bool CLinuxPersistentSettings::SaveFile() {
  // Every change is in the store as soon as it is made.
  return mStore ? true : CConfigFolderSettings::SaveFile();
}
