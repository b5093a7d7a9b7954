// An environment for tests: simulated time, captured log, the real file system.
#pragma once

#include <memory>

#include "platform/Environment.h"

namespace tests {

class TestEnvironment {
 public:
  TestEnvironment() : _override(_make()) {}

  platform::SimulatedClock& clock() { return *_clock; }
  platform::CapturingLogSink& log() { return *_log; }

 private:
  platform::Environment _make() {
    platform::Environment environment = platform::Environment::system();
    environment.clock = _clock;
    environment.log = _log;
    return environment;
  }

  std::shared_ptr<platform::SimulatedClock> _clock = std::make_shared<platform::SimulatedClock>();
  std::shared_ptr<platform::CapturingLogSink> _log = std::make_shared<platform::CapturingLogSink>();
  platform::EnvironmentOverride _override;
};

}  // namespace tests
