#include "host/Luxwell/LUXFolding.h"

#include <unicode/uchar.h>
#include <unicode/unorm2.h>
#include <unicode/uscript.h>
#include <unicode/utf16.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <cstdint>

#include "host/Luxwell/LUXLanguage.h"

namespace luxfolding {
namespace {

constexpr char16_t replacementCharacter = 0xFFFD;

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

std::u16string utf16FromUTF8(std::string_view text) {
  std::u16string out;
  out.reserve(text.size());
  const auto length = static_cast<int64_t>(text.size());
  const auto* const bytes = reinterpret_cast<const uint8_t*>(text.data());
  for (int64_t at = 0; at < length;) {
    UChar32 character = 0;
    U8_NEXT(bytes, at, length, character);
    if (character >= 0x10000) {
      out.push_back(U16_LEAD(character));
      out.push_back(U16_TRAIL(character));
    } else {
      out.push_back(character < 0 ? replacementCharacter : static_cast<char16_t>(character));
    }
  }
  return out;
}

std::string utf8FromUTF16(std::u16string_view text) {
  std::string out;
  out.reserve(text.size() * 3);
  const auto length = static_cast<int64_t>(text.size());
  for (int64_t at = 0; at < length;) {
    UChar32 character = 0;
    U16_NEXT(text.data(), at, length, character);
    char bytes[U8_MAX_LENGTH];
    int32_t count = 0;
    U8_APPEND_UNSAFE(bytes, count, character);
    out.append(bytes, static_cast<size_t>(count));
  }
  return out;
}

const UNormalizer2* normalizer(const UNormalizer2* (*instance)(UErrorCode*)) {
  UErrorCode status = U_ZERO_ERROR;
  const UNormalizer2* result = instance(&status);
  return U_SUCCESS(status) != 0 ? result : nullptr;
}

// Text stays as it is where ICU lacks the form, which means that its data are missing.
void normalize(const UNormalizer2* form, std::u16string& text) {
  if (form == nullptr || text.empty()) {
    return;
  }
  std::u16string normal(text.size() + 16, u'\0');
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

bool isDiacritic(UChar32 character) noexcept {
  constexpr uint8_t kanaVoicing = 8;
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

// Null for letters that stay as they are.
const char16_t* plainLetters(UChar32 character) noexcept {
  switch (character) {
    case 0x00E6:
      return u"ae";
    case 0x00F0:
    case 0x0111:
      return u"d";
    case 0x00F8:
      return u"o";
    case 0x00FE:
      return u"th";
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

}  // namespace

std::string caseFolded(std::string_view word, const LUXLanguage& language) {
  const bool dotless = hasDotlessI(language);
  if (!dotless && isASCII(word)) {
    return loweredASCII(word);
  }
  static const UNormalizer2* const caseFolding = normalizer(unorm2_getNFKCCasefoldInstance);
  static const UNormalizer2* const composition = normalizer(unorm2_getNFCInstance);
  std::u16string text = utf16FromUTF8(word);
  if (dotless) {
    normalize(composition, text);
    lowerDottedLetters(text);
  }
  normalize(caseFolding, text);
  normalize(composition, text);
  return utf8FromUTF16(text);
}

std::string withoutDiacritics(std::string_view folded) {
  if (isASCII(folded)) {
    return std::string(folded);
  }
  static const UNormalizer2* const decomposition = normalizer(unorm2_getNFDInstance);
  static const UNormalizer2* const composition = normalizer(unorm2_getNFCInstance);
  std::u16string text = utf16FromUTF8(folded);
  normalize(decomposition, text);
  std::u16string plain;
  plain.reserve(text.size());
  const auto length = static_cast<int64_t>(text.size());
  for (int64_t at = 0; at < length;) {
    const auto begin = static_cast<size_t>(at);
    UChar32 character = 0;
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
  normalize(composition, plain);
  return utf8FromUTF16(plain);
}

std::string compatibilityForm(std::string_view text) {
  static const UNormalizer2* const form = normalizer(unorm2_getNFKCInstance);
  std::u16string work = utf16FromUTF8(text);
  normalize(form, work);
  return utf8FromUTF16(work);
}

}  // namespace luxfolding
