#include "zebd/IdleExit.h"

#include <algorithm>
#include <utility>

#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "zebd/Owner.h"

namespace zebd {

namespace {

constexpr platform::Seconds pace{1};

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

}  // namespace

IdleExit::IdleExit(std::shared_ptr<platform::RunLoop> loop, const Owner& owner,
                   platform::Seconds delay, std::function<bool()> isInUse,
                   std::function<void()> leave)
    : _loop(std::move(loop)),
      _owner(owner),
      _ownDelay(delay),
      _isInUse(std::move(isInUse)),
      _leave(std::move(leave)),
      _lastActivity(elapsedNow()),
      _self(std::make_shared<IdleExit*>(this)) {
  _lookAfter(std::min(pace, this->delay()));
}

IdleExit::~IdleExit() = default;

void IdleExit::noteActivity() { _lastActivity = elapsedNow(); }

platform::Seconds IdleExit::delay() const { return _owner.idleTimeOutDelay().value_or(_ownDelay); }

void IdleExit::_lookAfter(platform::Seconds span) {
  _loop->performAfterDelay(span, [weak = std::weak_ptr<IdleExit*>(_self)] {
    if (const auto self = weak.lock()) {
      (*self)->_look();
    }
  });
}

void IdleExit::_look() {
  const platform::Seconds wanted = delay();
  const platform::Clock::Instant now = elapsedNow();
  if (_isInUse()) {
    _lastActivity = now;
  }
  const platform::Seconds left = wanted - (now - _lastActivity);
  if (left > platform::Seconds(0)) {
    _lookAfter(std::min(pace, left));
    return;
  }
  if (!_owner.isQuietFor(wanted)) {
    _lookAfter(std::min(pace, wanted));
    return;
  }
  _lastActivity = now;
  _lookAfter(std::min(pace, wanted));
  _leave();
}

}  // namespace zebd
