// Telling others, by the name of a key, that a value is about to change and has changed.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/ThreadSafety.h"
#include "platform/Value.h"

namespace platform {

class KeyValueObservable;

/// What a notification carries besides the key.
struct KeyValueChange {
  /// Sent before the change instead of after it.
  bool isPrior = false;
  /// The value after the change; absent in a prior notification and when it was not asked for.
  Value newValue;
};

class KeyValueObserver {
 public:
  virtual ~KeyValueObserver() = default;

  /// Called on the thread that makes the change, with no lock of the observed object held. An
  /// observer passes key paths that it does not know on to this implementation, which throws
  /// Exception "InternalInconsistencyException": such a notification was never asked for.
  virtual void observeValueForKeyPath(std::string_view keyPath, KeyValueObservable& object,
                                      const KeyValueChange& change, void* context);
};

using KeyValueObservingOptions = uint32_t;
/// Deliver the new value.
inline constexpr KeyValueObservingOptions keyValueObservingOptionNew = 1;
/// Also notify before the change.
inline constexpr KeyValueObservingOptions keyValueObservingOptionPrior = 8;

/// The announcing side. A class announces each change of a key with a pair of calls, will before
/// and did after; pairs of different keys may nest. Observers are called in the order in which they
/// were added; one that was added twice is called twice. Observers are held weakly. Thread-safety:
/// internally synchronised.
class KeyValueObservable {
 public:
  KeyValueObservable() = default;
  virtual ~KeyValueObservable() = default;
  KeyValueObservable(const KeyValueObservable&) = delete;
  KeyValueObservable& operator=(const KeyValueObservable&) = delete;

  void addObserver(const std::shared_ptr<KeyValueObserver>& observer, std::string_view keyPath,
                   KeyValueObservingOptions options = 0, void* context = nullptr);

  /// Takes back the latest addition of this observer for this key; does nothing if there is none.
  /// A notification that is under way on another thread may still arrive.
  void removeObserver(const KeyValueObserver* observer, std::string_view keyPath);

  void willChangeValueForKey(std::string_view key);
  void didChangeValueForKey(std::string_view key);

  /// The value of a key as observers get it; absent for an unknown key.
  virtual Value valueForKey(std::string_view key) const;

 protected:
  /// didChangeValueForKey with a value that was fixed beforehand.
  void _didChangeValueForKey(std::string_view key, const Value& newValue);

 private:
  struct Registration {
    std::weak_ptr<KeyValueObserver> observer;
    const KeyValueObserver* identity;
    std::string keyPath;
    KeyValueObservingOptions options;
    void* context;
  };

  std::vector<Registration> _registrationsForKey(std::string_view key) const;

  mutable Mutex _registrationsMutex;
  std::vector<Registration> _registrations GUARDED_BY(_registrationsMutex);
};

}  // namespace platform
