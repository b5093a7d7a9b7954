// The searches that clients of a host have asked for.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/ThreadSafety.h"
#include "zebd/FoundItem.h"
#include "zebd/SearchSchedule.h"

class ZEBQuery;

namespace zebd {

class Host;

/// What a client asks.
struct SearchRequest {
  std::string text;
  /// Identifiers of the books to search; empty for all.
  std::vector<std::string> bookIDs;
  /// ZEBHelp…Result; at least one.
  std::vector<std::string> kinds;
  /// Whether the text is the name of an anchor.
  bool isAnchor = false;
  /// 0 leaves it to the plug-in.
  size_t limit = 0;
  /// Language tags, the favourite first; empty for the user's settings.
  std::vector<std::string> languages;

  /// The query that the plug-in gets.
  std::shared_ptr<ZEBQuery> query() const;
};

/// How a search came to its end.
enum class SearchEnding {
  /// All that was found has been told.
  complete,
  /// It broke off; what was told may not be all.
  broken,
  /// Nobody wanted it any more: the client took it back or asked for something newer.
  cancelled,
};

/// Hears what searches find. Nothing follows the end of a search.
class SearchListener {
 public:
  virtual ~SearchListener() = default;
  /// On a thread of the search.
  virtual void searchFound(const std::string& client, uint64_t handle,
                           const std::vector<FoundItem>& items) = 0;
  /// On the main thread. `waited` is how long the search stood behind those of others.
  virtual void searchEnded(const std::string& client, uint64_t handle, SearchEnding ending,
                           platform::Seconds waited) = 0;
};

/// Runs the searches of clients one after the other, in the order of a SearchSchedule: the plug-in
/// has one current query by meaning. A client is a name that tells it from others.
/// Thread-safety: confined to the main thread.
class ClientSearches {
 public:
  using Client = SearchSchedule::Client;
  using Handle = SearchSchedule::Handle;

  /// So many clients may have a search at a time.
  static constexpr size_t maximumClientCount = 1024;

  /// The host must outlive it; the listener is kept.
  ClientSearches(Host& host, std::shared_ptr<SearchListener> listener);
  ~ClientSearches();
  ClientSearches(const ClientSearches&) = delete;
  ClientSearches& operator=(const ClientSearches&) = delete;

  /// Begins the search, as soon as the main loop runs again and it is the client's turn, in place
  /// of an earlier one of the client's: nothing is heard of it before this has returned. The handle
  /// is new. Absent when there are too many clients.
  std::optional<Handle> start(const Client& client, const SearchRequest& request);

  /// The answer is no longer wanted. False for a handle that is none of the client's, or of a
  /// search that has ended.
  bool cancel(const Client& client, Handle handle);

  /// Takes back what the client has asked for.
  void clientLeft(const Client& client);

  /// Searches that wait or run.
  size_t count() const { return _searches.size(); }
  size_t waitingCount() const { return _schedule.waitingCount(); }

 private:
  class Receiver;
  struct Search;

  void _cancel(Handle handle);
  void _runNext();
  void _ended(Handle handle, bool finished);
  void _tellEnd(Handle handle, SearchEnding ending);

  Host& _host;
  const std::shared_ptr<SearchListener> _listener;
  /// Lets what a thread of the host posts to the main loop find out that this object is gone.
  const std::shared_ptr<ClientSearches*> _self;
  SearchSchedule _schedule;
  std::map<Handle, Search> _searches;
  Handle _lastHandle = 0;
};

}  // namespace zebd
