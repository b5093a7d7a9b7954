// Uniform resource locators (RFC 3986), possibly relative to a base.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// A URL as written, with the base that it is relative to, if any.
/// Thread-safety: immutable.
class URL {
 public:
  /// The URL that `string` spells, or absent when it is empty or has characters that no URL may
  /// have (blanks, controls, non-ASCII, quotes, a '%' without two digits …): escape first.
  static std::optional<URL> URLWithString(std::string_view string);

  /// `string` relative to `base`: its last segment is replaced unless it ends in a slash.
  static std::optional<URL> URLWithStringRelativeToURL(std::string_view string, const URL& base);

  /// A file URL for a path, which path() gives back: every character that a path may not have in a
  /// URL is escaped, every '%' too. A relative path is taken from the root.
  static URL fileURLWithPath(std::string_view path);

  /// The spelling given, without the base.
  const std::string& relativeString() const noexcept { return _string; }
  /// Resolved against the base, dot segments removed there; as written where there is no base.
  const std::string& absoluteString() const noexcept { return _absolute; }
  URL absoluteURL() const;

  /// Parts of the absolute form; empty where there is none.
  std::string scheme() const;
  std::string host() const;
  /// Percent-decoded, without trailing slash (but "/" for the root).
  std::string path() const;
  std::string lastPathComponent() const;
  bool isFileURL() const;

  /// The absolute form with one more (escaped) path component; query and fragment are dropped.
  URL URLByAppendingPathComponent(std::string_view component) const;

  /// Equal when spelled alike and relative to equal bases; see absoluteURL() to compare targets.
  friend bool operator==(const URL& a, const URL& b) noexcept {
    return a._string == b._string && a._absolute == b._absolute;
  }

 private:
  URL(std::string string, std::string absolute)
      : _string(std::move(string)), _absolute(std::move(absolute)) {}

  std::string _string;
  std::string _absolute;
};

/// Percent-escapes every byte of `path` that may not stand in the path of a URL. A '%' that two
/// hexadecimal digits follow is taken as an escape already made and stays, so that escaping twice
/// changes nothing; a lone '%' becomes "%25".
std::string stringByEscapingPath(std::string_view path);

/// Undoes percent-escapes; malformed ones stay as they are.
std::string stringByRemovingPercentEncoding(std::string_view string);

}  // namespace platform
