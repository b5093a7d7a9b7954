// The outside world, gathered in one place so that tests can replace any part of it.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/Files.h"
#include "platform/Log.h"

namespace platform {

/// What the process runs in. Code asks Environment::current() and never the operating system
/// beside it. Thread-safety: an Environment in use is immutable; current() may be called from any
/// thread, and replacing it (EnvironmentOverride) is for the start of a program and for tests.
struct Environment {
  std::shared_ptr<Clock> clock;
  std::shared_ptr<FileManager> files;
  std::shared_ptr<LogSink> log;

  /// Language tags, the user's favourite first; never empty.
  std::vector<std::string> preferredLanguages;

  /// The user's caches folder; absent when there is none (no home folder).
  std::optional<std::string> cachesDirectory;

  /// The real world: system clock and files, log on standard error up to level 2, languages from
  /// LANGUAGE, LC_ALL, LC_MESSAGES and LANG, caches folder from XDG_CACHE_HOME or HOME.
  static Environment system();

  /// The environment in force; the real one until it is replaced.
  static std::shared_ptr<const Environment> current();
};

/// Puts another environment in force for its own lifetime and restores the former one after that.
class EnvironmentOverride {
 public:
  explicit EnvironmentOverride(Environment environment);
  ~EnvironmentOverride();
  EnvironmentOverride(const EnvironmentOverride&) = delete;
  EnvironmentOverride& operator=(const EnvironmentOverride&) = delete;

 private:
  std::shared_ptr<const Environment> _former;
};

}  // namespace platform
