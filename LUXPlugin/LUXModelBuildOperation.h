// One queued build of a language model.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <utility>

#include "platform/Operation.h"
#include "platform/ThreadSafety.h"

class HelpLUXModel;

/// What a build works on. The model is held for building.
struct LUXModelBuildParameters {
  std::string modelGroupName;
  /// Folder name ("English").
  std::string language;
  std::shared_ptr<HelpLUXModel> model;
};

/// A block operation that can be recognised by its group. Thread-safety: internally synchronised.
class LUXModelBuildOperation : public platform::BlockOperation {
 public:
  static std::shared_ptr<LUXModelBuildOperation> blockOperationWithBlock(
      std::function<void()> block) {
    return std::shared_ptr<LUXModelBuildOperation>(new LUXModelBuildOperation(std::move(block)));
  }

  std::string modelGroupName() const {
    const platform::MutexLock lock(_mutex);
    return _modelGroupName;
  }
  void setModelGroupName(std::string modelGroupName) {
    const platform::MutexLock lock(_mutex);
    _modelGroupName = std::move(modelGroupName);
  }

 private:
  explicit LUXModelBuildOperation(std::function<void()> block) : BlockOperation(std::move(block)) {}

  mutable platform::Mutex _mutex;
  std::string _modelGroupName GUARDED_BY(_mutex);
};
