#include "bvmake/Report.h"

#include <utility>

#include "bvmake/Printable.h"

namespace bvmake {

void Report::filesDone(size_t, size_t) {}

StreamReport::StreamReport(std::FILE* stream, std::string program, int verbosity)
    : _stream(stream), _program(std::move(program)), _verbosity(verbosity) {}

void StreamReport::error(std::string_view text) { _writeLine("error: ", text); }

void StreamReport::warning(std::string_view text) { _writeLine("warning: ", text); }

void StreamReport::progress(int verbosity, std::string_view text) {
  if (wants(verbosity)) {
    _writeLine("", text);
  }
}

void StreamReport::_writeLine(std::string_view kind, std::string_view text) {
  std::string line = _program;
  line.append(": ").append(kind);
  line.append(printable(text)).append("\n");
  std::fwrite(line.data(), 1, line.size(), _stream);
}

}  // namespace bvmake
