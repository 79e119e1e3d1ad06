#pragma once
// Writes a file so that nobody ever finds it half written: `write_I` writes
// a temporary file beside `path_I`, which is flushed to the disk and then
// renamed over `path_I` only if `write_I` returned true. A kill or a power
// cut at any moment leaves the old file or the new one, never a part of
// either; a failed write leaves the old file and no temporary.

#include <functional>
#include <string>

bool TavReplaceFile(const std::string& path_I,
                    const std::function<bool(const std::string& temporaryPath_I)>& write_I);
