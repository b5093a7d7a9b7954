#include "platform/KeyValueObserving.h"

#include <algorithm>

#include "platform/Exception.h"

namespace platform {

void KeyValueObserver::observeValueForKeyPath(std::string_view keyPath, KeyValueObservable&,
                                              const KeyValueChange&, void*) {
  throw Exception(
      internalInconsistencyException,
      "an observer got a notification for a key that it does not know: " + std::string(keyPath));
}

void KeyValueObservable::addObserver(const std::shared_ptr<KeyValueObserver>& observer,
                                     std::string_view keyPath, KeyValueObservingOptions options,
                                     void* context) {
  if (observer == nullptr) {
    return;
  }
  const MutexLock lock(_registrationsMutex);
  std::erase_if(_registrations, [](const Registration& known) { return known.observer.expired(); });
  _registrations.push_back({observer, observer.get(), std::string(keyPath), options, context});
}

void KeyValueObservable::removeObserver(const KeyValueObserver* observer,
                                        std::string_view keyPath) {
  const MutexLock lock(_registrationsMutex);
  const auto found =
      std::find_if(_registrations.rbegin(), _registrations.rend(), [&](const Registration& known) {
        return known.identity == observer && known.keyPath == keyPath;
      });
  if (found != _registrations.rend()) {
    _registrations.erase(std::next(found).base());
  }
}

void KeyValueObservable::willChangeValueForKey(std::string_view key) {
  for (const Registration& registration : _registrationsForKey(key)) {
    if ((registration.options & keyValueObservingOptionPrior) == 0) {
      continue;
    }
    if (const auto observer = registration.observer.lock()) {
      observer->observeValueForKeyPath(key, *this, {true, {}}, registration.context);
    }
  }
}

void KeyValueObservable::didChangeValueForKey(std::string_view key) {
  _didChangeValueForKey(key, valueForKey(key));
}

void KeyValueObservable::_didChangeValueForKey(std::string_view key, const Value& newValue) {
  for (const Registration& registration : _registrationsForKey(key)) {
    const bool wantsValue = (registration.options & keyValueObservingOptionNew) != 0;
    if (const auto observer = registration.observer.lock()) {
      observer->observeValueForKeyPath(key, *this, {false, wantsValue ? newValue : Value()},
                                       registration.context);
    }
  }
}

Value KeyValueObservable::valueForKey(std::string_view /*key*/) const { return {}; }

std::vector<KeyValueObservable::Registration> KeyValueObservable::_registrationsForKey(
    std::string_view key) const {
  const MutexLock lock(_registrationsMutex);
  std::vector<Registration> matching;
  for (const Registration& registration : _registrations) {
    if (registration.keyPath == key) {
      matching.push_back(registration);
    }
  }
  return matching;
}

}  // namespace platform
