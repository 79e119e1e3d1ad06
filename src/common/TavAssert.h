#pragma once
// Marks a broken assumption. It reports and returns: an assertion never
// stops the program, so every asserted path still needs an ordinary result.
// The caller has tested its condition already; `text` is the condition or a
// quoted sentence.

#include <functional>
#include <string>

void __TAVASSERT(const char* text_I, const char* file_I, int line_I);

// Convenience for call sites: reports with the current file and line.
#define TAVASSERT_TEXT(text) __TAVASSERT((text), __FILE__, __LINE__)

namespace TavAssert {
// Observers see every assertion's finished line; tests count them here.
using Observer = std::function<void(const std::string& line_I)>;
int AddObserver(Observer observer_I);
void RemoveObserver(int handle_I);
}  // namespace TavAssert
