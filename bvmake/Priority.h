// Giving way to other programs.
#pragma once

#include <optional>

#include "platform/Error.h"

namespace bvmake {

/// How far the process steps back on the processor, in the units of nice(1).
inline constexpr int loweredNiceness = 10;

/// From now on the process takes the processor only when others leave it time (niceness 10, or what
/// it is already where that is higher), and the disk only when it is idle. Threads started later
/// inherit this. There is no way back without privileges. An error means that some of it was
/// refused.
std::optional<platform::Error> lowerPriority();

}  // namespace bvmake
