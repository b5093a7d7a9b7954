#include "plugin/remote/ZEBAssetDownloadOperation.h"

#include <mutex>
#include <utility>

#include "host/Zebrine/RNXAssetURLProtocol.h"
#include "host/Zebrine/RNXConfig.h"
#include "host/Zebrine/ZEBAuthChallengeHandler.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/URLError.h"
#include "platform/URLProtocol.h"
#include "plugin/remote/ZEBError.h"

namespace {

constexpr platform::Seconds requestTimeout{30.0};
constexpr int assetResourceType = 1;
constexpr int statusOK = 200;

std::optional<platform::URLRequest> assetRequest(const platform::URL& url) {
  auto request = platform::URLRequest::requestWithURL(
      url, platform::URLRequestCachePolicy::useProtocolCachePolicy, requestTimeout);
  if (request) {
    platform::URLProtocol::setProperty(true, RNXAssetURLProtocolRequest, *request);
  }
  return request;
}

}  // namespace

ZEBAssetDownloadOperation::ZEBAssetDownloadOperation(std::shared_ptr<ZEBHelpBook> book,
                                                     std::weak_ptr<ZEBIndexshelf> indexshelf)
    : _book(std::move(book)), _indexshelf(std::move(indexshelf)) {}

void ZEBAssetDownloadOperation::initialize() {
  static std::once_flag initialized;
  std::call_once(initialized, [] {
    const auto handler =
        ZEBAuthChallengeHandler::initWithServiceName(RNXConfig::sharedConfig()->serviceName());
    handler->setResourceType(assetResourceType);
    RNXAssetURLProtocol::registerProtocolWithAuthHandler(handler);
  });
}

std::shared_ptr<ZEBAssetDownloadOperation> ZEBAssetDownloadOperation::initWithBook(
    std::shared_ptr<ZEBHelpBook> book, const std::shared_ptr<ZEBIndexshelf>& indexshelf) {
  initialize();
  return std::shared_ptr<ZEBAssetDownloadOperation>(
      new ZEBAssetDownloadOperation(std::move(book), indexshelf));
}

std::shared_ptr<platform::URLSession> ZEBAssetDownloadOperation::session() const {
  return platform::URLSession::sharedSession();
}

void ZEBAssetDownloadOperation::main() {
  const std::optional<platform::URL> url = remoteURL();
  const std::optional<std::string> path = destinationFilePath();
  if (!url || !path) {
    finishWithError(platform::Error{platform::URLErrorDomain, platform::URLErrorUnknown, {}});
    return;
  }
  const auto files = platform::Environment::current()->files;
  if (files->fileExistsAtPath(*path)) {
    _cachedData.set(files->contentsMappedAtPath(*path));
  }
  const std::optional<platform::URLRequest> made = assetRequest(*url);
  _request.set(made);
  if (!made) {
    finishWithError(zeb_errorWithDomain(platform::URLErrorDomain, platform::URLErrorBadURL,
                                        "Failed to create download task"));
    return;
  }
  ZEBLog(3, "Requesting asset: %@", *made);
  const auto self = std::static_pointer_cast<ZEBAssetDownloadOperation>(shared_from_this());
  // Kept until the task has called for the first time, and no longer than that.
  const auto kept = std::make_shared<std::shared_ptr<ZEBAssetDownloadOperation>>(self);
  const auto download = session()->dataTaskWithRequest(
      *made, [kept, weak = std::weak_ptr(self)](
                 const std::optional<platform::Data>& data,
                 const std::shared_ptr<const platform::URLResponse>& response,
                 std::optional<platform::Error> error) {
        if (const auto operation = weak.lock()) {
          kept->reset();
          operation->_taskDidComplete(data, response, std::move(error));
        }
      });
  _task.set(download);
  download->resume();
  if (isCancelled()) {
    // Cancelled before there was a task to cancel.
    download->cancel();
  }
}

void ZEBAssetDownloadOperation::cancel() {
  ZEBOperation::cancel();
  if (const auto download = task()) {
    download->cancel();
  }
}

void ZEBAssetDownloadOperation::_taskDidComplete(
    const std::optional<platform::Data>& data,
    const std::shared_ptr<const platform::URLResponse>& response,
    std::optional<platform::Error> error) {
  if (isCancelled() || (error && platform::isURLError(*error, platform::URLErrorCancelled))) {
    ZEBLog(3, "Asset Download cancelled: %@", error);
    finishWithError(std::nullopt);
  }
  if (data && response && response->statusCode() == statusOK) {
    _keep(*data);
  } else if (!error) {
    error = platform::Error{platform::URLErrorDomain, platform::URLErrorResourceUnavailable, {}};
  }
  finishWithError(std::move(error));
}

void ZEBAssetDownloadOperation::_keep(const platform::Data& data) {
  const std::optional<platform::Data> former = cachedData();
  _isUpdated = !former || data != *former;
  const std::string path = destinationFilePath().value_or(std::string());
  const auto files = platform::Environment::current()->files;
  const std::string folder = platform::stringByDeletingLastPathComponent(path);
  (void)files->createDirectoryWithParents(folder);
  platform::removeAbandonedFiles(folder);
  if (files->writeAtomically(path, data)) {
    ZEBLog(1, "Couldn't write updated asset data to %@", path);
  }
}
