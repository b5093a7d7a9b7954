#include "tests/support/ScriptedServer.h"

#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <condition_variable>
#include <list>
#include <mutex>
#include <stdexcept>
#include <thread>

#include "tests/support/Latch.h"
#include "tests/support/Sockets.h"

namespace tests {

namespace {

std::string_view trimmed(std::string_view text) {
  while (!text.empty() && (text.back() == '\r' || text.back() == ' ')) {
    text.remove_suffix(1);
  }
  while (!text.empty() && text.front() == ' ') {
    text.remove_prefix(1);
  }
  return text;
}

ScriptedRequest parsedRequest(std::string_view head) {
  ScriptedRequest request;
  const std::string_view first = head.substr(0, head.find("\r\n"));
  const size_t space = first.find(' ');
  request.method = first.substr(0, space);
  if (space != std::string_view::npos) {
    const std::string_view rest = first.substr(space + 1);
    request.target = rest.substr(0, rest.find(' '));
  }
  while (!head.empty()) {
    const size_t end = std::min(head.find('\n'), head.size());
    const std::string_view line = head.substr(0, end);
    head.remove_prefix(std::min(end + 1, head.size()));
    if (const size_t colon = line.find(':'); colon != std::string_view::npos && line != first) {
      request.headerFields[std::string(line.substr(0, colon))] = trimmed(line.substr(colon + 1));
    }
  }
  return request;
}

class Connection : public ScriptedConnection {
 public:
  Connection(Descriptor socket, size_t number) : _socket(std::move(socket)), _number(number) {}

  std::optional<ScriptedRequest> nextRequest() {
    while (true) {
      if (const size_t end = _received.find("\r\n\r\n"); end != std::string::npos) {
        ScriptedRequest request = parsedRequest(std::string_view(_received).substr(0, end));
        request.connection = _number;
        _received.erase(0, end + 4);
        return request;
      }
      char buffer[4096];
      const ssize_t count = _ended ? 0 : ::recv(_socket.number(), buffer, sizeof buffer, 0);
      if (count <= 0) {
        return std::nullopt;
      }
      _received.append(buffer, static_cast<size_t>(count));
    }
  }

  bool send(std::string_view bytes) override {
    while (!bytes.empty() && !_ended) {
      const ssize_t count = ::send(_socket.number(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
      if (count < 0) {
        _ended = true;
      } else {
        bytes.remove_prefix(static_cast<size_t>(count));
      }
    }
    return !_ended;
  }

  uint64_t sendFiller(uint64_t length) override {
    const std::string piece(1 << 16, 'z');
    uint64_t sent = 0;
    while (sent < length && !_ended) {
      const size_t wanted = static_cast<size_t>(std::min<uint64_t>(piece.size(), length - sent));
      const ssize_t count = ::send(_socket.number(), piece.data(), wanted, MSG_NOSIGNAL);
      if (count < 0) {
        _ended = true;
      } else {
        sent += static_cast<uint64_t>(count);
      }
    }
    return sent;
  }

  void close() override {
    // Not the descriptor itself: stop() may be about to use its number.
    _ended = true;
    ::shutdown(_socket.number(), SHUT_RDWR);
  }

  void reset() override {
    _ended = true;
    const linger nothing{1, 0};
    ::setsockopt(_socket.number(), SOL_SOCKET, SO_LINGER, &nothing, sizeof nothing);
    // The descriptor is closed, which sends the reset, when the connection's thread is done.
  }

  void waitUntilClientIsGone() override {
    char buffer[4096];
    while (!_ended && ::recv(_socket.number(), buffer, sizeof buffer, 0) > 0) {
    }
    _ended = true;
  }

  /// From any thread: all that goes on here ends.
  void stop() { ::shutdown(_socket.number(), SHUT_RDWR); }

  bool hasEnded() const { return _ended; }

 private:
  const Descriptor _socket;
  const size_t _number;
  std::string _received;
  bool _ended = false;
};

}  // namespace

struct ScriptedServer::Implementation : std::enable_shared_from_this<Implementation> {
  Handler handler;
  Descriptor socket = listeningSocket();
  const int port = portOfSocket(socket);

  mutable std::mutex mutex;
  mutable std::condition_variable changed;
  std::vector<ScriptedRequest> requests;
  std::list<std::shared_ptr<Connection>> connections;
  size_t serving = 0;
  size_t accepted = 0;
  bool stopping = false;
  std::thread acceptor;

