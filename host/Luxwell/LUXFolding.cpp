#include "host/Luxwell/LUXFolding.h"

#include <algorithm>

#include "host/Luxwell/LUXLanguage.h"
#include "platform/TextForms.h"

namespace luxfolding {
namespace {

using platform::NormalForm;

bool isASCII(std::string_view text) noexcept {
  return std::all_of(text.begin(), text.end(),
                     [](char byte) { return static_cast<unsigned char>(byte) < 0x80; });
}

std::string loweredASCII(std::string_view text) {
  std::string result(text);
  std::transform(result.begin(), result.end(), result.begin(), [](char byte) {
    return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
  });
  return result;
}

// In these languages the small letter of I has no dot, and the capital letter of i has one.
bool hasDotlessI(const LUXLanguage& language) noexcept {
  const std::string_view tag = language.tag;
  return tag == "tr" || tag == "az";
}

void lowerDottedLetters(std::u16string& text) {
  std::u16string out;
  out.reserve(text.size());
  for (const char16_t unit : text) {
    out.push_back(unit == u'I' ? u'\u0131' : unit == u'\u0130' ? u'i' : unit);
  }
  text.swap(out);
}

/// A letter of its own in Icelandic, two where it is not known.
void spellOutThorns(std::u16string& text) {
  constexpr char16_t thorn = 0x00FE;
  for (size_t at = text.find(thorn); at != std::u16string::npos; at = text.find(thorn, at)) {
    text.replace(at, 1, u"th");
  }
}

}  // namespace

std::string caseFolded(std::string_view word, const LUXLanguage& language) {
  const bool dotless = hasDotlessI(language);
  if (!dotless && isASCII(word)) {
    return loweredASCII(word);
  }
  std::u16string text = platform::utf16FromUTF8(word);
  if (dotless) {
    platform::normalize(NormalForm::composed, text);
    lowerDottedLetters(text);
  }
  platform::normalize(NormalForm::caseless, text);
  platform::normalize(NormalForm::composed, text);
  return platform::utf8FromUTF16(text);
}

std::string withoutDiacritics(std::string_view folded) {
  if (isASCII(folded)) {
    return std::string(folded);
  }
  std::u16string text = platform::utf16FromUTF8(folded);
  platform::normalize(NormalForm::decomposed, text);
  spellOutThorns(text);
  platform::dropDiacritics(text);
  platform::normalize(NormalForm::composed, text);
  return platform::utf8FromUTF16(text);
}

std::string compatibilityForm(std::string_view text) {
  std::u16string work = platform::utf16FromUTF8(text);
  platform::normalize(NormalForm::compatible, work);
  return platform::utf8FromUTF16(work);
}

}  // namespace luxfolding
