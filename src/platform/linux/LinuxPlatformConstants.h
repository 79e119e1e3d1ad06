#pragma once
// Retry counts and waits of the platform forms, with their reasons.

namespace LinuxPlatform {

// Another holder has the HID interface: it usually lets go within a
// couple of seconds, so one more try after this wait.
inline constexpr double kExclusiveOpenRetryWait = 2.0;
// Claiming the touch controller's vendor interface: the kernel driver or
// a previous run may still hold it; this many further tries, this far apart.
inline constexpr int kClaimRetries = 15;
inline constexpr double kClaimRetryWait = 2.0;
// Buffers of the bulk interface's control requests.
inline constexpr size_t kBulkRequestBufferSize = 128;

}  // namespace LinuxPlatform
