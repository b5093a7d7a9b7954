#include "host/Zebrine/ZEBHelpBook.h"

#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Strings.h"

struct ZEBHelpBook::Properties {
  std::string title;
  std::string localization;
  std::vector<std::string> indexPaths;
  std::optional<std::string> accessPagePath;
  std::optional<std::string> resourcesRootPath;
  std::optional<std::string> exactMatchPath;
  std::optional<std::string> suggestionsPath;
  std::optional<platform::URL> remoteURL;
  std::optional<platform::URL> catalogueURL;
  std::vector<std::string> preferredLanguages;
  bool usesExternalViewer = false;
  std::optional<std::string> appBundleID;
  std::optional<std::string> appBundleVersion;
  platform::Value remoteBookInfo;
  std::optional<platform::URL> remoteSearchIndex;
  std::optional<platform::URL> remoteExactMatch;
  platform::Value miscAttributes;
  std::shared_ptr<RNXBook> rnxBook;
};

ZEBHelpBook::ZEBHelpBook(std::string bookID, int32_t type, std::string path)
    : _bookID(std::move(bookID)),
      _type(type),
      _path(std::move(path)),
      _properties(std::make_unique<Properties>()) {
  const platform::MutexLock lock(_mutex);
  _properties->title = _bookID;
  if (_type != ZEBHelpBookType2 && _type != ZEBHelpBookType3 && !_path.empty()) {
    _properties->resourcesRootPath = _path;
  }
}

ZEBHelpBook::~ZEBHelpBook() {
  if (_type == ZEBHelpBookType4) {
    _forgetDeadType4Books(_bookID);
  }
}

std::shared_ptr<ZEBHelpBook> ZEBHelpBook::bookWithID(std::string bookID, int32_t type,
                                                     std::string path) {
  if (!isValidBookID(bookID) || type < ZEBHelpBookType1 || type > ZEBHelpBookType4) {
    return nullptr;
  }
  std::shared_ptr<ZEBHelpBook> book(new ZEBHelpBook(std::move(bookID), type, std::move(path)));
  if (type == ZEBHelpBookType4) {
    _rememberType4Book(book);
  }
  return book;
}

bool ZEBHelpBook::isValidBookID(std::string_view bookID) {
  constexpr size_t maximumLength = 200;
  return !bookID.empty() && bookID.size() <= maximumLength && bookID != "." && bookID != ".." &&
         bookID.find('/') == std::string_view::npos &&
         bookID.find('\0') == std::string_view::npos && platform::isValidUTF8(bookID);
}

std::string ZEBHelpBook::unversionedbookIDFromBookID(std::string_view bookID) {
  const size_t version = bookID.find('*');
  return std::string(version == 0 ? bookID : bookID.substr(0, version));
}

template <typename Member>
Member ZEBHelpBook::_get(Member Properties::*member) const {
  const platform::MutexLock lock(_mutex);
  return (*_properties).*member;
}

template <typename Member>
void ZEBHelpBook::_set(Member Properties::*member, Member value) {
  // The former value is freed after the lock is released.
  const platform::MutexLock lock(_mutex);
  std::swap((*_properties).*member, value);
}

std::string ZEBHelpBook::title() const { return _get(&Properties::title); }
void ZEBHelpBook::setTitle(std::string title) { _set(&Properties::title, std::move(title)); }

std::string ZEBHelpBook::localization() const { return _get(&Properties::localization); }
bool ZEBHelpBook::setLocalization(std::string localization) {
  if (!localization.empty() && !isValidBookID(localization)) {
    return false;
  }
  _set(&Properties::localization, std::move(localization));
  return true;
}

std::vector<std::string> ZEBHelpBook::indexPaths() const { return _get(&Properties::indexPaths); }
void ZEBHelpBook::setIndexPaths(std::vector<std::string> indexPaths) {
  _set(&Properties::indexPaths, std::move(indexPaths));
}

std::optional<std::string> ZEBHelpBook::accessPagePath() const {
  return _get(&Properties::accessPagePath);
}
void ZEBHelpBook::setAccessPagePath(std::optional<std::string> accessPagePath) {
  _set(&Properties::accessPagePath, std::move(accessPagePath));
}

