// A caches folder of its own, and the program run on it.
#pragma once

#include <sstream>
#include <string>
#include <string_view>
#include <vector>

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

class World {
 public:
  const TemporaryFolder& files() const { return _files; }
  std::string cacheFolder() const { return _files.path("cache"); }
  /// The folder of the catalogue.
  std::string booksFolder() const { return cacheFolder() + "/books"; }

  /// Runs a command line in this process. `setUp` may change the console first.
  template <typename SetUp>
  Outcome zeb(std::vector<std::string> arguments, SetUp setUp) const {
    arguments.insert(arguments.begin(), {"--cache-dir", cacheFolder()});
    std::ostringstream out;
    std::ostringstream err;
    zeb::Console console(out, err);
    setUp(console);
    Outcome run;
    run.code = zeb::run(arguments, console);
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
  TemporaryFolder _files;
};

}  // namespace tests
