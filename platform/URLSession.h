// Transfers from web servers.
#pragma once

#include <functional>
#include <memory>
#include <optional>

#include "platform/Data.h"
#include "platform/DispatchQueue.h"
#include "platform/Error.h"
#include "platform/URLCache.h"
#include "platform/URLRequest.h"
#include "platform/URLResponse.h"
#include "platform/URLSessionConfiguration.h"
#include "platform/URLSessionDataTask.h"

namespace platform {

class URLSession;

enum class URLSessionResponseDisposition { cancel, allow };

/// Hears of the progress of a session's tasks, on the session's delegate queue, one call at a time.
///
/// The calls of one task come in this order: any number of redirects; the response; whether to
/// cache, if the answer may be cached; pieces of the body; the completion. A transfer that fails
/// goes to the completion from wherever it is, and so does a cancelled one.
///
/// Calls that hand over a completion handler stop the task until the handler is called, once, at
/// any time and from any thread; further calls do nothing, and a handler that is dropped uncalled
/// cancels the task. What a call throws is logged at level 0.
class URLSessionDelegate {
 public:
  virtual ~URLSessionDelegate() = default;

  /// A server points elsewhere, and may be followed there (else the task fails). Absent means not
  /// to follow: the redirect's own response and body are the answer.
  using RedirectHandler = std::function<void(std::optional<URLRequest> request)>;
  virtual void URLSessionTaskWillPerformHTTPRedirection(
      const std::shared_ptr<URLSession>& session, const std::shared_ptr<URLSessionDataTask>& task,
      const std::shared_ptr<const URLResponse>& response, const URLRequest& newRequest,
      const RedirectHandler& completionHandler);

  using DispositionHandler = std::function<void(URLSessionResponseDisposition disposition)>;
  virtual void URLSessionDataTaskDidReceiveResponse(
      const std::shared_ptr<URLSession>& session,
      const std::shared_ptr<URLSessionDataTask>& dataTask,
      const std::shared_ptr<const URLResponse>& response,
      const DispositionHandler& completionHandler);

  /// Asked before the body comes, so the proposed response has no data yet: what the handler is
  /// given is stored, with the body, once that has come whole. Null means not to store.
  using CacheHandler = std::function<void(std::shared_ptr<const CachedURLResponse> cachedResponse)>;
  virtual void URLSessionDataTaskWillCacheResponse(
      const std::shared_ptr<URLSession>& session,
      const std::shared_ptr<URLSessionDataTask>& dataTask,
      const std::shared_ptr<const CachedURLResponse>& proposedResponse,
      const CacheHandler& completionHandler);

  virtual void URLSessionDataTaskDidReceiveData(const std::shared_ptr<URLSession>& session,
                                                const std::shared_ptr<URLSessionDataTask>& dataTask,
                                                const Data& data);

  /// The last call of a task, which comes exactly once; without error when the body came whole,
  /// whatever the status.
  virtual void URLSessionTaskDidCompleteWithError(const std::shared_ptr<URLSession>& session,
                                                  const std::shared_ptr<URLSessionDataTask>& task,
                                                  const std::optional<Error>& error);

  /// The last call of a session, after which it lets the delegate go.
  virtual void URLSessionDidBecomeInvalidWithError(const std::shared_ptr<URLSession>& session,
                                                   const std::optional<Error>& error);
};

/// A group of transfers with common settings, delegate and queue.
///
/// Speaks http and https (HTTP/1.1), verified against the system's certificates; follows up to 20
/// redirects, none of them from https to http; undoes content encodings. Never holds more of a body
/// than URLProtocol::backlogLimit and what the network hands over at once for a delegate that is
/// slow: the connection waits. A task with a completion handler collects its body, up to the
/// configuration's limit.
///
/// Time-outs go by the clock that the environment has when a task is resumed. What the clock does
/// not govern: the looking up of host names, which is the system's, though a task whose time is
/// over does not wait for its end; and how long idle connections are kept for later use.
///
/// Thread-safety: internally synchronised.
class URLSession : public std::enable_shared_from_this<URLSession> {
 public:
  static constexpr int maximumRedirects = 20;
  /// Transfers that go on with one server at a time; further ones wait, and their time-out with
  /// them.
  static constexpr int maximumConnectionsPerHost = 6;

  /// One a process, with the default configuration, no delegate, and a queue of its own. Cannot be
  /// invalidated.
  static std::shared_ptr<URLSession> sharedSession();

  /// Without delegate, tasks do what suits most: follow, allow, cache. `delegateQueue` is a serial
  /// queue, such as DispatchQueue::main(); without one the session makes its own. The session keeps
  /// the delegate until it is invalid.
  static std::shared_ptr<URLSession> sessionWithConfiguration(
      URLSessionConfiguration configuration, std::shared_ptr<URLSessionDelegate> delegate = nullptr,
      std::shared_ptr<DispatchQueue> delegateQueue = nullptr);
  ~URLSession();

  /// What a task brought: without error a response and data, which is empty (not absent) for an
  /// empty body; with one, neither.
  using CompletionHandler =
      std::function<void(std::optional<Data> data, std::shared_ptr<const URLResponse> response,
                         std::optional<Error> error)>;

  /// A task that starts when it is resumed. Null once the session was told to become invalid.
  std::shared_ptr<URLSessionDataTask> dataTaskWithRequest(URLRequest request);
  /// As above. The handler is called once, on the delegate queue, in place of the delegate, which
  /// hears nothing of this task.
  std::shared_ptr<URLSessionDataTask> dataTaskWithRequest(URLRequest request,
                                                          CompletionHandler completionHandler);

  /// Takes no new tasks; becomes invalid when those that were resumed have completed.
  void finishTasksAndInvalidate();
  /// The same, and cancels them.
  void invalidateAndCancel();

  const URLSessionConfiguration& configuration() const;
  std::shared_ptr<URLSessionDelegate> delegate() const;
  const std::shared_ptr<DispatchQueue>& delegateQueue() const;

 private:
  friend class URLSessionTaskCore;
  struct Implementation;
  explicit URLSession(std::unique_ptr<Implementation> implementation);

  const std::unique_ptr<Implementation> _implementation;
};

}  // namespace platform
