#include "zebd/SearchSchedule.h"

#include <algorithm>

namespace zebd {

SearchSchedule::Replaced SearchSchedule::add(const Client& client, Handle handle) {
  Replaced replaced;
  if (_running && _running->client == client) {
    replaced.running = _running->handle;
  }
  const auto own = std::find_if(_queue.begin(), _queue.end(),
                                [&](const Turn& turn) { return turn.client == client; });
  if (own == _queue.end()) {
    _queue.push_back({client, handle});
  } else {
    replaced.waiting = own->handle;
    own->handle = handle;
  }
  return replaced;
}

std::optional<SearchSchedule::Handle> SearchSchedule::next() {
  if (_running || _queue.empty()) {
    return std::nullopt;
  }
  _running = _queue.front();
  _queue.pop_front();
  return _running->handle;
}

void SearchSchedule::ended() { _running.reset(); }

bool SearchSchedule::removeWaiting(const Client& client, Handle handle) {
  return std::erase_if(_queue, [&](const Turn& turn) {
           return turn.client == client && turn.handle == handle;
         }) > 0;
}

}  // namespace zebd
