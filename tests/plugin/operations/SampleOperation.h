// A ZEBOperation whose main() is a block, and an observer that writes down what it is told.
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "plugin/operations/ZEBOperation.h"

namespace tests {

class SampleOperation : public ZEBOperation {
 public:
  static std::shared_ptr<SampleOperation> make(std::function<void()> body = {}) {
    std::shared_ptr<SampleOperation> operation(new SampleOperation);
    operation->body = std::move(body);
    return operation;
  }

  void main() override {
    if (body) {
      body();
    }
  }

  /// "100" for executing, not finished, not cancelled, and so on.
  std::string flags() const {
    return std::string(isExecuting() ? "1" : "0") + (isFinished() ? "1" : "0") +
           (isCancelled() ? "1" : "0");
  }

  std::function<void()> body;
};

/// Notes each announcement with the flags as they are while it is made: reading them here would
/// hang if the operation held its lock meanwhile.
class StateRecorder : public platform::KeyValueObserver {
 public:
  static std::shared_ptr<StateRecorder> observing(
      const std::shared_ptr<SampleOperation>& operation) {
    auto recorder = std::make_shared<StateRecorder>();
    for (const char* key :
         {platform::isExecutingKey, platform::isFinishedKey, platform::isCancelledKey}) {
      operation->addObserver(recorder, key, platform::keyValueObservingOptionPrior);
    }
    return recorder;
  }

  void observeValueForKeyPath(std::string_view keyPath, platform::KeyValueObservable& object,
                              const platform::KeyValueChange& change, void*) override {
    note((change.isPrior ? "will " : "did ") + std::string(keyPath) + " " +
         static_cast<const SampleOperation&>(object).flags());
  }

  void note(std::string line) {
    const std::lock_guard lock(_mutex);
    _lines.push_back(std::move(line));
  }

  /// What was noted since the last call.
  std::vector<std::string> takeLines() {
    const std::lock_guard lock(_mutex);
    return std::exchange(_lines, {});
  }

 private:
  std::mutex _mutex;
  std::vector<std::string> _lines;
};

}  // namespace tests
