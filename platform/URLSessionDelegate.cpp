#include "platform/URLSession.h"

namespace platform {

void URLSessionDelegate::URLSessionTaskWillPerformHTTPRedirection(
    const std::shared_ptr<URLSession>&, const std::shared_ptr<URLSessionDataTask>&,
    const std::shared_ptr<const URLResponse>&, const URLRequest& newRequest,
    const RedirectHandler& completionHandler) {
  completionHandler(newRequest);
}

void URLSessionDelegate::URLSessionDataTaskDidReceiveResponse(
    const std::shared_ptr<URLSession>&, const std::shared_ptr<URLSessionDataTask>&,
    const std::shared_ptr<const URLResponse>&, const DispositionHandler& completionHandler) {
  completionHandler(URLSessionResponseDisposition::allow);
}

void URLSessionDelegate::URLSessionDataTaskWillCacheResponse(
    const std::shared_ptr<URLSession>&, const std::shared_ptr<URLSessionDataTask>&,
    const std::shared_ptr<const CachedURLResponse>& proposedResponse,
    const CacheHandler& completionHandler) {
  completionHandler(proposedResponse);
}

void URLSessionDelegate::URLSessionDataTaskDidReceiveData(
    const std::shared_ptr<URLSession>&, const std::shared_ptr<URLSessionDataTask>&, const Data&) {}

void URLSessionDelegate::URLSessionTaskDidCompleteWithError(
    const std::shared_ptr<URLSession>&, const std::shared_ptr<URLSessionDataTask>&,
    const std::optional<Error>&) {}

void URLSessionDelegate::URLSessionDidBecomeInvalidWithError(const std::shared_ptr<URLSession>&,
                                                             const std::optional<Error>&) {}

}  // namespace platform
