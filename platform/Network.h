// Whether there is a network to speak of.
#pragma once

namespace platform {

/// Whether some network interface other than the loop-back one is up and has an address. That a
/// particular server answers is another matter. Thread-safe; asks the kernel each time.
bool systemNetworkIsReachable();

}  // namespace platform
