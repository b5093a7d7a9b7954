#include "platform/Processes.h"

#include <dirent.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>

#include "platform/Exception.h"
#include "platform/Files.h"

namespace platform {

namespace {

constexpr const char* launchException = "LaunchException";

[[noreturn]] void throwLaunchException(const std::string& path, int errorNumber) {
  char buffer[256];
  throw Exception(launchException, fmt::format("cannot launch {}: {}", path,
                                               strerror_r(errorNumber, buffer, sizeof buffer)));
}

/// What a child starts with: an empty standard input, the parent's two outputs, no other open file,
/// and signals as a fresh process has them, whatever the host ignores or blocks for itself.
class ChildSetup {
 public:
  ChildSetup() {
    posix_spawn_file_actions_init(&_actions);
    posix_spawn_file_actions_addopen(&_actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addclosefrom_np(&_actions, STDERR_FILENO + 1);

    posix_spawnattr_init(&_attributes);
    sigset_t signals;
    sigemptyset(&signals);
    posix_spawnattr_setsigmask(&_attributes, &signals);
    sigfillset(&signals);
    posix_spawnattr_setsigdefault(&_attributes, &signals);
    posix_spawnattr_setflags(&_attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
  }
  ~ChildSetup() {
    posix_spawnattr_destroy(&_attributes);
    posix_spawn_file_actions_destroy(&_actions);
  }
  ChildSetup(const ChildSetup&) = delete;
  ChildSetup& operator=(const ChildSetup&) = delete;

  const posix_spawn_file_actions_t* actions() const { return &_actions; }
  const posix_spawnattr_t* attributes() const { return &_attributes; }

 private:
  posix_spawn_file_actions_t _actions{};
  posix_spawnattr_t _attributes{};
};

class SubstitutingLauncher final : public ProcessLauncher {
 public:
  SubstitutingLauncher(std::string path, std::string program)
      : _path(std::move(path)), _program(std::move(program)) {}

  int launchAndWait(const std::string& path, const std::vector<std::string>& arguments) override {
    return ProcessLauncher::launchAndWait(path == _path ? _program : path, arguments);
  }

 private:
  const std::string _path;
  const std::string _program;
};

std::optional<int> processNumber(std::string_view name) {
  int number = 0;
  const auto result = std::from_chars(name.data(), name.data() + name.size(), number);
  const bool whole = result.ec == std::errc() && result.ptr == name.data() + name.size();
  return whole && number > 0 ? std::optional<int>(number) : std::nullopt;
}

}  // namespace

int ProcessLauncher::launchAndWait(const std::string& path,
                                   const std::vector<std::string>& arguments) {
  std::vector<std::string> copies = {path};
  copies.insert(copies.end(), arguments.begin(), arguments.end());
  std::vector<char*> pointers;
  for (std::string& copy : copies) {
    if (copy.find('\0') != std::string::npos) {
      throwLaunchException(path, EINVAL);
    }
    pointers.push_back(copy.data());
  }
  pointers.push_back(nullptr);

  const ChildSetup setup;
  pid_t child = 0;
  const int failure = posix_spawn(&child, path.c_str(), setup.actions(), setup.attributes(),
                                  pointers.data(), environ);
  if (failure != 0) {
    throwLaunchException(path, failure);
  }
  int status = 0;
  while (::waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      throwLaunchException(path, errno);
    }
  }
  return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
}

std::shared_ptr<ProcessLauncher> systemProcessLauncher() {
  static const auto launcher = std::make_shared<ProcessLauncher>();
  return launcher;
}

std::shared_ptr<ProcessLauncher> substitutingProcessLauncher(const std::string& path,
                                                             const std::string& program) {
  return std::make_shared<SubstitutingLauncher>(path, program);
}

int ProcessTable::readProcesses(std::vector<ProcessEntry>& entries) const {
  DIR* folder = ::opendir("/proc");
  if (folder == nullptr) {
    return errno;
  }
  entries.clear();
  errno = 0;
  // One stream, one thread: readdir is safe here.
  while (const dirent* entry = ::readdir(folder)) {  // NOLINT(concurrency-mt-unsafe)
    if (const std::optional<int> number = processNumber(entry->d_name)) {
      entries.push_back({*number, {}});
    }
    errno = 0;
  }
  const int failure = errno;
  ::closedir(folder);
  if (failure != 0) {
    entries.clear();
    return failure;
  }
  std::sort(entries.begin(), entries.end(),
            [](const ProcessEntry& a, const ProcessEntry& b) { return a.processID < b.processID; });
  const auto files = systemFileManager();
  std::erase_if(entries, [&](ProcessEntry& entry) {
    const auto name = files->contentsAtPath(fmt::format("/proc/{}/comm", entry.processID));
    if (!name) {
      return true;  // it ended meanwhile
    }
    // The line break at the end is the kernel's; one before it belongs to the name.
    entry.commandName = std::string(name->view());
    if (entry.commandName.ends_with('\n')) {
      entry.commandName.pop_back();
    }
    return false;
  });
  return 0;
}

std::optional<size_t> ProcessTable::maximumArgumentSize() const {
  const long size = ::sysconf(_SC_ARG_MAX);
  return size > 0 ? std::optional<size_t>(static_cast<size_t>(size)) : std::nullopt;
}

std::optional<Data> ProcessTable::argumentsOfProcess(int processID) const {
  return systemFileManager()->contentsAtPath(fmt::format("/proc/{}/cmdline", processID));
}

std::shared_ptr<ProcessTable> systemProcessTable() {
  static const auto table = std::make_shared<ProcessTable>();
  return table;
}

}  // namespace platform
