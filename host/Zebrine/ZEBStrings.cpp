#include "host/Zebrine/ZEBStrings.h"

#include <algorithm>
#include <array>
#include <cstdint>

namespace {

constexpr bool isLetter(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); }
constexpr bool isDigit(char c) { return c >= '0' && c <= '9'; }
constexpr bool isHexDigit(char c) {
  return isDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}
constexpr char lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c | 0x20) : c; }

bool equalIgnoringCase(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return lower(x) == lower(y); });
}

/// The length of "scheme:" at the beginning of a string, 0 when there is none.
size_t schemeLength(std::string_view string) {
  if (string.empty() || !isLetter(string.front())) {
    return 0;
  }
  const auto* const end = std::find_if_not(string.begin(), string.end(), [](char c) {
    return isLetter(c) || isDigit(c) || c == '+' || c == '-' || c == '.';
  });
  return end != string.end() && *end == ':' ? static_cast<size_t>(end - string.begin()) + 1 : 0;
}

constexpr std::string_view unreservedAndDelimiters =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-._~!$&'()*+,;=:@/";

constexpr std::array<bool, 256> tableOf(std::string_view characters, std::string_view more) {
  std::array<bool, 256> table{};
  for (const char c : characters) {
    table[static_cast<unsigned char>(c)] = true;
  }
  for (const char c : more) {
    table[static_cast<unsigned char>(c)] = true;
  }
  return table;
}

/// What may stand for itself in a path, in an authority, in a query or fragment (RFC 3986).
constexpr auto inPath = tableOf(unreservedAndDelimiters, "");
constexpr auto inAuthority = tableOf(unreservedAndDelimiters, "[]");
constexpr auto inQuery = tableOf(unreservedAndDelimiters, "?");

void appendEscape(std::string& out, char c) {
  constexpr std::string_view digits = "0123456789ABCDEF";
  const auto byte = static_cast<unsigned char>(c);
  out += '%';
  out += digits[byte >> 4U];
  out += digits[byte & 15U];
}

void appendEscaped(std::string& out, std::string_view text, const std::array<bool, 256>& allowed) {
  for (size_t i = 0; i < text.size(); ++i) {
    const bool escape =
        text[i] == '%' && i + 2 < text.size() && isHexDigit(text[i + 1]) && isHexDigit(text[i + 2]);
    if (escape || allowed[static_cast<unsigned char>(text[i])]) {
      out += text[i];
    } else {
      appendEscape(out, text[i]);
    }
  }
}

/// What follows "scheme://" of a URL whose delimiters count.
void appendWholeURL(std::string& out, std::string_view rest) {
  const size_t authorityLength = std::min(rest.find_first_of("/?#"), rest.size());
  appendEscaped(out, rest.substr(0, authorityLength), inAuthority);
  rest.remove_prefix(authorityLength);
  const size_t fragment = rest.find('#');
  appendEscaped(out, rest.substr(0, fragment), inQuery);
  if (fragment != std::string_view::npos) {
    out += '#';
    appendEscaped(out, rest.substr(fragment + 1), inQuery);
  }
}

void appendPathOrName(std::string& out, std::string_view path) {
  if (path.front() == '/') {
    path.remove_prefix(std::min(path.find_first_not_of('/'), path.size()) - 1);
    appendEscaped(out, path, inPath);
    return;
  }
  const size_t firstSegmentLength = std::min(path.find('/'), path.size());
  std::string segment;
  appendEscaped(segment, path.substr(0, firstSegmentLength), inPath);
  for (const char c : segment) {
    if (c == ':') {
      appendEscape(out, c);
    } else {
      out += c;
    }
  }
  appendEscaped(out, path.substr(firstSegmentLength), inPath);
}

