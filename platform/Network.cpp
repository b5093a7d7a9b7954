#include "platform/Network.h"

#include <ifaddrs.h>
#include <net/if.h>
#include <sys/socket.h>

#include <memory>

namespace platform {

bool systemNetworkIsReachable() {
  ifaddrs* list = nullptr;
  if (::getifaddrs(&list) != 0) {
    // Not known to be offline: whoever tries will find out.
    return true;
  }
  const std::unique_ptr<ifaddrs, void (*)(ifaddrs*)> owned(list, ::freeifaddrs);
  for (const ifaddrs* entry = list; entry != nullptr; entry = entry->ifa_next) {
    constexpr unsigned wanted = IFF_UP | IFF_RUNNING;
    const bool isUp = (entry->ifa_flags & wanted) == wanted;
    const bool isLoopback = (entry->ifa_flags & IFF_LOOPBACK) != 0;
    const bool hasAddress = entry->ifa_addr != nullptr && (entry->ifa_addr->sa_family == AF_INET ||
                                                           entry->ifa_addr->sa_family == AF_INET6);
    if (isUp && !isLoopback && hasAddress) {
      return true;
    }
  }
  return false;
}

}  // namespace platform
