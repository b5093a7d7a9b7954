#include "host/Zebrine/RNXBook.h"

#include <utility>

namespace {

std::optional<platform::URL> urlIn(const platform::Value& attributes, const char* key) {
  const platform::URL* url = attributes[key].urlIf();
  return url == nullptr ? std::nullopt : std::optional(*url);
}

}  // namespace

RNXBook::RNXBook(std::string bookID, std::string version, std::optional<std::string> locale,
                 platform::Value::Dictionary miscAttributes)
    : _bookID(std::move(bookID)),
      _version(std::move(version)),
      _locale(std::move(locale)),
      _miscAttributes(std::move(miscAttributes)) {}

std::shared_ptr<RNXBook> RNXBook::bookWithID(std::string bookID, std::string version,
                                             std::optional<std::string> locale,
                                             platform::Value::Dictionary miscAttributes) {
  return std::shared_ptr<RNXBook>(new RNXBook(std::move(bookID), std::move(version),
                                              std::move(locale), std::move(miscAttributes)));
}

std::optional<platform::URL> RNXBook::remoteSearchIndex() const {
  return urlIn(_miscAttributes, remoteSearchIndexKey);
}

std::optional<platform::URL> RNXBook::remoteExactMatch() const {
  return urlIn(_miscAttributes, remoteExactMatchKey);
}
