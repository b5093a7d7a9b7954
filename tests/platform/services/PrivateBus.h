// A message bus that belongs to one test.
#pragma once

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>
#include <string>
#include <utility>

#include "tests/platform/TemporaryFolder.h"

namespace tests {

/// Runs a bus daemon on a socket in a temporary folder, from construction to stop() or the end.
class PrivateBus {
 public:
  /// `more` goes into the configuration.
  explicit PrivateBus(const std::string& more = {}) {
    const std::string configuration = _folder.write(
        "bus.conf",
        "<!DOCTYPE busconfig PUBLIC \"-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN\" "
        "\"http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd\">"
        "<busconfig><type>session</type><listen>unix:path=" +
            _folder.path("bus") +
            "</listen><auth>EXTERNAL</auth><policy context=\"default\">"
            "<allow send_destination=\"*\" eavesdrop=\"true\"/><allow eavesdrop=\"true\"/>"
            "<allow own=\"*\"/><allow user=\"*\"/></policy>" +
            more + "</busconfig>");
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) {
      throw std::runtime_error("no pipe");
    }
    // The bus ends with the test, even with one that crashes.
    std::string wrapper = "/usr/bin/setpriv";
    std::string withParent = "--pdeathsig=KILL";
    std::string program = "/usr/bin/dbus-daemon";
    std::string file = "--config-file=" + configuration;
    std::string inForeground = "--nofork";
    std::string print = "--print-address=1";
    char* arguments[] = {wrapper.data(),      withParent.data(), program.data(), file.data(),
                         inForeground.data(), print.data(),      nullptr};
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
    // It complains there about limits that it may not raise.
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    const int failure =
        ::posix_spawn(&_process, wrapper.c_str(), &actions, nullptr, arguments, environ);
    posix_spawn_file_actions_destroy(&actions);
    ::close(ends[1]);
    if (failure != 0) {
      ::close(ends[0]);
      throw std::runtime_error("cannot start " + program);
    }
    // One line, written once the bus listens.
    char byte = 0;
    while (::read(ends[0], &byte, 1) == 1 && byte != '\n') {
      _address += byte;
    }
    ::close(ends[0]);
    if (_address.empty()) {
      stop();
      throw std::runtime_error("the bus did not start");
    }
  }
  ~PrivateBus() { stop(); }
  PrivateBus(const PrivateBus&) = delete;
  PrivateBus& operator=(const PrivateBus&) = delete;

  const std::string& address() const { return _address; }
  std::string socketPath() const { return _folder.path("bus"); }

  void stop() {
    if (const pid_t process = std::exchange(_process, 0); process != 0) {
      ::kill(process, SIGKILL);
      ::waitpid(process, nullptr, 0);
    }
  }

 private:
  TemporaryFolder _folder;
  std::string _address;
  pid_t _process = 0;
};

}  // namespace tests
