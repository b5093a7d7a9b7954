#include "host/Luxwell/HelpTokenizer.h"

#include <libstemmer.h>
#include <unicode/ubrk.h>
#include <unicode/uchar.h>
#include <unicode/uscript.h>
#include <unicode/utext.h>
#include <unicode/utf8.h>
#include <unicode/uversion.h>

#include <algorithm>
#include <array>
#include <map>
#include <mutex>
#include <utility>

#include "host/Luxwell/LUXFolding.h"
#include "host/Luxwell/LUXKoreanEndings.h"
#include "host/Luxwell/LUXLanguage.h"
#include "host/Luxwell/LUXStopWords.h"

namespace {

// Raised whenever words or stems may come out otherwise than before.
constexpr uint32_t rulesVersion = 1;

enum class CharacterClass : unsigned char {
  other,
  blank,
  // May stand in a name between two parts of it.
  connector,
  letter,
  digit,
  // A letter of a script that writes no blanks between words.
  unspaced,
  // Marks and invisible characters: part of what stands before them.
  continuation,
  apostrophe,
};

constexpr std::array<CharacterClass, 128> makeASCIIClasses() {
  std::array<CharacterClass, 128> classes{};
  for (size_t byte = 0; byte < classes.size(); ++byte) {
    const auto character = static_cast<char>(byte);
    if ((character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z')) {
      classes[byte] = CharacterClass::letter;
    } else if (character >= '0' && character <= '9') {
      classes[byte] = CharacterClass::digit;
    } else if (character == ' ' || (character >= '\t' && character <= '\r')) {
      classes[byte] = CharacterClass::blank;
    } else if (character == '\'') {
      classes[byte] = CharacterClass::apostrophe;
    } else if (std::string_view("-_./\\:@&+").find(character) != std::string_view::npos) {
      classes[byte] = CharacterClass::connector;
    }
  }
  return classes;
}

constexpr std::array<CharacterClass, 128> asciiClasses = makeASCIIClasses();

bool isUnspacedScript(UScriptCode script) noexcept {
  switch (script) {
    case USCRIPT_HAN:
    case USCRIPT_HIRAGANA:
    case USCRIPT_KATAKANA:
    case USCRIPT_BOPOMOFO:
    case USCRIPT_THAI:
    case USCRIPT_LAO:
    case USCRIPT_KHMER:
    case USCRIPT_MYANMAR:
      return true;
    default:
      return false;
  }
}

// Letters that kana and Han have in common, so that they count as of no script.
bool isSharedKanaLetter(UChar32 character) noexcept {
  return character == 0x30FC || character == 0x3005 || character == 0x303C ||
         (character >= 0x3031 && character <= 0x3035);
}

CharacterClass classOfWideCharacter(UChar32 character) noexcept {
  switch (character) {
    case 0x2019:  // right single quotation mark
    case 0x02BC:  // modifier letter apostrophe
    case 0x02BB:  // modifier letter turned comma
    case 0xFF07:  // full-width apostrophe
    case 0x05F3:  // geresh
    case 0x05F4:  // gershayim
    case 0x00B7:  // middle dot
      return CharacterClass::apostrophe;
    case 0x2010:  // hyphen
    case 0x2011:  // non-breaking hyphen
      return CharacterClass::connector;
    case 0x200B:  // zero-width space
      return CharacterClass::blank;
    default:
      break;
  }
  const uint32_t category = U_GET_GC_MASK(character);
  if ((category & (U_GC_L_MASK | U_GC_N_MASK | U_GC_M_MASK)) != 0) {
    UErrorCode status = U_ZERO_ERROR;
    const bool isMark = (category & U_GC_M_MASK) != 0;
    if (isUnspacedScript(uscript_getScript(character, &status)) || isSharedKanaLetter(character)) {
      return CharacterClass::unspaced;
    }
    if (isMark) {
      return CharacterClass::continuation;
    }
    return (category & U_GC_ND_MASK) != 0 ? CharacterClass::digit : CharacterClass::letter;
  }
  if ((category & U_GC_Z_MASK) != 0 || character == 0x85) {
    return CharacterClass::blank;
  }
  return (category & U_GC_CF_MASK) != 0 ? CharacterClass::continuation : CharacterClass::other;
}

struct Character {
  CharacterClass kind = CharacterClass::other;
  size_t end = 0;
};

Character wideCharacterAt(std::string_view text, size_t at) noexcept {
  auto end = static_cast<int64_t>(at);
  const auto* const bytes = reinterpret_cast<const uint8_t*>(text.data());
  UChar32 character = 0;
  U8_NEXT(bytes, end, static_cast<int64_t>(text.size()), character);
  return {character < 0 ? CharacterClass::other : classOfWideCharacter(character),
          static_cast<size_t>(end)};
}

// The character that begins at `at`, which is inside the text.
inline Character characterAt(std::string_view text, size_t at) noexcept {
  const auto byte = static_cast<unsigned char>(text[at]);
  return byte < 0x80 ? Character{asciiClasses[byte], at + 1} : wideCharacterAt(text, at);
}

CharacterClass classAt(std::string_view text, size_t at) noexcept {
  return at < text.size() ? characterAt(text, at).kind : CharacterClass::other;
}

bool isWordClass(CharacterClass kind) noexcept {
  return kind == CharacterClass::letter || kind == CharacterClass::digit;
}

// `text` cut to at most `length` bytes, between characters.
std::string_view beginningOf(std::string_view text, size_t length) noexcept {
  if (text.size() <= length) {
    return text;
  }
  while (length > 0 && (static_cast<unsigned char>(text[length]) & 0xC0U) == 0x80U) {
    --length;
  }
  return text.substr(0, length);
}

struct CloseBreakIterator {
  void operator()(UBreakIterator* iterator) const noexcept { ubrk_close(iterator); }
};

// Opening one loads rules and dictionaries; a thread keeps its own.
UBreakIterator* threadBreakIterator() {
  thread_local const std::unique_ptr<UBreakIterator, CloseBreakIterator> iterator = [] {
    UErrorCode status = U_ZERO_ERROR;
    std::unique_ptr<UBreakIterator, CloseBreakIterator> opened(
        ubrk_open(UBRK_WORD, "", nullptr, 0, &status));
    if (U_FAILURE(status) != 0) {
      opened.reset();
    }
    return opened;
  }();
  return iterator.get();
}

struct ThreadText {
  UText text = UTEXT_INITIALIZER;
  ThreadText() = default;
  ThreadText(const ThreadText&) = delete;
  ThreadText& operator=(const ThreadText&) = delete;
  ~ThreadText() { utext_close(&text); }
};

// The dictionaries need memory of several times the length of the run they look at, and a text
// without punctuation may be one run of megabytes.
constexpr size_t longestRun = 4096;

template <typename Sink>
void divideByDictionary(std::string_view run, Sink sink) {
  thread_local ThreadText holder;
  UBreakIterator* iterator = threadBreakIterator();
  while (!run.empty()) {
    const std::string_view piece = beginningOf(run, longestRun);
    run.remove_prefix(piece.size());
    UErrorCode status = U_ZERO_ERROR;
    utext_openUTF8(&holder.text, piece.data(), static_cast<int64_t>(piece.size()), &status);
    if (iterator != nullptr) {
      ubrk_setUText(iterator, &holder.text, &status);
    }
    if (iterator == nullptr || U_FAILURE(status) != 0) {
      sink(piece);
      continue;
    }
    auto begin = static_cast<size_t>(ubrk_first(iterator));
    for (int32_t next = ubrk_next(iterator); next != UBRK_DONE; next = ubrk_next(iterator)) {
      const auto end = static_cast<size_t>(next);
      sink(piece.substr(begin, end - begin));
      begin = end;
    }
  }
}

struct DeleteStemmer {
  void operator()(sb_stemmer* stemmer) const noexcept { sb_stemmer_delete(stemmer); }
};

// A stemmer works in a buffer of its own; a thread keeps those that it has used.
sb_stemmer* threadStemmer(const char* algorithm) {
  thread_local std::map<std::string_view, std::unique_ptr<sb_stemmer, DeleteStemmer>> stemmers;
  auto& stemmer = stemmers[algorithm];
  if (stemmer == nullptr) {
    stemmer.reset(sb_stemmer_new(algorithm, nullptr));
  }
  return stemmer.get();
}

std::string stemOf(const std::string& word, const char* algorithm) {
  sb_stemmer* stemmer = threadStemmer(algorithm);
  if (stemmer == nullptr) {
    return word;
  }
  const sb_symbol* stem = sb_stemmer_stem(stemmer, reinterpret_cast<const sb_symbol*>(word.data()),
                                          static_cast<int>(word.size()));
  return stem == nullptr ? word
                         : std::string(reinterpret_cast<const char*>(stem),
                                       static_cast<size_t>(sb_stemmer_length(stemmer)));
}

void replaceAll(std::string& text, std::string_view from, std::string_view to) {
  for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size())) {
    text.replace(at, from.size(), to);
  }
}

