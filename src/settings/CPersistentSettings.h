#pragma once
// The store of named values that outlive a run: booleans and strings,
// grouped in categories. This base form keeps them in a settings map read
// from an XML file and writes the file after every change.
//
// A category is a map in the root under the category's name; the empty
// category is the root itself. Keys and category names are stored without
// blanks, so "My Key" and "MyKey" name the same value.

#include <functional>
#include <memory>
#include <string>

#include "settings/CSettingsMap.h"

class CPersistentSettings {
 public:
  // Values of GetLastStatus.
  enum ESTATUS : int {
    ESTATUS_OK = 0,
    ESTATUS_READ_FAILED = 1,  // the file gave no map; the store started empty
    ESTATUS_SAVE_FAILED = 2,  // the last change did not reach the file
  };

  using Factory = std::function<std::unique_ptr<CPersistentSettings>()>;

  // The one store of the process, made and initialised on first use by the
  // registered factory, else as the configuration-folder file. Callers
  // never delete it. Takes no lock.
  static CPersistentSettings* SharedInstance();
  // The platform's form, which this folder cannot name: the application
  // registers it before anything asks for SharedInstance().
  static void SetFactory(Factory factory_I);

  explicit CPersistentSettings(std::string filePath_I = std::string());
  virtual ~CPersistentSettings() = default;
  CPersistentSettings(const CPersistentSettings&) = delete;
  CPersistentSettings& operator=(const CPersistentSettings&) = delete;

  virtual void Init();
  virtual bool IsKeyPresent(const std::string& key_I, const std::string& category_I = "");
  virtual size_t CountKeys(const std::string& category_I = "");
  // True when the key was there; only then is the file written.
  virtual bool DeleteKey(const std::string& key_I, const std::string& category_I = "");
  virtual bool DeleteCategory(const std::string& category_I);
  // Each store writes the file; the result says whether that worked.
  virtual bool SetKeyAndBool(const std::string& key_I, bool value_I,
                             const std::string& category_I = "");
  virtual bool SetKeyAndString(const std::string& key_I, const std::string& value_I,
                               const std::string& category_I = "");
  // False for an absent key.
  virtual bool GetBoolForKey(const std::string& key_I, const std::string& category_I = "");
  // Empty for an absent key.
  virtual std::string GetStringForKey(const std::string& key_I, const std::string& category_I = "");
  virtual bool SaveFile();

  // The category's map, made empty in the root when it is not there yet.
  std::shared_ptr<CSettingsMap> GetCategory(const std::string& category_I);
  // The name without its blanks.
  static std::string FormatKey(const std::string& name_I);
  int GetLastStatus() const { return mLastStatus; }
  const std::string& GetFilePath() const { return mFilePath; }

 protected:
  std::string mFilePath;
  int mLastStatus = ESTATUS_OK;
  std::shared_ptr<CSettingsMap> mRoot;
};
