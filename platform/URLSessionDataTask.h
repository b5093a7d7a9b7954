// One transfer of a URL session.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "platform/Error.h"
#include "platform/URLRequest.h"
#include "platform/URLResponse.h"

namespace platform {

class URLSession;
class URLSessionTaskCore;

/// A request on its way. Made by URLSession::dataTaskWithRequest; one that was resumed lives until
/// it has completed, others as long as someone holds them.
/// Thread-safety: internally synchronised.
class URLSessionDataTask : public std::enable_shared_from_this<URLSessionDataTask> {
 public:
  enum class State { suspended, running, canceling, completed };

  ~URLSessionDataTask();

  /// Starts it; does nothing on one that was started before.
  void resume();
  /// Ends it with URLErrorCancelled, one that was never resumed as well; does nothing on one that
  /// has completed. When this returns on the delegate queue, the only call still to come is the
  /// completion; on other threads one call may be under way.
  void cancel();

  State state() const;
  /// Counts from 1 in each session.
  uint64_t taskIdentifier() const;
  const URLRequest& originalRequest() const;
  /// The request last followed, or the original one.
  URLRequest currentRequest() const;
  /// Null until one was received.
  std::shared_ptr<const URLResponse> response() const;
  /// Absent until the task has failed.
  std::optional<Error> error() const;
  /// Bytes of the body that came so far, those that wait for the delegate among them.
  uint64_t countOfBytesReceived() const;

  /// Number and URL; what the log shows for "%@".
  std::string description() const;

 private:
  friend class URLSession;
  explicit URLSessionDataTask(std::shared_ptr<URLSessionTaskCore> core);

  const std::shared_ptr<URLSessionTaskCore> _core;
};

}  // namespace platform
