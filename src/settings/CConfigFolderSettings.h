#pragma once
// The persistent store kept in an XML file of the user's configuration
// folder: $XDG_CONFIG_HOME/tavik/tdc.xml (default ~/.config/tavik/). It is
// what SharedInstance() makes when the application registered no other
// form, and where the Linux form keeps the values when no data store
// answers on the session bus.
//
// Booleans are kept as the texts "YES" and "NO", as the data store keeps
// them, so that values written by either read the same. A file left by
// older versions in ~/.tavik/tdc.xml is moved in once by Init(). The file
// is written completely beside the old one before it replaces it.

#include <functional>
#include <string>

#include "settings/CPersistentSettings.h"

class CConfigFolderSettings : public CPersistentSettings {
 public:
  // Receives the new value when "LOGGING_ENABLED" is stored in the root,
  // so that the host can tell the other processes of the family.
  using LoggingNotifier = std::function<void(bool enable_I)>;

  static constexpr const char* kLoggingEnabledKey = "LOGGING_ENABLED";

  CConfigFolderSettings();

  void Init() override;
  bool SetKeyAndBool(const std::string& key_I, bool value_I,
                     const std::string& category_I = "") override;
  bool GetBoolForKey(const std::string& key_I, const std::string& category_I = "") override;
  // Makes the folder when needed, and replaces the file only once the new
  // one is complete.
  bool SaveFile() override;

  void SetLoggingNotifier(LoggingNotifier notifier_I) { mLoggingNotifier = std::move(notifier_I); }

  // The user's configuration folder of the program (LinuxPaths).
  static std::string ConfigFolder();
  // ~/.tavik, where older versions kept tdc.xml.
  static std::string LegacyFolder();
  // tdc.xml in the folder.
  static std::string StoreFileIn(const std::string& folder_I);

 protected:
  // Stores the booleans and texts of an XML settings file, those of the
  // root and those of its categories one level down, through the setters,
  // and removes the file once every one of them is stored. A file that
  // cannot be read, or whose values could not all be stored, stays.
  void MoveInFile(const std::string& path_I);
  // The texts booleans are kept as.
  static const char* BoolText(bool value_I);
  static bool IsTrueText(const std::string& text_I);
  // Tells the notifier when the key is "LOGGING_ENABLED" in the root.
  void NotifyIfLogging(const std::string& key_I, const std::string& category_I, bool value_I);

 private:
  bool MoveInMap(const CSettingsMap& map_I, const std::string& category_I);

  LoggingNotifier mLoggingNotifier;
};
