#include "platform/Assertion.h"

#include <cstdio>
#include <cstdlib>

namespace platform {

void failAssertion(const char* text) {
  std::fprintf(stderr, "Assertion failed: %s\n", text);
  std::abort();
}

}  // namespace platform
