#include "platform/URL.h"

#include <curl/curl.h>

#include <array>
#include <utility>

#include "platform/Files.h"

namespace platform {

namespace {

constexpr bool isHexDigit(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

constexpr unsigned hexValue(char c) {
  if (c >= '0' && c <= '9') {
    return static_cast<unsigned>(c - '0');
  }
  return static_cast<unsigned>((c | 0x20) - 'a') + 10U;
}

/// Which of the characters may stand in which place (RFC 3986, appendix A).
enum CharacterClass : uint8_t { inPath = 1, inURL = 2 };

constexpr std::array<uint8_t, 256> makeCharacterTable() {
  std::array<uint8_t, 256> table{};
  const std::string_view path =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-._~!$&'()*+,;=:@/";
  for (const char c : path) {
    table[static_cast<unsigned char>(c)] = inPath | inURL;
  }
  for (const char c : std::string_view("?#[]")) {
    table[static_cast<unsigned char>(c)] = inURL;
  }
  return table;
}

constexpr std::array<uint8_t, 256> characterTable = makeCharacterTable();

bool startsEscape(std::string_view string, size_t i) {
  return string[i] == '%' && i + 2 < string.size() && isHexDigit(string[i + 1]) &&
         isHexDigit(string[i + 2]);
}

bool isWellFormed(std::string_view string) {
  for (size_t i = 0; i < string.size(); ++i) {
    const bool allowed = (characterTable[static_cast<unsigned char>(string[i])] & inURL) != 0;
    if (!allowed && !startsEscape(string, i)) {
      return false;
    }
  }
  return !string.empty();
}

using Handle = std::unique_ptr<CURLU, decltype(&curl_url_cleanup)>;

constexpr unsigned parseFlags = CURLU_NON_SUPPORT_SCHEME;

Handle parse(const std::string& absolute) {
  Handle handle(curl_url(), &curl_url_cleanup);
  if (handle &&
      curl_url_set(handle.get(), CURLUPART_URL, absolute.c_str(), parseFlags) != CURLUE_OK) {
    handle.reset();
  }
  return handle;
}

std::string part(const Handle& handle, CURLUPart which) {
  char* text = nullptr;
  if (!handle || curl_url_get(handle.get(), which, &text, 0) != CURLUE_OK) {
    return {};
  }
  std::string result = text;
  curl_free(text);
  return result;
}

/// A path of the file system means each '%' as it stands; other strings may be escaped already.
enum class PercentSign { isItself, mayBeginEscape };
std::string escapedPath(std::string_view path, PercentSign percentSign);

constexpr std::string_view fileRoot = "file:///";

/// The path of a file URL as spelled: most URLs here are of this form, and need no parser.
std::string_view spelledPathOfFileURL(std::string_view absolute) {
  absolute.remove_prefix(fileRoot.size() - 1);
  return absolute.substr(0, absolute.find_first_of("?#"));
}

}  // namespace

std::optional<URL> URL::URLWithString(std::string_view string) {
  if (!isWellFormed(string)) {
    return std::nullopt;
  }
  return URL(std::string(string), std::string(string));
}

std::optional<URL> URL::URLWithStringRelativeToURL(std::string_view string, const URL& base) {
  if (!isWellFormed(string)) {
    return std::nullopt;
  }
  std::string relative(string);
  const Handle handle = parse(base.absoluteString());
  if (!handle ||
      curl_url_set(handle.get(), CURLUPART_URL, relative.c_str(), parseFlags) != CURLUE_OK) {
    return URL(relative, relative);
  }
  std::string absolute = part(handle, CURLUPART_URL);
  return URL(std::move(relative), std::move(absolute));
}

URL URL::fileURLWithPath(std::string_view path) {
  std::string string = "file://";
  if (!path.starts_with('/')) {
    string += '/';
  }
  string += escapedPath(path, PercentSign::isItself);
  return URL(string, string);
}

URL URL::absoluteURL() const { return URL(_absolute, _absolute); }

std::string URL::scheme() const {
  const size_t colon = _absolute.find_first_of(":/?#");
  if (colon == std::string::npos || colon == 0 || _absolute[colon] != ':') {
    return {};
  }
  std::string scheme = _absolute.substr(0, colon);
  for (char& c : scheme) {
    c = c >= 'A' && c <= 'Z' ? static_cast<char>(c | 0x20) : c;
  }
  return scheme;
}

std::string URL::host() const { return part(parse(_absolute), CURLUPART_HOST); }

std::string URL::path() const {
  std::string spelled;
  if (_absolute.starts_with(fileRoot)) {
    spelled = spelledPathOfFileURL(_absolute);
  } else if (const Handle handle = parse(_absolute)) {
    spelled = part(handle, CURLUPART_PATH);
  } else {
    spelled = _absolute.substr(0, _absolute.find_first_of("?#"));
  }
  std::string path = stringByRemovingPercentEncoding(spelled);
  while (path.size() > 1 && path.back() == '/') {
    path.pop_back();
  }
  return path;
}

std::string URL::lastPathComponent() const { return platform::lastPathComponent(path()); }

bool URL::isFileURL() const { return scheme() == "file"; }

URL URL::URLByAppendingPathComponent(std::string_view component) const {
  std::string string = stringByAppendingPathComponent(
      std::string_view(_absolute).substr(0, _absolute.find_first_of("?#")),
      escapedPath(component, PercentSign::isItself));
  return URL(string, string);
}

std::string stringByEscapingPath(std::string_view path) {
  return escapedPath(path, PercentSign::mayBeginEscape);
}

namespace {

std::string escapedPath(std::string_view path, PercentSign percentSign) {
  constexpr std::string_view digits = "0123456789ABCDEF";
  std::string escaped;
  escaped.reserve(path.size());
  for (size_t i = 0; i < path.size(); ++i) {
    const auto c = static_cast<unsigned char>(path[i]);
    const bool isEscape = percentSign == PercentSign::mayBeginEscape && startsEscape(path, i);
    if ((characterTable[c] & inPath) != 0 || isEscape) {
      escaped += path[i];
      continue;
    }
    escaped += '%';
    escaped += digits[c >> 4U];
    escaped += digits[c & 15U];
  }
  return escaped;
}

}  // namespace

std::string stringByRemovingPercentEncoding(std::string_view string) {
  std::string decoded;
  decoded.reserve(string.size());
  for (size_t i = 0; i < string.size(); ++i) {
    if (startsEscape(string, i)) {
      decoded += static_cast<char>(hexValue(string[i + 1]) * 16 + hexValue(string[i + 2]));
      i += 2;
    } else {
      decoded += string[i];
    }
  }
  return decoded;
}

}  // namespace platform