/// Whether four decimal numbers of up to three digits follow each other, the first of them 127.
bool isLoopbackIPv4(std::string_view host) {
  if (!host.starts_with("127.")) {
    return false;
  }
  int parts = 0;
  while (true) {
    const size_t length = std::min(host.find('.'), host.size());
    if (length == 0 || length > 3 || !std::all_of(host.begin(), host.begin() + length, isDigit)) {
      return false;
    }
    ++parts;
    if (length == host.size()) {
      return parts == 4;
    }
    host.remove_prefix(length + 1);
  }
}

bool isThisMachine(std::string_view host) {
  return equalIgnoringCase(host, "localhost") || host == "[::1]" || isLoopbackIPv4(host);
}

}  // namespace

std::optional<platform::URL> URLByEscapingString(std::string_view string) {
  if (string.empty() || string.find('\0') != std::string_view::npos) {
    return std::nullopt;
  }
  std::string out;
  out.reserve(string.size() + string.size() / 8);
  const size_t scheme = schemeLength(string);
  const std::string_view rest = string.substr(scheme);
  if (scheme > 0 && equalIgnoringCase(string.substr(0, scheme), "file:") && rest.starts_with('/')) {
    out = string.substr(0, scheme);
    appendEscaped(out, rest, inPath);
  } else if (scheme > 0 && rest.starts_with("//")) {
    out = string.substr(0, scheme + 2);
    appendWholeURL(out, rest.substr(2));
  } else {
    appendPathOrName(out, string);
  }
  return platform::URL::URLWithString(out);
}

std::string addSSLAsNecessary(std::string_view string) {
  constexpr std::string_view insecure = "http://";
  if (!equalIgnoringCase(string.substr(0, insecure.size()), insecure)) {
    return std::string(string);
  }
  const std::string_view rest = string.substr(insecure.size());
  const size_t authorityLength = std::min(rest.find_first_of("/?#"), rest.size());
  const std::string_view authority = rest.substr(0, authorityLength);
  const size_t at = authority.rfind('@');
  const std::string_view hostAndPort =
      at == std::string_view::npos ? authority : authority.substr(at + 1);
  const size_t colon = hostAndPort.rfind(':');
  const bool hasPort = colon != std::string_view::npos &&
                       std::all_of(hostAndPort.begin() + colon + 1, hostAndPort.end(), isDigit);
  const std::string_view host = hasPort ? hostAndPort.substr(0, colon) : hostAndPort;
  // Some parsers end the host at a backslash; what follows it must not pass for the host.
  if (isThisMachine(host) && authority.find('\\') == std::string_view::npos) {
    return std::string(string);
  }
  std::string secure = "https://";
  secure += hasPort && hostAndPort.substr(colon) == ":80"
                ? authority.substr(0, authority.size() - 3)
                : authority;
  secure += rest.substr(authorityLength);
  return secure;
}

std::string ZEBOriginOfURL(const platform::URL& url) {
  const std::string& address = url.absoluteString();
  const size_t separator = address.find("://");
  if (separator == std::string::npos) {
    return {};
  }
  std::string_view authority = std::string_view(address).substr(separator + 3);
  authority = authority.substr(0, authority.find_first_of("/?#\\"));
  const size_t at = authority.rfind('@');
  if (at != std::string_view::npos) {
    authority.remove_prefix(at + 1);
  }
  const size_t colon = authority.rfind(':');
  const bool hasColon = colon != std::string_view::npos &&
                        std::all_of(authority.begin() + colon + 1, authority.end(), isDigit);
  const std::string_view host = hasColon ? authority.substr(0, colon) : authority;
  if (host.empty()) {
    return {};
  }
  std::string origin = address.substr(0, separator + 3);
  origin += host;
  std::transform(origin.begin(), origin.end(), origin.begin(), lower);
  std::string_view port = hasColon ? authority.substr(colon + 1) : std::string_view();
  port.remove_prefix(std::min(port.find_first_not_of('0'), port.size()));
  if (port.empty()) {
    port = origin.starts_with("https:") ? "443" : "80";
  }
  return origin + ':' + std::string(port);
}
