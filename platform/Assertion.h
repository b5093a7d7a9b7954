// Conditions without which the program makes no sense.
#pragma once

namespace platform {

/// Prints `text` on standard error and stops the process.
[[noreturn]] void failAssertion(const char* text);

/// Stops the process with `text`, which names the condition, unless it holds; in every build type.
inline void assertCondition(bool condition, const char* text) {
  if (!condition) {
    failAssertion(text);
  }
}

}  // namespace platform
