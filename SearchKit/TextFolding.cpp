#include "SearchKit/TextFolding.h"

#include <unicode/uchar.h>
#include <unicode/unorm2.h>
#include <unicode/uscript.h>
#include <unicode/ustring.h>
#include <unicode/utf16.h>
#include <unicode/utf8.h>

namespace searchkit {
namespace {

constexpr UChar zeroWidthSpace = 0x200B;
constexpr UChar replacementCharacter = 0xFFFD;
// Canonical combining class of the voicing marks of kana.
constexpr uint8_t kanaVoicing = 8;

void appendUTF16(std::string_view text, std::u16string& out) {
  const auto length = static_cast<int64_t>(text.size());
  const auto* bytes = reinterpret_cast<const uint8_t*>(text.data());
  for (int64_t at = 0; at < length;) {
    UChar32 character;
    U8_NEXT(bytes, at, length, character);
    if (character < 0) {
      out.push_back(replacementCharacter);
    } else if (character == zeroWidthSpace) {
      out.push_back(u' ');
    } else if (character <= 0xFFFF) {
      out.push_back(static_cast<char16_t>(character));
    } else {
      out.push_back(U16_LEAD(character));
      out.push_back(U16_TRAIL(character));
    }
  }
}

const UNormalizer2* normalizer(const UNormalizer2* (*instance)(UErrorCode*)) {
  UErrorCode status = U_ZERO_ERROR;
  const UNormalizer2* result = instance(&status);
  return U_SUCCESS(status) != 0 ? result : nullptr;
}

// Replaces the text by its normal form; leaves it alone where ICU has none, which only happens
// when its data are missing.
void normalize(const UNormalizer2* form, std::u16string& text) {
  if (form == nullptr || text.empty()) {
    return;
  }
  std::u16string normal(text.size() * 2 + 16, u'\0');
  for (;;) {
    UErrorCode status = U_ZERO_ERROR;
    const int32_t length =
        unorm2_normalize(form, text.data(), static_cast<int32_t>(text.size()), normal.data(),
                         static_cast<int32_t>(normal.size()), &status);
    if (status == U_BUFFER_OVERFLOW_ERROR) {
      normal.resize(static_cast<size_t>(length));
      continue;
    }
    if (U_SUCCESS(status) != 0) {
      normal.resize(static_cast<size_t>(length));
      text.swap(normal);
    }
    return;
  }
}

bool isMark(UChar32 character) noexcept { return (U_GET_GC_MASK(character) & U_GC_M_MASK) != 0; }

bool isDiacritic(UChar32 character) noexcept {
  if ((U_GET_GC_MASK(character) & (U_GC_MN_MASK | U_GC_ME_MASK)) == 0 ||
      u_getCombiningClass(character) == kanaVoicing) {
    return false;
  }
  UErrorCode status = U_ZERO_ERROR;
  switch (uscript_getScript(character, &status)) {
    case USCRIPT_COMMON:
    case USCRIPT_INHERITED:
    case USCRIPT_LATIN:
    case USCRIPT_GREEK:
    case USCRIPT_CYRILLIC:
    case USCRIPT_HEBREW:
    case USCRIPT_ARABIC:
    case USCRIPT_SYRIAC:
      return true;
    default:
      return false;
  }
}

// The plain letters for a letter that does not decompose; null for all others.
const char16_t* plainLetters(UChar32 character) noexcept {
  switch (character) {
    case 0x00E6:
      return u"ae";
    case 0x00F0:
    case 0x0111:
      return u"d";
    case 0x00F8:
      return u"o";
    case 0x0127:
      return u"h";
    case 0x0131:
      return u"i";
    case 0x0142:
      return u"l";
    case 0x0153:
      return u"oe";
    case 0x0167:
      return u"t";
    case 0x0640:
      return u"";
    default:
      return nullptr;
  }
}

void dropDiacritics(std::u16string& text) {
  std::u16string plain;
  plain.reserve(text.size());
  const auto length = static_cast<int64_t>(text.size());
  for (int64_t at = 0; at < length;) {
    const auto begin = static_cast<size_t>(at);
    UChar32 character;
    U16_NEXT(text.data(), at, length, character);
    if (isDiacritic(character)) {
      continue;
    }
    if (const char16_t* letters = plainLetters(character)) {
      plain.append(letters);
    } else {
      plain.append(text, begin, static_cast<size_t>(at) - begin);
    }
  }
  text.swap(plain);
}

bool isUnspacedScript(UScriptCode script) noexcept {
  switch (script) {
    case USCRIPT_HAN:
    case USCRIPT_HIRAGANA:
    case USCRIPT_KATAKANA:
    case USCRIPT_BOPOMOFO:
    case USCRIPT_HANGUL:
    case USCRIPT_THAI:
    case USCRIPT_LAO:
    case USCRIPT_KHMER:
    case USCRIPT_MYANMAR:
      return true;
    default:
      return false;
  }
}

// Letters that kana and Han share with no script to their name: the sound and repetition marks.
bool isSharedKanaLetter(UChar32 character) noexcept {
  return character == 0x30FC || character == 0x303C || (character >= 0x3031 && character <= 0x3035);
}

}  // namespace

void foldText(std::string_view text, std::u16string& folded) {
  static const UNormalizer2* const caseFolding = normalizer(unorm2_getNFKCCasefoldInstance);
  static const UNormalizer2* const decomposition = normalizer(unorm2_getNFDInstance);
  static const UNormalizer2* const composition = normalizer(unorm2_getNFCInstance);
  std::u16string work;
  work.reserve(text.size());
  appendUTF16(text, work);
  normalize(caseFolding, work);
  normalize(decomposition, work);
  dropDiacritics(work);
  normalize(composition, work);
  folded.append(work);
}

CharacterClass characterClass(char32_t character) noexcept {
  if (character < 0x80) {
    const bool isLetter = (character >= 'a' && character <= 'z') ||
                          (character >= 'A' && character <= 'Z') ||
                          (character >= '0' && character <= '9');
    return isLetter ? CharacterClass::letter : CharacterClass::separator;
  }
  const auto point = static_cast<UChar32>(character);
  if (isMark(point)) {
    return CharacterClass::mark;
  }
  // The modifier apostrophes separate as the other apostrophes do.
  if ((U_GET_GC_MASK(point) & (U_GC_L_MASK | U_GC_N_MASK)) == 0 || point == 0x02BC ||
      point == 0x02BB) {
    return CharacterClass::separator;
  }
  UErrorCode status = U_ZERO_ERROR;
  return isUnspacedScript(uscript_getScript(point, &status)) || isSharedKanaLetter(point)
             ? CharacterClass::unspacedLetter
             : CharacterClass::letter;
}

void findRuns(std::u16string_view folded, std::vector<Run>& runs) {
  const auto length = static_cast<int64_t>(folded.size());
  bool inside = false;
  for (int64_t at = 0; at < length;) {
    const auto begin = static_cast<size_t>(at);
    UChar32 character;
    U16_NEXT(folded.data(), at, length, character);
    const CharacterClass kind = characterClass(static_cast<char32_t>(character));
    if (kind == CharacterClass::separator || (kind == CharacterClass::mark && !inside)) {
      inside = false;
      continue;
    }
    const bool unspaced = kind == CharacterClass::unspacedLetter;
    if (!inside || (kind != CharacterClass::mark && unspaced != runs.back().unspaced)) {
      runs.push_back({begin, begin, unspaced});
      inside = true;
    }
    runs.back().end = static_cast<size_t>(at);
  }
}

TextLibraryVersion textLibraryVersion() noexcept {
  UVersionInfo version;
  u_getVersion(version);
  return {version[0], version[1]};
}

}  // namespace searchkit
