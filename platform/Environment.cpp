#include "platform/Environment.h"

#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <string_view>
#include <thread>
#include <utility>

#include "platform/Applications.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Files.h"
#include "platform/Network.h"
#include "platform/Processes.h"
#include "platform/UserDefaults.h"

namespace platform {

namespace {

std::string variable(const char* name) {
  // Read once, before threads start; nothing in the system changes its own environment.
  const char* value = std::getenv(name);  // NOLINT(concurrency-mt-unsafe)
  return value == nullptr ? std::string() : std::string(value);
}

/// "pt_BR.UTF-8@euro" as the language tag "pt-BR"; empty for "C" and "POSIX".
std::string languageTag(std::string_view locale) {
  std::string tag(locale.substr(0, locale.find_first_of(".@")));
  if (tag == "C" || tag == "POSIX") {
    return {};
  }
  std::replace(tag.begin(), tag.end(), '_', '-');
  return tag;
}

void append(std::vector<std::string>& languages, const std::string& tag) {
  if (!tag.empty() && std::find(languages.begin(), languages.end(), tag) == languages.end()) {
    languages.push_back(tag);
  }
}

std::vector<std::string> languagesOfTheUser() {
  std::vector<std::string> languages;
  const std::string list = variable("LANGUAGE");
  for (size_t start = 0; start < list.size();) {
    const size_t end = std::min(list.find(':', start), list.size());
    append(languages, languageTag(std::string_view(list).substr(start, end - start)));
    start = end + 1;
  }
  for (const char* name : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    if (const std::string value = variable(name); !value.empty()) {
      append(languages, languageTag(value));
      break;
    }
  }
  if (languages.empty()) {
    languages.emplace_back("en");
  }
  return languages;
}

/// The folder that the variable `name` gives, else `standard` in the user's home folder.
std::optional<std::string> folderOfTheUser(const char* name, const char* standard) {
  // A relative path is to be ignored, says the base-directory convention.
  if (const std::string folder = variable(name); folder.starts_with('/')) {
    return folder;
  }
  if (const std::string home = variable("HOME"); home.starts_with('/')) {
    return stringByAppendingPathComponent(home, standard);
  }
  passwd record{};
  passwd* found = nullptr;
  char buffer[4096];
  if (getpwuid_r(getuid(), &record, buffer, sizeof buffer, &found) == 0 && found != nullptr &&
      found->pw_dir != nullptr && found->pw_dir[0] == '/') {
    return stringByAppendingPathComponent(found->pw_dir, standard);
  }
  return std::nullopt;
}

/// As the base-directory convention has them; applications of Flatpak are installed beside those.
std::vector<std::string> sharedDataFolders() {
  std::vector<std::string> folders;
  const auto add = [&folders](const std::string& folder) {
    std::string path = stringByStandardizingPath(folder);
    if (folder.starts_with('/') &&
        std::find(folders.begin(), folders.end(), path) == folders.end()) {
      folders.push_back(std::move(path));
    }
  };
  constexpr const char* exports = "flatpak/exports/share";
  if (const auto own = folderOfTheUser("XDG_DATA_HOME", ".local/share")) {
    add(*own);
    add(stringByAppendingPathComponent(*own, exports));
  }
  std::string list = variable("XDG_DATA_DIRS");
  if (list.empty()) {
    list = "/usr/local/share:/usr/share";
  }
  for (size_t start = 0; start <= list.size();) {
    const size_t end = std::min(list.find(':', start), list.size());
    add(list.substr(start, end - start));
    start = end + 1;
  }
  add(stringByAppendingPathComponent("/var/lib", exports));
  return folders;
}

struct Current {
  std::mutex mutex;
  std::shared_ptr<const Environment> environment;
};

Current& currentHolder() {
  // Never destroyed: worker threads may ask while the process ends.
  static auto& current = *new Current;
  return current;
}

}  // namespace

std::optional<std::string> userDefaultsPath() {
  const auto settings = folderOfTheUser("XDG_CONFIG_HOME", ".config");
  return settings ? std::optional(*settings + "/zeb/settings.plist") : std::nullopt;
}

Environment Environment::system() {
  Environment environment;
  environment.clock = systemClock();
  environment.files = systemFileManager();
  environment.log = standardErrorLogSink(2);
  environment.preferredLanguages = languagesOfTheUser();
  environment.cachesDirectory = folderOfTheUser("XDG_CACHE_HOME", ".cache");
  environment.dataDirectories = sharedDataFolders();
  environment.processLauncher = systemProcessLauncher();
  environment.processTable = systemProcessTable();
  const auto settings = userDefaultsPath();
  environment.userDefaults =
      settings ? userDefaultsFromFile(*settings) : userDefaultsFromDictionary({});
  environment.notificationCenter = localNotificationCenter();
  environment.standardOutput = [](const std::string& text) {
    std::fwrite(text.data(), 1, text.size(), stdout);
  };
  environment.networkIsReachable = systemNetworkIsReachable;
  environment.runningApplications = systemRunningApplications;
  environment.processorCount = [] {
    return std::max(1, static_cast<int>(std::thread::hardware_concurrency()));
  };
  return environment;
}

std::shared_ptr<const Environment> Environment::current() {
  Current& holder = currentHolder();
  const std::lock_guard lock(holder.mutex);
  if (holder.environment == nullptr) {
    holder.environment = std::make_shared<const Environment>(system());
  }
  return holder.environment;
}

EnvironmentOverride::EnvironmentOverride(Environment environment)
    : _former(Environment::current()) {
  auto replacement = std::make_shared<const Environment>(std::move(environment));
  Current& holder = currentHolder();
  const std::lock_guard lock(holder.mutex);
  holder.environment = std::move(replacement);
}

EnvironmentOverride::~EnvironmentOverride() {
  // Not destroyed with the lock held: threads of its parts may ask for the current one to their
  // end.
  std::shared_ptr<const Environment> replaced;
  Current& holder = currentHolder();
  const std::lock_guard lock(holder.mutex);
  replaced = std::exchange(holder.environment, std::move(_former));
}

}  // namespace platform
