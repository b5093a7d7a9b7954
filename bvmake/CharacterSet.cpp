#include "bvmake/CharacterSet.h"

#include <unicode/ucnv.h>
#include <unicode/ucsdet.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <array>
#include <memory>
#include <utility>

#include "bvmake/ASCII.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

/// How far into a page a `meta` element may declare the character set. Browsers stop after 1024
/// bytes; pages with long licence comments before it exist.
constexpr size_t declarationRange = 4096;

/// The piece of text in which it is decided whether the bytes are text.
constexpr size_t binaryCheckRange = 4096;

/// How much of a page that declares no character set is looked at to guess it, how many of these
/// bytes must be beyond ASCII, and how sure ICU must be, of 100.
constexpr size_t guessingRange = 65536;
constexpr std::ptrdiff_t fewestTellingBytes = 24;
constexpr int32_t leastConfidence = 30;

/// Names that web pages use for something else than, or more than, what the name once stood for.
constexpr std::array<std::pair<std::string_view, const char*>, 22> webMeanings{{
    {"iso-8859-1", "windows-1252"},
    {"iso8859-1", "windows-1252"},
    {"iso_8859-1", "windows-1252"},
    {"latin1", "windows-1252"},
    {"l1", "windows-1252"},
    {"us-ascii", "windows-1252"},
    {"ascii", "windows-1252"},
    {"iso-8859-9", "windows-1254"},
    {"latin5", "windows-1254"},
    {"iso-8859-11", "windows-874"},
    {"tis-620", "windows-874"},
    {"gb2312", "gb18030"},
    {"gb_2312-80", "gb18030"},
    {"gbk", "gb18030"},
    {"x-gbk", "gb18030"},
    {"shift_jis", "windows-31j"},
    {"shift-jis", "windows-31j"},
    {"sjis", "windows-31j"},
    {"x-sjis", "windows-31j"},
    {"euc-kr", "windows-949"},
    {"ks_c_5601-1987", "windows-949"},
    {"x-x-big5", "big5"},
}};

bool startsWith(std::string_view bytes, std::string_view prefix) {
  return bytes.substr(0, prefix.size()) == prefix;
}

/// The value after `name=` in the attributes of a tag, lower-cased; empty when there is none.
std::string attributeValue(std::string_view tag, std::string_view name) {
  size_t at = 0;
  while (at < tag.size()) {
    while (at < tag.size() && (isBlank(tag[at]) || tag[at] == '/')) {
      ++at;
    }
    const size_t nameStart = at;
    while (at < tag.size() && !isBlank(tag[at]) && tag[at] != '=' && tag[at] != '/') {
      ++at;
    }
    const std::string_view found = tag.substr(nameStart, at - nameStart);
    while (at < tag.size() && isBlank(tag[at])) {
      ++at;
    }
    if (at == tag.size() || tag[at] != '=') {
      at += at == nameStart ? 1 : 0;
      continue;
    }
    ++at;
    while (at < tag.size() && isBlank(tag[at])) {
      ++at;
    }
    size_t end = at;
    if (at < tag.size() && (tag[at] == '"' || tag[at] == '\'')) {
      end = std::min(tag.find(tag[at], at + 1), tag.size());
      ++at;
    } else {
      while (end < tag.size() && !isBlank(tag[end])) {
        ++end;
      }
    }
    if (equalsIgnoringCase(found, name)) {
      return lowercased(tag.substr(at, end - at));
    }
    at = std::min(end + 1, tag.size());
  }
  return {};
}

/// "utf-8" of "text/html; charset=utf-8".
std::string characterSetOfContentType(std::string_view contentType) {
  const size_t found = contentType.find("charset");
  if (found == std::string_view::npos) {
    return {};
  }
  std::string_view rest = trimmed(contentType.substr(found + 7));
  if (rest.empty() || rest.front() != '=') {
    return {};
  }
  rest = trimmed(rest.substr(1));
  return std::string(trimmed(rest.substr(0, rest.find(';')), " \t\n\f\r\"'"));
}

std::string characterSetOfMetaElements(std::string_view head) {
  const std::string lower = lowercased(head);
  for (size_t at = lower.find('<'); at != std::string::npos; at = lower.find('<', at + 1)) {
    if (startsWith(std::string_view(lower).substr(at), "<!--")) {
      at = lower.find("-->", at + 4);
      if (at == std::string::npos) {
        return {};
      }
      continue;
    }
    if (!startsWith(std::string_view(lower).substr(at), "<meta") || at + 5 >= lower.size() ||
        !(isBlank(lower[at + 5]) || lower[at + 5] == '/')) {
      continue;
    }
    const size_t end = lower.find('>', at);
    if (end == std::string::npos) {
      return {};
    }
    const std::string_view tag = std::string_view(lower).substr(at + 5, end - at - 5);
    std::string name(trimmed(attributeValue(tag, "charset")));
    if (name.empty() && attributeValue(tag, "http-equiv") == "content-type") {
      name = characterSetOfContentType(attributeValue(tag, "content"));
    }
    if (!name.empty()) {
      // A declaration that could be read as ASCII cannot be in a set of two-byte units.
      return startsWith(name, "utf-16") || startsWith(name, "utf-32") ? "utf-8" : name;
    }
  }
  return {};
}

std::string characterSetOfXMLDeclaration(std::string_view head) {
  if (!startsWith(head, "<?xml")) {
    return {};
  }
  const size_t end = head.find("?>");
  if (end == std::string_view::npos) {
    return {};
  }
  std::string name(trimmed(attributeValue(head.substr(5, end - 5), "encoding")));
  return startsWith(name, "utf-16") || startsWith(name, "utf-32") ? "utf-8" : name;
}

