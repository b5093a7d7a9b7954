#include "zeb/Terminal.h"

#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <optional>
#include <utility>

namespace zeb {

namespace {

/// How long the rest of a key's sequence may take.
constexpr int sequenceMilliseconds = 30;

size_t lengthOfCharacter(char lead) {
  const auto byte = static_cast<unsigned char>(lead);
  if (byte < 0xC2) {
    return 1;
  }
  if (byte < 0xE0) {
    return 2;
  }
  return byte < 0xF0 ? 3 : 4;
}

std::optional<Key::Kind> controlKey(char byte) {
  switch (byte) {
    case '\r':
    case '\n':
      return Key::Kind::enter;
    case '\t':
      return Key::Kind::tab;
    case 0x7F:
    case 0x08:
      return Key::Kind::backspace;
    case 0x04:
      return Key::Kind::end;
    case 0x0E:
      return Key::Kind::down;
    case 0x10:
      return Key::Kind::up;
    case 0x15:
      return Key::Kind::deleteLine;
    case 0x17:
      return Key::Kind::deleteWord;
    default:
      return std::nullopt;
  }
}

/// The key of a control sequence that ends in this byte; those of no use here are none.
std::optional<Key::Kind> sequenceKey(char final) {
  if (final == 'A') {
    return Key::Kind::up;
  }
  return final == 'B' ? std::optional(Key::Kind::down) : std::nullopt;
}

}  // namespace

std::vector<Key> KeyDecoder::take(bool isLast) {
  std::vector<Key> keys;
  size_t at = 0;
  const auto addText = [&](std::string_view text) {
    if (keys.empty() || keys.back().kind != Key::Kind::text) {
      keys.push_back({Key::Kind::text, {}});
    }
    keys.back().text += text;
  };
  while (at < _bytes.size()) {
    const char byte = _bytes[at];
    if (byte == '\x1B') {
      if (at + 1 == _bytes.size()) {
        if (!isLast) {
          break;
        }
        keys.push_back({Key::Kind::escape, {}});
        ++at;
        continue;
      }
      if (_bytes[at + 1] != '[' && _bytes[at + 1] != 'O') {
        keys.push_back({Key::Kind::escape, {}});
        ++at;
        continue;
      }
      const auto isFinal = [](char c) { return c >= '@' && c <= '~'; };
      const auto end =
          std::find_if(_bytes.begin() + static_cast<std::ptrdiff_t>(at) + 2, _bytes.end(), isFinal);
      if (end == _bytes.end()) {
        if (isLast) {
          at = _bytes.size();
        }
        break;
      }
      if (const auto kind = sequenceKey(*end)) {
        keys.push_back({*kind, {}});
      }
      at = static_cast<size_t>(end - _bytes.begin()) + 1;
      continue;
    }
    if (const auto kind = controlKey(byte)) {
      keys.push_back({*kind, {}});
      ++at;
      continue;
    }
    if (static_cast<unsigned char>(byte) < 0x20) {
      ++at;
      continue;
    }
    const size_t length = lengthOfCharacter(byte);
    if (at + length > _bytes.size() && !isLast) {
      break;
    }
    addText(std::string_view(_bytes).substr(at, length));
    at += std::min(length, _bytes.size() - at);
  }
  _bytes.erase(0, at);
  return keys;
}

Terminal::Terminal(int input, int output) : _input(input), _output(output) {
  if (::tcgetattr(_input, &_before) != 0) {
    return;
  }
  termios raw = _before;
  raw.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
  raw.c_iflag &= ~static_cast<tcflag_t>(ICRNL | IXON);
  raw.c_cc[VMIN] = 0;
  raw.c_cc[VTIME] = 0;
  _changed = ::tcsetattr(_input, TCSADRAIN, &raw) == 0;
}

Terminal::~Terminal() {
  if (_changed) {
    ::tcsetattr(_input, TCSADRAIN, &_before);
  }
}

bool Terminal::hasInput() const {
  pollfd waiting{_input, POLLIN, 0};
  return ::poll(&waiting, 1, 0) > 0;
}

std::vector<Key> Terminal::keys() {
  std::array<char, 1024> buffer{};
  const ssize_t count = ::read(_input, buffer.data(), buffer.size());
  if (count <= 0) {
    return {{Key::Kind::end, {}}};
  }
  _decoder.feed({buffer.data(), static_cast<size_t>(count)});
  std::vector<Key> keys = _decoder.take(false);
  // An escape character may be the key, or the beginning of another key's sequence.
  pollfd waiting{_input, POLLIN, 0};
  if (::poll(&waiting, 1, keys.empty() ? sequenceMilliseconds : 0) == 0) {
    for (Key& key : _decoder.take(true)) {
      keys.push_back(std::move(key));
    }
  }
  return keys;
}

void Terminal::write(std::string_view text) const {
  while (!text.empty()) {
    const ssize_t count = ::write(_output, text.data(), text.size());
    if (count <= 0) {
      return;
    }
    text.remove_prefix(static_cast<size_t>(count));
  }
}

size_t Terminal::columns() const {
  winsize size{};
  return ::ioctl(_output, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : 80;
}

size_t Terminal::rows() const {
  winsize size{};
  return ::ioctl(_output, TIOCGWINSZ, &size) == 0 && size.ws_row > 0 ? size.ws_row : 24;
}

}  // namespace zeb
