#include "host/Zebrine/ZEBDescription.h"

#include <fmt/format.h>

#include <chrono>
#include <cmath>

#include "host/Zebrine/ZEBDescriptionWriter.h"

namespace {

constexpr std::string_view ellipsis = "…";

/// `text` cut to at most `length` bytes, not within a character.
std::string_view cut(std::string_view text, size_t length) {
  while (length > 0 && (static_cast<unsigned char>(text[length]) & 0xC0U) == 0x80U) {
    --length;
  }
  return text.substr(0, length);
}

std::string escaped(std::string_view text) {
  std::string out = "\"";
  for (const char c : text) {
    switch (c) {
      case '"':
      case '\\':
        out += '\\';
        out += c;
        break;
      case '\n':
        out += "\\n";
        break;
      case '\r':
        out += "\\r";
        break;
      case '\t':
        out += "\\t";
        break;
      default:
        if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) {
          out += fmt::format("\\u{:04x}", static_cast<unsigned>(c));
        } else {
          out += c;
        }
    }
  }
  return out + "\"";
}

}  // namespace

bool ZEBDescriptionWriter::text(std::string_view text) {
  if (_full) {
    return false;
  }
  const size_t room = ZEBDescriptionMaximumLength - _out.size();
  if (text.size() > room) {
    _out += cut(text, room);
    _out += ellipsis;
    _full = true;
    return false;
  }
  _out += text;
  return true;
}

bool ZEBDescriptionWriter::quoted(std::string_view string) {
  // No more is escaped than can be shown.
  return text(escaped(string.substr(0, ZEBDescriptionMaximumLength)));
}

void ZEBDescriptionWriter::element(const platform::Value& value, int depth) {
  using Kind = platform::Value::Kind;
  switch (value.kind()) {
    case Kind::absent:
      text("(null)");
      break;
    case Kind::boolean:
      text(value.boolValue() ? "true" : "false");
      break;
    case Kind::integer:
      text(value.isAboveSignedRange() ? fmt::format("{}", value.unsignedValue())
                                      : fmt::format("{}", value.integerValue()));
      break;
    case Kind::real:
      text(fmt::format("{}", value.doubleValue()));
      break;
    case Kind::date:
      date(*value.dateIf());
      break;
    case Kind::uid:
      text(fmt::format("<uid {}>", value.uidIf()->index));
      break;
    case Kind::string:
      quoted(*value.stringIf());
      break;
    case Kind::data:
      data(*value.dataIf());
      break;
    case Kind::url:
      text(value.urlIf()->absoluteString());
      break;
    case Kind::array:
      array(*value.arrayIf(), depth);
      break;
    case Kind::dictionary:
      dictionary(*value.dictionaryIf(), depth);
      break;
  }
}

void ZEBDescriptionWriter::array(const platform::Value::Array& array, int depth) {
  if (depth >= ZEBDescriptionMaximumDepth) {
    text(ellipsis);
    return;
  }
  text("[");
  std::string_view separator;
  for (const platform::Value& value : array) {
    if (!text(separator)) {
      return;
    }
    separator = ", ";
    element(value, depth + 1);
  }
  text("]");
}

void ZEBDescriptionWriter::dictionary(const platform::Value::Dictionary& dictionary, int depth) {
  if (depth >= ZEBDescriptionMaximumDepth) {
    text(ellipsis);
    return;
  }
  text("{");
  std::string_view separator;
  for (const auto& [key, value] : dictionary) {
    if (!text(separator)) {
      return;
    }
    separator = ", ";
    quoted(key);
    text(": ");
    element(value, depth + 1);
  }
  text("}");
}

void ZEBDescriptionWriter::data(const platform::Data& data) {
  constexpr size_t shownBytes = 16;
  text(fmt::format("<{} byte{}", data.length(), data.length() == 1 ? "" : "s"));
  for (size_t i = 0; i < data.length() && i < shownBytes; ++i) {
    text(fmt::format("{}{:02x}", i == 0 ? " " : "", data.bytes()[i]));
  }
  text(data.length() > shownBytes ? "…>" : ">");
}

void ZEBDescriptionWriter::date(const platform::Date& date) {
  constexpr double referenceInUnixTime = 978307200;
  // Years 1 to 9999, which four digits can show.
  constexpr double earliest = -63113904000.0;
  constexpr double latest = 252423993600.0;
  const double seconds = std::floor(date.secondsSinceReference);
  if (!(seconds >= earliest && seconds < latest)) {
    text(fmt::format("<date {}>", date.secondsSinceReference));
    return;
  }
  namespace chrono = std::chrono;
  const chrono::sys_seconds time{
      chrono::seconds{static_cast<int64_t>(seconds + referenceInUnixTime)}};
  const auto day = chrono::floor<chrono::days>(time);
  const chrono::year_month_day ymd{day};
  const chrono::hh_mm_ss hms{time - day};
  text(fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}Z", static_cast<int>(ymd.year()),
                   static_cast<unsigned>(ymd.month()), static_cast<unsigned>(ymd.day()),
                   hms.hours().count(), hms.minutes().count(), hms.seconds().count()));
}

std::string ZEBDescription(const platform::Value& value) {
  if (const std::string* string = value.stringIf()) {
    return *string;
  }
  ZEBDescriptionWriter writer;
  writer.element(value, 0);
  return writer.take();
}
