#include "bvmake/Priority.h"

#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

namespace bvmake {

namespace {

// The C library has no name for the call, so neither has it these constants.
constexpr int ioprioWhoProcess = 1;
constexpr int ioprioClassIdle = 3;
constexpr int ioprioClassShift = 13;

}  // namespace

std::optional<platform::Error> lowerPriority() {
  std::optional<platform::Error> error;
  const int niceness = std::max(getpriority(PRIO_PROCESS, 0), loweredNiceness);
  if (setpriority(PRIO_PROCESS, 0, niceness) != 0) {
    error = platform::posixError(errno, "lower priority on the processor");
  }
  if (syscall(SYS_ioprio_set, ioprioWhoProcess, 0, ioprioClassIdle << ioprioClassShift) != 0) {
    error = platform::posixError(errno, "lower priority on the disk");
  }
  return error;
}

}  // namespace bvmake
