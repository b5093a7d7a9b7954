#include "SearchKit/TextFolding.h"

#include <unicode/uchar.h>
#include <unicode/uscript.h>
#include <unicode/utf16.h>

#include <algorithm>
#include <cstdint>

#include "platform/TextForms.h"

namespace searchkit {
namespace {

constexpr char16_t zeroWidthSpace = 0x200B;

bool isMark(UChar32 character) noexcept { return (U_GET_GC_MASK(character) & U_GC_M_MASK) != 0; }

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
  using platform::NormalForm;
  std::u16string work = platform::utf16FromUTF8(text);
  std::replace(work.begin(), work.end(), zeroWidthSpace, u' ');
  platform::normalize(NormalForm::caseless, work);
  platform::normalize(NormalForm::decomposed, work);
  platform::dropDiacritics(work);
  platform::normalize(NormalForm::composed, work);
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
