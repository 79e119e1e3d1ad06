#pragma once
// Asks polkit whether the sender of a request may manage the driver. Any
// failure to get an answer refuses: no polkit, no answer, a challenge that
// would need the user to type a password (nobody waits for that: the
// updater gives up on a reply after half a second).

#include <systemd/sd-bus.h>

#include <string>

class CPolkitAuthority {
 public:
  static constexpr const char* kActionId = "com.tavik.update-helper.manage-driver";

  // `sender_I` is the caller's unique bus name; `why_O` says why not.
  static bool IsAuthorized(sd_bus* bus_I, const std::string& sender_I, std::string& why_O);
};
