#include "bvmake/Report.h"

#include <fmt/format.h>

#include <utility>

#include "bvmake/Printable.h"
#include "platform/Environment.h"

namespace bvmake {

namespace {

constexpr size_t barLength = 40;
constexpr platform::Clock::Instant timeBetweenDraws{0.1};

}  // namespace

void Report::filesDone(size_t, size_t) {}

StreamReport::StreamReport(std::FILE* stream, std::string program, int verbosity)
    : _stream(stream), _program(std::move(program)), _verbosity(verbosity) {}

StreamReport::~StreamReport() { _eraseBar(); }

void StreamReport::error(std::string_view text) { _writeLine("error: ", text); }

void StreamReport::warning(std::string_view text) { _writeLine("warning: ", text); }

void StreamReport::progress(int verbosity, std::string_view text) {
  if (wants(verbosity)) {
    _writeLine("", text);
  }
}

void StreamReport::filesDone(size_t done, size_t count) {
  if (!_showsBar || count == 0) {
    return;
  }
  const platform::Clock::Instant now = platform::Environment::current()->clock->elapsed();
  if (now < _nextDraw && done < count) {
    return;
  }
  _nextDraw = now + timeBetweenDraws;
  const size_t filled = done * barLength / count;
  const std::string bar = fmt::format("{}: [{:#<{}}{:.<{}}] {} of {} files", _program, "", filled,
                                      "", barLength - filled, done, count);
  _eraseBar();
  std::fwrite(bar.data(), 1, bar.size(), _stream);
  std::fflush(_stream);
  _barWidth = bar.size();
}

void StreamReport::_eraseBar() {
  if (_barWidth > 0) {
    const std::string blanks = "\r" + std::string(_barWidth, ' ') + "\r";
    std::fwrite(blanks.data(), 1, blanks.size(), _stream);
    std::fflush(_stream);
    _barWidth = 0;
  }
}

void StreamReport::_writeLine(std::string_view kind, std::string_view text) {
  _eraseBar();
  std::string line = _program;
  line.append(": ").append(kind);
  line.append(printable(text)).append("\n");
  std::fwrite(line.data(), 1, line.size(), _stream);
}

}  // namespace bvmake
