// Programs that a test starts and ends.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace tests {

/// A child that ends with its object, and at the latest with the test program, even with one that
/// crashes. Confined to one thread.
class ChildProcess {
 public:
  /// Starts `program` (a path) with the arguments; output goes to the file `output`. With
  /// `asNobody` and a test that runs as root, the child gives up all privileges. Throws
  /// std::runtime_error when that fails.
  ChildProcess(const std::string& program, const std::vector<std::string>& arguments,
               const std::string& output, bool asNobody = false);
  ~ChildProcess();
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;

  bool isRunning();
  /// Kills it, unless it has ended.
  void kill() const;
  /// Waits for its end; the exit status, or 128 and the signal's number.
  int wait();

 private:
  pid_t _process = 0;
  int _status = 0;
};

/// Runs a program to its end; throws std::runtime_error, with what it said, unless it exits with 0.
void runToEnd(const std::string& program, const std::vector<std::string>& arguments);

}  // namespace tests
