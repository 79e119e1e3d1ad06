#include "helper/CPolkitAuthority.h"

bool CPolkitAuthority::IsAuthorized(sd_bus* bus_I, const std::string& sender_I,
                                    std::string& why_O) {
  sd_bus_error error = SD_BUS_ERROR_NULL;
  sd_bus_message* reply = nullptr;
  // No details, no interaction, no cancellation id.
  int status = sd_bus_call_method(bus_I, "org.freedesktop.PolicyKit1",
                                  "/org/freedesktop/PolicyKit1/Authority",
                                  "org.freedesktop.PolicyKit1.Authority", "CheckAuthorization",
                                  &error, &reply, "(sa{sv})sa{ss}us", "system-bus-name", 1, "name",
                                  "s", sender_I.c_str(), kActionId, 0, 0u, "");
  int authorized = 0;
  int challenge = 0;
  if (status < 0) {
    why_O = error.message != nullptr ? error.message : "polkit did not answer";
  } else if (sd_bus_message_enter_container(reply, 'r', "bba{ss}") < 0 ||
             sd_bus_message_read(reply, "bb", &authorized, &challenge) < 0) {
    why_O = "polkit's answer could not be read";
    authorized = 0;
  } else if (!authorized) {
    why_O = challenge ? "polkit wants an administrator's password" : "polkit refused";
  }
  sd_bus_message_unref(reply);
  sd_bus_error_free(&error);
  return authorized != 0;
}
