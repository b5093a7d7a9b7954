#include "platform/Applications.h"

#include <sdbus-c++/sdbus-c++.h>

#include <cerrno>
#include <set>
#include <string>
#include <vector>

#include "platform/Environment.h"
#include "platform/Files.h"

namespace platform {

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
  for (const std::string& folder : Environment::current()->dataDirectories) {
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
