// Which language a text is in, for books that do not say.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <string_view>

struct LUXLanguage;

/// Counts letters by script and stop words by language. Enough for whole pages, not for single
/// sentences. Thread-safety: confined to one thread.
class LUXLanguageGuess {
 public:
  void addText(std::string_view text);

  /// The language most of the text is in; where fewer than `leastStopWords` tell it, the foremost
  /// of its script; English where there are no letters. Of languages that are told by the same
  /// signs, the one that comes first in LUXLanguage::all().
  static constexpr uint64_t leastStopWords = 5;
  const LUXLanguage& language() const;

 private:
  /// Letters by ICU's number of their script.
  std::map<int, uint64_t> _letters;
  /// Stop words by position in LUXLanguage::all().
  std::map<size_t, uint64_t> _stopWords;
};
