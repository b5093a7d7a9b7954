// Which server a URL speaks of. Private to URL sessions.
#pragma once

#include <string>

#include "platform/URL.h"

namespace platform {

/// Scheme, host and port, the scheme's own port where the URL names none; empty for a URL that
/// libcurl cannot take apart.
std::string originOfURL(const URL& url);

}  // namespace platform
