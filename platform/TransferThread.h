// The thread on which libcurl works. Private to HTTPTransfer.
#pragma once

#include <curl/curl.h>

#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/HTTPTransfer.h"
#include "platform/ThreadSafety.h"

namespace platform {

/// Runs all transfers of the process, side by side, on one thread of its own named "url-transport",
/// which is started when first needed and lives as long as the process. With one server (scheme,
/// host and port) no more than URLSession::maximumConnectionsPerHost go on at a time.
///
/// It waits for sockets, so its waits are not announced to a simulated clock as those of sleepers;
/// it hears of the clock's leaps.
class TransferThread {
 public:
  static TransferThread& shared();

  // From any thread.
  void start(std::shared_ptr<HTTPTransfer> transfer);
  void cancel(std::shared_ptr<HTTPTransfer> transfer);
  void resume(std::shared_ptr<HTTPTransfer> transfer);

 private:
  using Command = std::function<void()>;
  class LeapListener;

  /// Transfers with one server.
  struct Server {
    int running = 0;
    std::deque<std::shared_ptr<HTTPTransfer>> waiting;
  };

  TransferThread();
  void _perform(Command command);
  void _run();
  void _runCommands();
  void _takeOn(const std::shared_ptr<HTTPTransfer>& transfer);
  void _begin(const std::shared_ptr<HTTPTransfer>& transfer);
  /// Ends it for libcurl and for its server, which may take on the next one.
  void _release(const std::shared_ptr<HTTPTransfer>& transfer);
  void _forget(const std::shared_ptr<HTTPTransfer>& transfer);
  void _tellEnd(const std::shared_ptr<HTTPTransfer>& transfer, const std::optional<Error>& error);
  void _collectFinished();
  /// Ends what is overdue; returns how many milliseconds the next deadline is away.
  int _enforceDeadlines();

  CURLM* const _multi;
  const std::shared_ptr<LeapListener> _listener;
  Mutex _mutex;
  std::vector<Command> _commands GUARDED_BY(_mutex);

  // Confined to the thread.
  std::map<CURL*, std::shared_ptr<HTTPTransfer>> _running;
  std::map<std::string, Server> _servers;
};

}  // namespace platform
