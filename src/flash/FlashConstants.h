#pragma once
// Every retry count and wait of the flash subsystem, with its reason.

#include <cstdint>

namespace FlashConstants {

// SafeRead and SafeWrite: a retried failure is not yet an error.
inline constexpr int kSafeTries = 100;
// The wait after failed try i is kSafeWaitBase + kSafeWaitStep * i seconds,
// so from 11 ms to 110 ms: gives a busy device more time each round.
inline constexpr double kSafeWaitBase = 0.01;
inline constexpr double kSafeWaitStep = 0.001;
// After the last try, the connection is reopened and given this long.
inline constexpr double kSafeReopenWait = 1.0;

// Loader commands that carry data or erase are tried this often.
inline constexpr int kCommandTries = 5;
// Reading data and writing blocks reopen the connection between tries.
inline constexpr double kCommandReopenWait = 0.5;

// A block that fails to program is erased and written again this often.
inline constexpr int kWriteBlockTries = 10;
// Under the non-BL protocol the expected block checksum covers this many
// bytes, so blocks there are of this size.
inline constexpr unsigned int kNonBLBlockSize = 4096;

// A loader describing a bigger block than this is taken as broken: the
// image of such a block would not fit in memory.
inline constexpr uint32_t kMaxFlashBlockBytes = 16u << 20;

// Only the first blocks of pen and touch S-record files enter the sums.
inline constexpr unsigned int kSummedPenTouchBlocks = 39;

// Programming reports: the frame, the busy poll and the write step.
inline constexpr unsigned int kProgrammingReportSize = 512;
inline constexpr double kBusyPollWait = 0.1;
inline constexpr unsigned int kBusyPollTenSeconds = 101;
inline constexpr unsigned int kBusyPollSixtySeconds = 601;
inline constexpr double kWriteStepWait = 0.02;
inline constexpr double kIntelHexChunkWait = 0.001;

}  // namespace FlashConstants
