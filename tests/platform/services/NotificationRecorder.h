// An environment with a captured log and real time, and what a test does with notifications in it.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"

namespace tests {

class NotificationRecorder {
 public:
  NotificationRecorder() : _override(_make()) {}
  ~NotificationRecorder() { platform::RunLoop::main()->runPending(); }

  platform::CapturingLogSink& log() { return *_log; }

  /// A handler that writes "<mark>name" or "<mark>name(object)" to lines.
  platform::DistributedNotificationCenter::Handler handler(std::string mark = {}) {
    return [this, mark = std::move(mark)](const platform::DistributedNotification& notification) {
      lines.push_back(mark + notification.name +
                      (notification.object ? "(" + *notification.object + ")" : ""));
    };
  }

  /// Runs the main loop until `condition` holds; false when it never does.
  static bool runUntil(const std::function<bool()>& condition) {
    const auto clock = platform::systemClock();
    const auto end = clock->elapsed() + platform::Seconds(20);
    while (!condition()) {
      if (clock->elapsed() > end) {
        return false;
      }
      platform::RunLoop::main()->runFor(platform::Seconds(0.002));
    }
    return true;
  }
  bool runUntilCount(size_t count) {
    return runUntil([&] { return lines.size() >= count; });
  }

  std::vector<std::string> lines;

 private:
  platform::Environment _make() {
    platform::Environment environment = platform::Environment::system();
    environment.log = _log;
    return environment;
  }

  std::shared_ptr<platform::CapturingLogSink> _log = std::make_shared<platform::CapturingLogSink>();
  platform::EnvironmentOverride _override;
};

}  // namespace tests
