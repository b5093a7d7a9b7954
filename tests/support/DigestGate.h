// A server's side of digest authentication (RFC 7616), which believes nobody.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "tests/support/ScriptedServer.h"

namespace tests {

/// Knows one user. Thread-safety: immutable.
class DigestGate {
 public:
  /// `algorithm` is "MD5" or "SHA-256".
  DigestGate(std::string algorithm, std::string user, std::string password)
      : _algorithm(std::move(algorithm)), _user(std::move(user)), _password(std::move(password)) {}

  /// Whether the request proves that its sender knows the password.
  bool admits(const ScriptedRequest& request) const;
  /// The answer to all others.
  std::string refusal() const;
  /// Lets those pass who may.
  ScriptedServer::Handler before(ScriptedServer::Handler handler) const;

 private:
  std::string _digest(std::string_view text) const;

  const std::string _algorithm;
  const std::string _user;
  const std::string _password;
};

}  // namespace tests