// Apostrophes of one kind, and the marks that only set letters apart left out.
void unifyApostrophes(std::string& word) {
  if (std::all_of(word.begin(), word.end(),
                  [](char byte) { return static_cast<unsigned char>(byte) < 0x80; })) {
    return;
  }
  for (const std::string_view apostrophe : {"\u2019", "\u02BC", "\u02BB"}) {
    replaceAll(word, apostrophe, "'");
  }
  for (const std::string_view mark : {"\u00B7", "\u05F3", "\u05F4"}) {
    replaceAll(word, mark, "");
  }
}

std::string formOfFolded(std::string_view folded) {
  std::string form = luxfolding::withoutDiacritics(folded);
  form.resize(beginningOf(form, HelpTokenizer::maximumFormLength).size());
  return form;
}

std::string_view withoutPossessive(std::string_view surface) noexcept {
  // What the ending ends with tells most words from those that have one.
  if (surface.size() < 3 || (surface.back() != 's' && surface.back() != 'S')) {
    return surface;
  }
  const std::string_view word = surface.substr(0, surface.size() - 1);
  if (word.back() == '\'') {
    return word.substr(0, word.size() - 1);
  }
  constexpr std::string_view quotationMark = "\u2019";
  if (word.back() == quotationMark.back() && word.size() > quotationMark.size() &&
      word.ends_with(quotationMark)) {
    return word.substr(0, word.size() - quotationMark.size());
  }
  return surface;
}

