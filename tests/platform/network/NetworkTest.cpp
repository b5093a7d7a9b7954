#include "platform/Network.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using platform::networkIsReachableByRoutes;

const std::string header =
    "Iface\tDestination\tGateway \tFlags\tRefCnt\tUse\tMetric\tMask\t\tMTU\tWindow\tIRTT\n";

std::string route(const std::string& interface, const std::string& destination,
                  const std::string& flags) {
  return header + interface + "\t" + destination + "\t00000000\t" + flags +
         "\t0\t0\t0\t00FFFFFF\t0\t0\t0\n";
}

std::string ipv6Route(const std::string& destination, const std::string& flags,
                      const std::string& interface) {
  const std::string nothing(32, '0');
  return destination + " 40 " + nothing + " 00 " + nothing + " 00000100 00000001 00000000 " +
         flags + " " + interface + "\n";
}

TEST(Network, aDefaultRouteLeadsOut) {
  EXPECT_TRUE(networkIsReachableByRoutes(route("eth0", "00000000", "0003"), ""));
  EXPECT_TRUE(
      networkIsReachableByRoutes(header, ipv6Route(std::string(32, '0'), "00000003", "wlan0")));
}

TEST(Network, aNetworkWithoutAWayFurtherIsANetwork) {
  EXPECT_TRUE(networkIsReachableByRoutes(route("eth0", "000200C0", "0001"), ""));
  EXPECT_TRUE(networkIsReachableByRoutes(
      header, ipv6Route("fd000000000000000000000000000000", "00000001", "eth0")));
}

TEST(Network, withoutRoutesThereIsNone) {
  EXPECT_FALSE(networkIsReachableByRoutes("", ""));
  EXPECT_FALSE(networkIsReachableByRoutes(header, ""));
}

TEST(Network, theLoopbackInterfaceLeadsNowhere) {
  EXPECT_FALSE(networkIsReachableByRoutes(route("lo", "00000000", "0001"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "0000007F", "0001"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes("", ipv6Route(std::string(32, '0'), "00200201", "lo")));
}

TEST(Network, routesThatAreDownOrRefuseCountForNothing) {
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "00000000", "0002"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "00000000", "0201"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes("", ipv6Route(std::string(32, '0'), "00000201", "eth0")));
}

TEST(Network, theLinkItselfAndMulticastCountForNothing) {
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "0000FEA9", "0001"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "000000E0", "0001"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes(
      "", ipv6Route("fe800000000000000000000000000000", "00000001", "eth0")));
  EXPECT_FALSE(networkIsReachableByRoutes(
      "", ipv6Route("ff000000000000000000000000000000", "00000001", "eth0")));
}

TEST(Network, anAddressOfThisMachineIsNoWayOut) {
  EXPECT_FALSE(networkIsReachableByRoutes(
      "", ipv6Route("fd000000000000000000000000000002", "80200001", "eth0")));
}

TEST(Network, whatIsNotUnderstoodCountsForNothing) {
  EXPECT_FALSE(networkIsReachableByRoutes("eth0\n\n\x01\xFF zzzz 0 zzzz\neth0 0 0\n", "00 11\n"));
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "not a number", "0003"), ""));
  EXPECT_FALSE(networkIsReachableByRoutes(route("eth0", "00000000", "-3"), ""));
}

}  // namespace
