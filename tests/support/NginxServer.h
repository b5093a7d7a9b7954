// A real web server for the ordinary paths.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tests/platform/TemporaryFolder.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TestAuthority.h"

namespace tests {

/// nginx on 127.0.0.1, on a free port, with its own configuration, in its own folder, without
/// privileges. Serves the files that were written to it. Confined to one thread, which must live as
/// long as the server (the kernel ends the server with that thread).
class NginxServer {
 public:
  /// `directives` stand in the server block, beside "location /" for the files: further locations,
  /// headers, redirects. With an identity it speaks https. Throws std::runtime_error when the
  /// server does not come up.
  explicit NginxServer(std::string directives = {},
                       std::optional<TestAuthority::Identity> identity = std::nullopt);
  ~NginxServer();

  int port() const { return _port; }
  /// "http://127.0.0.1:PORT" and the path, which begins with a slash.
  std::string URL(std::string_view path) const;

  /// Writes a served file, with its parent folders, in one step.
  void write(const std::string& name, std::string_view content) const;
  void remove(const std::string& name) const;
  /// Sets the time that the server gives as Last-Modified, in seconds since 1970.
  void setModified(const std::string& name, long seconds) const;
  /// The folder that is served.
  std::string folder() const { return _folder.path("files"); }
  /// A file outside it, for directives to name (passwords): gives its path.
  std::string writePrivate(const std::string& name, std::string_view content) const;

  /// Afterwards nobody listens on the port.
  void stop();
  /// Starts again, on the same port.
  void start();

  /// One line for each request that was answered, oldest first: "METHOD PATH STATUS BYTES", BYTES
  /// being those of the body that was sent. A line is written just after its answer was sent: wait
  /// for it.
  std::vector<std::string> accessLog() const;
  /// Waits until the log has `count` lines, and gives it; throws when it never has.
  std::vector<std::string> waitForAccessLog(size_t count) const;

 private:
  bool _tryToStart();
  std::string _configuration() const;

  TemporaryFolder _folder;
  const std::string _directives;
  const std::optional<TestAuthority::Identity> _identity;
  int _port = 0;
  std::unique_ptr<ChildProcess> _process;
};

/// The line of a password file for basic authentication.
std::string nginxPasswordLine(const std::string& user, const std::string& password);

}  // namespace tests
