// Notifications that reach every process of the user's session.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace platform {

/// A notification: a name, and a string that says what it is about, where it is about something.
struct DistributedNotification {
  std::string name;
  std::optional<std::string> object;
};

/// Posts notifications and delivers those of others, and one's own, to observers. Delivery is
/// asynchronous, on the main queue, in the order of posting; observers of one name hear it in the
/// order in which they were added. What a handler throws is logged at level 0 and ends that handler
/// only. Thread-safety: internally synchronised.
class DistributedNotificationCenter {
 public:
  using Handler = std::function<void(const DistributedNotification& notification)>;
  /// Ends the observation when the last copy is dropped: on the main thread at once; on another
  /// thread a call of the handler that is just beginning there may still take place. It may outlive
  /// the centre.
  using Observation = std::shared_ptr<void>;

  virtual ~DistributedNotificationCenter() = default;

  /// From now on `handler` gets the notifications of this name that are delivered, from any sender;
  /// one that was posted before but is still under way is among them.
  [[nodiscard]] virtual Observation addObserver(const std::string& name, Handler handler) = 0;

  /// A name or object that is no UTF-8 text, or has a NUL in it, cannot be posted: that is logged
  /// at level 1, and nobody hears of it.
  virtual void postNotification(const std::string& name, std::optional<std::string> object) = 0;
};

/// A centre that reaches this process only.
std::shared_ptr<DistributedNotificationCenter> localNotificationCenter();

/// A centre on the message bus at `address`, or on the user's session bus where it is empty. Null
/// when there is no such bus. Once the bus is gone (logged at level 1), each posting logs that at
/// level 1 and reaches this process only.
std::shared_ptr<DistributedNotificationCenter> busNotificationCenter(
    const std::string& address = {});

}  // namespace platform
