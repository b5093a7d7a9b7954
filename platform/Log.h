// Where log messages go.
#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

/// Takes finished messages with their level: 0 caught exceptions and failed child processes, 1
/// errors, 2 notable events, 3 progress, 4 detailed tracing, 5 flow of one query, 6 single results.
/// Thread-safety: internally synchronised.
class LogSink {
 public:
  virtual ~LogSink() = default;
  virtual void write(int level, std::string_view message) = 0;

  /// Whether messages of this level are wanted at all; lets callers skip formatting.
  virtual bool accepts(int level) const noexcept = 0;
};

/// Standard error, one line a message, for levels up to `maximumLevel`. Where standard error is
/// connected to the journal, each line begins with the journal's priority mark instead of our own.
std::shared_ptr<LogSink> standardErrorLogSink(int maximumLevel);

/// Keeps every message of every level. For tests.
class CapturingLogSink : public LogSink {
 public:
  struct Entry {
    int level;
    std::string message;
    friend bool operator==(const Entry&, const Entry&) = default;
  };

  void write(int level, std::string_view message) override;
  bool accepts(int) const noexcept override { return true; }

  std::vector<Entry> entries() const;
  /// The messages of one level, in order.
  std::vector<std::string> messages(int level) const;
  void clear();

 private:
  mutable std::mutex _mutex;
  std::vector<Entry> _entries;
};

}  // namespace platform