std::optional<std::string> ZEBHelpBook::resourcesRootPath() const {
  return _get(&Properties::resourcesRootPath);
}
void ZEBHelpBook::setResourcesRootPath(std::optional<std::string> resourcesRootPath) {
  _set(&Properties::resourcesRootPath, std::move(resourcesRootPath));
}

std::optional<std::string> ZEBHelpBook::exactMatchPath() const {
  return _get(&Properties::exactMatchPath);
}
void ZEBHelpBook::setExactMatchPath(std::optional<std::string> exactMatchPath) {
  _set(&Properties::exactMatchPath, std::move(exactMatchPath));
}

std::optional<std::string> ZEBHelpBook::suggestionsPath() const {
  return _get(&Properties::suggestionsPath);
}
void ZEBHelpBook::setSuggestionsPath(std::optional<std::string> suggestionsPath) {
  _set(&Properties::suggestionsPath, std::move(suggestionsPath));
}

std::optional<platform::URL> ZEBHelpBook::catalogueURL() const {
  return _get(&Properties::catalogueURL);
}
void ZEBHelpBook::setCatalogueURL(std::optional<platform::URL> catalogueURL) {
  _set(&Properties::catalogueURL, std::move(catalogueURL));
}

std::vector<std::string> ZEBHelpBook::preferredLanguages() const {
  return _get(&Properties::preferredLanguages);
}
void ZEBHelpBook::setPreferredLanguages(std::vector<std::string> languages) {
  _set(&Properties::preferredLanguages, std::move(languages));
}

std::optional<platform::URL> ZEBHelpBook::remoteURL() const { return _get(&Properties::remoteURL); }
void ZEBHelpBook::setRemoteURL(std::optional<platform::URL> remoteURL) {
  _set(&Properties::remoteURL, std::move(remoteURL));
}

bool ZEBHelpBook::usesExternalViewer() const { return _get(&Properties::usesExternalViewer); }
void ZEBHelpBook::setUsesExternalViewer(bool usesExternalViewer) {
  _set(&Properties::usesExternalViewer, usesExternalViewer);
}

std::optional<std::string> ZEBHelpBook::appBundleID() const {
  return _get(&Properties::appBundleID);
}
void ZEBHelpBook::setAppBundleID(std::optional<std::string> appBundleID) {
  _set(&Properties::appBundleID, std::move(appBundleID));
}

std::optional<std::string> ZEBHelpBook::appBundleVersion() const {
  return _get(&Properties::appBundleVersion);
}
void ZEBHelpBook::setAppBundleVersion(std::optional<std::string> appBundleVersion) {
  _set(&Properties::appBundleVersion, std::move(appBundleVersion));
}

platform::Value ZEBHelpBook::remoteBookInfo() const { return _get(&Properties::remoteBookInfo); }
void ZEBHelpBook::setRemoteBookInfo(platform::Value remoteBookInfo) {
  _set(&Properties::remoteBookInfo, std::move(remoteBookInfo));
}

std::optional<platform::URL> ZEBHelpBook::remoteSearchIndex() const {
  return _get(&Properties::remoteSearchIndex);
}
void ZEBHelpBook::setRemoteSearchIndex(std::optional<platform::URL> remoteSearchIndex) {
  _set(&Properties::remoteSearchIndex, std::move(remoteSearchIndex));
}

std::optional<platform::URL> ZEBHelpBook::remoteExactMatch() const {
  return _get(&Properties::remoteExactMatch);
}
void ZEBHelpBook::setRemoteExactMatch(std::optional<platform::URL> remoteExactMatch) {
  _set(&Properties::remoteExactMatch, std::move(remoteExactMatch));
}

platform::Value ZEBHelpBook::miscAttributes() const { return _get(&Properties::miscAttributes); }
void ZEBHelpBook::setMiscAttributes(platform::Value miscAttributes) {
  _set(&Properties::miscAttributes, std::move(miscAttributes));
}

std::shared_ptr<RNXBook> ZEBHelpBook::rnxBook() const { return _get(&Properties::rnxBook); }
void ZEBHelpBook::setRnxBook(std::shared_ptr<RNXBook> rnxBook) {
  _set(&Properties::rnxBook, std::move(rnxBook));
}

std::string ZEBHelpBook::description() const {
  return ZEBStringWithFormat("book %@ type: %d path: %@ localization: %@", _bookID, _type, _path,
                             localization());
}
