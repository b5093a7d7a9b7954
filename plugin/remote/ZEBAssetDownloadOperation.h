// Downloads one file of a remote book.
#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/URL.h"
#include "platform/URLRequest.h"
#include "platform/URLSession.h"
#include "plugin/operations/ZEBOperation.h"
#include "plugin/records/AtomicProperty.h"

class ZEBHelpBook;
class ZEBIndexshelf;

/// Fetches a URL through the host's asset protocol, which answers only with bytes that are the
/// right ones, and replaces the file at its destination by an answer of status 200, equal or not.
/// Every other answer and every failure leaves that file alone and ends in an error.
///
/// A download that the transport reports as cancelled finishes twice: without an error, then with
/// the one that it was cancelled with. Whoever goes by the first finish may see either.
///
/// URL and destination are set before the operation is queued.
/// Thread-safety: internally synchronised.
class ZEBAssetDownloadOperation : public ZEBOperation {
 public:
  /// Registers the host's asset protocol for all requests of this process. The first operation does
  /// so; calling it again does no harm.
  static void initialize();

  /// The shelf is not kept alive.
  static std::shared_ptr<ZEBAssetDownloadOperation> initWithBook(
      std::shared_ptr<ZEBHelpBook> book, const std::shared_ptr<ZEBIndexshelf>& indexshelf);

  const std::shared_ptr<ZEBHelpBook>& book() const { return _book; }
  std::shared_ptr<ZEBIndexshelf> indexshelf() const { return _indexshelf.lock(); }

  std::optional<platform::URL> remoteURL() const { return _remoteURL.get(); }
  void setRemoteURL(std::optional<platform::URL> url) { _remoteURL.set(std::move(url)); }
  std::optional<std::string> destinationFilePath() const { return _destinationFilePath.get(); }
  void setDestinationFilePath(std::optional<std::string> path) {
    _destinationFilePath.set(std::move(path));
  }

  /// What was asked for; absent before main().
  std::optional<platform::URLRequest> request() const { return _request.get(); }
  /// Null before main().
  std::shared_ptr<platform::URLSessionDataTask> task() const { return _task.get(); }
  /// What was at the destination when the download began; absent where there was nothing.
  std::optional<platform::Data> cachedData() const { return _cachedData.get(); }
  /// Whether other bytes have come than were there.
  bool isUpdated() const { return _isUpdated; }

  /// The session of the process.
  std::shared_ptr<platform::URLSession> session() const;

  void main() override;
  /// Ends the operation at once and the transfer soon after.
  void cancel() override;

 private:
  ZEBAssetDownloadOperation(std::shared_ptr<ZEBHelpBook> book,
                            std::weak_ptr<ZEBIndexshelf> indexshelf);
  void _taskDidComplete(const std::optional<platform::Data>& data,
                        const std::shared_ptr<const platform::URLResponse>& response,
                        std::optional<platform::Error> error);
  void _keep(const platform::Data& data);

  const std::shared_ptr<ZEBHelpBook> _book;
  const std::weak_ptr<ZEBIndexshelf> _indexshelf;
  AtomicProperty<std::optional<platform::URL>> _remoteURL;
  AtomicProperty<std::optional<std::string>> _destinationFilePath;
  AtomicProperty<std::optional<platform::URLRequest>> _request;
  AtomicProperty<std::shared_ptr<platform::URLSessionDataTask>> _task;
  AtomicProperty<std::optional<platform::Data>> _cachedData;
  std::atomic<bool> _isUpdated{false};
};
