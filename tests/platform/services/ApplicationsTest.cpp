#include "platform/Applications.h"

#include <gtest/gtest.h>
#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <optional>

#include "platform/Environment.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/platform/services/PrivateBus.h"
#include "tests/platform/services/UnopenedBus.h"

namespace platform {
namespace {

using tests::PrivateBus;
using tests::TemporaryFolder;

/// Sets an environment variable for one test; an absent value removes it.
class Variable {
 public:
  Variable(std::string name, const std::optional<std::string>& value) : _name(std::move(name)) {
    if (const char* former = std::getenv(_name.c_str())) {  // NOLINT(concurrency-mt-unsafe)
      _former = former;
    }
    _set(value);
  }
  ~Variable() { _set(_former); }
  Variable(const Variable&) = delete;
  Variable& operator=(const Variable&) = delete;

 private:
  void _set(const std::optional<std::string>& value) const {
    if (value) {
      ::setenv(_name.c_str(), value->c_str(), 1);  // NOLINT(concurrency-mt-unsafe)
    } else {
      ::unsetenv(_name.c_str());  // NOLINT(concurrency-mt-unsafe)
    }
  }

  const std::string _name;
  std::optional<std::string> _former;
};

bool contains(const std::vector<std::string>& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

TEST(RunningApplications, areTheNamesOnTheBusAsItIsNow) {
  const PrivateBus bus;
  const Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  EXPECT_FALSE(contains(systemRunningApplications(), "org.example.viewer"));
  {
    const auto viewer = sdbus::createSessionBusConnectionWithAddress(bus.address());
    viewer->requestName("org.example.viewer");
    const auto names = systemRunningApplications();
    EXPECT_TRUE(contains(names, "org.example.viewer"));
    for (const std::string& name : names) {
      EXPECT_NE(name.front(), ':') << name;
    }
    EXPECT_EQ(Environment::system().runningApplications(), names);
  }
  EXPECT_FALSE(contains(systemRunningApplications(), "org.example.viewer"));
}

TEST(RunningApplications, areNoneWithoutABus) {
  const TemporaryFolder folder;
  const Variable address("DBUS_SESSION_BUS_ADDRESS", "unix:path=" + folder.path("nothing"));
  const tests::LostConnections lost;
  EXPECT_TRUE(systemRunningApplications().empty());
}

/// Under the variables as they are now.
std::vector<std::string> installed(int* status = nullptr) {
  const EnvironmentOverride environment(Environment::system());
  std::vector<URL> urls;
  const int result = LSCopyAllApplicationURLs(urls);
  if (status != nullptr) {
    *status = result;
  }
  std::vector<std::string> paths;
  for (const URL& url : urls) {
    EXPECT_TRUE(url.absoluteString().starts_with("file:///"));
    paths.push_back(url.path());
  }
  return paths;
}

TEST(InstalledApplications, areTheDesktopEntriesOfAllDataFolders) {
  const TemporaryFolder folder;
  const Variable own("XDG_DATA_HOME", folder.path("own"));
  const Variable shared("XDG_DATA_DIRS", folder.path("first") + "::relative:" +
                                             folder.path("missing") + ":" + folder.path("second"));
  folder.write("own/applications/a.desktop", "");
  folder.write("own/applications/readme.txt", "");
  folder.write("first/applications/a.desktop", "");
  folder.write("first/applications/b c.desktop", "");
  folder.write("second/applications/d.desktop", "");
  int status = -1;
  EXPECT_EQ(installed(&status),
            (std::vector<std::string>{folder.path("own/applications/a.desktop"),
                                      folder.path("first/applications/b c.desktop"),
                                      folder.path("second/applications/d.desktop")}));
  EXPECT_EQ(status, 0);
}

TEST(InstalledApplications, areLookedForInTheHomeFolderWithoutAFolderOfTheirOwn) {
  const TemporaryFolder folder;
  const Variable own("XDG_DATA_HOME", std::nullopt);
  const Variable shared("XDG_DATA_DIRS", folder.path("missing"));
  const Variable home("HOME", folder.path());
  folder.write(".local/share/applications/a.desktop", "");
  EXPECT_EQ(installed(),
            std::vector<std::string>{folder.path(".local/share/applications/a.desktop")});
}

TEST(InstalledApplications, cannotBeToldWhereNoFolderCanBeRead) {
  const TemporaryFolder folder;
  const Variable own("XDG_DATA_HOME", folder.path("missing"));
  const Variable shared("XDG_DATA_DIRS", folder.path("missing too"));
  int status = 0;
  EXPECT_TRUE(installed(&status).empty());
  EXPECT_NE(status, 0);
}

}  // namespace
}  // namespace platform
