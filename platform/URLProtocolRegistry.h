// The kinds of protocols that a program has registered. Private to URL sessions.
#pragma once

#include <memory>
#include <vector>

#include "platform/URLProtocol.h"

namespace platform {

/// In the order in which they are to be asked. Thread-safe.
std::vector<std::shared_ptr<const URLProtocolClass>> registeredProtocolClasses();

}  // namespace platform
