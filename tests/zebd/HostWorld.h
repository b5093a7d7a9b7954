// A computer with a caches folder of its own, on which a host runs.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/Processes.h"
#include "tests/platform/QuickClock.h"
#include "tests/platform/TemporaryFolder.h"
#include "zebd/Host.h"

namespace tests {

/// Time enough for anything that ends at all.
inline constexpr platform::Seconds ample{6000};

/// The real plug-in and the real indexing tool, in quick time.
class HostWorld {
 public:
  HostWorld() : _environment(_made()) {}

  std::unique_ptr<zebd::Host> startHost() const {
    platform::Error error;
    std::unique_ptr<zebd::Host> started =
        zebd::Host::start(ZEB_PLUGIN_BUNDLE, {true, false, folder.path("caches/help")}, error);
    EXPECT_NE(started, nullptr) << error.description;
    return started;
  }
  /// A page with a title, which is also the name of an anchor.
  void writePage(const std::string& name, const std::string& title, const std::string& body) const {
    folder.write(name, "<html><head><title>" + title + "</title></head><body><h1 id=\"" + title +
                           "\">" + title + "</h1><p>" + body + "</p></body></html>");
  }
  static bool waitUntilQuiet(const zebd::Owner& owner) {
    return zebd::Host::runMainLoopUntil([&] { return owner.isQuietFor(platform::Seconds(0.5)); },
                                        ample);
  }
  bool hasIndex(const std::string& bookID, const std::string& localization) const {
    return std::filesystem::exists(folder.path("caches/org.zeb.zebd/GeneratedIndexes/") + bookID +
                                   "/" + localization + ".helpindex");
  }

  /// What was said of this world; a host of the test before may still be at work.
  std::vector<std::string> messages(int level) const {
    std::vector<std::string> own = log->messages(level);
    own.erase(std::remove_if(own.begin(), own.end(),
                             [this](const std::string& message) {
                               return message.find("/zeb-test-") != std::string::npos &&
                                      message.find(folder.path("")) == std::string::npos;
                             }),
              own.end());
    return own;
  }

  TemporaryFolder folder;
  std::shared_ptr<platform::CapturingLogSink> log = std::make_shared<platform::CapturingLogSink>();

 private:
  platform::Environment _made() const {
    platform::Environment environment = platform::Environment::system();
    environment.clock = std::make_shared<QuickClock>(20);
    environment.log = log;
    environment.processLauncher =
        platform::substitutingProcessLauncher("/usr/bin/bvmake", ZEB_TOOL);
    environment.notificationCenter = platform::localNotificationCenter();
    environment.standardOutput = [](const std::string&) {};
    environment.cachesDirectory = folder.path("caches");
    return environment;
  }

  platform::EnvironmentOverride _environment;
};

}  // namespace tests
