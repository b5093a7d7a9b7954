// Whose search is next, where several clients want one.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <optional>
#include <string>

namespace zebd {

/// The order in which the searches of several clients run, one at a time. Clients take turns: one
/// that has had its turn goes behind all that wait. A client has one search; a newer one takes the
/// place of one that still waits, so somebody who types keeps the place in the queue.
/// Thread-safety: confined to one thread.
class SearchSchedule {
 public:
  using Client = std::string;
  using Handle = uint64_t;

  /// What a new search does to the client's earlier one.
  struct Replaced {
    /// It waited, and will not run.
    std::optional<Handle> waiting;
    /// It runs, and nobody wants it any more.
    std::optional<Handle> running;
  };

  Replaced add(const Client& client, Handle handle);

  /// The search to run now; it counts as running until ended(). Absent while one runs, and when
  /// nobody waits.
  std::optional<Handle> next();
  /// The running search has come to its end.
  void ended();

  /// Takes a search out that waits; false for every other.
  bool removeWaiting(const Client& client, Handle handle);

  size_t waitingCount() const { return _queue.size(); }
  bool isRunning() const { return _running.has_value(); }

 private:
  struct Turn {
    Client client;
    Handle handle;
  };

  std::deque<Turn> _queue;
  std::optional<Turn> _running;
};

}  // namespace zebd
