#include "platform/Applications.h"

#include <sdbus-c++/sdbus-c++.h>

#include <cerrno>
#include <cstdlib>
#include <optional>
#include <set>
#include <sstream>

#include "platform/Environment.h"
#include "platform/Files.h"

namespace platform {

namespace {

std::string variable(const char* name) {
  const char* value = std::getenv(name);  // NOLINT(concurrency-mt-unsafe): never changed
  return value == nullptr ? std::string() : value;
}

/// Folders for data of all applications, the most important first.
std::vector<std::string> dataFolders() {
  std::vector<std::string> folders;
  if (const std::string own = variable("XDG_DATA_HOME"); !own.empty()) {
    folders.push_back(own);
  } else if (const std::string home = variable("HOME"); !home.empty()) {
    folders.push_back(home + "/.local/share");
  }
  std::string shared = variable("XDG_DATA_DIRS");
  if (shared.empty()) {
    shared = "/usr/local/share:/usr/share";
  }
  std::istringstream list(shared);
  for (std::string folder; std::getline(list, folder, ':');) {
    if (folder.starts_with('/')) {
      folders.push_back(folder);
    }
  }
  return folders;
}

}  // namespace

std::vector<std::string> systemRunningApplications() {
  std::vector<std::string> names;
  try {
    const auto connection = sdbus::createSessionBusConnection();
    const auto bus =
        sdbus::createProxy(*connection, "org.freedesktop.DBus", "/org/freedesktop/DBus");
    bus->callMethod("ListNames").onInterface("org.freedesktop.DBus").storeResultsTo(names);
  } catch (const sdbus::Error&) {
    return {};
  }
  std::erase_if(names, [](const std::string& name) { return name.starts_with(':'); });
  return names;
}

int LSCopyAllApplicationURLs(std::vector<URL>& applicationURLs) {
  bool anyFolder = false;
  std::set<std::string> seen;
  for (const std::string& folder : dataFolders()) {
    const std::string applications = stringByAppendingPathComponent(folder, "applications");
    const auto names = Environment::current()->files->namesInDirectory(applications);
    anyFolder = anyFolder || names.has_value();
    for (const std::string& name : names.value_or(std::vector<std::string>())) {
      if (name.ends_with(".desktop") && seen.insert(name).second) {
        applicationURLs.push_back(
            URL::fileURLWithPath(stringByAppendingPathComponent(applications, name)));
      }
    }
  }
  return anyFolder ? 0 : ENOENT;
}

}  // namespace platform
