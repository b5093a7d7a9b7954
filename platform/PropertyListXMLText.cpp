#include "platform/PropertyListXMLText.h"

#include <fmt/format.h>
#include <unicode/ustring.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <limits>
#include <utility>

#include "platform/Base64.h"
#include "platform/Exception.h"
#include "platform/PropertyListForms.h"

namespace platform::propertylist {
namespace {

constexpr std::string_view blanks = " \t\r\n";
constexpr size_t longestTag = 4096;

[[noreturn]] void fail(const std::string& reason) {
  throw Exception(inconsistentArchiveException, reason);
}

[[noreturn]] void failAt(const std::string& reason, std::string_view text, size_t offset) {
  const auto line =
      1 + std::count(text.begin(), text.begin() + static_cast<ptrdiff_t>(offset), '\n');
  fail(fmt::format("{} on line {}", reason, line));
}

std::string_view trimmed(std::string_view text) {
  const size_t begin = text.find_first_not_of(blanks);
  if (begin == std::string_view::npos) {
    return {};
  }
  return text.substr(begin, text.find_last_not_of(blanks) - begin + 1);
}

// Where the markup that begins at `offset` ends: behind its last character.
size_t endOfTag(std::string_view text, size_t offset) {
  const bool isDoctype = text.substr(offset, 9) == "<!DOCTYPE";
  char quote = 0;
  for (size_t i = offset; i < text.size(); ++i) {
    if (i - offset > longestTag) {
      failAt("a tag that is too long", text, offset);
    }
    const char character = text[i];
    if (quote != 0) {
      quote = character == quote ? '\0' : quote;
    } else if (character == '"' || character == '\'') {
      quote = character;
    } else if (character == '[' && isDoctype) {
      failAt("the document type has declarations of its own, such as entities", text, i);
    } else if (character == '>') {
      return i + 1;
    }
  }
  failAt("a tag that does not end", text, offset);
}

size_t endBehind(std::string_view text, size_t offset, std::string_view begin,
                 std::string_view end) {
  const size_t found = text.find(end, offset + begin.size());
  if (found == std::string_view::npos) {
    failAt(fmt::format("\"{}\" without \"{}\"", begin, end), text, offset);
  }
  return found + end.size();
}

Value integerFromText(std::string_view text) {
  std::string_view digits = trimmed(text);
  const bool negative = digits.starts_with('-');
  if (negative || digits.starts_with('+')) {
    digits.remove_prefix(1);
  }
  const bool hexadecimal = digits.starts_with("0x") || digits.starts_with("0X");
  if (hexadecimal) {
    digits.remove_prefix(2);
  }
  uint64_t magnitude = 0;
  const char* const end = digits.data() + digits.size();
  const auto [stop, error] = std::from_chars(digits.data(), end, magnitude, hexadecimal ? 16 : 10);
  constexpr uint64_t lowest = uint64_t{1} << 63;
  if (error == std::errc::result_out_of_range || (negative && magnitude > lowest)) {
    fail(fmt::format("integer {} is out of range", quoted(text)));
  }
  if (error != std::errc() || stop != end) {
    fail(fmt::format("{} is no integer", quoted(text)));
  }
  if (negative) {
    return static_cast<int64_t>(uint64_t{0} - magnitude);
  }
  return magnitude;
}

Value realFromText(std::string_view text) {
  std::string_view digits = trimmed(text);
  if (digits.starts_with('+') && !digits.starts_with("+-")) {
    digits.remove_prefix(1);
  }
  double number = 0;
  const char* const end = digits.data() + digits.size();
  const auto [stop, error] = std::from_chars(digits.data(), end, number);
  if (error == std::errc::result_out_of_range) {
    fail(fmt::format("real {} is out of range", quoted(text)));
  }
  if (error != std::errc() || stop != end) {
    fail(fmt::format("{} is no real", quoted(text)));
  }
  return number;
}

// YYYY-MM-DDThh:mm:ssZ and nothing else.
Value dateFromText(std::string_view text) {
  constexpr std::string_view pattern = "dddd-dd-ddTdd:dd:ddZ";
  const std::string_view date = trimmed(text);
  std::array<int, 6> fields{};
  size_t field = 0;
  bool matches = date.size() == pattern.size();
  for (size_t i = 0; matches && i < pattern.size(); ++i) {
    if (pattern[i] != 'd') {
      matches = date[i] == pattern[i];
      ++field;
    } else if (date[i] >= '0' && date[i] <= '9') {
      fields[field] = fields[field] * 10 + (date[i] - '0');
    } else {
      matches = false;
    }
  }
  using namespace std::chrono;
  const year_month_day day(year{fields[0]}, month{static_cast<unsigned>(fields[1])},
                           std::chrono::day{static_cast<unsigned>(fields[2])});
  if (!matches || !day.ok() || fields[0] < 1 || fields[3] > 23 || fields[4] > 59 ||
      fields[5] > 59) {
    fail(fmt::format("{} is no date", quoted(text)));
  }
  const sys_days reference = year{2001} / 1 / 1;
  const seconds since =
      (sys_days(day) - reference) + hours(fields[3]) + minutes(fields[4]) + seconds(fields[5]);
  return Date{static_cast<double>(since.count())};
}

Value dataFromText(std::string_view text) {
  std::optional<std::string> bytes = bytesFromBase64(text);
  if (!bytes) {
    fail("data is not in base64");
  }
  return Data::adopt(std::move(*bytes));
}

Value emptyElement(std::string_view name, std::string_view text, bool value) {
  if (!trimmed(text).empty()) {
    fail(fmt::format("element {} is not empty", quoted(name)));
  }
  return value;
}

}  // namespace

std::optional<std::string> utf8FromMarkedUTF16(std::string_view bytes) {
  const bool bigEndian = bytes.starts_with("\xFE\xFF");
  if (!bigEndian && !bytes.starts_with("\xFF\xFE")) {
    return std::nullopt;
  }
  bytes.remove_prefix(2);
  if (bytes.size() % 2 != 0) {
    fail("UTF-16 text ends inside a character");
  }
  const size_t units = bytes.size() / 2;
  if (units > std::numeric_limits<int32_t>::max() / 3) {
    fail("UTF-16 text is too long");
  }
  std::u16string wide(units, u'\0');
  for (size_t i = 0; i < units; ++i) {
    const auto first = static_cast<uint8_t>(bytes[2 * i]);
    const auto second = static_cast<uint8_t>(bytes[2 * i + 1]);
    wide[i] = static_cast<char16_t>(bigEndian ? first << 8 | second : second << 8 | first);
  }
  std::string text(units * 3, '\0');
  int32_t written = 0;
  UErrorCode status = U_ZERO_ERROR;
  u_strToUTF8(text.data(), static_cast<int32_t>(text.size()), &written, wide.data(),
              static_cast<int32_t>(units), &status);
  if (U_FAILURE(status)) {
    fail("UTF-16 text has a surrogate without its pair");
  }
  text.resize(static_cast<size_t>(written));
  return text;
}

void checkMarkup(std::string_view text) {
  size_t offset = text.starts_with("\xEF\xBB\xBF") ? 3 : 0;
  const size_t first = text.find_first_not_of(blanks, offset);
  if (first == std::string_view::npos || text[first] != '<') {
    fail("neither a binary nor an XML property list");
  }
  // It would make the parser guess another encoding than the one checked here.
  if (const size_t zero = text.find('\0'); zero != std::string_view::npos) {
    failAt("a zero byte", text, zero);
  }
  while ((offset = text.find('<', offset)) != std::string_view::npos) {
    const std::string_view rest = text.substr(offset);
    if (rest.starts_with("<!--")) {
      offset = endBehind(text, offset, "<!--", "-->");
    } else if (rest.starts_with("<![CDATA[")) {
      offset = endBehind(text, offset, "<![CDATA[", "]]>");
    } else if (rest.starts_with("<?")) {
      offset = endBehind(text, offset, "<?", "?>");
    } else {
      offset = endOfTag(text, offset);
    }
  }
}

bool isLeafElement(std::string_view name) {
  return name == "string" || name == "integer" || name == "real" || name == "true" ||
         name == "false" || name == "date" || name == "data";
}

Value leafFromText(std::string_view name, std::string text) {
  if (name == "string") {
    return Value(std::move(text));
  }
  if (name == "integer") {
    return integerFromText(text);
  }
  if (name == "real") {
    return realFromText(text);
  }
  if (name == "date") {
    return dateFromText(text);
  }
  if (name == "data") {
    return dataFromText(text);
  }
  return emptyElement(name, text, name == "true");
}

}  // namespace platform::propertylist
