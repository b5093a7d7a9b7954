#include "platform/DistributedNotificationCenter.h"

#include <sdbus-c++/sdbus-c++.h>

#include <exception>
#include <map>
#include <thread>
#include <utility>
#include <vector>

#include "platform/DispatchQueue.h"
#include "platform/Environment.h"
#include "platform/Strings.h"
#include "platform/ThreadSafety.h"
#include "platform/WorkerThreads.h"

namespace platform {

namespace {

/// Observers by name. A handler runs on the main queue, and only while its observation is held.
class Observers : public std::enable_shared_from_this<Observers> {
 public:
  using Handler = DistributedNotificationCenter::Handler;

  DistributedNotificationCenter::Observation add(const std::string& name, Handler handler) {
    auto observer = std::make_shared<const Handler>(std::move(handler));
    const MutexLock lock(_mutex);
    std::vector<std::weak_ptr<const Handler>>& known = _observers[name];
    std::erase_if(known, [](const auto& weak) { return weak.expired(); });
    known.push_back(observer);
    return std::const_pointer_cast<Handler>(observer);
  }

  void deliver(const DistributedNotification& notification) {
    DispatchQueue::main()->async([self = shared_from_this(), notification] {
      for (const auto& weak : self->_observersOf(notification.name)) {
        if (const auto handler = weak.lock()) {
          runLoggingExceptions([&] { (*handler)(notification); });
        }
      }
    });
  }

 private:
  std::vector<std::weak_ptr<const Handler>> _observersOf(const std::string& name) const {
    const MutexLock lock(_mutex);
    const auto found = _observers.find(name);
    return found == _observers.end() ? std::vector<std::weak_ptr<const Handler>>() : found->second;
  }

  mutable Mutex _mutex;
  std::map<std::string, std::vector<std::weak_ptr<const Handler>>> _observers GUARDED_BY(_mutex);
};

void logFailure(const std::string& text) {
  Environment::current()->log->write(1, "Notification not posted: " + text);
}

/// Whether every centre can carry the strings of a notification; logs it when not.
bool canBePosted(const std::string& name, const std::optional<std::string>& object) {
  const auto isText = [](const std::string& string) {
    return isValidUTF8(string) && string.find('\0') == std::string::npos;
  };
  const bool possible = isText(name) && (!object || isText(*object));
  if (!possible) {
    logFailure("its name or object is no text");
  }
  return possible;
}

class LocalCenter final : public DistributedNotificationCenter {
 public:
  Observation addObserver(const std::string& name, Handler handler) override {
    return _observers->add(name, std::move(handler));
  }

  void postNotification(const std::string& name, std::optional<std::string> object) override {
    if (canBePosted(name, object)) {
      _observers->deliver({name, std::move(object)});
    }
  }

 private:
  const std::shared_ptr<Observers> _observers = std::make_shared<Observers>();
};

constexpr const char* busPath = "/org/zeb/Notifications";
constexpr const char* busInterface = "org.zeb.Notifications";
constexpr const char* busMember = "Posted";

/// Each notification is one signal: name, whether there is an object, object. The bus sends it to
/// every listener, the sender among them, so posting needs no delivery of its own.
class BusCenter final : public DistributedNotificationCenter {
 public:
  explicit BusCenter(std::unique_ptr<sdbus::IConnection> connection)
      : _connection(std::move(connection)), _object(sdbus::createObject(*_connection, busPath)) {
    _object->registerSignal(busMember)
        .onInterface(busInterface)
        .withParameters<std::string, bool, std::string>();
    _object->finishRegistration();
    const std::string rule = std::string("type='signal',path='") + busPath + "',interface='" +
                             busInterface + "',member='" + busMember + "'";
    _match = _connection->addMatch(rule, [observers = _observers](sdbus::Message& message) {
      _received(*observers, message);
    });
    // The library's own thread would end the process together with the bus.
    _loop = std::thread([this] { _listen(); });
  }

  ~BusCenter() override {
    _connection->leaveEventLoop();
    _loop.join();
  }

  Observation addObserver(const std::string& name, Handler handler) override {
    return _observers->add(name, std::move(handler));
  }

  void postNotification(const std::string& name, std::optional<std::string> object) override {
    if (!canBePosted(name, object)) {
      return;
    }
    const MutexLock lock(_postMutex);
    try {
      _object->emitSignal(busMember)
          .onInterface(busInterface)
          .withArguments(name, object.has_value(), object.value_or(std::string()));
    } catch (const sdbus::Error& error) {
      logFailure(error.getMessage());
      _observers->deliver({name, std::move(object)});
    }
  }

 private:
  void _listen() {
    try {
      _connection->enterEventLoop();
    } catch (const std::exception& error) {
      Environment::current()->log->write(
          1, std::string("Notifications of others are no longer heard: ") + error.what());
    }
  }

  static bool _isAtEnd(const sdbus::Message& message) {
    std::string type;
    std::string contents;
    message.peekType(type, contents);
    return type.empty() || type.front() == '\0';
  }

  static void _received(Observers& observers, sdbus::Message& message) {
    std::string name;
    std::string object;
    bool hasObject = false;
    try {
      message >> name >> hasObject >> object;
      if (!_isAtEnd(message)) {
        return;  // more arguments than ours has
      }
    } catch (const sdbus::Error&) {
      return;  // fewer arguments, or others: somebody else's idea of this signal
    }
    observers.deliver({std::move(name),
                       hasObject ? std::optional<std::string>(std::move(object)) : std::nullopt});
  }

  const std::shared_ptr<Observers> _observers = std::make_shared<Observers>();
  Mutex _postMutex;
  std::unique_ptr<sdbus::IConnection> _connection;
  std::unique_ptr<sdbus::IObject> _object;
  sdbus::Slot _match;
  std::thread _loop;
};

}  // namespace

std::shared_ptr<DistributedNotificationCenter> localNotificationCenter() {
  return std::make_shared<LocalCenter>();
}

std::shared_ptr<DistributedNotificationCenter> busNotificationCenter(const std::string& address) {
  try {
    return std::make_shared<BusCenter>(address.empty()
                                           ? sdbus::createSessionBusConnection()
                                           : sdbus::createSessionBusConnectionWithAddress(address));
  } catch (const sdbus::Error&) {
    return nullptr;
  }
}

}  // namespace platform