// Whether characters of the block of half- and full-width forms may be there.
bool mayHaveWideForms(std::string_view text) noexcept {
  for (size_t at = text.find('\xEF'); at != std::string_view::npos;
       at = text.find('\xEF', at + 1)) {
    if (at + 1 < text.size() && static_cast<unsigned char>(text[at + 1]) >= 0xBC) {
      return true;
    }
  }
  return false;
}

bool joinsNames(char connector) noexcept {
  return connector == '.' || connector == '_' || connector == ':';
}

class Segmenter {
 public:
  Segmenter(const LUXLanguage& language, std::string_view text,
            std::vector<HelpTokenizer::Segment>& segments)
      : _language(language), _text(text), _segments(segments) {}

  void run() {
    size_t at = 0;
    while (at < _text.size()) {
      const Character character = characterAt(_text, at);
      switch (character.kind) {
        case CharacterClass::letter:
        case CharacterClass::digit:
          at = _takeWord(at);
          break;
        case CharacterClass::unspaced:
          at = _takeUnspaced(at);
          break;
        default:
          _passOver(at, character);
          at = character.end;
      }
    }
  }

 private:
  static constexpr size_t longestConnection = 2;

  void _passOver(size_t at, const Character& character) {
    switch (character.kind) {
      case CharacterClass::blank:
        _gapHasBlank = true;
        break;
      case CharacterClass::continuation:
        break;
      case CharacterClass::connector:
      case CharacterClass::apostrophe:
        ++_connectors;
        _gapJoinsNames = _gapJoinsNames && joinsNames(_text[at]);
        break;
      default:
        _gapBreaks = true;
    }
  }

  void _add(std::string_view surface) {
    const bool connected = _connectors == 0 || (!_gapHasBlank && _connectors <= longestConnection);
    const bool breaks = _first || _gapBreaks || !connected;
    const auto begin = static_cast<size_t>(surface.data() - _text.data());
    std::string_view whole;
    if (!breaks && _connectors > 0 && _gapJoinsNames) {
      whole = _text.substr(_wholeBegin, begin + surface.size() - _wholeBegin);
      _segments.back().whole = {};
    } else {
      _wholeBegin = begin;
    }
    if (whole.size() > HelpTokenizer::maximumFormLength) {
      whole = {};
    }
    _segments.push_back({surface, breaks, whole});
    _first = false;
    _gapBreaks = false;
    _gapHasBlank = false;
    _gapJoinsNames = true;
    _connectors = 0;
  }

