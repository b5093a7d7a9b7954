// What is behind a task of a URL session. Private to sessions and their tasks.
#pragma once

#include <atomic>
#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "platform/HTTPTransfer.h"
#include "platform/ThreadSafety.h"
#include "platform/URLProtocol.h"
#include "platform/URLSession.h"

namespace platform {

/// A task in the midst of its work. What protocols tell becomes steps, which run one after the
/// other on the delegate queue; a step that asks the delegate something holds up those behind it.
/// Thread-safety: internally synchronised.
class URLSessionTaskCore : public URLProtocolClient,
                           public std::enable_shared_from_this<URLSessionTaskCore> {
 public:
  using Step = std::function<void()>;
  class Reply;

  URLSessionTaskCore(std::shared_ptr<URLSession> owner, uint64_t number, URLRequest request,
                     URLSession::CompletionHandler handler);

  void start(const std::shared_ptr<URLSessionDataTask>& self);
  void cancel(const std::shared_ptr<URLSessionDataTask>& self);

  void URLProtocolWasRedirectedToRequest(
      URLProtocol& protocol, const URLRequest& newRequest,
      const std::shared_ptr<const URLResponse>& redirectResponse) override;
  void URLProtocolDidReceiveResponse(URLProtocol& protocol,
                                     const std::shared_ptr<const URLResponse>& response,
                                     URLCacheStoragePolicy cacheStoragePolicy) override;
  void URLProtocolDidLoadData(URLProtocol& protocol, const Data& data) override;
  void URLProtocolDidFinishLoading(URLProtocol& protocol) override;
  void URLProtocolDidFailWithError(URLProtocol& protocol, const Error& error) override;

  // Loading: one at a time, on the queue `loads`.
  void load(URLRequest request);
  std::shared_ptr<URLProtocol> protocolForRequest(const URLRequest& request);
  void stopProtocol(std::shared_ptr<URLProtocol> stopped);
  URLRequest requestToLoad(URLRequest request) const;

  // Steps: on the delegate queue.
  /// `length` bytes of the body come with the step.
  void addStep(const URLProtocol& teller, uint64_t length, Step step);
  void schedulePump() REQUIRES(mutex);
  void pump();
  void takeRedirect(const URLRequest& newRequest,
                    const std::shared_ptr<const URLResponse>& redirectResponse);
  void follow(const URLRequest& request);
  void takeResponse(const std::shared_ptr<const URLResponse>& received,
                    URLCacheStoragePolicy policy);
  void considerCaching(const std::shared_ptr<const URLResponse>& received,
                       URLCacheStoragePolicy policy);
  void takeData(const Data& data);
  void collectForCache(const Data& data);
  void takeEnd();
  void complete(std::optional<Error> outcome);

  /// From now on no step runs until the reply was given, or the task is cancelled.
  std::shared_ptr<Reply> awaitReply();
  void takeReply(uint64_t number, Step step);
  /// Makes the protocol hold back, or go on, as the backlog asks for.
  void adjustFlow();

  std::shared_ptr<URLSessionDelegate> delegateOfTask() const;
  std::shared_ptr<URLSession> sessionOfTask() const;
  std::shared_ptr<URLSessionDataTask> selfOfTask() const;

  const uint64_t identifier;
  const URLRequest original;
  const URLSessionConfiguration configuration;
  const std::shared_ptr<DispatchQueue> delegateQueue;
  const std::shared_ptr<CookieJar> cookies;
  const std::shared_ptr<DispatchQueue> loads;

  /// Held over asking a protocol to hold back or to go on; comes before the other.
  Monitor flow;
  bool heldBack GUARDED_BY(flow) = false;

  mutable Mutex mutex;
  URLSessionDataTask::State state GUARDED_BY(mutex) = URLSessionDataTask::State::suspended;
  URLRequest current GUARDED_BY(mutex);
  std::shared_ptr<const URLResponse> response GUARDED_BY(mutex);
  std::optional<Error> error GUARDED_BY(mutex);
  uint64_t received GUARDED_BY(mutex) = 0;
  std::shared_ptr<URLProtocol> protocol GUARDED_BY(mutex);
  std::deque<Step> steps GUARDED_BY(mutex);
  bool pumping GUARDED_BY(mutex) = false;
  bool waiting GUARDED_BY(mutex) = false;
  uint64_t replyNumber GUARDED_BY(mutex) = 0;
  uint64_t backlog GUARDED_BY(mutex) = 0;
  /// From the start to the completion: who let go of a task that runs has not stopped it.
  std::shared_ptr<URLSessionDataTask> self GUARDED_BY(mutex);
  /// Up to the completion.
  std::shared_ptr<URLSession> session GUARDED_BY(mutex);
  HTTPTransferSettings transferSettings GUARDED_BY(mutex);

  // Confined to the delegate queue.
  URLSession::CompletionHandler completionHandler;
  const bool hasCompletionHandler;
  int redirects = 0;
  bool hasResponse = false;
  uint64_t delivered = 0;
  std::string body;
  std::shared_ptr<URLCache> cache;
  std::shared_ptr<const CachedURLResponse> toBeCached;
  std::string collected;
};

/// A question to the delegate. Dropped without an answer, it cancels the task.
/// Thread-safety: internally synchronised.
class URLSessionTaskCore::Reply {
 public:
  Reply(std::shared_ptr<URLSessionTaskCore> task, uint64_t number)
      : _task(std::move(task)), _number(number) {}
  ~Reply();
  Reply(const Reply&) = delete;
  Reply& operator=(const Reply&) = delete;

  /// What goes on in the task's next step; later answers are not heard.
  void give(Step step);

 private:
  const std::shared_ptr<URLSessionTaskCore> _task;
  const uint64_t _number;
  std::atomic<bool> _given{false};
};

}  // namespace platform
