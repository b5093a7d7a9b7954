// Running text gathered piece by piece, with its white space put in order.
#pragma once

#include <string>
#include <string_view>

namespace bvmake {

/// Collects the text of one block or title: runs of white space become one blank, none is kept at
/// the ends, soft hyphens and byte order marks vanish (they would split words that readers see
/// whole). Takes UTF-8 and gives UTF-8. Thread-safety: confined to one thread.
class TextRun {
 public:
  void append(std::string_view text);

  /// As append(" ").
  void appendBlank() noexcept { _blankPending = !_text.empty(); }

  const std::string& text() const noexcept { return _text; }
  bool empty() const noexcept { return _text.empty(); }

  /// Forgets what was appended after the text had this length.
  void truncate(size_t length);

  /// The text so far; the run is empty afterwards.
  std::string take();

 private:
  std::string _text;
  bool _blankPending = false;
};

/// `text` as one run.
std::string collapsedText(std::string_view text);

/// Whether the text has a letter or digit of any script.
bool hasLetterOrDigit(std::string_view text) noexcept;

}  // namespace bvmake
