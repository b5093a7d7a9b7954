// Whether the computer has something better to do.
#pragma once

#include <string>

namespace zebd {

/// Whether background work should wait: the computer runs on its battery, or has half as much work
/// again as processors. `root` is where the kernel's folders /proc and /sys are; what cannot be
/// read there does not count.
bool computerShouldBeLazy(int processorCount, const std::string& root = {});

}  // namespace zebd
