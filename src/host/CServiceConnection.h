#pragma once
// The transport beneath the service clients: one connection to one named
// background service. Linux form: CLinuxServiceConnection over sd-bus.
//
// Contract:
// - Send() puts a message on its way and returns at once; false when it
//   could not be sent, and then its handler never runs. `message_I` is the
//   remote message as the clients name it ("stopProcess:withReply:"); the
//   form maps it onto its own method names. A null argument sends none.
// - The handler runs at most once, inside a later Dispatch(), on the thread
//   that calls Dispatch. It gets the service's reply dictionary with
//   `error_I` false; for an error reply that carries the service's user
//   information, that dictionary with `error_I` true; for a failure that
//   carries none (no such service, the service went away, a transport
//   time-out), null with `error_I` true.
// - Dispatch() never blocks.
// - One thread at a time: the clients serialise their calls.

#include <functional>
#include <memory>
#include <string>

#include "host/CXPCDictionary.h"

class CServiceConnection {
 public:
  using ReplyHandler = std::function<void(std::shared_ptr<CXPCDictionary> reply_I, bool error_I)>;

  virtual ~CServiceConnection() = default;
  virtual bool Send(const std::string& message_I,
                    const std::shared_ptr<const CXPCDictionary>& argument_I,
                    ReplyHandler handler_I) = 0;
  virtual void Dispatch() = 0;
};
