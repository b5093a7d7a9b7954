#include "zeb/Console.h"

#include <ostream>

#include "platform/Strings.h"

namespace zeb {

namespace {

const char* escapeSequence(Style style) {
  switch (style) {
    case Style::title:
      return "\033[1m";
    case Style::book:
      return "\033[36m";
    case Style::url:
      return "\033[34m";
    case Style::label:
      return "\033[2m";
    case Style::error:
      return "\033[1;31m";
  }
  return "";
}

std::string inStyle(Style style, std::string_view text) {
  std::string styled = escapeSequence(style);
  styled += text;
  styled += "\033[0m";
  return styled;
}

}  // namespace

std::string singleLine(std::string_view text) {
  const std::string repaired = platform::stringByRepairingUTF8(text);
  std::string line;
  line.reserve(repaired.size());
  bool blankPending = false;
  for (size_t at = 0; at < repaired.size();) {
    const auto byte = static_cast<unsigned char>(repaired[at]);
    // U+0080 to U+009F are control characters, too: terminals obey some of them.
    const bool isLateControl = byte == 0xC2 && at + 1 < repaired.size() &&
                               static_cast<unsigned char>(repaired[at + 1]) < 0xA0;
    if (byte <= 0x20 || byte == 0x7F || isLateControl) {
      blankPending = !line.empty();
      at += isLateControl ? 2 : 1;
      continue;
    }
    if (blankPending) {
      line += ' ';
      blankPending = false;
    }
    line += repaired[at++];
  }
  return line;
}

bool Console::_colored(bool isTerminal) const {
  switch (_colorMode) {
    case ColorMode::always:
      return true;
    case ColorMode::never:
      return false;
    case ColorMode::automatic:
      break;
  }
  return isTerminal && !_colorsUnwanted;
}

std::string Console::styled(Style style, std::string_view text) const {
  return _colored(_outIsTerminal) ? inStyle(style, text) : std::string(text);
}

void Console::_message(std::string_view kind, std::string_view text) {
  clearProgress();
  _err << "zeb: ";
  if (!kind.empty()) {
    _err << (_colored(_errIsTerminal) ? inStyle(Style::error, kind) : std::string(kind)) << ' ';
  }
  _err << singleLine(text) << '\n';
}

void Console::error(std::string_view text) { _message("error:", text); }

void Console::warning(std::string_view text) { _message("warning:", text); }

void Console::note(std::string_view text) { _message({}, text); }

void Console::progress(std::string_view text) {
  if (!_errIsTerminal) {
    return;
  }
  _err << "\r\033[K" << singleLine(text) << std::flush;
  _progressShown = true;
}

void Console::clearProgress() {
  if (_progressShown) {
    _err << "\r\033[K" << std::flush;
    _progressShown = false;
  }
}

bool Console::flush() {
  clearProgress();
  _out.flush();
  _err.flush();
  return _out.good();
}

}  // namespace zeb
