#include "helper/HelperLog.h"

#include <systemd/sd-journal.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>

namespace {

bool HasJournal() {
  static const bool has = access("/run/systemd/journal/socket", W_OK) == 0;
  return has;
}

}  // namespace

void HelperLog::Print(int priority_I, const char* format_I, ...) {
  va_list arguments;
  va_start(arguments, format_I);
  if (HasJournal()) {
    sd_journal_printv(priority_I, format_I, arguments);
  } else {
    std::vfprintf(stderr, format_I, arguments);
    std::fputc('\n', stderr);
    std::fflush(stderr);
  }
  va_end(arguments);
}
