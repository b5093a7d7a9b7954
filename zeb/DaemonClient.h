// The daemon as its clients see it, over the message bus.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "zeb/SearchProvider.h"
#include "zebd/HelpService.h"

namespace sdbus {
class MethodCall;
class MethodReply;
}  // namespace sdbus

namespace zeb {

/// What the daemon says of itself.
struct DaemonStatus {
  int64_t process = 0;
  std::string version;
  /// Searches of clients that wait or run.
  uint64_t searchCount = 0;
  uint64_t watchedFolderCount = 0;
  bool isScanning = false;
  /// Units of background work.
  int64_t guardCount = 0;
  /// Operations that run or wait.
  uint64_t operationCount = 0;
  platform::Seconds running{0};
};

/// A client of the help daemon (docs/bus.md). Searches run one at a time: a newer one takes an
/// older one back.
class DaemonClient : public SearchProvider {
 public:
  /// Null where there is no session bus, or neither a daemon on it nor one that the bus can start.
  /// `address` in place of the session bus's where it is not empty.
  static std::unique_ptr<DaemonClient> connect(const std::string& address = {});
  ~DaemonClient() override;
  DaemonClient(const DaemonClient&) = delete;
  DaemonClient& operator=(const DaemonClient&) = delete;

  std::shared_ptr<RunningSearch> begin(const zebd::SearchRequest& request) override;
  std::vector<std::string> booksWithoutIndex(const std::vector<std::string>& bookIDs) override;

  /// Absent where the daemon does not answer.
  std::optional<std::vector<zebd::BookStatus>> books() const;
  std::optional<DaemonStatus> status() const;
  /// Whether books are being looked for, indexed or downloaded, or models built.
  bool isBusy() const;
  /// Has the bus start the daemon where none runs. Returns why it cannot; absent when one is there.
  std::optional<std::string> start();
  /// Whether there is a daemon now; asking does not start one.
  bool isRunning() const;
  /// Grows with every change of a book's index, and when daemons come and go.
  uint64_t changeCount() const;

  /// Has the daemon look for books, and waits for that, for `limit` at most. Absent, with `problem`
  /// set, where it does not answer.
  std::optional<zebd::BookChanges> scan(const zebd::ScanRequest& request, platform::Seconds limit,
                                        std::string& problem);

  /// Subscribes to a publisher's books; of the entries only identifier, title and language.
  zebd::AddedBooks addRemote(const std::string& address, const zebd::WantedBooks& wanted,
                             platform::Seconds limit);
  /// Forgets books on servers, by identifier or address of their catalogue. Returns why it cannot;
  /// absent when they are forgotten.
  std::optional<std::string> removeRemote(const std::string& name, platform::Seconds limit);

 private:
  std::optional<std::string> _call(const char* member, platform::Seconds limit,
                                   const std::function<void(sdbus::MethodCall& call)>& fill,
                                   const std::function<void(sdbus::MethodReply& reply)>& read);

  struct Implementation;
  class Running;
  explicit DaemonClient(std::shared_ptr<Implementation> implementation);

  const std::shared_ptr<Implementation> _implementation;
};

}  // namespace zeb
