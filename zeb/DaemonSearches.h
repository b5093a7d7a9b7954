// Searches by the daemon, over the message bus.
#pragma once

#include <memory>
#include <string>

#include "platform/Clock.h"
#include "zeb/SearchProvider.h"

namespace zeb {

/// A client of the help daemon (docs/bus.md). Searches run one at a time: a newer one takes an
/// older one back.
class DaemonSearches : public SearchProvider {
 public:
  /// Null where there is no session bus, or neither a daemon on it nor one that the bus can start.
  /// `address` in place of the session bus's where it is not empty.
  static std::unique_ptr<DaemonSearches> connect(const std::string& address = {});
  ~DaemonSearches() override;
  DaemonSearches(const DaemonSearches&) = delete;
  DaemonSearches& operator=(const DaemonSearches&) = delete;

  std::shared_ptr<RunningSearch> begin(const zebd::SearchRequest& request) override;
  std::vector<std::string> booksWithoutIndex(const std::vector<std::string>& bookIDs) override;

  /// Whether books are being looked for, indexed or downloaded, or models built.
  bool isBusy() const;

  /// Has the daemon look through the help folders, and waits for that, for `limit` at most. False
  /// where it does not answer.
  bool rescan(platform::Seconds limit);

 private:
  struct Implementation;
  class Running;
  explicit DaemonSearches(std::shared_ptr<Implementation> implementation);

  const std::shared_ptr<Implementation> _implementation;
};

}  // namespace zeb
