#include "platform/HTTPCaching.h"

#include <curl/curl.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <functional>

namespace platform::httpcaching {

namespace {

using std::chrono::seconds;
using std::chrono::system_clock;

/// No answer is fresh for longer: beyond a year nobody means it, and sums stay far from overflow.
constexpr seconds longestLifetime{366L * 24 * 3600};

/// Calls visit(name, value) for each part of a list such as "no-cache, max-age=5, x=\"a, b\"".
void forEachDirective(std::string_view list,
                      const std::function<void(std::string_view, std::string_view)>& visit) {
  while (!list.empty()) {
    bool quoted = false;
    size_t end = 0;
    while (end < list.size() && (quoted || list[end] != ',')) {
      if (list[end] == '"') {
        quoted = !quoted;
      }
      ++end;
    }
    const std::string_view part = trimmedHTTPFieldValue(list.substr(0, end));
    list.remove_prefix(std::min(end + 1, list.size()));
    const size_t equals = part.find('=');
    std::string_view value = equals == std::string_view::npos
                                 ? std::string_view()
                                 : trimmedHTTPFieldValue(part.substr(equals + 1));
    if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
      value = value.substr(1, value.size() - 2);
    }
    visit(trimmedHTTPFieldValue(part.substr(0, equals)), value);
  }
}

/// A number of seconds (section 1.2.2): absent for anything but digits, large ones cut.
std::optional<seconds> secondsFromText(std::string_view text) {
  uint64_t count = 0;
  const char* const end = text.data() + text.size();
  const auto [rest, failure] = std::from_chars(text.data(), end, count);
  if (text.empty() || rest != end || failure == std::errc::invalid_argument) {
    return std::nullopt;
  }
  if (failure == std::errc::result_out_of_range ||
      count > static_cast<uint64_t>(longestLifetime.count())) {
    return longestLifetime;
  }
  return seconds(static_cast<int64_t>(count));
}

struct Directives {
  bool noStore = false;
  bool noCache = false;
  /// Zero where it is given in a way that makes no sense.
  std::optional<seconds> maximumAge;
};

Directives directivesOf(const HTTPHeaderFields& fields) {
  Directives directives;
  const std::optional<std::string> list = valueForHTTPHeaderField(fields, "Cache-Control");
  if (!list) {
    const std::optional<std::string> pragma = valueForHTTPHeaderField(fields, "Pragma");
    directives.noCache = pragma && isSameHTTPFieldName(trimmedHTTPFieldValue(*pragma), "no-cache");
    return directives;
  }
  forEachDirective(*list, [&](std::string_view name, std::string_view value) {
    if (isSameHTTPFieldName(name, "no-store")) {
      directives.noStore = true;
    } else if (isSameHTTPFieldName(name, "no-cache")) {
      directives.noCache = true;
    } else if (isSameHTTPFieldName(name, "max-age")) {
      const seconds given = secondsFromText(value).value_or(seconds::zero());
      directives.maximumAge = std::min(directives.maximumAge.value_or(given), given);
    }
  });
  return directives;
}

std::optional<system_clock::time_point> timeOfField(const URLResponse& response,
                                                    std::string_view name) {
  const std::optional<std::string> text = response.valueForHTTPHeaderField(name);
  return text ? timeFromText(*text) : std::nullopt;
}

/// Fields that belong to one message or one connection and say nothing of what is stored.
bool belongsToOneMessage(std::string_view name) {
  constexpr std::array<std::string_view, 12> names = {"Content-Length",
                                                      "Content-Encoding",
                                                      "Content-Range",
                                                      "Transfer-Encoding",
                                                      "Connection",
                                                      "Keep-Alive",
                                                      "TE",
                                                      "Trailer",
                                                      "Proxy-Authenticate",
                                                      "Upgrade",
                                                      "Proxy-Authorization",
                                                      "Set-Cookie"};
  return std::any_of(names.begin(), names.end(),
                     [&](std::string_view other) { return isSameHTTPFieldName(name, other); });
}

/// Fields that change with every answer, and matter only where the answer stays fresh for a while.
bool onlyTellsTheTime(std::string_view name) {
  return isSameHTTPFieldName(name, "Date") || isSameHTTPFieldName(name, "Age") ||
         isSameHTTPFieldName(name, "Expires");
}

HTTPHeaderFields withoutTimes(const HTTPHeaderFields& fields) {
  HTTPHeaderFields rest;
  std::copy_if(fields.begin(), fields.end(), std::inserter(rest, rest.end()),
               [](const auto& field) { return !onlyTellsTheTime(field.first); });
  return rest;
}

/// An entity tag without the mark of the weak ones (section 8.8.3.2 of RFC 9110).
std::string_view opaqueTag(std::string_view tag) {
  tag = trimmedHTTPFieldValue(tag);
  return tag.starts_with("W/") ? tag.substr(2) : tag;
}

/// Credentials are not kept with answers, so nothing could tell later whose such an answer is.
bool isForThisUserAlone(const URLRequest& request, const URLResponse& response) {
  if (!request.credential() && !request.valueForHTTPHeaderField("Authorization")) {
    return false;
  }
  bool varies = false;
  const std::string fields = response.valueForHTTPHeaderField("Vary").value_or("");
  forEachDirective(fields, [&](std::string_view name, std::string_view) {
    varies = varies || isSameHTTPFieldName(name, "Authorization");
  });
  return varies;
}

}  // namespace

