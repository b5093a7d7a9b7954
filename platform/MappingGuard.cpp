#include "platform/MappingGuard.h"

#include <sys/mman.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <memory>
#include <optional>
#include <utility>

namespace platform {

namespace {

/// A guarded range; free while `isTaken` is not set, without effect while `begin` is 0.
struct Range {
  std::atomic<bool> isTaken{false};
  std::atomic<uintptr_t> begin{0};
  std::atomic<uintptr_t> end{0};
};

// What the handler reads: no locks, nothing that is ever destroyed.
constinit std::array<Range, 256> ranges;
static_assert(std::atomic<uintptr_t>::is_always_lock_free);
constinit std::atomic<uintptr_t> pageSize{0};
struct sigaction formerAction;  // NOLINT: set before the handler is in force.

// Puts pages of zeros where the rest of the range was; munmap() of the range takes them too.
bool replaceRest(uintptr_t address) noexcept {
  for (const Range& range : ranges) {
    const uintptr_t begin = range.begin.load(std::memory_order_acquire);
    const uintptr_t end = range.end.load(std::memory_order_acquire);
    if (begin != 0 && begin <= address && address < end) {
      const uintptr_t page = address / pageSize * pageSize;
      // NOLINTNEXTLINE(performance-no-int-to-ptr): addresses are what a fault tells.
      return ::mmap(reinterpret_cast<void*>(page), end - page, PROT_READ,
                    MAP_PRIVATE | MAP_ANONYMOUS | MAP_FIXED, -1, 0) != MAP_FAILED;
    }
  }
  return false;
}

void handleFault(int number, siginfo_t* information, void* context) {
  const int formerError = errno;
  const bool isReplaced = information->si_code == BUS_ADRERR &&
                          replaceRest(reinterpret_cast<uintptr_t>(information->si_addr));
  errno = formerError;
  if (isReplaced) {
    return;
  }
  if ((formerAction.sa_flags & SA_SIGINFO) != 0) {
    formerAction.sa_sigaction(number, information, context);
  } else if (formerAction.sa_handler != SIG_DFL && formerAction.sa_handler != SIG_IGN) {
    formerAction.sa_handler(number);
  } else {
    // A fault comes again and finds what there was before; what somebody sent has to be sent again.
    ::sigaction(SIGBUS, &formerAction, nullptr);
    if (information->si_code <= 0) {
      ::raise(number);
    }
  }
}

bool installHandler() noexcept {
  pageSize = static_cast<uintptr_t>(::sysconf(_SC_PAGESIZE));
  struct sigaction action {};
  action.sa_sigaction = handleFault;
  action.sa_flags = SA_SIGINFO | SA_ONSTACK;
  ::sigemptyset(&action.sa_mask);
  return ::sigaction(SIGBUS, nullptr, &formerAction) == 0 &&
         ::sigaction(SIGBUS, &action, nullptr) == 0;
}

/// Holds a range as long as its bytes are in use.
class Guard {
 public:
  Guard(Data data, Range& range) : _data(std::move(data)), _range(range) {
    const auto begin = reinterpret_cast<uintptr_t>(_data.bytes());
    _range.end.store(begin + _data.length(), std::memory_order_release);
    _range.begin.store(begin, std::memory_order_release);
  }
  ~Guard() {
    _range.begin.store(0, std::memory_order_release);
    _range.isTaken.store(false, std::memory_order_release);
  }
  Guard(const Guard&) = delete;
  Guard& operator=(const Guard&) = delete;

 private:
  const Data _data;
  Range& _range;
};

Range* freeRange() noexcept {
  for (Range& range : ranges) {
    if (!range.isTaken.exchange(true, std::memory_order_acq_rel)) {
      return &range;
    }
  }
  return nullptr;
}

}  // namespace

Data dataGuardedAgainstTruncation(const Data& data) {
  static const bool isInstalled = installHandler();
  Range* const range = isInstalled && !data.empty() ? freeRange() : nullptr;
  return range == nullptr
             ? data
             : Data::wrap(data.bytes(), data.length(), std::make_shared<const Guard>(data, *range));
}

}  // namespace platform
