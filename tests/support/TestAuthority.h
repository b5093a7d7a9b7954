// Certificates that only tests trust.
#pragma once

#include <string>

#include "tests/platform/TemporaryFolder.h"

namespace tests {

/// A certificate authority in a temporary folder, and certificates for servers, made with the
/// openssl command. Thread-safety: immutable.
class TestAuthority {
 public:
  /// One authority a test program: making keys takes time.
  static const TestAuthority& shared();

  TestAuthority();

  /// A certificate and its key, as files (PEM).
  struct Identity {
    std::string certificateFile;
    std::string keyFile;
  };

  /// What a client has to trust.
  const std::string& certificateFile() const { return _authority.certificateFile; }

  /// For localhost and 127.0.0.1.
  const Identity& serverIdentity() const { return _server; }
  /// The same, of yesterday.
  const Identity& expiredIdentity() const { return _expired; }
  /// For another host.
  const Identity& foreignIdentity() const { return _foreign; }

 private:
  Identity _issue(const std::string& name, const std::string& alternativeNames, int days) const;

  TemporaryFolder _folder;
  Identity _authority;
  Identity _server;
  Identity _expired;
  Identity _foreign;
};

}  // namespace tests
