// Errors with a text for people.
#pragma once

#include <string>

#include "platform/Error.h"

/// An error of the domain that is described by `description`.
platform::Error zeb_errorWithDomain(std::string domain, long code, std::string description);
