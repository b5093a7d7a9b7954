#include "platform/Log.h"

#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

namespace platform {

namespace {

/// The journal tells the processes whose standard error it reads which stream that is; a process
/// that was redirected since then no longer matches.
bool standardErrorIsJournal() {
  const char* stream = std::getenv("JOURNAL_STREAM");  // NOLINT(concurrency-mt-unsafe)
  struct stat status {};
  if (stream == nullptr || fstat(STDERR_FILENO, &status) != 0) {
    return false;
  }
  return fmt::format("{}:{}", status.st_dev, status.st_ino) == stream;
}

/// Our level as the journal's priority: 3 error, 4 warning, 5 notice, 6 information, 7 debug.
int journalPriority(int level) {
  switch (level) {
    case 0:
    case 1:
      return 3;
    case 2:
      return 5;
    case 3:
      return 6;
    default:
      return 7;
  }
}

class StandardErrorLogSink final : public LogSink {
 public:
  explicit StandardErrorLogSink(int maximumLevel)
      : _maximumLevel(maximumLevel), _journal(standardErrorIsJournal()) {}

  bool accepts(int level) const noexcept override { return level <= _maximumLevel; }

  void write(int level, std::string_view message) override {
    if (!accepts(level)) {
      return;
    }
    std::string text = _journal ? fmt::format("<{}>{}", journalPriority(level), message)
                                : fmt::format("[{}] {}", level, message);
    text += '\n';
    // One write a message, so that messages of several threads do not mix.
    for (size_t done = 0; done < text.size();) {
      const ssize_t count = ::write(STDERR_FILENO, text.data() + done, text.size() - done);
      if (count <= 0) {
        return;
      }
      done += static_cast<size_t>(count);
    }
  }

 private:
  const int _maximumLevel;
  const bool _journal;
};

}  // namespace

std::shared_ptr<LogSink> standardErrorLogSink(int maximumLevel) {
  return std::make_shared<StandardErrorLogSink>(maximumLevel);
}

void CapturingLogSink::write(int level, std::string_view message) {
  const std::lock_guard lock(_mutex);
  _entries.push_back({level, std::string(message)});
}

std::vector<CapturingLogSink::Entry> CapturingLogSink::entries() const {
  const std::lock_guard lock(_mutex);
  return _entries;
}

std::vector<std::string> CapturingLogSink::messages(int level) const {
  const std::lock_guard lock(_mutex);
  std::vector<std::string> messages;
  for (const Entry& entry : _entries) {
    if (entry.level == level) {
      messages.push_back(entry.message);
    }
  }
  return messages;
}

void CapturingLogSink::clear() {
  const std::lock_guard lock(_mutex);
  _entries.clear();
}

}  // namespace platform
