// What the tool tells a person while it works.
#pragma once

#include <cstddef>
#include <cstdio>
#include <string>
#include <string_view>

#include "platform/Clock.h"

namespace bvmake {

/// Takes the messages of one run. Texts are single lines in UTF-8, without program name and without
/// line end; names of files in them are as found on the disk.
/// Thread-safety: an implementation is confined to the thread that calls run().
class Report {
 public:
  virtual ~Report() = default;

  /// The run fails because of this.
  virtual void error(std::string_view text) = 0;

  /// Something was left out or looks wrong; the run goes on.
  virtual void warning(std::string_view text) = 0;

  /// Progress of interest from `verbosity` on: 1 what the run did as a whole, 2 each page, 3 why
  /// each thing was left out that is left out in the ordinary course of things.
  virtual void progress(int verbosity, std::string_view text) = 0;

  /// How far the run is: so many of the files are done. Called after each; nothing is done here.
  virtual void filesDone(size_t done, size_t count);

  /// Whether progress() of this verbosity goes anywhere; lets callers skip formatting.
  virtual bool wants(int verbosity) const noexcept = 0;
};

/// Writes each message as a line "<program>: error: …", "<program>: warning: …" or
/// "<program>: …" to a stream. Control characters (file names may hold them) come out as '?'.
/// On a terminal it can show below them how far the run is; nothing of that is left in the end.
class StreamReport : public Report {
 public:
  /// The stream must outlive the report.
  StreamReport(std::FILE* stream, std::string program, int verbosity);
  ~StreamReport() override;
  StreamReport(const StreamReport&) = delete;
  StreamReport& operator=(const StreamReport&) = delete;

  /// From now on filesDone() draws a bar, at most ten times a second, unless each page is told of
  /// anyway.
  void showProgressBar() noexcept { _showsBar = _verbosity < 2; }

  void error(std::string_view text) override;
  void warning(std::string_view text) override;
  void progress(int verbosity, std::string_view text) override;
  void filesDone(size_t done, size_t count) override;
  bool wants(int verbosity) const noexcept override { return verbosity <= _verbosity; }

 private:
  void _writeLine(std::string_view kind, std::string_view text);
  void _eraseBar();

  std::FILE* _stream;
  std::string _program;
  int _verbosity;
  bool _showsBar = false;
  /// Columns of the bar on the terminal; 0 while there is none.
  size_t _barWidth = 0;
  platform::Clock::Instant _nextDraw{};
};

}  // namespace bvmake
