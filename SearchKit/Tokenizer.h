// Splits text into terms, the same way for pages and for queries.
//
// A word is a longest run of letters and digits; everything else separates, inside words too:
// "wi-fi", "file_name" and "l'image" are two words each, "C++" is "c". One rule for all keeps a
// file name findable by its parts and an elided article from hiding its noun; phrases put the
// parts together again. In scripts without blanks ICU's dictionaries find the words. What is
// folded is told in TextFolding.h.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "SearchKit/TextFolding.h"
#include "SearchKit/WordEndsCache.h"

namespace searchkit {

/// The version of the rules in this file and in TextFolding.h. An index says by which its text was
/// split; one made by rules that this code no longer has cannot be opened.
inline constexpr uint32_t tokenizerRules = 1;

/// The term for a stretch of folded text: UTF-8, cut at a character when it is too long for an
/// index.
std::string termFromFolded(std::u16string_view folded);

/// Splits texts into terms. Thread-safety: confined to one thread (it keeps buffers).
class Tokenizer {
 public:
  /// Terms of fewer characters are reported as short, but for those of unspaced letters.
  explicit Tokenizer(size_t minimumTermLength = 1) : _minimumTermLength(minimumTermLength) {}

  /// From the first byte of each term on, so many can be read, whatever follows the term.
  static constexpr size_t readableLength = 8;

  /// Calls `sink(std::string_view term, bool isShort)` for each word of the text, in order. The
  /// term is valid until the sink returns.
  ///
  /// Words of ASCII are found and folded 64 bytes at a time; letters whose folding needs no look at
  /// what is beside them are folded by table, and runs of Han, kana and Hangul that fold to
  /// themselves go straight to the dictionaries. Only what lies between two ASCII separators around
  /// any other character is folded by ICU. All ways give the same terms.
  template <typename Sink>
  void tokenize(std::string_view text, Sink&& sink) {
    using Plain = std::remove_reference_t<Sink>;
    _tokenize(text, Receiver{&sink, [](void* context, std::string_view term, bool isShort) {
                               (*static_cast<Plain*>(context))(term, isShort);
                             }});
  }

  /// As tokenize(), but without the tables. For comparison.
  template <typename Sink>
  void tokenizeByLibrary(std::string_view text, Sink&& sink) {
    using Plain = std::remove_reference_t<Sink>;
    _tokenizeByLibrary(text,
                       Receiver{&sink, [](void* context, std::string_view term, bool isShort) {
                                  (*static_cast<Plain*>(context))(term, isShort);
                                }});
  }

  /// Whether a term is below the minimum length.
  bool isShort(std::string_view term, bool unspaced) const noexcept;

 private:
  struct Receiver {
    void* context;
    void (*call)(void*, std::string_view, bool);
    void operator()(std::string_view term, bool isShort) const { call(context, term, isShort); }
  };

  void _tokenize(std::string_view text, Receiver sink);
  const uint8_t* _takeASCII(const uint8_t* at, const uint8_t* end, const Receiver& sink);
  const uint8_t* _takeWord(const uint8_t* at, const uint8_t* end, const Receiver& sink);
  const uint8_t* _takeUnspaced(const uint8_t* at, const uint8_t* end, const Receiver& sink);
  void _splitUnspaced(std::string_view run, const Receiver& sink);
  void _tokenizeByLibrary(std::string_view text, const Receiver& sink);

  size_t _minimumTermLength;
  std::u16string _folded;
  std::vector<Run> _runs;
  std::vector<size_t> _wordEnds;
  WordEndsCache _knownRuns;
};

}  // namespace searchkit