std::optional<system_clock::time_point> timeFromText(const std::string& text) {
  const time_t time = curl_getdate(text.c_str(), nullptr);
  // Beyond the year 9999 a clock of nanoseconds would overflow.
  constexpr time_t latest = 253402300799;
  if (time < 0) {
    return std::nullopt;
  }
  constexpr auto greatest =
      std::chrono::duration_cast<seconds>(system_clock::duration::max()).count() / 2;
  return system_clock::time_point(seconds(std::min({time, latest, time_t{greatest}})));
}

bool concernsCache(const URLRequest& request) {
  constexpr std::array<std::string_view, 6> own = {
      "If-None-Match", "If-Modified-Since", "If-Match", "If-Range", "If-Unmodified-Since", "Range"};
  return request.HTTPMethod() == "GET" &&
         std::none_of(own.begin(), own.end(), [&](std::string_view name) {
           return request.valueForHTTPHeaderField(name).has_value();
         });
}

bool mayStore(const URLRequest& request, const URLResponse& response) {
  return concernsCache(request) && response.statusCode() == 200 &&
         !isForThisUserAlone(request, response) &&
         !directivesOf(response.allHeaderFields()).noStore &&
         !directivesOf(request.allHTTPHeaderFields()).noStore;
}

seconds freshnessLifetime(const URLResponse& response) {
  const Directives directives = directivesOf(response.allHeaderFields());
  if (directives.noCache) {
    return seconds::zero();
  }
  if (directives.maximumAge) {
    return *directives.maximumAge;
  }
  const auto expires = timeOfField(response, "Expires");
  const auto date = timeOfField(response, "Date");
  if (!expires || !date || *expires <= *date) {
    return seconds::zero();
  }
  return std::min(std::chrono::duration_cast<seconds>(*expires - *date), longestLifetime);
}

bool isFresh(const CachedURLResponse& cached, const URLRequest& request,
             system_clock::time_point now) {
  const URLResponse& response = *cached.response();
  const Directives asked = directivesOf(request.allHTTPHeaderFields());
  seconds lifetime = freshnessLifetime(response);
  if (asked.maximumAge) {
    lifetime = std::min(lifetime, *asked.maximumAge);
  }
  // A clock that was set back tells nothing about the age.
  if (asked.noCache || lifetime <= seconds::zero() || now < cached.date()) {
    return false;
  }
  const auto date = timeOfField(response, "Date").value_or(cached.date());
  const auto apparentAge = std::max(cached.date() - date, system_clock::duration::zero());
  const seconds statedAge =
      secondsFromText(trimmedHTTPFieldValue(response.valueForHTTPHeaderField("Age").value_or("")))
          .value_or(seconds::zero());
  const auto initialAge = std::max<system_clock::duration>(apparentAge, statedAge);
  return initialAge + (now - cached.date()) < lifetime;
}

bool makeConditional(URLRequest& request, const URLResponse& stored) {
  const std::optional<std::string> tag = stored.valueForHTTPHeaderField("ETag");
  const std::optional<std::string> modified = stored.valueForHTTPHeaderField("Last-Modified");
  if (tag) {
    request.setValueForHTTPHeaderField(tag, "If-None-Match");
  }
  if (modified) {
    request.setValueForHTTPHeaderField(modified, "If-Modified-Since");
  }
  return tag || modified;
}

bool confirms(const URLResponse& notModified, const URLResponse& stored) {
  const std::optional<std::string> now = notModified.valueForHTTPHeaderField("ETag");
  const std::optional<std::string> then = stored.valueForHTTPHeaderField("ETag");
  return !now || !then || opaqueTag(*now) == opaqueTag(*then);
}

std::shared_ptr<const URLResponse> renewed(const URLResponse& stored,
                                           const URLResponse& notModified) {
  HTTPHeaderFields fields = stored.allHeaderFields();
  // The age of the answer was that of the stored copy.
  if (const auto age = fields.find("Age"); age != fields.end()) {
    fields.erase(age);
  }
  for (const auto& [name, value] : notModified.allHeaderFields()) {
    if (!belongsToOneMessage(name)) {
      fields.insert_or_assign(name, value);
    }
  }
  return URLResponse::initWithURL(stored.URL(), stored.statusCode(), stored.HTTPVersion(),
                                  std::move(fields));
}

bool isWorthKeeping(const URLResponse& renewed, const URLResponse& stored) {
  return freshnessLifetime(renewed) > seconds::zero() ||
         withoutTimes(renewed.allHeaderFields()) != withoutTimes(stored.allHeaderFields());
}

}  // namespace platform::httpcaching
