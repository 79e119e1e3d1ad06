#pragma once
// The persistent settings of the Linux build. Init() chooses where the
// values live, for the whole run, and logs the choice once:
//
// - The user's data store, "com.tavik.DataStoreMgr" on the session bus,
//   where one answers: the values are then shared with the family's other
//   programs, as everywhere else the family runs. Values travel as texts,
//   booleans as "YES" and "NO"; a category is the store's Category under
//   the category's name. Init() moves the tdc.xml files of the
//   configuration folder and of ~/.tavik into the store once and removes
//   them, so that afterwards the store alone holds the values.
// - Otherwise, the common case on a plain Linux machine, the XML file of
//   the configuration folder, as CConfigFolderSettings keeps it: the
//   program must keep its values without any service installed.
//
// It lives with the service clients because it needs both them and the
// settings; the application registers it with CPersistentSettings::SetFactory.
//
// In the store, DeleteKey within a category answers whether the key was
// there but leaves it stored, as Category::deleteKey does, and the root's
// keys cannot be counted: the store has no such question, so CountKeys("")
// gives 0. A store that stops answering during the run gives the defaults,
// and a change is then lost, with a warning in the log.

#include <memory>
#include <string>

#include "settings/CConfigFolderSettings.h"

class Category;
class LoggingEnable;
class OPersistentDataStoreClient;

class CLinuxPersistentSettings : public CConfigFolderSettings {
 public:
  // Storing "LOGGING_ENABLED" in the root posts the notification of that
  // name, with the value under "Enable", through the process utilities'
  // desktop.
  CLinuxPersistentSettings();
  ~CLinuxPersistentSettings() override;

  void Init() override;
  bool IsKeyPresent(const std::string& key_I, const std::string& category_I = "") override;
  size_t CountKeys(const std::string& category_I = "") override;
  bool DeleteKey(const std::string& key_I, const std::string& category_I = "") override;
  bool SetKeyAndBool(const std::string& key_I, bool value_I,
                     const std::string& category_I = "") override;
  bool SetKeyAndString(const std::string& key_I, const std::string& value_I,
                       const std::string& category_I = "") override;
  bool GetBoolForKey(const std::string& key_I, const std::string& category_I = "") override;
  std::string GetStringForKey(const std::string& key_I,
                              const std::string& category_I = "") override;
  bool SaveFile() override;

  // True when Init() found the data store.
  bool IsUsingDataStore() const { return mStore != nullptr; }

 private:
  static std::shared_ptr<OPersistentDataStoreClient> ConnectToStore();
  // The category of the store; null for the root, where the client itself answers.
  std::unique_ptr<Category> OpenCategory(const std::string& category_I);
  std::string ReadText(const std::string& key_I, const std::string& category_I);
  void RegisterForLogging();

  std::shared_ptr<OPersistentDataStoreClient> mStore;
  std::shared_ptr<LoggingEnable> mLoggingEnabler;
};
