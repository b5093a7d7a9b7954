#include "host/Zebrine/RNXCatalogue.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>
#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLocalization.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Digest.h"

namespace {

using nlohmann::json;
using nlohmann::ordered_json;

constexpr int formatVersion = 1;
constexpr size_t maximumDepth = 32;
constexpr size_t maximumBookCount = 10'000;
constexpr size_t maximumTextLength = 1'000;
constexpr size_t maximumURLLength = 4'000;

constexpr const char* formatKey = "format";
constexpr const char* booksKey = "books";
constexpr const char* identifierKey = "identifier";
constexpr const char* versionKey = "version";
constexpr const char* localeKey = "locale";
constexpr const char* titleKey = "title";
constexpr const char* pagesKey = "pages";
constexpr const char* searchIndexKey = "searchIndex";
constexpr const char* exactMatchKey = "exactMatch";
constexpr const char* urlKey = "url";
constexpr const char* sha256Key = "sha256";

/// What is wrong with a catalogue; ends the reading of it and never leaves this file.
struct Refusal {
  std::string reason;
};

[[noreturn]] void refuse(const std::string& place, const std::string& what) {
  throw Refusal{place.empty() ? what : place + ": " + what};
}

json parsed(std::string_view bytes) {
  bool tooDeep = false;
  const auto bounded = [&tooDeep](int depth, json::parse_event_t, json&) {
    tooDeep = tooDeep || static_cast<size_t>(depth) > maximumDepth;
    // What is discarded is never kept, so that depth costs no memory either.
    return !tooDeep;
  };
  json value;
  try {
    value = json::parse(bytes.begin(), bytes.end(), bounded);
  } catch (const json::exception& exception) {
    refuse({}, std::string("no JSON: ") + exception.what());
  }
  if (tooDeep) {
    refuse({}, "nested too deeply");
  }
  return value;
}

/// One object of the catalogue, and where it stands.
class Reader {
 public:
  Reader(const json& object, std::string place, const platform::URL& base)
      : _object(object), _place(std::move(place)), _base(base) {
    if (!object.is_object()) {
      refuse(_place, "is no object");
    }
  }

  std::optional<std::string> optionalText(const char* key,
                                          size_t longest = maximumTextLength) const {
    const auto found = _object.find(key);
    if (found == _object.end()) {
      return std::nullopt;
    }
    if (!found->is_string()) {
      refuse(_placeOf(key), "is no string");
    }
    std::string text = found->get<std::string>();
    if (text.size() > longest) {
      refuse(_placeOf(key), "is too long");
    }
    if (text.find('\0') != std::string::npos) {
      refuse(_placeOf(key), "holds a NUL");
    }
    return text;
  }

  std::string text(const char* key) const {
    std::optional<std::string> text = optionalText(key);
    if (!text || text->empty()) {
      refuse(_placeOf(key), "is missing");
    }
    return std::move(*text);
  }

  std::optional<platform::URL> optionalURL(const char* key) const {
    const std::optional<std::string> text = optionalText(key, maximumURLLength);
    if (!text) {
      return std::nullopt;
    }
    auto url = platform::URL::URLWithStringRelativeToURL(*text, _base);
    if (!url) {
      refuse(_placeOf(key), "is no URL");
    }
    const std::string& target = url->absoluteString();
    const bool isSecure = url->scheme() == "https";
    // A page that came over a secure connection vouches for no file that does not.
    const bool isLocal =
        url->scheme() == "http" && _base.scheme() == "http" && addSSLAsNecessary(target) == target;
    if (url->host().empty() || !(isSecure || isLocal)) {
      refuse(_placeOf(key), "is no https URL");
    }
    const size_t authority = target.find("//") + 2;
    if (target.substr(authority, target.find_first_of("/?#", authority) - authority).find('@') !=
        std::string::npos) {
      refuse(_placeOf(key), "names a user");
    }
    if (target.find('#') != std::string::npos) {
      refuse(_placeOf(key), "has a fragment");
    }
    return url;
  }

  std::optional<RNXAsset> optionalAsset(const char* key) const {
    const auto found = _object.find(key);
    if (found == _object.end()) {
      return std::nullopt;
    }
    const Reader reader(*found, _placeOf(key), _base);
    std::optional<platform::URL> url = reader.optionalURL(urlKey);
    if (!url) {
      refuse(reader._placeOf(urlKey), "is missing");
    }
    std::string digest = reader.text(sha256Key);
    if (!platform::isSHA256Digest(digest)) {
      refuse(reader._placeOf(sha256Key), "is not 64 lower-case hexadecimal digits");
    }
    return RNXAsset{std::move(*url), std::move(digest)};
  }

  std::string name(const char* key) const {
    std::string name = text(key);
    if (!ZEBHelpBook::isValidBookID(name)) {
      refuse(_placeOf(key), "cannot name a folder");
    }
    return name;
  }

  bool has(const char* key) const { return _object.contains(key); }

