// A caches folder of its own, and the program run on it.
#pragma once

#include <algorithm>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "tests/platform/QuickClock.h"
#include "tests/platform/TemporaryFolder.h"
#include "zeb/Commands.h"

namespace tests {

struct Outcome {
  zeb::ExitCode code = zeb::ExitCode::success;
  std::string out;
  std::string err;
};

/// The shipped book of that name.
inline std::string shippedBook(const std::string& name) {
  return std::string(ZEB_SOURCE_DIR) + "/books/" + name;
}

/// The parts of this build.
inline zebd::Installation installation() { return {ZEB_PLUGIN_BUNDLE, ZEB_TOOL}; }

class World {
 public:
  /// Time passes `pace` times as fast as the machine's.
  explicit World(double pace = 25) : _environment(_madeEnvironment(pace)) {}

  const TemporaryFolder& files() const { return _files; }
  std::string cacheFolder() const { return _files.path("cache"); }
  /// The folder of the catalogue.
  std::string booksFolder() const { return cacheFolder() + "/books"; }
  /// Where the plug-in puts the index of a book without localization.
  std::string indexPath(const std::string& bookID) const { return indexPath(bookID, bookID); }
  std::string indexPath(const std::string& bookID, const std::string& localization) const {
    return cacheFolder() + "/org.zeb.zebd/GeneratedIndexes/" + bookID + "/" + localization +
           ".helpindex";
  }

  /// Runs a command line in this process. `setUp` may change the console first.
  template <typename SetUp>
  Outcome zeb(std::vector<std::string> arguments, SetUp setUp) const {
    arguments.insert(arguments.begin(), {"--cache-dir", cacheFolder()});
    // The usual limit is short where time passes quickly and the machine is slow.
    if (std::find(arguments.begin(), arguments.end(), "--wait") == arguments.end()) {
      arguments.insert(arguments.begin(), {"--wait", "30000"});
    }
    std::ostringstream out;
    std::ostringstream err;
    zeb::Console console(out, err);
    setUp(console);
    Outcome run;
    run.code = zeb::run(arguments, installation(), console);
    run.out = out.str();
    run.err = err.str();
    return run;
  }
  Outcome zeb(std::vector<std::string> arguments) const {
    return zeb(std::move(arguments), [](zeb::Console&) {});
  }

  /// A page with a title, a description, a body and an anchor "anchor-<title>".
  std::string writePage(const std::string& name, const std::string& title,
                        const std::string& body) const {
    return _files.write(name, "<!DOCTYPE html><html><head><meta charset=\"utf-8\"><title>" + title +
                                  "</title><meta name=\"description\" content=\"About " + title +
                                  ".\"></head><body><h1 id=\"anchor-" + title + "\">" + title +
                                  "</h1><p>" + body + "</p></body></html>");
  }

 private:
  /// What is still going on after a command goes on in the world's own folder, and time passes so
  /// quickly that waits for quiet cost next to nothing.
  platform::Environment _madeEnvironment(double pace) const {
    platform::Environment environment = *platform::Environment::current();
    environment.clock = std::make_shared<QuickClock>(pace);
    environment.cachesDirectory = cacheFolder();
    environment.notificationCenter = platform::localNotificationCenter();
    return environment;
  }

  TemporaryFolder _files;
  platform::EnvironmentOverride _environment;
};

}  // namespace tests
