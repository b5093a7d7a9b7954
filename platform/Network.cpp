#include "platform/Network.h"

#include <arpa/inet.h>
#include <net/route.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
#include <vector>

namespace platform {

namespace {

using Fields = std::vector<std::string_view>;

/// <linux/ipv6_route.h> has it, which clashes with <net/route.h>: an address of this machine.
constexpr uint32_t routeToOurselves = 0x8000'0000;

Fields fieldsOfLine(std::string_view line) {
  constexpr std::string_view blanks = " \t\r";
  Fields fields;
  for (size_t begin = line.find_first_not_of(blanks); begin != std::string_view::npos;
       begin = line.find_first_not_of(blanks, begin)) {
    const size_t end = std::min(line.find_first_of(blanks, begin), line.size());
    fields.push_back(line.substr(begin, end - begin));
    begin = end;
  }
  return fields;
}

std::optional<uint32_t> hexadecimal(std::string_view digits) {
  uint32_t number = 0;
  const auto [end, error] =
      std::from_chars(digits.data(), digits.data() + digits.size(), number, 16);
  const bool isAll = error == std::errc() && end == digits.data() + digits.size();
  return isAll ? std::optional(number) : std::nullopt;
}

bool leadsOut(std::string_view interface, std::optional<uint32_t> flags) {
  return interface != "lo" && flags && (*flags & RTF_UP) != 0 && (*flags & RTF_REJECT) == 0;
}

/// Interface, destination, gateway, flags, …
bool isIPv4RouteOut(const Fields& fields) {
  if (fields.size() < 4) {
    return false;
  }
  const auto destination = hexadecimal(fields[1]);
  if (!destination) {
    return false;
  }
  // The kernel prints the bytes, which are in the order of the network, as one number.
  const uint32_t address = ntohl(*destination);
  const bool isLinkLocal = address >> 16 == 0xA9FE;
  const bool isLoopback = address >> 24 == 0x7F;
  const bool isMulticast = address >> 28 >= 0xE;
  return !isLinkLocal && !isLoopback && !isMulticast && leadsOut(fields[0], hexadecimal(fields[3]));
}

/// Destination, length of its prefix, source, …, flags, interface.
bool isIPv6RouteOut(const Fields& fields) {
  if (fields.size() < 10 || fields[0].size() != 32) {
    return false;
  }
  const auto start = hexadecimal(fields[0].substr(0, 4));
  const auto flags = hexadecimal(fields[8]);
  return start && (*start & 0xFFC0) != 0xFE80 && (*start & 0xFF00) != 0xFF00 && flags &&
         (*flags & routeToOurselves) == 0 && leadsOut(fields[9], flags);
}

template <typename IsRouteOut>
bool anyLine(std::string_view text, const IsRouteOut& isRouteOut) {
  while (!text.empty()) {
    const size_t end = std::min(text.find('\n'), text.size());
    if (isRouteOut(fieldsOfLine(text.substr(0, end)))) {
      return true;
    }
    text.remove_prefix(std::min(end + 1, text.size()));
  }
  return false;
}

std::optional<std::string> contentsOf(const char* path) {
  std::ifstream file(path);
  return file ? std::optional(std::string{std::istreambuf_iterator<char>(file), {}}) : std::nullopt;
}

}  // namespace

bool networkIsReachableByRoutes(std::string_view routes, std::string_view ipv6Routes) {
  return anyLine(routes, isIPv4RouteOut) || anyLine(ipv6Routes, isIPv6RouteOut);
}

bool systemNetworkIsReachable() {
  const auto routes = contentsOf("/proc/net/route");
  // A kernel without IPv6 has no such file.
  return !routes ||
         networkIsReachableByRoutes(*routes, contentsOf("/proc/net/ipv6_route").value_or(""));
}

}  // namespace platform
