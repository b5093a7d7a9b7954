// For tests of what happens where there is no message bus.
#pragma once

#if defined(__SANITIZE_ADDRESS__)
#define ZEB_LEAK_CHECKER
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define ZEB_LEAK_CHECKER
#endif
#endif
#if defined(ZEB_LEAK_CHECKER)
#include <sanitizer/lsan_interface.h>
#endif

namespace tests {

/// The bus library loses the connection object of an address that it cannot open. For the lifetime
/// of this, the leak checker overlooks what this thread allocates.
class LostConnections {
 public:
#if defined(ZEB_LEAK_CHECKER)
  LostConnections() { __lsan_disable(); }
  ~LostConnections() { __lsan_enable(); }
#else
  LostConnections() {}
  ~LostConnections() {}
#endif
  LostConnections(const LostConnections&) = delete;
  LostConnections& operator=(const LostConnections&) = delete;
};

}  // namespace tests
