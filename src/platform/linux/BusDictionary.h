#pragma once
// The D-Bus form of a service dictionary: a{sv}. Flags travel as "b",
// integers as "x", numbers as "d", texts as "s", lists of texts as "as",
// nested dictionaries as "a{sv}". On reading, every integer type is taken,
// object paths and signatures read as texts, and a value of any other kind
// is passed over, as is anything nested deeper than kMaxDepth.

#include <systemd/sd-bus.h>

#include <memory>

#include "host/CXPCDictionary.h"

namespace BusDictionary {

// Deeper than any dictionary of the services; keeps a hostile message from
// running the reader's stack down.
inline constexpr int kMaxDepth = 8;

// Negative errno on failure, as sd-bus gives it.
int Append(sd_bus_message* message_IO, const CXPCDictionary& dictionary_I);
// The a{sv} at the read position; null when there is none or it is broken.
std::shared_ptr<CXPCDictionary> Read(sd_bus_message* message_IO);

}  // namespace BusDictionary
