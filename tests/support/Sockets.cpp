#include "tests/support/Sockets.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <mutex>
#include <set>
#include <stdexcept>

namespace tests {

namespace {

sockaddr_in loopbackAddress(int port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return address;
}

Descriptor socketOnPort(int port) {
  Descriptor socket(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const int yes = 1;
  ::setsockopt(socket.number(), SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
  const sockaddr_in address = loopbackAddress(port);
  if (::bind(socket.number(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      ::listen(socket.number(), 128) != 0) {
    throw std::runtime_error("cannot listen on the loopback address");
  }
  return socket;
}

/// Whether no socket of this process has had the port before.
bool isNewPort(int port) {
  static std::mutex mutex;
  static std::set<int> known;
  const std::lock_guard lock(mutex);
  return known.insert(port).second;
}

}  // namespace

void Descriptor::close() {
  if (const int number = std::exchange(_number, -1); number >= 0) {
    ::close(number);
  }
}

Descriptor listeningSocket(int port) {
  if (port != 0) {
    return socketOnPort(port);
  }
  Descriptor socket = socketOnPort(0);
  while (!isNewPort(portOfSocket(socket))) {
    socket = socketOnPort(0);
  }
  return socket;
}

int portOfSocket(const Descriptor& socket) {
  sockaddr_in address{};
  socklen_t length = sizeof address;
  ::getsockname(socket.number(), reinterpret_cast<sockaddr*>(&address), &length);
  return ntohs(address.sin_port);
}

int freePort() { return portOfSocket(listeningSocket()); }

Descriptor connectedSocket(int port) {
  Descriptor socket(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_in address = loopbackAddress(port);
  if (::connect(socket.number(), reinterpret_cast<const sockaddr*>(&address), sizeof address) !=
      0) {
    socket.close();
  }
  return socket;
}

bool sendAll(const Descriptor& socket, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = ::send(socket.number(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (count < 0) {
      return false;
    }
    bytes.remove_prefix(static_cast<size_t>(count));
  }
  return true;
}

std::string plainExchange(int port, std::string_view request) {
  const Descriptor socket = connectedSocket(port);
  if (!sendAll(socket, request)) {
    return {};
  }
  std::string answer;
  char buffer[4096];
  ssize_t count = 0;
  while ((count = ::recv(socket.number(), buffer, sizeof buffer, 0)) > 0) {
    answer.append(buffer, static_cast<size_t>(count));
  }
  return answer;
}

}  // namespace tests
