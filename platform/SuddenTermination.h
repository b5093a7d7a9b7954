// Moments at which the process must not be ended without being asked.
#pragma once

#include "platform/Clock.h"

namespace platform {

/// From now on the process has something to finish, until enableSuddenTermination() was called as
/// often. Calls from all over the process are counted together. Thread-safe.
void disableSuddenTermination();

/// Takes one such call back. Stops the process where there is none left: somebody counts wrongly.
void enableSuddenTermination();

/// How many calls are not taken back yet.
int suddenTerminationDisableCount();

/// Waits, on the environment's clock, until there are none; returns whether that came about within
/// `timeout`. For whoever is about to end the process.
bool waitUntilSuddenTerminationIsEnabled(Seconds timeout);

}  // namespace platform