  size_t _takeWord(size_t begin) {
    size_t at = begin;
    size_t ending = std::string_view::npos;
    CharacterClass last = CharacterClass::letter;
    while (at < _text.size()) {
      // Most of most words.
      if (const auto byte = static_cast<unsigned char>(_text[at]);
          byte < 0x80 && isWordClass(asciiClasses[byte])) {
        last = asciiClasses[byte];
        ++at;
        continue;
      }
      const Character character = characterAt(_text, at);
      if (isWordClass(character.kind)) {
        last = character.kind;
      } else if (character.kind == CharacterClass::apostrophe && last == CharacterClass::letter &&
                 classAt(_text, character.end) == CharacterClass::letter) {
        if (_language.apostrophe == LUXLanguage::Apostrophe::divides && _text[at] != '\xC2') {
          break;
        }
        if (_language.apostrophe == LUXLanguage::Apostrophe::beginsEnding) {
          ending = std::min(ending, at);
        }
      } else if (character.kind != CharacterClass::continuation && !_joinsDigits(at, last)) {
        break;
      }
      at = character.end;
    }
    const std::string_view word = _text.substr(begin, std::min(at, ending) - begin);
    _add(withoutPossessive(beginningOf(word, HelpTokenizer::maximumFormLength)));
    return at;
  }

  bool _joinsDigits(size_t at, CharacterClass last) const noexcept {
    return last == CharacterClass::digit && (_text[at] == '.' || _text[at] == ',') &&
           classAt(_text, at + 1) == CharacterClass::digit;
  }

  size_t _takeUnspaced(size_t begin) {
    size_t at = begin;
    while (at < _text.size()) {
      const Character character = characterAt(_text, at);
      if (character.kind != CharacterClass::unspaced &&
          character.kind != CharacterClass::continuation) {
        break;
      }
      at = character.end;
    }
    divideByDictionary(_text.substr(begin, at - begin), [this](std::string_view word) {
      _add(beginningOf(word, HelpTokenizer::maximumFormLength));
    });
    return at;
  }

  const LUXLanguage& _language;
  std::string_view _text;
  std::vector<HelpTokenizer::Segment>& _segments;
  bool _first = true;
  bool _gapBreaks = false;
  bool _gapHasBlank = false;
  bool _gapJoinsNames = true;
  size_t _connectors = 0;
  size_t _wholeBegin = 0;
};

bool isUnspacedAt(std::string_view text, size_t at) noexcept {
  return classAt(text, at) == CharacterClass::unspaced;
}

bool endsUnspaced(std::string_view text) noexcept {
  size_t at = text.size();
  while (at > 0) {
    --at;
    if ((static_cast<unsigned char>(text[at]) & 0xC0U) != 0x80U) {
      break;
    }
  }
  return isUnspacedAt(text, at);
}

}  // namespace

HelpTokenizer::HelpTokenizer(const LUXLanguage& language)
    : _language(language), _isKorean(std::string_view(language.tag) == "ko") {
  std::string_view words = LUXStopWordsForLanguage(language.tag);
  while (!words.empty()) {
    const size_t end = std::min(words.find(' '), words.size());
    if (const std::optional<Word> word = wordOfSurface(words.substr(0, end))) {
      _stopWords.insert(word->form);
    }
    words.remove_prefix(std::min(end + 1, words.size()));
  }
}

uint32_t HelpTokenizer::version() {
  UVersionInfo icu;
  u_getVersion(icu);
  return (rulesVersion << 16U) | (static_cast<uint32_t>(icu[0]) << 8U) | icu[1];
}

std::optional<std::string> HelpTokenizer::luxLocalizationForLanguage(std::string_view languageTag) {
  const LUXLanguage* language = LUXLanguage::withTag(languageTag);
  return language == nullptr ? std::nullopt : std::optional<std::string>(language->localization);
}

const std::vector<std::string>& HelpTokenizer::supportedLocalizations() {
  static const std::vector<std::string>& all = *new std::vector<std::string>([] {
    std::vector<std::string> names;
    for (const LUXLanguage& language : LUXLanguage::all()) {
      names.emplace_back(language.localization);
    }
    return names;
  }());
  return all;
}

