// One exchange with a web server: a request, the head of an answer, its body. Private to
// HTTPLoader.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "platform/Clock.h"
#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/URLRequest.h"
#include "platform/URLResponse.h"

namespace platform {

class CookieJar;
class TransferThread;

/// What goes for all exchanges of one task.
struct HTTPTransferSettings {
  /// The clock of all its time-outs.
  std::shared_ptr<Clock> clock;
  /// When the task as a whole must be over.
  Clock::Instant resourceDeadline{0};
  uint64_t maximumBodyLength = 0;
  /// Certificates to trust in place of the system's.
  std::optional<std::string> authorityFile;
  /// Null where no cookies are kept.
  std::shared_ptr<CookieJar> cookies;
};

/// Hears of an exchange, on the transfer thread: it must not block and must not throw.
class HTTPTransferClient {
 public:
  virtual ~HTTPTransferClient() = default;

  virtual void transferDidReceiveResponse(const std::shared_ptr<const URLResponse>& response) = 0;
  virtual void transferDidReceiveData(const Data& data) = 0;
  /// The last call: without error when the answer has come whole.
  virtual void transferDidEnd(const std::optional<Error>& error) = 0;
};

/// An exchange over libcurl. Follows no redirects and knows no cache. Everything but the public
/// calls is confined to the transfer thread.
///
/// The head must be complete within the request's time-out, and each piece of the body must come
/// within it after the one before; the time for which the client holds the transfer back does not
/// count, nor does the time for which it waits for its turn with the server.
class HTTPTransfer : public std::enable_shared_from_this<HTTPTransfer> {
 public:
  /// More of a head than this is no honest server's.
  static constexpr size_t maximumHeadLength = size_t{256} << 10;

  HTTPTransfer(URLRequest request, HTTPTransferSettings settings,
               std::shared_ptr<HTTPTransferClient> client);
  ~HTTPTransfer();
  HTTPTransfer(const HTTPTransfer&) = delete;
  HTTPTransfer& operator=(const HTTPTransfer&) = delete;

  // From any thread. What start() leads to comes later, on the transfer thread.
  void start();
  /// The client hears nothing more, but for a call that is under way. Before start(), nothing will
  /// come of that.
  void cancel();
  /// No data is delivered from the next piece on, until resume() was called as often; the
  /// connection waits.
  void suspend();
  void resume();

 private:
  friend class TransferThread;
  struct Exchange;

  const URLRequest _request;
  const HTTPTransferSettings _settings;
  std::atomic<bool> _cancelled{false};
  /// Taken back on the transfer thread alone, where the time-out begins anew with that.
  std::atomic<int> _holds{0};
  // Confined to the transfer thread.
  std::shared_ptr<HTTPTransferClient> _client;
  std::unique_ptr<Exchange> _exchange;
};

}  // namespace platform
