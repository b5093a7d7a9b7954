// Telling leak checkers which objects live for ever on purpose.
#pragma once

#if __has_include(<sanitizer/lsan_interface.h>)
#include <sanitizer/lsan_interface.h>
// Weak: only programs that were built with a checker have it.
#pragma weak __lsan_ignore_object
#define ZEB_HAS_LEAK_CHECKER 1
#endif

/// From now on the allocated object, and all that can be reached from it, is no leak.
inline void tellLeakCheckerToIgnore([[maybe_unused]] const void* object) {
#ifdef ZEB_HAS_LEAK_CHECKER
  if (&__lsan_ignore_object != nullptr) {
    __lsan_ignore_object(object);
  }
#endif
}
