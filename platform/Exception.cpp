#include "platform/Exception.h"

#include <fmt/format.h>

#include <cstring>
#include <utility>

#include "platform/Error.h"

namespace platform {

Exception::Exception(std::string name, std::string reason)
    : _name(std::make_shared<const std::string>(std::move(name))),
      _reason(std::make_shared<const std::string>(std::move(reason))) {}

ArchiveException::ArchiveException(const std::string& reason, size_t offset)
    : Exception(inconsistentArchiveException, fmt::format("{} at byte {}", reason, offset)),
      _offset(offset) {}

Error posixError(int errorNumber, std::string_view what) {
  char buffer[256];
  const char* text = strerror_r(errorNumber, buffer, sizeof buffer);
  return {posixErrorDomain, errorNumber, fmt::format("{}: {}", what, text)};
}

Error formatError(std::string description) {
  return {formatErrorDomain, 1, std::move(description)};
}

}  // namespace platform
