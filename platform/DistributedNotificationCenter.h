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
/// asynchronous, on the main queue, in the order of posting.
/// Thread-safety: internally synchronised.
class DistributedNotificationCenter {
 public:
  using Handler = std::function<void(const DistributedNotification& notification)>;
  /// Ends the observation when the last copy is dropped; no handler starts after that.
  using Observation = std::shared_ptr<void>;

  virtual ~DistributedNotificationCenter() = default;

  /// From now on `handler` gets notifications of this name from any sender.
  [[nodiscard]] virtual Observation addObserver(const std::string& name, Handler handler) = 0;

  virtual void postNotification(const std::string& name, std::optional<std::string> object) = 0;
};

/// A centre that reaches this process only.
std::shared_ptr<DistributedNotificationCenter> localNotificationCenter();

/// A centre on the message bus at `address`, or on the user's session bus where it is empty. Null
/// when there is no such bus.
std::shared_ptr<DistributedNotificationCenter> busNotificationCenter(
    const std::string& address = {});

}  // namespace platform
