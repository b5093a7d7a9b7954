// Child processes and the table of running ones.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Data.h"

namespace platform {

/// Starts child processes. Thread-safety: internally synchronised.
class ProcessLauncher {
 public:
  virtual ~ProcessLauncher() = default;

  /// Runs the program at `path` with `arguments` (without the program's own name) and waits until
  /// it has ended. Returns its exit status, or for one that a signal ended 128 plus the signal's
  /// number. Standard input is empty; standard output and error are this process's; the child gets
  /// no other open file, and no signal is ignored or blocked in it. Throws Exception
  /// "LaunchException" when it cannot be started: no such program, no right to run it, a NUL in its
  /// path or in an argument.
  virtual int launchAndWait(const std::string& path, const std::vector<std::string>& arguments);
};

/// The real launcher.
std::shared_ptr<ProcessLauncher> systemProcessLauncher();

/// A launcher that starts other programs than the paths asked for say: a program of a build folder
/// in place of an installed one. Other paths are started as they are.
std::shared_ptr<ProcessLauncher> substitutingProcessLauncher(const std::string& path,
                                                             const std::string& program);

/// One running process.
struct ProcessEntry {
  int processID = 0;
  /// The kernel's name of the command: the program's file name, its first 15 bytes.
  std::string commandName;
};

/// The processes of the machine, as the kernel's process files show them.
/// Thread-safety: internally synchronised (it has no state of its own).
class ProcessTable {
 public:
  virtual ~ProcessTable() = default;

  /// Replaces `entries` by the processes, lowest number first. Returns 0, or an error number on
  /// failure.
  virtual int readProcesses(std::vector<ProcessEntry>& entries) const;

  /// The longest argument area that a process may have; absent when that cannot be told.
  virtual std::optional<size_t> maximumArgumentSize() const;

  /// The argument area of a process: the program's own name and its arguments, each ended by a NUL.
  /// Absent when there is no such process or it may not be read.
  virtual std::optional<Data> argumentsOfProcess(int processID) const;
};

/// The real table.
std::shared_ptr<ProcessTable> systemProcessTable();

}  // namespace platform