/// The byte order mark's character set and length.
std::pair<const char*, size_t> byteOrderMark(std::string_view bytes) {
  using namespace std::string_view_literals;
  if (startsWith(bytes, "\xEF\xBB\xBF"sv)) {
    return {"utf-8", 3};
  }
  if (startsWith(bytes, "\xFF\xFE"sv)) {
    return {"utf-16le", 2};
  }
  if (startsWith(bytes, "\xFE\xFF"sv)) {
    return {"utf-16be", 2};
  }
  // No mark, but the first characters of a tag or declaration in two-byte units.
  if (startsWith(bytes, "<\0"sv)) {
    return {"utf-16le", 0};
  }
  if (startsWith(bytes, "\0<"sv)) {
    return {"utf-16be", 0};
  }
  return {nullptr, 0};
}

/// Converts with ICU; absent when it does not know the character set.
std::optional<std::string> converted(std::string_view bytes, const char* characterSet) {
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<UConverter, void (*)(UConverter*)> converter(
      ucnv_open(characterSet, &status), ucnv_close);
  if (U_FAILURE(status)) {
    return std::nullopt;
  }
  const icu::UnicodeString text(bytes.data(), static_cast<int32_t>(bytes.size()), converter.get(),
                                status);
  if (U_FAILURE(status) || text.isBogus()) {
    return std::nullopt;
  }
  std::string utf8;
  text.toUTF8String(utf8);
  return utf8;
}

std::string webMeaning(const std::string& name) {
  for (const auto& [webName, meaning] : webMeanings) {
    if (name == webName) {
      return meaning;
    }
  }
  return name;
}

/// What ICU takes the bytes for, by how often they follow each other in the languages of each set;
/// empty where there is too little to go by, or nothing that it is sure of.
std::string guessedCharacterSet(std::string_view bytes) {
  bytes = bytes.substr(0, guessingRange);
  const auto telling = std::count_if(bytes.begin(), bytes.end(), [](char character) {
    return static_cast<unsigned char>(character) >= 0x80;
  });
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<UCharsetDetector, void (*)(UCharsetDetector*)> detector(
      ucsdet_open(&status), ucsdet_close);
  if (telling < fewestTellingBytes || U_FAILURE(status)) {
    return {};
  }
  ucsdet_enableInputFilter(detector.get(), 1);
  ucsdet_setText(detector.get(), bytes.data(), static_cast<int32_t>(bytes.size()), &status);
  const UCharsetMatch* const match = ucsdet_detect(detector.get(), &status);
  if (U_FAILURE(status) || match == nullptr ||
      ucsdet_getConfidence(match, &status) < leastConfidence) {
    return {};
  }
  const std::string name = lowercased(ucsdet_getName(match, &status));
  // Sets of other units than bytes would have shown by their zeros.
  return startsWith(name, "utf") ? std::string() : webMeaning(name);
}

std::string utf8Text(std::string_view bytes) {
  return platform::isValidUTF8(bytes) ? std::string(bytes) : platform::stringByRepairingUTF8(bytes);
}

std::string decoded(std::string_view bytes, Markup markup) {
  const auto [mark, markLength] = byteOrderMark(bytes);
  const std::string declared = declaredCharacterSet(bytes, markup);
  bytes.remove_prefix(markLength);
  if (declared == "utf-8" || declared == "utf8") {
    return utf8Text(bytes);
  }
  if (!declared.empty()) {
    if (std::optional<std::string> text = converted(bytes, webMeaning(declared).c_str())) {
      // Some sets can spell lone surrogates; ICU writes them as U+FFFD bytes or not at all.
      return platform::isValidUTF8(*text) ? std::move(*text)
                                          : platform::stringByRepairingUTF8(*text);
    }
  }
  if (platform::isValidUTF8(bytes)) {
    return std::string(bytes);
  }
  if (const std::string name = guessedCharacterSet(bytes); !name.empty()) {
    if (std::optional<std::string> text = converted(bytes, name.c_str())) {
      return platform::isValidUTF8(*text) ? std::move(*text)
                                          : platform::stringByRepairingUTF8(*text);
    }
  }
  return converted(bytes, "windows-1252").value_or(platform::stringByRepairingUTF8(bytes));
}

bool isBinary(std::string_view text) {
  const std::string_view sample = text.substr(0, binaryCheckRange);
  const auto controls = std::count_if(sample.begin(), sample.end(), [](char character) {
    const auto byte = static_cast<unsigned char>(character);
    // The escape stands in sets that shift between tables; blanks of any kind are text.
    return byte < 0x20 && !isBlank(character) && byte != 0x0B && byte != 0x1B;
  });
  return static_cast<size_t>(controls) * 10 > sample.size();
}

}  // namespace

std::string declaredCharacterSet(std::string_view bytes, Markup markup) {
  if (const char* mark = byteOrderMark(bytes).first) {
    return mark;
  }
  const std::string_view head = bytes.substr(0, declarationRange);
  if (markup == Markup::html) {
    if (std::string name = characterSetOfMetaElements(head); !name.empty()) {
      return name;
    }
  }
  return characterSetOfXMLDeclaration(head);
}

std::optional<std::string> textFromBytes(std::string_view bytes, Markup markup) {
  std::string text = decoded(bytes, markup);
  if (isBinary(text)) {
    return std::nullopt;
  }
  if (text.find('\0') != std::string::npos) {
    std::erase(text, '\0');
  }
  return text;
}

}  // namespace bvmake
