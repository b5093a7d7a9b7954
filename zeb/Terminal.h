// A terminal that gives each key as it is pressed.
#pragma once

#include <termios.h>

#include <cstddef>
#include <string>
#include <vector>

namespace zeb {

/// One key.
struct Key {
  enum class Kind { text, backspace, deleteWord, deleteLine, enter, escape, up, down, tab, end };
  Kind kind = Kind::text;
  /// What was typed or pasted, UTF-8; for text only.
  std::string text;

  friend bool operator==(const Key&, const Key&) = default;
};

/// Bytes from a terminal, made keys. Sequences that are cut off wait for their rest.
/// Thread-safety: confined to one thread.
class KeyDecoder {
 public:
  void feed(std::string_view bytes) { _bytes += bytes; }
  /// The keys that are complete. With `isLast`, nothing more comes soon: an escape character alone
  /// is then the escape key.
  std::vector<Key> take(bool isLast);

 private:
  std::string _bytes;
};

/// Puts a terminal into the state in which it hands over keys at once and shows none by itself, for
/// its own lifetime. Thread-safety: confined to one thread.
class Terminal {
 public:
  /// File descriptors of the terminal.
  Terminal(int input, int output);
  ~Terminal();
  Terminal(const Terminal&) = delete;
  Terminal& operator=(const Terminal&) = delete;

  /// The descriptor that keys come from, to watch it.
  int input() const { return _input; }
  /// Whether a key may be there. Does not wait.
  bool hasInput() const;
  /// The keys pressed so far. Kind::end when the terminal is gone.
  std::vector<Key> keys();
  void write(std::string_view text) const;
  /// How many columns and rows it has now; 80 and 24 where that cannot be told.
  size_t columns() const;
  size_t rows() const;

 private:
  const int _input;
  const int _output;
  termios _before{};
  bool _changed = false;
  KeyDecoder _decoder;
};

}  // namespace zeb
