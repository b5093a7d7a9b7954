// When a host that nobody needs may leave.
#pragma once

#include <functional>
#include <memory>

#include "platform/Clock.h"

namespace platform {
class RunLoop;
}  // namespace platform

namespace zebd {

class Owner;

/// Watches for the moment at which nothing has happened for the idle delay: no shutdown guard held
/// (nor one too many given back), no operation waiting or running, no request of a client, and then
/// calls `leave`, once each time. If the host is still there after that, the delay begins anew.
///
/// The delay is what the plug-in last asked its owner for, or else the host's own.
///
/// It looks every second, as the plug-in may ask for a shorter delay at any time, and so leaves no
/// later than a second after the delay.
/// Thread-safety: confined to the thread of its run loop.
class IdleExit {
 public:
  /// `isInUse` tells of work that has no guard; whoever ends it notes activity. The owner and what
  /// the functions use must outlive this.
  IdleExit(std::shared_ptr<platform::RunLoop> loop, const Owner& owner, platform::Seconds delay,
           std::function<bool()> isInUse, std::function<void()> leave);
  ~IdleExit();
  IdleExit(const IdleExit&) = delete;
  IdleExit& operator=(const IdleExit&) = delete;

  /// Somebody asked for something.
  void noteActivity();

  platform::Seconds delay() const;

 private:
  void _look();
  void _lookAfter(platform::Seconds span);

  const std::shared_ptr<platform::RunLoop> _loop;
  const Owner& _owner;
  const platform::Seconds _ownDelay;
  const std::function<bool()> _isInUse;
  const std::function<void()> _leave;
  platform::Clock::Instant _lastActivity;
  /// Lets a timer that is due find out that this object is gone.
  const std::shared_ptr<IdleExit*> _self;
};

}  // namespace zebd
