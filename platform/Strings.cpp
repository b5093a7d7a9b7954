#include "platform/Strings.h"

#include <unicode/coll.h>
#include <unicode/locid.h>
#include <unicode/uchar.h>
#include <unicode/unistr.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <cstring>
#include <limits>
#include <map>
#include <memory>

#include "platform/Environment.h"
#include "platform/ThreadSafety.h"

namespace platform {

namespace {

/// ICU counts in 32 bits; no text that people write comes near that, so the rest is cut off.
icu::StringPiece piece(std::string_view string) {
  constexpr size_t limit = std::numeric_limits<int32_t>::max();
  return {string.data(), static_cast<int32_t>(std::min(string.size(), limit))};
}

icu::UnicodeString fromUTF8(std::string_view string) {
  return icu::UnicodeString::fromUTF8(piece(string));
}

/// One character of UTF-8 text; a negative one stands for an ill-formed byte sequence.
struct Character {
  UChar32 code;
  std::string_view bytes;
};

/// Calls `visit` with each character in turn, until it returns false.
template <typename Visit>
void forEachCharacter(std::string_view string, Visit visit) {
  const auto* bytes = reinterpret_cast<const uint8_t*>(string.data());
  const size_t length = string.size();
  for (size_t position = 0; position < length;) {
    const size_t start = position;
    UChar32 code = 0;
    U8_NEXT(bytes, position, length, code);
    if (!visit(Character{code, string.substr(start, position - start)})) {
      return;
    }
  }
}

/// The collator for a language, made once: making one costs far more than a comparison.
std::shared_ptr<const icu::Collator> collatorForLanguage(const std::string& language) {
  static Mutex mutex;
  static std::map<std::string, std::shared_ptr<const icu::Collator>, std::less<>> collators;
  const MutexLock lock(mutex);
  auto& collator = collators[language];
  if (collator == nullptr) {
    UErrorCode status = U_ZERO_ERROR;
    const icu::Locale locale = icu::Locale::forLanguageTag(language, status);
    status = U_ZERO_ERROR;
    std::unique_ptr<icu::Collator> made(icu::Collator::createInstance(locale, status));
    if (U_FAILURE(status) || made == nullptr) {
      return nullptr;
    }
    // Base letters and accents count, case does not.
    made->setStrength(icu::Collator::SECONDARY);
    collator = std::move(made);
  }
  return collator;
}

}  // namespace

bool isWhitespaceOrNewline(char32_t character) noexcept {
  if (character < 0x80) {
    return character == U' ' || (character >= 0x09 && character <= 0x0D);
  }
  if (character == 0x85) {
    return true;
  }
  return (U_GET_GC_MASK(static_cast<UChar32>(character)) & U_GC_Z_MASK) != 0;
}

std::string stringByRemovingWhitespace(std::string_view string) {
  std::string kept;
  kept.reserve(string.size());
  forEachCharacter(string, [&](const Character& character) {
    if (character.code < 0 || !isWhitespaceOrNewline(static_cast<char32_t>(character.code))) {
      kept += character.bytes;
    }
    return true;
  });
  return kept;
}

std::string stringByTrimmingWhitespace(std::string_view string) {
  size_t first = string.size();
  size_t last = 0;
  forEachCharacter(string, [&](const Character& character) {
    if (character.code < 0 || !isWhitespaceOrNewline(static_cast<char32_t>(character.code))) {
      const auto start = static_cast<size_t>(character.bytes.data() - string.data());
      first = std::min(first, start);
      last = start + character.bytes.size();
    }
    return true;
  });
  return first < last ? std::string(string.substr(first, last - first)) : std::string();
}

std::string lowercaseString(std::string_view string) {
  std::string lowered;
  fromUTF8(string).toLower(icu::Locale::getRoot()).toUTF8String(lowered);
  return lowered;
}

namespace {

size_t columnsOfCharacter(UChar32 character) {
  const int category = u_charType(character);
  if (category == U_NON_SPACING_MARK || category == U_ENCLOSING_MARK || category == U_FORMAT_CHAR) {
    return 0;
  }
  const int width = u_getIntPropertyValue(character, UCHAR_EAST_ASIAN_WIDTH);
  return width == U_EA_FULLWIDTH || width == U_EA_WIDE ? 2 : 1;
}

}  // namespace

std::string stringByTruncatingToColumns(std::string_view string, size_t columns) {
  const icu::UnicodeString text = fromUTF8(string);
  size_t used = 0;
  // Where the text would be cut if it turns out not to fit: one column is the ellipsis's.
  int32_t cut = 0;
  for (int32_t at = 0; at < text.length(); at = text.moveIndex32(at, 1)) {
    const size_t width = columnsOfCharacter(text.char32At(at));
    if (used + width <= columns - std::min<size_t>(columns, 1)) {
      cut = text.moveIndex32(at, 1);
    }
    used += width;
  }
  std::string result;
  if (used <= columns) {
    text.toUTF8String(result);
  } else if (columns > 0) {
    text.tempSubString(0, cut).toUTF8String(result);
    result += "\u2026";
  }
  return result;
}

int caseInsensitiveCompare(std::string_view a, std::string_view b) {
  return fromUTF8(a).caseCompare(fromUTF8(b), U_FOLD_CASE_DEFAULT);
}

int localizedCaseInsensitiveCompare(std::string_view a, std::string_view b,
                                    std::string_view language) {
  const auto collator =
      collatorForLanguage(language.empty() ? Environment::current()->preferredLanguages.front()
                                           : std::string(language));
  if (collator == nullptr) {
    return caseInsensitiveCompare(a, b);
  }
  UErrorCode status = U_ZERO_ERROR;
  const UCollationResult result = collator->compareUTF8(piece(a), piece(b), status);
  return U_FAILURE(status) ? caseInsensitiveCompare(a, b) : static_cast<int>(result);
}

int numericCompare(std::string_view a, std::string_view b) {
  const auto isDigit = [](std::string_view s) {
    return !s.empty() && s.front() >= '0' && s.front() <= '9';
  };
  // A number is compared as its digits without leading zeros: first their count, then themselves.
  const auto takeNumber = [&](std::string_view& s) {
    while (s.starts_with('0')) {
      s.remove_prefix(1);
    }
    const size_t length = std::min(s.find_first_not_of("0123456789"), s.size());
    const std::string_view digits = s.substr(0, length);
    s.remove_prefix(length);
    return digits;
  };
  while (!a.empty() && !b.empty()) {
    int order = 0;
    if (isDigit(a) && isDigit(b)) {
      const std::string_view left = takeNumber(a);
      const std::string_view right = takeNumber(b);
      order =
          left.size() != right.size() ? (left.size() < right.size() ? -1 : 1) : left.compare(right);
    } else {
      order = static_cast<unsigned char>(a.front()) - static_cast<unsigned char>(b.front());
      a.remove_prefix(1);
      b.remove_prefix(1);
    }
    if (order != 0) {
      return order;
    }
  }
  return static_cast<int>(!a.empty()) - static_cast<int>(!b.empty());
}

bool isValidUTF8(std::string_view bytes) noexcept {
  const auto* const text = reinterpret_cast<const uint8_t*>(bytes.data());
  const size_t length = bytes.size();
  size_t at = 0;
  while (at < length) {
    // Most text is ASCII for the most part: eight bytes at a time.
    uint64_t word = 0;
    if (length - at >= sizeof word) {
      std::memcpy(&word, text + at, sizeof word);
      if ((word & 0x8080808080808080U) == 0) {
        at += sizeof word;
        continue;
      }
    }
    UChar32 code = 0;
    U8_NEXT(text, at, length, code);
    if (code < 0) {
      return false;
    }
  }
  return true;
}

std::string stringByRepairingUTF8(std::string_view bytes) {
  std::string repaired;
  repaired.reserve(bytes.size());
  forEachCharacter(bytes, [&](const Character& character) {
    repaired += character.code < 0 ? std::string_view("\xEF\xBF\xBD") : character.bytes;
    return true;
  });
  return repaired;
}

}  // namespace platform
