#include "bench/tool/ChildRun.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <stdexcept>

namespace bench {

namespace {

double seconds(const timeval& time) {
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * 1e-6;
}

/// The child's part; does not return.
[[noreturn]] void become(const std::vector<std::string>& words, const cpu_set_t& cores) {
  std::vector<char*> pointers;
  for (const std::string& word : words) {
    pointers.push_back(const_cast<char*>(word.c_str()));
  }
  pointers.push_back(nullptr);
  const int nowhere = open("/dev/null", O_WRONLY);
  dup2(nowhere, STDOUT_FILENO);
  dup2(nowhere, STDERR_FILENO);
  if (sched_setaffinity(0, sizeof cores, &cores) == 0) {
    execvp(pointers[0], pointers.data());
  }
  _exit(127);
}

}  // namespace

size_t availableCores() {
  cpu_set_t cores;
  return sched_getaffinity(0, sizeof cores, &cores) == 0 ? static_cast<size_t>(CPU_COUNT(&cores))
                                                         : 1;
}

Measured runToEnd(const std::vector<std::string>& words, size_t cores) {
  cpu_set_t available;
  cpu_set_t chosen;
  CPU_ZERO(&chosen);
  sched_getaffinity(0, sizeof available, &available);
  for (size_t core = 0, count = 0; core < CPU_SETSIZE && count < cores; ++core) {
    if (CPU_ISSET(core, &available)) {
      CPU_SET(core, &chosen);
      ++count;
    }
  }
  const auto begin = std::chrono::steady_clock::now();
  const pid_t child = fork();
  if (child == 0) {
    become(words, chosen);
  }
  int status = 0;
  rusage usage{};
  if (child < 0 || wait4(child, &status, 0, &usage) != child || status != 0) {
    throw std::runtime_error(words.front() + " failed");
  }
  const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - begin;
  return {elapsed.count(), seconds(usage.ru_utime) + seconds(usage.ru_stime),
          static_cast<uint64_t>(usage.ru_maxrss) * 1024};
}

}  // namespace bench
