// The outside world, gathered in one place so that tests can replace any part of it.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/Files.h"
#include "platform/Log.h"

namespace platform {

class DistributedNotificationCenter;
class ProcessLauncher;
class ProcessTable;
class UserDefaults;

/// What the process runs in. Code asks Environment::current() and never the operating system
/// beside it. Thread-safety: an Environment in use is immutable; current() may be called from any
/// thread, and replacing it (EnvironmentOverride) is for the start of a program and for tests.
struct Environment {
  std::shared_ptr<Clock> clock;
  std::shared_ptr<FileManager> files;
  std::shared_ptr<LogSink> log;
  std::shared_ptr<ProcessLauncher> processLauncher;
  std::shared_ptr<ProcessTable> processTable;
  std::shared_ptr<UserDefaults> userDefaults;
  std::shared_ptr<DistributedNotificationCenter> notificationCenter;

  /// Takes what code prints for people. A host that prints results of its own sends this elsewhere.
  std::function<void(const std::string& text)> standardOutput;
  /// Number of processors; 1 where that cannot be told.
  std::function<int()> processorCount;
  /// Whether there is a network; may change at any time.
  std::function<bool()> networkIsReachable;

  /// Identifiers of the applications that run in the user's session.
  std::function<std::vector<std::string>()> runningApplications;

  /// Language tags, the user's favourite first; never empty.
  std::vector<std::string> preferredLanguages;

  /// The user's caches folder; absent when there is none (no home folder).
  std::optional<std::string> cachesDirectory;

  /// A file of certificates (PEM) to trust in place of the system's store; absent but in tests.
  std::optional<std::string> certificateAuthorityFile;

  /// Folders of data that programs share, like /usr/share: the user's own first, then the
  /// computer's. Not all of them need be there.
  std::vector<std::string> dataDirectories;

  /// The real world: system clock, files and processes, log on standard error up to level 2,
  /// languages from LANGUAGE, LC_ALL, LC_MESSAGES and LANG, caches folder from XDG_CACHE_HOME or
  /// HOME, data folders from XDG_DATA_HOME or HOME, XDG_DATA_DIRS and what Flatpak exports,
  /// settings from zeb/settings.plist under XDG_CONFIG_HOME or HOME, and notifications within this
  /// process only (busNotificationCenter() reaches further).
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
