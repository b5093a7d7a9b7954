#include "zebd/ClientSearches.h"

#include <algorithm>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "platform/Value.h"
#include "zebd/Host.h"

namespace zebd {

namespace {

using platform::Value;

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

}  // namespace

std::shared_ptr<ZEBQuery> SearchRequest::query() const {
  auto query = ZEBQuery::initWithQueryString(text);
  query->setScope(bookIDs);
  query->setResultTypes(kinds);
  query->setLimit(limit);
  query->setPreferredLanguages(languages);
  Value::Dictionary options;
  if (bookIDs.empty()) {
    // Without that, models that do not have the system's own manual would be passed over.
    options[ZEBQuerySearchAllBooksOptionKey] = true;
  }
  if (isAnchor) {
    options[ZEBQueryAnchorSearchOptionKey] = true;
  }
  query->setOptions(std::move(options));
  return query;
}

struct ClientSearches::Search {
  Client client;
  std::shared_ptr<ZEBQuery> query;
  platform::Clock::Instant asked;
  /// Absent while it waits.
  std::optional<platform::Clock::Instant> begun;
};

/// Hands on what one search finds.
class ClientSearches::Receiver : public SearchReceiver {
 public:
  Receiver(std::weak_ptr<ClientSearches*> searches, Client client, Handle handle,
           std::shared_ptr<ZEBQuery> query, std::shared_ptr<const Bookshelf> bookshelf,
           std::shared_ptr<SearchListener> listener)
      : _searches(std::move(searches)),
        _client(std::move(client)),
        _handle(handle),
        _query(std::move(query)),
        _bookshelf(std::move(bookshelf)),
        _listener(std::move(listener)) {}

  void foundResults(const ZEBResultBatch& batch) override {
    if (_query->cancelled()) {
      return;
    }
    const std::vector<FoundItem> items = itemsOfBatch(batch, *_bookshelf);
    if (!items.empty()) {
      _listener->searchFound(_client, _handle, items);
    }
  }

  void searchEnded(bool finished) override {
    platform::RunLoop::main()->perform([searches = _searches, handle = _handle, finished] {
      if (const auto self = searches.lock()) {
        (*self)->_ended(handle, finished);
      }
    });
  }

 private:
  const std::weak_ptr<ClientSearches*> _searches;
  const Client _client;
  const Handle _handle;
  const std::shared_ptr<ZEBQuery> _query;
  const std::shared_ptr<const Bookshelf> _bookshelf;
  const std::shared_ptr<SearchListener> _listener;
};

ClientSearches::ClientSearches(Host& host, std::shared_ptr<SearchListener> listener)
    : _host(host), _listener(std::move(listener)), _self(std::make_shared<ClientSearches*>(this)) {}

ClientSearches::~ClientSearches() = default;

std::optional<ClientSearches::Handle> ClientSearches::start(const Client& client,
                                                            const SearchRequest& request) {
  const bool isKnown = std::any_of(_searches.begin(), _searches.end(), [&](const auto& entry) {
    return entry.second.client == client;
  });
  if (!isKnown && _searches.size() >= maximumClientCount) {
    return std::nullopt;
  }
  const Handle handle = ++_lastHandle;
  _searches[handle] = {client, request.query(), elapsedNow(), std::nullopt};
  const SearchSchedule::Replaced replaced = _schedule.add(client, handle);
  if (replaced.waiting) {
    _tellEnd(*replaced.waiting, SearchEnding::cancelled);
  }
  if (replaced.running) {
    _searches.at(*replaced.running).query->cancel();
  }
  // Whoever asked learns the handle before anything that is found under it.
  platform::RunLoop::main()->perform([weak = std::weak_ptr<ClientSearches*>(_self)] {
    if (const auto self = weak.lock()) {
      (*self)->_runNext();
    }
  });
  return handle;
}

bool ClientSearches::cancel(const Client& client, Handle handle) {
  const auto found = _searches.find(handle);
  if (found == _searches.end() || found->second.client != client) {
    return false;
  }
  _cancel(handle);
  return true;
}

void ClientSearches::clientLeft(const Client& client) {
  std::vector<Handle> handles;
  for (const auto& entry : _searches) {
    if (entry.second.client == client) {
      handles.push_back(entry.first);
    }
  }
  for (const Handle handle : handles) {
    _cancel(handle);
  }
}

void ClientSearches::_cancel(Handle handle) {
  const Search& search = _searches.at(handle);
  search.query->cancel();
  // One that runs ends by itself.
  if (_schedule.removeWaiting(search.client, handle)) {
    _tellEnd(handle, SearchEnding::cancelled);
  }
}

void ClientSearches::_runNext() {
  const std::optional<Handle> handle = _schedule.next();
  if (!handle) {
    return;
  }
  Search& search = _searches.at(*handle);
  search.begun = elapsedNow();
  _host.startSearch(search.query,
                    std::make_shared<Receiver>(_self, search.client, *handle, search.query,
                                               _host.sharedBookshelf(), _listener));
}

void ClientSearches::_ended(Handle handle, bool finished) {
  _schedule.ended();
  const bool isUnwanted = _searches.at(handle).query->cancelled();
  _tellEnd(handle, isUnwanted ? SearchEnding::cancelled
                   : finished ? SearchEnding::complete
                              : SearchEnding::broken);
  _runNext();
}

void ClientSearches::_tellEnd(Handle handle, SearchEnding ending) {
  const auto found = _searches.find(handle);
  const Search search = std::move(found->second);
  _searches.erase(found);
  const platform::Seconds waited = search.begun.value_or(elapsedNow()) - search.asked;
  _listener->searchEnded(search.client, handle, ending, waited);
}

}  // namespace zebd
