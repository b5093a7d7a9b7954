// Sockets on the loopback address.
#pragma once

#include <string>
#include <string_view>
#include <utility>

namespace tests {

/// A file descriptor that is closed in the end.
class Descriptor {
 public:
  Descriptor() = default;
  explicit Descriptor(int number) : _number(number) {}
  Descriptor(Descriptor&& other) noexcept : _number(std::exchange(other._number, -1)) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    std::swap(_number, other._number);
    return *this;
  }
  ~Descriptor() { close(); }

  int number() const { return _number; }
  void close();

 private:
  int _number = -1;
};

/// A socket that listens on 127.0.0.1; on a free port when `port` is 0, never on one that this
/// process had before: what is known of a URL must not be taken for another server's. Throws
/// std::runtime_error when it cannot be had.
Descriptor listeningSocket(int port = 0);

/// The port that a socket is bound to.
int portOfSocket(const Descriptor& socket);

/// A port that was free a moment ago.
int freePort();

/// A socket connected to the port; it has no number when nobody listens.
Descriptor connectedSocket(int port);

/// Sends all of the bytes; false when the other end is gone.
bool sendAll(const Descriptor& socket, std::string_view bytes);

/// Sends one request with plain sockets and gives the whole answer, up to the connection's end;
/// empty when nobody listens.
std::string plainExchange(int port, std::string_view request);

}  // namespace tests
