// A failure that is reported rather than thrown.
#pragma once

#include <string>
#include <string_view>

namespace platform {

/// What went wrong in an operation that may fail in the ordinary course of things (files,
/// transfers). Functions that can fail this way return std::optional<Error>: absent is success.
struct Error {
  std::string domain;
  long code = 0;
  std::string description;

  friend bool operator==(const Error&, const Error&) = default;
};

/// Codes of this domain are errno values.
inline constexpr const char* posixErrorDomain = "PosixErrorDomain";
/// Property lists and archives that cannot be read; the code is always 1.
inline constexpr const char* formatErrorDomain = "FormatErrorDomain";

/// An error of the errno domain: "<what>: <text of the number>".
Error posixError(int errorNumber, std::string_view what);

/// An error of the format domain.
Error formatError(std::string description);

}  // namespace platform
