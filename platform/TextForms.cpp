#include "platform/TextForms.h"

#include <unicode/uchar.h>
#include <unicode/unorm2.h>
#include <unicode/uscript.h>
#include <unicode/utf16.h>
#include <unicode/utf8.h>

#include <cstdint>

namespace platform {

namespace {

constexpr char16_t replacementCharacter = 0xFFFD;
// Canonical combining class of the voicing marks of kana.
constexpr uint8_t kanaVoicing = 8;

const UNormalizer2* normalizer(const UNormalizer2* (*instance)(UErrorCode*)) {
  UErrorCode status = U_ZERO_ERROR;
  const UNormalizer2* result = instance(&status);
  return U_SUCCESS(status) != 0 ? result : nullptr;
}

const UNormalizer2* normalizer(NormalForm form) {
  static const UNormalizer2* const composed = normalizer(unorm2_getNFCInstance);
  static const UNormalizer2* const decomposed = normalizer(unorm2_getNFDInstance);
  static const UNormalizer2* const compatible = normalizer(unorm2_getNFKCInstance);
  static const UNormalizer2* const caseless = normalizer(unorm2_getNFKCCasefoldInstance);
  switch (form) {
    case NormalForm::decomposed:
      return decomposed;
    case NormalForm::compatible:
      return compatible;
    case NormalForm::caseless:
      return caseless;
    case NormalForm::composed:
      break;
  }
  return composed;
}

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

}  // namespace

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

void normalize(NormalForm form, std::u16string& text) {
  const UNormalizer2* const normalizing = normalizer(form);
  if (normalizing == nullptr || text.empty()) {
    return;
  }
  std::u16string normal(text.size() * 2 + 16, u'\0');
  for (;;) {
    UErrorCode status = U_ZERO_ERROR;
    const int32_t length =
        unorm2_normalize(normalizing, text.data(), static_cast<int32_t>(text.size()), normal.data(),
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

void dropDiacritics(std::u16string& text) {
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
  text.swap(plain);
}

}  // namespace platform
