#pragma once
// The persistent store of the Linux build. The original kept these values in
// a per-user data-store service; here they stay in the XML file of the base
// class, in the user's configuration folder, so this is plain file I/O and
// lives with the rest of the settings code rather than behind a platform seam.
//
// The file is $XDG_CONFIG_HOME/tavik/tdc.xml (default ~/.config/tavik/).
// Booleans are kept as the texts "YES" and "NO", as the service kept them,
// so that values written by either read the same. A file left by older
// versions in ~/.tavik/tdc.xml is moved in once by Init().

#include <functional>
#include <string>

#include "settings/CPersistentSettings.h"

class CLinuxPersistentSettings : public CPersistentSettings {
 public:
  // Receives the new value when "LOGGING_ENABLED" is stored in the root,
  // so that the host can tell the other processes of the family.
  using LoggingNotifier = std::function<void(bool enable_I)>;

  CLinuxPersistentSettings();

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

 private:
  void MigrateLegacyFile();

  LoggingNotifier mLoggingNotifier;
};
