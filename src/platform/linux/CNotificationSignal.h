#pragma once
// A notification of the family as a D-Bus signal on the session bus:
// interface "com.tavik.Notification", member the name with its dots turned
// into underscores, the user information as the body "a{sv}", the sender's
// application id encoded in the object path below "/com/tavik/Notification".

#include <systemd/sd-bus.h>

#include <string>

#include "seams/CDesktop.h"

namespace CNotificationSignal {

constexpr const char* kInterface = "com.tavik.Notification";
constexpr const char* kPath = "/com/tavik/Notification";

// "com.tavik.TFUCompleted" is sent as member "com_tavik_TFUCompleted".
std::string MemberFor(const std::string& name_I);
// The family's names hold no underscore, so a member gives its name back.
std::string NameFor(const std::string& member_I);

// A negative errno when the signal could not be built.
int Make(sd_bus* bus_I, const SNotification& notification_I, sd_bus_message** signal_O);
// False for a signal of another interface or with a body of another form.
bool Read(sd_bus_message* signal_I, SNotification& notification_O);

}  // namespace CNotificationSignal
