// The rules of RFC 9111 for a private cache, as far as fetching files needs them.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/URLCache.h"
#include "platform/URLRequest.h"
#include "platform/URLResponse.h"

namespace platform::httpcaching {

/// What the rules leave open is decided so: only whole 200 answers to GET requests are stored, and
/// an answer that does not say for how long it is fresh is stale at once, so that the server is
/// asked each time. All functions are thread-safe.

/// The time that a field gives (section 5.6.7 of RFC 9110); absent for anything else.
std::optional<std::chrono::system_clock::time_point> timeFromText(const std::string& text);

/// Whether the cache has any part in the request: a GET without conditions or ranges of its own.
bool concernsCache(const URLRequest& request);

/// Whether the answer may be kept.
bool mayStore(const URLRequest& request, const URLResponse& response);

/// How long the answer is fresh, from when the server made it; zero where it must be asked about.
std::chrono::seconds freshnessLifetime(const URLResponse& response);

/// Whether the answer can be given to the request without asking the server (section 4.2).
bool isFresh(const CachedURLResponse& cached, const URLRequest& request,
             std::chrono::system_clock::time_point now);

/// Makes a request that asks whether the answer still holds; false, with nothing changed, where the
/// answer has nothing to ask by.
bool makeConditional(URLRequest& request, const URLResponse& stored);

/// Whether a 304 speaks of the stored answer, as far as one can tell.
bool confirms(const URLResponse& notModified, const URLResponse& stored);

/// The stored answer with the fields that the 304 renews (section 3.2).
std::shared_ptr<const URLResponse> renewed(const URLResponse& stored,
                                           const URLResponse& notModified);

/// Whether keeping the renewed answer in place of the stored one would make a difference to a later
/// request.
bool isWorthKeeping(const URLResponse& renewed, const URLResponse& stored);

}  // namespace platform::httpcaching
