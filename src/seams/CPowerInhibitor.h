#pragma once
// The power seam: keeps the machine from idling to sleep while one update
// runs.
//
// Linux form: systemd-logind's Inhibit("idle:sleep", ...) over the system bus;
// the lock lasts as long as the returned file descriptor is open. On a
// machine with no system bus or no logind nothing can idle it to sleep, and
// the assertion counts as granted. A logind that refuses is a refusal.
// Lab form: granted, and counted, in-process.
//
// Contract: Create() gives an assertion that holds until it is destroyed,
// or null when the system refused. It never blocks for long (the D-Bus call
// has a short time-out) and never throws.

#include <memory>
#include <string>

class CPowerAssertion {
 public:
  virtual ~CPowerAssertion() = default;  // releases the assertion
};

class CPowerInhibitor {
 public:
  virtual ~CPowerInhibitor() = default;
  virtual std::unique_ptr<CPowerAssertion> Create(const std::string& name_I) = 0;
};
