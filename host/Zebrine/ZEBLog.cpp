#include "host/Zebrine/ZEBLog.h"

#include <fmt/format.h>

#include <iterator>

#include "host/Zebrine/ZEBDescription.h"
#include "host/Zebrine/ZEBDescriptionWriter.h"
#include "platform/Environment.h"
#include "platform/Error.h"
#include "platform/Log.h"

namespace {

constexpr std::string_view absentText = "(null)";

}  // namespace

ZEBLogArgument::ZEBLogArgument(const char* text) noexcept {
  if (text != nullptr) {
    _content = std::string_view(text);
  }
}

ZEBLogArgument::ZEBLogArgument(const platform::Value& value) {
  if (const std::string* string = value.stringIf()) {
    _content = std::string_view(*string);
  } else if (value.kind() == platform::Value::Kind::real) {
    _content = value.doubleValue();
  } else if (!value.isAbsent()) {
    _content = ZEBDescription(value);
  }
}

ZEBLogArgument::ZEBLogArgument(const platform::Value::Array& array) {
  ZEBDescriptionWriter writer;
  writer.array(array, 0);
  _content = writer.take();
}

ZEBLogArgument::ZEBLogArgument(const platform::Value::Dictionary& dictionary) {
  ZEBDescriptionWriter writer;
  writer.dictionary(dictionary, 0);
  _content = writer.take();
}

ZEBLogArgument::ZEBLogArgument(const platform::URL& url)
    : _content(std::string(url.absoluteString())) {}

ZEBLogArgument::ZEBLogArgument(const platform::Error& error)
    : _content(fmt::format("{} ({} {})", error.description, error.domain, error.code)) {}

ZEBLogArgument::ZEBLogArgument(const std::exception& exception)
    : _content(std::string(exception.what())) {}

void ZEBLogArgument::appendTo(std::string& message) const {
  struct Appender {
    std::string& message;
    void operator()(std::monostate) const { message += absentText; }
    void operator()(int64_t integer) const {
      fmt::format_to(std::back_inserter(message), "{}", integer);
    }
    void operator()(uint64_t integer) const {
      fmt::format_to(std::back_inserter(message), "{}", integer);
    }
    void operator()(double real) const { fmt::format_to(std::back_inserter(message), "{}", real); }
    void operator()(std::string_view text) const { message += text; }
    void operator()(const std::string& text) const { message += text; }
  };
  std::visit(Appender{message}, _content);
}

bool ZEBLogArgument::_writeAsElementTo(ZEBDescriptionWriter& writer) const {
  if (const auto* text = std::get_if<std::string_view>(&_content)) {
    return writer.quoted(*text);
  }
  std::string picture;
  appendTo(picture);
  return writer.text(picture);
}

std::string ZEBLogArgument::_listDescription(std::span<const ZEBLogArgument> elements) {
  ZEBDescriptionWriter writer;
  writer.text("[");
  std::string_view separator;
  for (const ZEBLogArgument& element : elements) {
    if (!writer.text(separator) || !element._writeAsElementTo(writer)) {
      break;
    }
    separator = ", ";
  }
  writer.text("]");
  return writer.take();
}

std::string ZEBLogArgument::_dictionaryDescription(
    std::span<const std::pair<std::string_view, ZEBLogArgument>> entries) {
  ZEBDescriptionWriter writer;
  writer.text("{");
  std::string_view separator;
  for (const auto& [key, value] : entries) {
    if (!writer.text(separator) || !writer.quoted(key) || !writer.text(": ") ||
        !value._writeAsElementTo(writer)) {
      break;
    }
    separator = ", ";
  }
  writer.text("}");
  return writer.take();
}

std::string ZEBStringWithArguments(std::string_view format,
                                   std::span<const ZEBLogArgument> arguments) {
  std::string message;
  message.reserve(format.size() + 32 * arguments.size());
  size_t next = 0;
  while (!format.empty()) {
    const size_t percent = format.find('%');
    message += format.substr(0, percent);
    if (percent == std::string_view::npos) {
      break;
    }
    format.remove_prefix(percent);
    const char kind = format.size() > 1 ? format[1] : '\0';
    if (kind == '@' || kind == 'd') {
      if (next < arguments.size()) {
        arguments[next].appendTo(message);
      }
      ++next;
      format.remove_prefix(2);
    } else {
      message += '%';
      format.remove_prefix(kind == '%' ? 2 : 1);
    }
  }
  return message;
}

bool ZEBLogAccepts(int level) {
  const auto environment = platform::Environment::current();
  return environment->log != nullptr && environment->log->accepts(level);
}

void ZEBLogMessage(int level, std::string_view message) {
  const auto environment = platform::Environment::current();
  if (environment->log != nullptr) {
    environment->log->write(level, message);
  }
}
