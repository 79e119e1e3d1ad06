#pragma once
// Log lines of the whole program. Every line is formatted with its level
// tag and handed to one sink, TavTraceD. The sink is silent unless the
// application attached outputs (stderr with --verbose, a file with --log).

#include <cstdarg>
#include <functional>
#include <string>

namespace TavLog {

enum ELogLevel : int {
  eDebug = 0,
  eInfo = 1,
  eNotice = 2,
  eWarning = 3,
  eError = 4,
  eUnused = 5,
  eCritical = 6,
  eAlert = 7,
  eAll = 8,
};

std::string FormatWithLevel(int level_I, const char* format_I);

void Debug(const char* format_I, ...) __attribute__((format(printf, 1, 2)));
void Info(const char* format_I, ...) __attribute__((format(printf, 1, 2)));
void Warning(const char* format_I, ...) __attribute__((format(printf, 1, 2)));
void Error(const char* format_I, ...) __attribute__((format(printf, 1, 2)));

// An output of the sink: receives each finished text as it was formatted.
// Outputs are how --verbose, --log and the tests see log lines.
using Output = std::function<void(const std::string& text_I)>;

// Adds an output and returns a handle for RemoveOutput.
int AddOutput(Output output_I);
void RemoveOutput(int handle_I);

// Clears the Debug new-line flag; for tests that need a known start.
void ResetLineState();

}  // namespace TavLog

// Non-zero turns on the trace lines of the bridge link and the scalar
// layer. Those lines are wrapped in a ConditionalFunction, so a normal run
// does not even format them. Set once before threads start.
extern int g_DebugTrace;

// The single point where log lines leave the program. Returns the number
// of characters handed to the outputs, or -1 when none is attached.
int TavTraceD(int level_I, const char* format_I, va_list args_I);