std::shared_ptr<const HelpTokenizer> HelpTokenizer::tokenizerForLanguage(
    std::string_view localization) {
  const LUXLanguage* language = LUXLanguage::withTag(localization);
  if (language == nullptr) {
    return nullptr;
  }
  // Each is made when it is first asked for; background work may still ask while the process ends.
  struct Slot {
    std::once_flag once;
    std::shared_ptr<const HelpTokenizer> tokenizer;
  };
  static std::vector<Slot>& slots = *new std::vector<Slot>(LUXLanguage::all().size());
  Slot& slot = slots[static_cast<size_t>(language - LUXLanguage::all().data())];
  std::call_once(slot.once, [&] {
    slot.tokenizer = std::shared_ptr<const HelpTokenizer>(new HelpTokenizer(*language));
  });
  return slot.tokenizer;
}

std::string HelpTokenizer::localization() const { return _language.localization; }

std::string HelpTokenizer::languageTag() const { return _language.tag; }

std::string HelpTokenizer::tokenizedStringFromString(std::string_view text) const {
  std::vector<Word> words;
  wordsOfText(text, words);
  const bool allStopWords =
      std::all_of(words.begin(), words.end(), [](const Word& word) { return word.isStopWord; });
  std::string result;
  for (const Word& word : words) {
    if (word.isStopWord && !allStopWords) {
      continue;
    }
    if (!result.empty()) {
      result += ' ';
    }
    result += allStopWords ? word.form : word.stem;
  }
  return result;
}

size_t HelpTokenizer::countOfGramsInTokenString(std::string_view tokenString,
                                                std::string_view usingSeparator) {
  if (usingSeparator.empty()) {
    return tokenString.empty() ? 0 : 1;
  }
  size_t count = 0;
  for (;;) {
    const size_t end = tokenString.find(usingSeparator);
    count += end == 0 || tokenString.empty() ? 0 : 1;
    if (end == std::string_view::npos) {
      return count;
    }
    tokenString.remove_prefix(end + usingSeparator.size());
  }
}

void HelpTokenizer::segmentsOfText(std::string_view text, std::vector<Segment>& segments,
                                   std::string& buffer) const {
  if (mayHaveWideForms(text)) {
    buffer = luxfolding::compatibilityForm(text);
    text = buffer;
  }
  Segmenter(_language, text, segments).run();
}

std::optional<HelpTokenizer::Word> HelpTokenizer::wordOfSurface(std::string_view surface) const {
  const std::string folded = _folded(surface);
  Word word;
  word.form = formOfFolded(folded);
  if (word.form.empty()) {
    return std::nullopt;
  }
  word.stem = word.form;
  if (_language.stemmer != nullptr) {
    word.stem = luxfolding::withoutDiacritics(stemOf(folded, _language.stemmer));
  } else if (_isKorean) {
    word.stem = LUXWithoutKoreanEnding(word.form);
  }
  if (word.stem.empty() || word.stem.size() > maximumFormLength) {
    word.stem = word.form;
  }
  word.surface = surface;
  word.isStopWord = _stopWords.find(word.form) != _stopWords.end();
  return word;
}

std::string HelpTokenizer::formOfSurface(std::string_view surface) const {
  return formOfFolded(_folded(surface));
}

std::string HelpTokenizer::_folded(std::string_view surface) const {
  std::string folded = luxfolding::caseFolded(surface, _language);
  // A few ligatures stand for whole phrases, and tokens are joined by blanks.
  folded.erase(std::remove(folded.begin(), folded.end(), ' '), folded.end());
  unifyApostrophes(folded);
  folded.resize(beginningOf(folded, maximumFormLength).size());
  return folded;
}

void HelpTokenizer::wordsOfText(std::string_view text, std::vector<Word>& words) const {
  std::vector<Segment> segments;
  std::string buffer;
  segmentsOfText(text, segments, buffer);
  bool breaks = false;
  for (const Segment& segment : segments) {
    breaks = breaks || segment.breaksChain;
    if (std::optional<Word> word = wordOfSurface(segment.surface)) {
      word->breaksChain = breaks;
      // A part before it that leaves nothing may be what the name begins with.
      if (!segment.whole.empty() && !breaks) {
        word->wholeForm = formOfSurface(segment.whole);
      }
      words.push_back(std::move(*word));
      breaks = false;
    }
  }
}

void HelpTokenizer::appendToDisplay(std::string& display, std::string_view surface) {
  if (!display.empty() && !surface.empty() && !endsUnspaced(display) && !isUnspacedAt(surface, 0)) {
    display += ' ';
  }
  display += surface;
}
