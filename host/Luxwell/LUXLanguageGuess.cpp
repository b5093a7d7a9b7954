#include "host/Luxwell/LUXLanguageGuess.h"

#include <unicode/uchar.h>
#include <unicode/uscript.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <unordered_map>
#include <vector>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXFolding.h"
#include "host/Luxwell/LUXLanguage.h"
#include "host/Luxwell/LUXStopWords.h"

namespace {

constexpr const char* fallbackTag = "en";

struct Script {
  UScriptCode code;
  // The language of a text in this script in which no stop word tells another.
  const char* tag;
};

constexpr Script scripts[] = {
    {USCRIPT_ARABIC, "ar"},   {USCRIPT_ARMENIAN, "hy"},   {USCRIPT_BENGALI, "bn"},
    {USCRIPT_CYRILLIC, "ru"}, {USCRIPT_DEVANAGARI, "hi"}, {USCRIPT_ETHIOPIC, "am"},
    {USCRIPT_GEORGIAN, "ka"}, {USCRIPT_GREEK, "el"},      {USCRIPT_GUJARATI, "gu"},
    {USCRIPT_GURMUKHI, "pa"}, {USCRIPT_HAN, "zh"},        {USCRIPT_HANGUL, "ko"},
    {USCRIPT_HEBREW, "he"},   {USCRIPT_HIRAGANA, "ja"},   {USCRIPT_KANNADA, "kn"},
    {USCRIPT_KATAKANA, "ja"}, {USCRIPT_KHMER, "km"},      {USCRIPT_LAO, "lo"},
    {USCRIPT_LATIN, "en"},    {USCRIPT_MALAYALAM, "ml"},  {USCRIPT_MYANMAR, "my"},
    {USCRIPT_ORIYA, "or"},    {USCRIPT_SINHALA, "si"},    {USCRIPT_TAMIL, "ta"},
    {USCRIPT_TELUGU, "te"},   {USCRIPT_THAI, "th"},       {USCRIPT_TIBETAN, "bo"},
};

// The languages whose stop word each form is, by position in LUXLanguage::all().
using Table = std::unordered_map<std::string, std::vector<size_t>>;

const Table& stopWordTable() {
  static const Table& table = *new Table([] {
    Table made;
    const auto languages = LUXLanguage::all();
    for (size_t i = 0; i < languages.size(); ++i) {
      std::string_view words = LUXStopWordsForLanguage(languages[i].tag);
      while (!words.empty()) {
        const size_t end = std::min(words.find(' '), words.size());
        auto& owners = made[luxfolding::caseFolded(words.substr(0, end), languages[i])];
        if (owners.empty() || owners.back() != i) {
          owners.push_back(i);
        }
        words.remove_prefix(std::min(end + 1, words.size()));
      }
    }
    return made;
  }());
  return table;
}

// The script in which a language with stop words is written: that of the first of them.
int scriptOf(const LUXLanguage& language) {
  const std::string_view words = LUXStopWordsForLanguage(language.tag);
  const auto* const bytes = reinterpret_cast<const uint8_t*>(words.data());
  int64_t at = 0;
  UChar32 character = 0;
  UErrorCode status = U_ZERO_ERROR;
  U8_NEXT(bytes, at, static_cast<int64_t>(words.size()), character);
  return character < 0 ? USCRIPT_UNKNOWN : uscript_getScript(character, &status);
}

}  // namespace

void LUXLanguageGuess::addText(std::string_view text) {
  const auto* const bytes = reinterpret_cast<const uint8_t*>(text.data());
  const auto length = static_cast<int64_t>(text.size());
  for (int64_t at = 0; at < length;) {
    UChar32 character = 0;
    U8_NEXT(bytes, at, length, character);
    if (character >= 0 && u_isalpha(character) != 0) {
      UErrorCode status = U_ZERO_ERROR;
      ++_letters[uscript_getScript(character, &status)];
    }
  }
  const LUXLanguage& plain = *LUXLanguage::withTag(fallbackTag);
  std::vector<HelpTokenizer::Segment> segments;
  std::string buffer;
  HelpTokenizer::tokenizerForLanguage(fallbackTag)->segmentsOfText(text, segments, buffer);
  for (const HelpTokenizer::Segment& segment : segments) {
    const auto found = stopWordTable().find(luxfolding::caseFolded(segment.surface, plain));
    if (found != stopWordTable().end()) {
      for (const size_t language : found->second) {
        ++_stopWords[language];
      }
    }
  }
}

const LUXLanguage& LUXLanguageGuess::language() const {
  // Japanese is told by its kana, of which any text has plenty; Chinese has none.
  std::map<int, uint64_t> letters = _letters;
  const uint64_t kana = letters[USCRIPT_HIRAGANA] + letters[USCRIPT_KATAKANA];
  if (kana * 10 > letters[USCRIPT_HAN]) {
    letters[USCRIPT_HIRAGANA] = kana + letters[USCRIPT_HAN];
    letters[USCRIPT_HAN] = 0;
  }
  const Script* main = nullptr;
  for (const Script& script : scripts) {
    if (letters[script.code] > (main == nullptr ? 0 : letters[main->code])) {
      main = &script;
    }
  }
  if (main == nullptr) {
    return *LUXLanguage::withTag(fallbackTag);
  }
  const LUXLanguage* best = LUXLanguage::withTag(main->tag);
  uint64_t most = leastStopWords - 1;
  for (const auto& [position, count] : _stopWords) {
    const LUXLanguage& language = LUXLanguage::all()[position];
    if (count > most && scriptOf(language) == main->code) {
      best = &language;
      most = count;
    }
  }
  return *best;
}
