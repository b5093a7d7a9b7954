#include "tests/support/ChildProcess.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <iterator>
#include <stdexcept>

#include "tests/platform/TemporaryFolder.h"

namespace tests {

namespace {

int exitStatus(int status) {
  return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
}

}  // namespace

ChildProcess::ChildProcess(const std::string& program, const std::vector<std::string>& arguments,
                           const std::string& output, bool asNobody) {
  std::vector<std::string> words = {"/usr/bin/setpriv", "--pdeathsig=KILL"};
  if (asNobody && ::geteuid() == 0) {
    words.insert(words.end(), {"--reuid=65534", "--regid=65534", "--clear-groups"});
  }
  words.push_back(program);
  words.insert(words.end(), arguments.begin(), arguments.end());
  std::vector<char*> pointers;
  pointers.reserve(words.size() + 1);
  for (std::string& word : words) {
    pointers.push_back(word.data());
  }
  pointers.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, output.c_str(),
                                   O_WRONLY | O_CREAT | O_APPEND, 0644);
  posix_spawn_file_actions_adddup2(&actions, STDOUT_FILENO, STDERR_FILENO);
  const int failure =
      ::posix_spawn(&_process, pointers[0], &actions, nullptr, pointers.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (failure != 0) {
    throw std::runtime_error("cannot start " + program);
  }
}

ChildProcess::~ChildProcess() {
  if (_process != 0) {
    ::kill(_process, SIGKILL);
    wait();
  }
}

bool ChildProcess::isRunning() {
  int status = 0;
  if (_process != 0 && ::waitpid(_process, &status, WNOHANG) == _process) {
    _process = 0;
    _status = exitStatus(status);
  }
  return _process != 0;
}

void ChildProcess::kill() const {
  if (_process != 0) {
    ::kill(_process, SIGKILL);
  }
}

int ChildProcess::wait() {
  int status = 0;
  if (_process != 0 && ::waitpid(_process, &status, 0) == _process) {
    _process = 0;
    _status = exitStatus(status);
  }
  return _status;
}

void runToEnd(const std::string& program, const std::vector<std::string>& arguments) {
  const TemporaryFolder folder;
  const std::string output = folder.path("output");
  ChildProcess child(program, arguments, output);
  if (child.wait() != 0) {
    std::ifstream file(output);
    throw std::runtime_error(program +
                             " failed: " + std::string(std::istreambuf_iterator<char>(file), {}));
  }
}

}  // namespace tests
