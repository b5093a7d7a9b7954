// Strings that are, or become, URLs.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/URL.h"

/// The URL that a string means, with everything percent-escaped that a URL may not hold. Applied to
/// the absolute string of its own result it changes nothing.
///
/// - "file:" followed by a slash: all that follows is host and path. '?' and '#' belong to file
///   names here and are escaped.
/// - Any other scheme followed by "//": a whole URL whose delimiters stay; a '#' after the first
///   is escaped, as are brackets outside the host.
/// - Anything else is a path or a name, and the result has no scheme: '?' and '#' are escaped,
///   and in the first segment ':' too, so that "a:b.html" is no URL of scheme "a". Of several
///   slashes at the beginning one stays, or the first folder would be taken for a host.
///
/// A '%' that two hexadecimal digits follow counts as an escape already made; any other becomes
/// "%25". Bytes beyond ASCII are escaped one by one, well-formed UTF-8 or not. Absent for an empty
/// string and for one with a NUL.
std::optional<platform::URL> URLByEscapingString(std::string_view string);

/// The same URL over a secure connection: "http" becomes "https" and an explicit port 80 is dropped
/// (other ports stay). Unchanged for other schemes, for what is no URL, and for hosts that are this
/// machine ("localhost", 127.0.0.0/8, "[::1]"), to which no connection leaves it.
std::string addSSLAsNecessary(std::string_view string);

/// Scheme, host and port of an absolute URL, spelled alike for all URLs of one server:
/// "https://help.example.org:443". Empty for a URL without a host.
std::string ZEBOriginOfURL(const platform::URL& url);
