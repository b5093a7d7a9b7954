// Mapped files that others cut off.
#pragma once

#include "platform/Data.h"

namespace platform {

/// The same bytes, kept alive with the original. Should they be those of a mapped file and the file
/// be cut off while they are in use, then what is gone reads as zeros from then on, where otherwise
/// the process would be ended by the signal SIGBUS; the same after errors of the disk. For files
/// whose readers bear any content.
///
/// Other faults are passed on to whoever handled the signal before the first call. At most 256 data
/// are guarded at a time; further ones are given back as they are.
/// Thread-safety: internally synchronised; the bytes may be read from any thread.
Data dataGuardedAgainstTruncation(const Data& data);

}  // namespace platform
