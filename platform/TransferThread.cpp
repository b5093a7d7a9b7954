#include "platform/TransferThread.h"

#include <algorithm>
#include <cmath>
#include <mutex>
#include <utility>

#include "platform/HTTPTransferExchange.h"
#include "platform/URLOrigin.h"
#include "platform/URLSession.h"
#include "platform/WorkerThreads.h"

namespace platform {

namespace {

/// A deadline may be further away than a wait can be long; it is looked at again then.
constexpr int longestWait = 3600 * 1000;

}  // namespace

class TransferThread::LeapListener : public ClockListener {
 public:
  explicit LeapListener(CURLM* multi) : _multi(multi) {}
  void clockMoved() noexcept override { curl_multi_wakeup(_multi); }

 private:
  CURLM* const _multi;
};

TransferThread& TransferThread::shared() {
  // Never destroyed: the thread goes on while the process ends.
  static TransferThread& thread = []() -> TransferThread& {
    curl_global_init(CURL_GLOBAL_DEFAULT);
    auto& created = *new TransferThread;
    startNamedThread("url-transport", [&created] { created._run(); });
    return created;
  }();
  return thread;
}

TransferThread::TransferThread()
    : _multi(curl_multi_init()), _listener(std::make_shared<LeapListener>(_multi)) {}

void TransferThread::_perform(Command command) {
  {
    const MutexLock lock(_mutex);
    _commands.push_back(std::move(command));
  }
  curl_multi_wakeup(_multi);
}

void TransferThread::start(std::shared_ptr<HTTPTransfer> transfer) {
  transfer->_settings.clock->addListener(_listener);
  _perform([this, transfer = std::move(transfer)] { _takeOn(transfer); });
}

void TransferThread::cancel(std::shared_ptr<HTTPTransfer> transfer) {
  _perform([this, transfer = std::move(transfer)] { _forget(transfer); });
}

void TransferThread::resume(std::shared_ptr<HTTPTransfer> transfer) {
  _perform([transfer = std::move(transfer)] {
    if (--transfer->_holds == 0 && transfer->_exchange != nullptr) {
      transfer->_exchange->goOn();
    }
  });
}

void TransferThread::_run() {
  while (true) {
    _runCommands();
    int running = 0;
    curl_multi_perform(_multi, &running);
    _collectFinished();
    const int wait = _enforceDeadlines();
    curl_multi_poll(_multi, nullptr, 0, wait, nullptr);
  }
}

void TransferThread::_runCommands() {
  std::vector<Command> commands;
  {
    const MutexLock lock(_mutex);
    commands.swap(_commands);
  }
  for (const Command& command : commands) {
    command();
  }
}

void TransferThread::_takeOn(const std::shared_ptr<HTTPTransfer>& transfer) {
  if (transfer->_cancelled) {
    transfer->_client.reset();
    return;
  }
  Server& server = _servers[originOfURL(transfer->_request.URL())];
  if (server.running < URLSession::maximumConnectionsPerHost) {
    ++server.running;
    _begin(transfer);
  } else {
    server.waiting.push_back(transfer);
  }
}

void TransferThread::_begin(const std::shared_ptr<HTTPTransfer>& transfer) {
  transfer->_exchange = std::make_unique<HTTPTransfer::Exchange>(*transfer);
  _running[transfer->_exchange->handle] = transfer;
  if (curl_multi_add_handle(_multi, transfer->_exchange->handle) != CURLM_OK) {
    _tellEnd(transfer, URLError(URLErrorUnknown, "no transfer could be set up"));
  }
}

void TransferThread::_release(const std::shared_ptr<HTTPTransfer>& transfer) {
  curl_multi_remove_handle(_multi, transfer->_exchange->handle);
  _running.erase(transfer->_exchange->handle);
  transfer->_exchange.reset();
  const auto server = _servers.find(originOfURL(transfer->_request.URL()));
  --server->second.running;
  if (!server->second.waiting.empty()) {
    const std::shared_ptr<HTTPTransfer> next = std::move(server->second.waiting.front());
    server->second.waiting.pop_front();
    ++server->second.running;
    _begin(next);
  } else if (server->second.running == 0) {
    _servers.erase(server);
  }
}

void TransferThread::_forget(const std::shared_ptr<HTTPTransfer>& transfer) {
  if (transfer->_exchange != nullptr) {
    _release(transfer);
  } else if (const auto server = _servers.find(originOfURL(transfer->_request.URL()));
             server != _servers.end()) {
    auto& waiting = server->second.waiting;
    waiting.erase(std::remove(waiting.begin(), waiting.end(), transfer), waiting.end());
  }
  transfer->_client.reset();
}

void TransferThread::_tellEnd(const std::shared_ptr<HTTPTransfer>& transfer,
                              const std::optional<Error>& error) {
  _release(transfer);
  const std::shared_ptr<HTTPTransferClient> client = std::exchange(transfer->_client, nullptr);
  if (client != nullptr && !transfer->_cancelled) {
    client->transferDidEnd(error);
  }
}

void TransferThread::_collectFinished() {
  int left = 0;
  while (const CURLMsg* message = curl_multi_info_read(_multi, &left)) {
    const auto found = _running.find(message->easy_handle);
    if (message->msg != CURLMSG_DONE || found == _running.end()) {
      continue;
    }
    // The message is gone once its handle is.
    const CURLcode code = message->data.result;
    const std::shared_ptr<HTTPTransfer> transfer = found->second;
    _tellEnd(transfer, transfer->_exchange->outcome(code));
  }
}

int TransferThread::_enforceDeadlines() {
  std::vector<std::shared_ptr<HTTPTransfer>> overdue;
  std::vector<std::shared_ptr<HTTPTransfer>> overdueWaiting;
  int wait = longestWait;
  const auto consider = [&](const std::shared_ptr<HTTPTransfer>& transfer, Clock::Instant deadline,
                            std::vector<std::shared_ptr<HTTPTransfer>>& late) {
    const Clock& clock = *transfer->_settings.clock;
    if (clock.elapsed() >= deadline) {
      late.push_back(transfer);
    } else if (const std::optional<Seconds> left = clock.realTimeUntil(deadline)) {
      const double milliseconds = std::ceil(left->count() * 1000);
      wait = milliseconds < wait ? std::max(1, static_cast<int>(milliseconds)) : wait;
    }
  };
  for (const auto& entry : _running) {
    if (const auto deadline = entry.second->_exchange->deadline()) {
      consider(entry.second, *deadline, overdue);
    }
  }
  for (const auto& server : _servers) {
    for (const auto& transfer : server.second.waiting) {
      consider(transfer, transfer->_settings.resourceDeadline, overdueWaiting);
    }
  }
  const Error error = URLError(URLErrorTimedOut);
  for (const auto& transfer : overdueWaiting) {
    const std::shared_ptr<HTTPTransferClient> client = transfer->_client;
    _forget(transfer);
    if (client != nullptr && !transfer->_cancelled) {
      client->transferDidEnd(error);
    }
  }
  for (const auto& transfer : overdue) {
    _tellEnd(transfer, error);
  }
  // Whoever took the place of one that ended has not begun yet, and its deadline is not counted.
  return overdue.empty() ? wait : 0;
}

}  // namespace platform
