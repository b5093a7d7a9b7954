// Whether there is a network to speak of.
#pragma once

#include <string_view>

namespace platform {

/// Whether the kernel has a route that leads out of this machine: one that is up, does not refuse
/// packets, goes through another interface than the loop-back one, and to more than the link itself
/// (link-local addresses, multicast). That a particular server answers is another matter.
/// Thread-safe; asks the kernel each time. True where the kernel does not tell: whoever tries will
/// find out.
bool systemNetworkIsReachable();

/// The same of routes that are given as /proc/net/route and /proc/net/ipv6_route have them. Lines
/// that are not understood count for nothing.
bool networkIsReachableByRoutes(std::string_view routes, std::string_view ipv6Routes);

}  // namespace platform
