// What URL sessions keep to themselves. Private to them and their tasks.
#pragma once

#include <map>
#include <memory>

#include "platform/ThreadSafety.h"
#include "platform/URLSession.h"

namespace platform {

class CookieJar;

/// Thread-safety: internally synchronised.
struct URLSession::Implementation {
  Implementation(URLSessionConfiguration settings, std::shared_ptr<URLSessionDelegate> listener,
                 std::shared_ptr<DispatchQueue> queue);

  /// Counts a task that starts; false when the session takes none any more.
  bool admit(const std::shared_ptr<URLSessionDataTask>& task);
  /// On the delegate queue, after the completion was told.
  void taskDidComplete(const std::shared_ptr<URLSession>& session, const URLSessionDataTask& task);
  /// Tells the delegate, and lets it go, once nothing is left to do.
  void becomeInvalidIfDone(const std::shared_ptr<URLSession>& session);

  const URLSessionConfiguration configuration;
  const std::shared_ptr<DispatchQueue> delegateQueue;
  const std::shared_ptr<CookieJar> cookies;
  bool isShared = false;

  mutable Mutex mutex;
  std::shared_ptr<URLSessionDelegate> delegate GUARDED_BY(mutex);
  std::map<const URLSessionDataTask*, std::shared_ptr<URLSessionDataTask>> running
      GUARDED_BY(mutex);
  uint64_t lastIdentifier GUARDED_BY(mutex) = 0;
  bool finishing GUARDED_BY(mutex) = false;
  bool invalid GUARDED_BY(mutex) = false;
};

}  // namespace platform
