// The two ways in which things go wrong: exceptions (thrown) and errors (returned or passed on).
#pragma once

#include <cstddef>
#include <exception>
#include <memory>
#include <string>

namespace platform {

/// The platform exception: a name by which code can tell kinds apart, and a reason for people.
/// Thrown for broken input and broken contracts; caught only where a caller says so.
class Exception : public std::exception {
 public:
  Exception(std::string name, std::string reason);

  const std::string& name() const noexcept { return *_name; }
  const std::string& reason() const noexcept { return *_reason; }

  /// The reason; what the log shows for "%@".
  const char* what() const noexcept override { return _reason->c_str(); }

 private:
  // Shared so that copying a thrown exception cannot throw.
  std::shared_ptr<const std::string> _name;
  std::shared_ptr<const std::string> _reason;
};

inline constexpr const char* rangeException = "RangeException";
inline constexpr const char* invalidArgumentException = "InvalidArgumentException";
inline constexpr const char* internalInconsistencyException = "InternalInconsistencyException";
inline constexpr const char* inconsistentArchiveException = "InconsistentArchiveException";

/// Bytes that are not what they claim to be, and the place at which that showed. The reason
/// already names the offset; offset() is for programs and tests.
class ArchiveException : public Exception {
 public:
  /// `reason` without the offset; " at byte N" is appended.
  ArchiveException(const std::string& reason, size_t offset);

  size_t offset() const noexcept { return _offset; }

 private:
  size_t _offset;
};

}  // namespace platform
