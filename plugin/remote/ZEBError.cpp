#include "plugin/remote/ZEBError.h"

#include <utility>

platform::Error zeb_errorWithDomain(std::string domain, long code, std::string description) {
  return platform::Error{std::move(domain), code, std::move(description)};
}
