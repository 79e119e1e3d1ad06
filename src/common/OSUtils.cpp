#include "common/OSUtils.h"

#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <condition_variable>
#include <exception>
#include <mutex>

#include "common/CMainThreadLoop.h"

#ifndef TAV_PROGRAM_VERSION_STRING
#error "the build defines TAV_PROGRAM_VERSION_STRING from the project version"
#endif

namespace OSUtils {

namespace {

FileVersion::ERELEASE ReleaseFromStageByte(unsigned int stage_I) {
  switch (stage_I) {
    case 0x20: return FileVersion::EDevelopmentVersion;
    case 0x40: return FileVersion::EAlphaVersion;
    case 0x60: return FileVersion::EBetaVersion;
    case 0x80: return FileVersion::EFinalVersion;
    default: return FileVersion::EUnknownVersion;
  }
}

}  // namespace

void DispatchOnMainThread(std::function<void()> block_I) {
  if (CMainThreadLoop::IsMainThread()) {
    block_I();
    return;
  }
  // Lives on this thread's stack. The main thread hands over the outcome
  // under the lock and touches nothing of it afterwards, so everything it
  // made (a thrown exception too) is released here.
  struct SOutcome {
    std::mutex mLock;
    std::condition_variable mDone;
    bool mFinished = false;
    std::exception_ptr mError;
  } outcome;
  auto run = [&outcome, &block_I] {
    std::exception_ptr error;
    try {
      block_I();
    } catch (...) {
      error = std::current_exception();
    }
    std::lock_guard<std::mutex> guard(outcome.mLock);
    outcome.mError = std::move(error);
    outcome.mFinished = true;
    outcome.mDone.notify_all();
  };
  if (!CMainThreadLoop::PostToMain(run)) run();

  std::unique_lock<std::mutex> lock(outcome.mLock);
  outcome.mDone.wait(lock, [&outcome] { return outcome.mFinished; });
  if (outcome.mError) std::rethrow_exception(outcome.mError);
}

FileVersion GetMainBundleVersion() {
  return GetVersionFromBundle(TAV_PROGRAM_VERSION_STRING, false);
}

FileVersion GetVersionFromBundle(const std::string& versionText_I, bool bIsWeb_I) {
  if (versionText_I.empty()) return FileVersion();
  return FileVersion(versionText_I, bIsWeb_I);
}

FileVersion GetVersionFromVersNumber(unsigned int number_I) {
  return FileVersion(static_cast<uint8_t>(number_I >> 24),
                     static_cast<uint8_t>((number_I >> 20) & 0xF),
                     static_cast<uint8_t>((number_I >> 16) & 0xF),
                     ReleaseFromStageByte((number_I >> 8) & 0xFF), static_cast<uint8_t>(number_I));
}

uint64_t CurrentTimeInMicroseconds() {
  const auto sinceOrigin = std::chrono::steady_clock::now().time_since_epoch();
  return static_cast<uint64_t>(
      std::chrono::duration_cast<std::chrono::microseconds>(sinceOrigin).count());
}

bool HasSystemLog() {
  static const bool present = ::access(_PATH_LOG, W_OK) == 0;
  return present;
}

}  // namespace OSUtils
