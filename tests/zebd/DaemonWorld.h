// A session with a bus that starts the real daemon.
#pragma once

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

#include "tests/platform/TemporaryFolder.h"
#include "tests/platform/services/PrivateBus.h"
#include "tests/support/ChildProcess.h"

namespace tests {

/// Sets a variable of this process, and so of its children, for a while.
class Variable {
 public:
  Variable(const char* name, std::string value) : _name(name), _value(std::move(value)) { set(); }
  ~Variable() { ::unsetenv(_name); }
  Variable(const Variable&) = delete;
  Variable& operator=(const Variable&) = delete;

  /// Again, where somebody else has set it meanwhile.
  void set() const { ::setenv(_name, _value.c_str(), 1); }

 private:
  const char* const _name;
  const std::string _value;
};

inline std::string contents(const std::string& path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), {}};
}

/// A session of its own, with a bus that starts the real daemon when somebody asks for it.
class DaemonWorld {
 public:
  explicit DaemonWorld(const std::string& options = "--idle 3600") : bus(_configuration(options)) {
    page("garden", "Roses", "Cut roses in spring.");
    page("kitchen", "Boiling", "Put water into a pot.");
  }
  ~DaemonWorld() {
    if (const pid_t process = daemonProcess(); process > 0) {
      ::kill(process, SIGKILL);
    }
  }

  void page(const std::string& book, const std::string& title, const std::string& text) const {
    folder.write(
        "share/help/en/" + book + "/index.html",
        "<title>" + title + "</title><h1 id=\"top\">" + title + "</h1><p>" + text + "</p>");
  }
  /// Answers of the daemon, started by the bus where it does not run.
  std::string gdbus(const std::vector<std::string>& arguments) const {
    const std::string output = folder.path("output");
    std::filesystem::remove(output);
    std::vector<std::string> line = {
        "call",   "--address",    bus.address(),   "--timeout",     "60",
        "--dest", "org.zeb.zebd", "--object-path", "/org/zeb/Help", "--method"};
    line.insert(line.end(), arguments.begin(), arguments.end());
    ChildProcess("/usr/bin/gdbus", line, output).wait();
    return contents(output);
  }
  std::string status() const { return gdbus({"org.zeb.Help1.Status"}); }
  bool isThere() const { return _askBus("NameHasOwner") == "(true,)\n"; }
  /// The daemon that runs; 0 where none does.
  pid_t daemonProcess() const {
    const std::string answer = _askBus("GetConnectionUnixProcessID");
    constexpr std::string_view start = "(uint32 ";
    return answer.starts_with(start) ? std::atoi(answer.c_str() + start.size()) : 0;
  }
  /// Waits for a state that is bound to come; false when that takes unreasonably long.
  template <typename Condition>
  static bool waitFor(const Condition& condition) {
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(120);
    while (!condition()) {
      if (std::chrono::steady_clock::now() > end) {
        return false;
      }
      std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    return true;
  }
  bool waitUntilIndexed(const std::string& count) const {
    return waitFor(
        [&] { return status().find("'indexed': <uint64 " + count) != std::string::npos; });
  }
  bool waitUntilGone(pid_t process) const {
    return waitFor([&] { return daemonProcess() != process; });
  }
  /// Files that a writer leaves behind when it is killed.
  std::vector<std::string> temporaryFiles() const {
    std::vector<std::string> paths;
    std::error_code error;
    for (std::filesystem::recursive_directory_iterator entry(folder.path("cache"), error), end;
         !error && entry != end; entry.increment(error)) {
      const std::string name = entry->path().filename().string();
      if (name.find(".tmp") != std::string::npos || name.find(".new") != std::string::npos) {
        paths.push_back(entry->path().string());
      }
    }
    return paths;
  }
  /// Exit code and output of the command line, as a program of this session or, with
  /// `hasBus` false, of one without a bus.
  std::string zeb(const std::vector<std::string>& arguments, bool hasBus = true) const {
    return endOf(*startZeb(arguments, hasBus));
  }
  /// The same in two steps, one command at a time.
  std::unique_ptr<ChildProcess> startZeb(const std::vector<std::string>& arguments,
                                         bool hasBus = true) const {
    const Variable address("DBUS_SESSION_BUS_ADDRESS",
                           hasBus ? bus.address() : "unix:path=" + folder.path("none"));
    std::filesystem::remove(folder.path("zeb output"));
    return std::make_unique<ChildProcess>(ZEB_PROGRAM, arguments, folder.path("zeb output"));
  }
  std::string endOf(ChildProcess& program) const {
    const int code = program.wait();
    return std::to_string(code) + "\n" + contents(folder.path("zeb output"));
  }
  bool waitUntilIdle() const {
    return waitFor([this] {
      const std::string now = status();
      return now.find("'guards': <int64 0>") != std::string::npos &&
             now.find("'scanning': <false>") != std::string::npos;
    });
  }

  /// Makes this the session of the programs that are started from now on, where there are several.
  void enter() const {
    for (const Variable* variable : {&cache, &data, &shared, &config, &language}) {
      variable->set();
    }
  }

  TemporaryFolder folder;
  const Variable cache{"XDG_CACHE_HOME", folder.path("cache")};
  const Variable data{"XDG_DATA_HOME", folder.path("own")};
  const Variable shared{"XDG_DATA_DIRS", folder.path("share")};
  const Variable config{"XDG_CONFIG_HOME", folder.path("config")};
  const Variable language{"LANGUAGE", "en"};
  PrivateBus bus;

 private:
  /// What the bus itself says of the daemon's name.
  std::string _askBus(const std::string& member) const {
    const std::string output = folder.path("of the bus");
    std::filesystem::remove(output);
    ChildProcess(
        "/usr/bin/gdbus",
        {"call", "--address", bus.address(), "--dest", "org.freedesktop.DBus", "--object-path", "/",
         "--method", "org.freedesktop.DBus." + member, "org.zeb.zebd"},
        output)
        .wait();
    return contents(output);
  }
  /// The bus reads its service files when it starts, and notices changes late.
  std::string _configuration(const std::string& options) const {
    folder.write("services/org.zeb.zebd.service",
                 "[D-BUS Service]\nName=org.zeb.zebd\nExec=" ZEB_DAEMON " " + options + "\n");
    return "<servicedir>" + folder.path("services") + "</servicedir>";
  }
};

}  // namespace tests
