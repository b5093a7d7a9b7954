// Where a model is on the disk.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>

#include "platform/Clock.h"
#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/ThreadSafety.h"

class LUXModelView;

/// The file of a model in the model's folder. A new model takes the place of the old one in one
/// step, and views of the old one stay as they are. Should somebody else write into the file or cut
/// it off, then whoever asks for a view after that gets one of what is there, or none; views that
/// are in use read what is there, and zeros where nothing is left. Thread-safety: internally
/// synchronised.
class LUXModelFile {
 public:
  static constexpr const char* fileName = "LUXModel";

  explicit LUXModelFile(std::string directoryPath);

  const std::string& directoryPath() const noexcept { return _directoryPath; }
  const std::string& path() const noexcept { return _path; }

  /// What can be read at this moment; null where that is no whole model of this version. Costs one
  /// question to the file system where nothing has changed.
  std::shared_ptr<const LUXModelView> view();

  /// From now on there is no view until the file has changed.
  void distrust(const std::shared_ptr<const LUXModelView>& view);

  /// Makes the folder, with those above it.
  std::optional<platform::Error> makeDirectory() const;
  /// Replaces the file. On failure the old one is untouched.
  std::optional<platform::Error> write(const platform::Data& data);
  /// Deletes what processes that were killed while they wrote have left.
  void removeLeftovers() const;

 private:
  void _open(std::chrono::system_clock::time_point modified) REQUIRES(_mutex);
  bool _isCutOff() const REQUIRES(_mutex);

  const std::string _directoryPath;
  const std::string _path;
  platform::Mutex _mutex;
  std::shared_ptr<const LUXModelView> _view GUARDED_BY(_mutex);
  size_t _length GUARDED_BY(_mutex) = 0;
  std::optional<std::chrono::system_clock::time_point> _modified GUARDED_BY(_mutex);
  platform::Clock::Instant _opened GUARDED_BY(_mutex){0};
  bool _isSettled GUARDED_BY(_mutex) = false;
};