  void acceptAll() {
    while (true) {
      Descriptor accepting(::accept4(socket.number(), nullptr, nullptr, SOCK_CLOEXEC));
      const std::lock_guard lock(mutex);
      if (stopping || accepting.number() < 0) {
        return;
      }
      auto connection = std::make_shared<Connection>(std::move(accepting), accepted++);
      connections.push_back(connection);
      ++serving;
      std::thread([self = shared_from_this(), connection] { self->serve(connection); }).detach();
    }
  }

  void serve(std::shared_ptr<Connection> connection) {
    while (!connection->hasEnded()) {
      const std::optional<ScriptedRequest> request = connection->nextRequest();
      if (!request) {
        break;
      }
      {
        const std::lock_guard lock(mutex);
        requests.push_back(*request);
        changed.notify_all();
      }
      handler(*request, *connection);
    }
    const std::lock_guard lock(mutex);
    connections.remove(connection);
    // Closed before anybody hears that it is gone.
    connection.reset();
    --serving;
    changed.notify_all();
  }
};

ScriptedServer::ScriptedServer(Handler handler)
    : _implementation(std::make_shared<Implementation>()) {
  _implementation->handler = std::move(handler);
  _implementation->acceptor =
      std::thread([implementation = _implementation.get()] { implementation->acceptAll(); });
}

std::unique_ptr<ScriptedServer> ScriptedServer::sending(std::string bytes) {
  return std::make_unique<ScriptedServer>(
      [bytes = std::move(bytes)](const ScriptedRequest&, ScriptedConnection& connection) {
        connection.send(bytes);
        connection.close();
      });
}

std::unique_ptr<ScriptedServer> ScriptedServer::routing(std::map<std::string, Handler> handlers) {
  return std::make_unique<ScriptedServer>(
      [handlers = std::move(handlers)](const ScriptedRequest& request,
                                       ScriptedConnection& connection) {
        const auto found = handlers.find(request.target.substr(0, request.target.find('?')));
        if (found == handlers.end()) {
          connection.send(httpAnswer(404, "no such page"));
        } else {
          found->second(request, connection);
        }
      });
}

ScriptedServer::~ScriptedServer() {
  {
    const std::lock_guard lock(_implementation->mutex);
    _implementation->stopping = true;
    for (const auto& connection : _implementation->connections) {
      connection->stop();
    }
  }
  ::shutdown(_implementation->socket.number(), SHUT_RDWR);
  _implementation->acceptor.join();
  std::unique_lock lock(_implementation->mutex);
  _implementation->changed.wait(lock, [&] { return _implementation->serving == 0; });
}

int ScriptedServer::port() const { return _implementation->port; }

std::string ScriptedServer::URL(std::string_view path) const {
  return "http://127.0.0.1:" + std::to_string(port()) + std::string(path);
}

std::vector<ScriptedRequest> ScriptedServer::requests() const {
  const std::lock_guard lock(_implementation->mutex);
  return _implementation->requests;
}

std::vector<ScriptedRequest> ScriptedServer::waitForRequests(size_t count) const {
  std::unique_lock lock(_implementation->mutex);
  if (!_implementation->changed.wait_for(
          lock, patience, [&] { return _implementation->requests.size() >= count; })) {
    throw std::runtime_error("the server was not asked that often");
  }
  return _implementation->requests;
}

size_t ScriptedServer::openConnections() const {
  const std::lock_guard lock(_implementation->mutex);
  return _implementation->connections.size();
}

void ScriptedServer::waitUntilAllClientsAreGone() const {
  std::unique_lock lock(_implementation->mutex);
  if (!_implementation->changed.wait_for(lock, patience,
                                         [&] { return _implementation->connections.empty(); })) {
    throw std::runtime_error("a client holds on to its connection");
  }
}

std::string httpAnswer(int status, std::string_view body, const std::vector<std::string>& fields) {
  std::string answer = "HTTP/1.1 " + std::to_string(status) + " Answer\r\n";
  for (const std::string& field : fields) {
    answer += field + "\r\n";
  }
  if (status != 304 && status != 204) {
    answer += "Content-Length: " + std::to_string(body.size()) + "\r\n";
  }
  return answer + "\r\n" + std::string(body);
}

ScriptedServer::Handler answering(std::string answer) {
  return [answer = std::move(answer)](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send(answer);
  };
}

}  // namespace tests
