// A web server that misbehaves to order.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/HTTPHeaderFields.h"

namespace tests {

/// The head of a request as a ScriptedServer received it.
struct ScriptedRequest {
  std::string method;
  /// Path and query.
  std::string target;
  platform::HTTPHeaderFields headerFields;
  /// Which connection it came on, counted from 0.
  size_t connection = 0;

  std::optional<std::string> header(std::string_view name) const {
    return platform::valueForHTTPHeaderField(headerFields, name);
  }
};

/// The server's end of one connection. Calls on a connection that has ended do nothing and give
/// false. Confined to the handler's thread.
class ScriptedConnection {
 public:
  virtual ~ScriptedConnection() = default;

  /// Sends all of the bytes, waiting as long as the client takes none; false once it is gone.
  virtual bool send(std::string_view bytes) = 0;
  /// Sends `length` bytes 'z' as quickly as they are taken; returns how many were.
  virtual uint64_t sendFiller(uint64_t length) = 0;
  /// Ends the connection properly.
  virtual void close() = 0;
  /// Ends it with a reset.
  virtual void reset() = 0;
  /// Waits until the client has ended it, or the server is being stopped.
  virtual void waitUntilClientIsGone() = 0;
};

/// A server on 127.0.0.1, on a free port, that does with each request what a handler does: sends
/// whatever bytes it likes, waits for what it likes. Each connection has a thread; a handler that
/// returns without having ended the connection gets the next request on it. Thread-safety:
/// internally synchronised.
class ScriptedServer {
 public:
  using Handler = std::function<void(const ScriptedRequest&, ScriptedConnection&)>;

  explicit ScriptedServer(Handler handler);
  /// A server that sends the same bytes in answer to every request, then ends the connection.
  static std::unique_ptr<ScriptedServer> sending(std::string bytes);
  /// A server with a handler for each path (without query), and 404 for others.
  static std::unique_ptr<ScriptedServer> routing(std::map<std::string, Handler> handlers);

  /// Ends all connections and waits for the handlers: what they wait for must be over.
  ~ScriptedServer();
  ScriptedServer(const ScriptedServer&) = delete;
  ScriptedServer& operator=(const ScriptedServer&) = delete;

  int port() const;
  std::string URL(std::string_view path) const;

  /// All that were received so far.
  std::vector<ScriptedRequest> requests() const;
  /// Waits for that many requests, and gives them; throws std::runtime_error when they never come.
  std::vector<ScriptedRequest> waitForRequests(size_t count) const;
  /// Connections that the clients have not ended yet.
  size_t openConnections() const;
  /// Waits until there is none; throws when that never is.
  void waitUntilAllClientsAreGone() const;

 private:
  struct Implementation;
  const std::shared_ptr<Implementation> _implementation;
};

/// A complete answer with a Content-Length. `fields` are whole lines without line ends.
std::string httpAnswer(int status, std::string_view body,
                       const std::vector<std::string>& fields = {});

/// A handler that sends that answer and keeps the connection.
ScriptedServer::Handler answering(std::string answer);

}  // namespace tests
