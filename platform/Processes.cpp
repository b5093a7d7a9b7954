#include "platform/Processes.h"

#include <dirent.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>

#include "platform/Exception.h"
#include "platform/Files.h"

extern char** environ;

namespace platform {

namespace {

constexpr const char* launchException = "LaunchException";

[[noreturn]] void throwLaunchException(const std::string& path, int errorNumber) {
  char buffer[256];
  throw Exception(launchException, fmt::format("cannot launch {}: {}", path,
                                               strerror_r(errorNumber, buffer, sizeof buffer)));
}

/// What the child opens before it runs.
class FileActions {
 public:
  FileActions() { posix_spawn_file_actions_init(&_actions); }
  ~FileActions() { posix_spawn_file_actions_destroy(&_actions); }
  FileActions(const FileActions&) = delete;
  FileActions& operator=(const FileActions&) = delete;

  void emptyStandardInput() {
    posix_spawn_file_actions_addopen(&_actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
  }
  const posix_spawn_file_actions_t* get() const { return &_actions; }

 private:
  posix_spawn_file_actions_t _actions{};
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
  for (const std::string& argument : arguments) {
    if (argument.find('\0') != std::string::npos) {
      throwLaunchException(path, EINVAL);
    }
  }
  std::vector<std::string> copies = {path};
  copies.insert(copies.end(), arguments.begin(), arguments.end());
  std::vector<char*> pointers;
  for (std::string& copy : copies) {
    pointers.push_back(copy.data());
  }
  pointers.push_back(nullptr);

  FileActions actions;
  actions.emptyStandardInput();
  pid_t child = 0;
  const int failure =
      posix_spawn(&child, path.c_str(), actions.get(), nullptr, pointers.data(), environ);
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
  // One stream, one thread: readdir is safe here.
  while (const dirent* entry = ::readdir(folder)) {  // NOLINT(concurrency-mt-unsafe)
    if (const std::optional<int> number = processNumber(entry->d_name)) {
      entries.push_back({*number, {}});
    }
  }
  ::closedir(folder);
  std::sort(entries.begin(), entries.end(),
            [](const ProcessEntry& a, const ProcessEntry& b) { return a.processID < b.processID; });
  const auto files = systemFileManager();
  std::erase_if(entries, [&](ProcessEntry& entry) {
    const auto name = files->contentsAtPath(fmt::format("/proc/{}/comm", entry.processID));
    if (!name) {
      return true;  // it ended meanwhile
    }
    entry.commandName = std::string(name->view().substr(0, name->view().find('\n')));
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