 private:
  std::string _placeOf(const char* key) const { return _place + "." + key; }

  const json& _object;
  const std::string _place;
  const platform::URL& _base;
};

RNXCatalogueEntry entryFromJSON(const json& object, size_t number, const platform::URL& base) {
  const Reader reader(object, std::string(booksKey) + "[" + std::to_string(number) + "]", base);
  RNXCatalogueEntry entry;
  entry.identifier = reader.name(identifierKey);
  entry.version = reader.text(versionKey);
  if (reader.has(localeKey)) {
    entry.locale = reader.name(localeKey);
  }
  entry.title = reader.optionalText(titleKey).value_or("");
  if (entry.title.empty()) {
    entry.title = entry.identifier;
  }
  entry.pages = reader.optionalURL(pagesKey);
  entry.searchIndex = reader.optionalAsset(searchIndexKey);
  entry.exactMatch = reader.optionalAsset(exactMatchKey);
  return entry;
}

RNXCatalogue catalogueFromJSON(const json& root, const platform::URL& base) {
  if (!root.is_object()) {
    refuse({}, "is no object");
  }
  const auto format = root.find(formatKey);
  if (format == root.end() || *format != formatVersion) {
    refuse(formatKey, "is not 1");
  }
  const auto books = root.find(booksKey);
  if (books == root.end() || !books->is_array()) {
    refuse(booksKey, "is no array");
  }
  if (books->size() > maximumBookCount) {
    refuse(booksKey, "has too many entries");
  }
  RNXCatalogue catalogue;
  std::set<std::pair<std::string, std::optional<std::string>>> known;
  for (size_t i = 0; i < books->size(); ++i) {
    RNXCatalogueEntry entry = entryFromJSON((*books)[i], i, base);
    if (!known.emplace(entry.identifier, entry.locale).second) {
      refuse(std::string(booksKey) + "[" + std::to_string(i) + "]", "is there twice");
    }
    catalogue.books.push_back(std::move(entry));
  }
  return catalogue;
}

ordered_json jsonOfAsset(const RNXAsset& asset) {
  return {{urlKey, asset.url.relativeString()}, {sha256Key, asset.sha256}};
}

ordered_json jsonOfEntry(const RNXCatalogueEntry& entry) {
  ordered_json object;
  object[identifierKey] = entry.identifier;
  object[versionKey] = entry.version;
  if (entry.locale) {
    object[localeKey] = *entry.locale;
  }
  object[titleKey] = entry.title;
  if (entry.pages) {
    object[pagesKey] = entry.pages->relativeString();
  }
  if (entry.searchIndex) {
    object[searchIndexKey] = jsonOfAsset(*entry.searchIndex);
  }
  if (entry.exactMatch) {
    object[exactMatchKey] = jsonOfAsset(*entry.exactMatch);
  }
  return object;
}

}  // namespace

std::optional<RNXCatalogue> RNXCatalogue::catalogueWithData(const platform::Data& data,
                                                            const platform::URL& url,
                                                            platform::Error* error) {
  try {
    if (data.length() > maximumLength) {
      refuse({}, "is too long");
    }
    return catalogueFromJSON(parsed(data.view()), url);
  } catch (const Refusal& refusal) {
    if (error != nullptr) {
      *error = platform::formatError("catalogue " + url.absoluteString() + ": " + refusal.reason);
    }
    return std::nullopt;
  }
}

std::string RNXCatalogue::text() const {
  std::vector<RNXCatalogueEntry> sorted = books;
  std::sort(sorted.begin(), sorted.end(),
            [](const RNXCatalogueEntry& a, const RNXCatalogueEntry& b) {
              return std::tie(a.identifier, a.locale) < std::tie(b.identifier, b.locale);
            });
  ordered_json root;
  root[formatKey] = formatVersion;
  root[booksKey] = ordered_json::array();
  for (const RNXCatalogueEntry& entry : sorted) {
    root[booksKey].push_back(jsonOfEntry(entry));
  }
  return root.dump(2, ' ', false, ordered_json::error_handler_t::replace) + "\n";
}

const RNXCatalogueEntry* RNXCatalogue::bookWithIdentifier(
    std::string_view identifier, std::string_view localization,
    std::span<const std::string> languages) const {
  std::vector<std::string> available;
  for (const RNXCatalogueEntry& entry : books) {
    if (entry.identifier == identifier) {
      available.push_back(entry.locale.value_or(""));
    }
  }
  const auto best = ZEBBestLocalization(available, languages, localization);
  return best ? bookInLocalization(identifier, *best) : nullptr;
}

const RNXCatalogueEntry* RNXCatalogue::bookInLocalization(std::string_view identifier,
                                                          std::string_view localization) const {
  const auto found = std::find_if(books.begin(), books.end(), [&](const RNXCatalogueEntry& entry) {
    return entry.identifier == identifier && entry.locale.value_or("") == localization;
  });
  return found == books.end() ? nullptr : &*found;
}
