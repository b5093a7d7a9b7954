#include "plugin/records/ZEBHelpindexIndex.h"

#include <string_view>
#include <utility>
#include <vector>

#include "SearchKit/IndexReader.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Zebrine/ZEBCheckClass.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/Files.h"

namespace {

// The keys of a help-index file. A value of another kind than its key has counts as absent, so
// that a file with one broken entry still serves with what is left of it.
constexpr const char* indexDataKey = "SKI_INDEX_DATA";
constexpr const char* anchorDataKey = "SKI_ANCHOR_DATA";
constexpr const char* useRemoteRootKey = "SKI_USE_REMOTE_ROOT";
constexpr const char* remoteRootKey = "SKI_REMOTE_ROOT";
constexpr const char* preferNetworkFilesKey = "SKI_PREFER_NETWORK_FILES";
constexpr const char* luxIndexDataKey = "LUXIndexData";

// The string under a key; an object of another class counts as none. The decoder refuses such an
// object before it is made, and one bad entry is no reason to lose the other records of a cache.
std::optional<std::string> decodeString(platform::KeyedUnarchiver& coder, const char* key) {
  try {
    return zebCheckClass<std::string>(
        coder.decodeObjectOfClasses({platform::KeyedUnarchiver::stringClass}, key).value());
  } catch (const platform::Exception&) {
    return std::nullopt;
  }
}

// Bytes that were an index and are not what was written any more. Searches would only find less and
// could not tell why.
bool isDamagedIndex(const std::optional<platform::Data>& data) {
  const SKIndexRef index = data ? SKIndexOpenWithData(*data) : nullptr;
  return index && !SKIndexVerifyChecksums(index);
}

bool isPlainPath(std::string_view path) {
  return path.size() > 1 && path.front() == '/' && path.back() != '/' &&
         path.find('%') == std::string_view::npos && path.find('\0') == std::string_view::npos;
}

}  // namespace

std::shared_ptr<ZEBHelpindexIndex> ZEBHelpindexIndex::initWithPath(
    const std::optional<std::string>& path) {
  std::shared_ptr<ZEBHelpindexIndex> record(new ZEBHelpindexIndex);
  return record->_initWithPath(path) ? record : nullptr;
}

std::shared_ptr<ZEBHelpindexIndex> ZEBHelpindexIndex::init() {
  std::shared_ptr<ZEBHelpindexIndex> record(new ZEBHelpindexIndex);
  return record->_init() ? record : nullptr;
}

std::shared_ptr<ZEBHelpindexIndex> ZEBHelpindexIndex::indexWithDictionary(
    const platform::Value& dictionary) {
  return initWithDictionary(dictionary);
}

std::shared_ptr<ZEBHelpindexIndex> ZEBHelpindexIndex::initWithDictionary(
    const platform::Value& dictionary) {
  std::shared_ptr<ZEBHelpindexIndex> record(new ZEBHelpindexIndex);
  return record->_initWithDictionary(dictionary) ? record : nullptr;
}

std::shared_ptr<ZEBHelpindexIndex> ZEBHelpindexIndex::initWithCoder(
    platform::KeyedUnarchiver& coder) {
  std::shared_ptr<ZEBHelpindexIndex> record(new ZEBHelpindexIndex);
  return record->_initWithCoder(coder) ? record : nullptr;
}

void ZEBHelpindexIndex::registerArchiveClass() {
  platform::KeyedUnarchiver::registerClass(
      archivedClassName,
      [](platform::KeyedUnarchiver& coder) -> std::shared_ptr<const platform::KeyedCodable> {
        return initWithCoder(coder);
      });
}

ZEBHelpindexIndex::~ZEBHelpindexIndex() { _disposeRetainedData(); }

bool ZEBHelpindexIndex::_initWithPath(const std::optional<std::string>& path) {
  if (!ZEBIndex::_initWithPath(path) || !path) {
    return false;
  }
  const std::optional<platform::Data> contents =
      platform::Environment::current()->files->contentsMappedAtPath(*path);
  if (!contents) {
    return false;
  }
  _isSearchable.store(false);
  _hasAnchors.store(false);
  return _populateWithData(*contents);
}

bool ZEBHelpindexIndex::_initWithDictionary(const platform::Value& dictionary) {
  return _init() && _populateWithDictionary(dictionary);
}

bool ZEBHelpindexIndex::_initWithCoder(platform::KeyedUnarchiver& coder) {
  const std::optional<std::string> path = decodeString(coder, SKIIndexPathKey);
  if (!path || !_initWithPath(path)) {
    return false;
  }
  setBookID(decodeString(coder, SKIBookIDKey));
  setLoadedFromGeneratedCache(true);
  return true;
}

void ZEBHelpindexIndex::encodeWithCoder(platform::KeyedArchiver& coder) const {
  if (const std::optional<std::string> file = path()) {
    coder.encodeObject(platform::Value(*file), SKIIndexPathKey);
  }
  if (const std::optional<std::string> book = bookID()) {
    coder.encodeObject(platform::Value(*book), SKIBookIDKey);
  }
}

bool ZEBHelpindexIndex::reinitializeWithData(const platform::Data& data) {
  const bool populated = _populateWithData(data);
  if (populated) {
    _isReinitialized.store(true);
  }
  setIsDownloading(false);
  setLoadedFromGeneratedCache(false);
  return populated;
}

bool ZEBHelpindexIndex::_populateWithData(const platform::Data& data) {
  try {
    platform::ClassicUnarchiver unarchiver(data);
    unarchiver.setAllowedClassNames({"NSObject", "NSString", "NSData", "NSMutableData", "NSArray",
                                     "NSMutableArray", "NSDictionary", "NSMutableDictionary",
                                     "NSNumber", "NSValue"});
    return _populateWithDictionary(unarchiver.decodeRootObject());
  } catch (const platform::Exception& exception) {
    ZEBLog(0, "Error trying to unarchive index data. Original path is <%@>. Error: %@", path(),
           exception.reason());
    return false;
  }
}

bool ZEBHelpindexIndex::_populateWithDictionary(const platform::Value& dictionary) {
  if (dictionary.isAbsent()) {
    return false;
  }
  const platform::MonitorLock lock(_monitor);
  _isSearchable.store(false);
  _hasAnchors.store(false);
  _networkFilesPreferred.store(false);
  _disposeRetainedData();
  if (!dictionary.dictionaryIf()) {
    throw platform::Exception(platform::invalidArgumentException,
                              "the root object is no dictionary");
  }
  const std::optional<std::string> root = dictionary[remoteRootKey].stringValue();
  if (dictionary[useRemoteRootKey].boolValue()) {
    setRemoteRoot(root ? std::optional(addSSLAsNecessary(*root)) : std::nullopt);
    _networkFilesPreferred.store(dictionary[preferNetworkFilesKey].boolValue());
  }
  _luxIndexData = zebCheckClass<platform::Data>(dictionary[luxIndexDataKey]);
  _indexData = zebCheckClass<platform::Data>(dictionary[indexDataKey]);
  _isIndexDamaged = isDamagedIndex(_indexData);
  // Taken for granted until an index is opened and tells its number of terms.
  _isSearchable.store(true);
  if (root) {
    ZEBLog(3, "Loading anchor dict for index with remote root: %@", root);
  } else {
    ZEBLog(3, "Loading anchor dict for index with no remote root");
  }
  const platform::Value& anchors = dictionary[anchorDataKey];
  if (anchors.dictionaryIf() != nullptr && !anchors.dictionaryIf()->empty()) {
    // Anchors before the flag: who reads the flag without a lock finds the anchors.
    _anchorDictionary.set(anchors);
    _hasAnchors.store(true);
    ZEBLog(3, "anchor dict loaded");
  }
  return true;
}

void ZEBHelpindexIndex::_disposeRetainedData() {
  _anchorDictionary.set({});
  _indexData.reset();
  _isIndexDamaged = false;
  _hasPlainPages.reset();
  _luxIndexData.reset();
  _luxIndex.reset();
}

SKIndexRef ZEBHelpindexIndex::copyIndexRef() {
  const platform::MonitorLock lock(_monitor);
  if (!_indexData) {
    return _indexRef.lock();
  }
  SKIndexRef opened = _isIndexDamaged ? nullptr : SKIndexOpenWithData(*_indexData);
  _indexRef = opened;
  if (opened) {
    _isSearchable.store(SKIndexGetMaximumTermID(opened) >= 1);
  }
  return opened;
}

bool ZEBHelpindexIndex::hasPlainPages(const SKIndexRef& indexRef) {
  const platform::MonitorLock lock(_monitor);
  // The record may have other data by now.
  const bool isOfThisData =
      _indexData && _indexData->bytes() == searchkit::indexBytes(*indexRef).bytes();
  if (isOfThisData && _hasPlainPages) {
    return *_hasPlainPages;
  }
  const uint32_t count = searchkit::indexDocumentCount(*indexRef);
  bool arePlain = true;
  for (uint32_t id = 0; arePlain && id < count; ++id) {
    const auto page = searchkit::indexDocument(*indexRef, id);
    arePlain = page && page->abstract && isPlainPath(page->path);
  }
  if (isOfThisData) {
    _hasPlainPages = arePlain;
  }
  return arePlain;
}

void ZEBHelpindexIndex::disposeIndexRef(SKIndexRef& indexRef) const {
  if (indexRef.use_count() > 0) {
    indexRef.reset();
  }
}

std::shared_ptr<HelpLUXIndex> ZEBHelpindexIndex::luxIndex() {
  const platform::MonitorLock lock(_monitor);
  if (_luxIndexData) {
    _luxIndex.reset();
    _luxIndex = HelpLUXIndex::initWithVersionedData(*_luxIndexData);
    if (_luxIndex) {
      _luxIndexData.reset();
    }
  }
  return _luxIndex;
}

std::optional<platform::Data> ZEBHelpindexIndex::luxIndexData() const {
  const platform::MonitorLock lock(_monitor);
  if (_luxIndexData) {
    return _luxIndexData;
  }
  return _luxIndex ? std::optional(_luxIndex->versionedData()) : std::nullopt;
}

bool ZEBHelpindexIndex::shouldUseLUXIndex() {
  const platform::MonitorLock lock(_monitor);
  if (_luxIndexData && _luxIndexData->length() > luxDataLengthWorthUsing) {
    return true;
  }
  const std::shared_ptr<HelpLUXIndex> index = luxIndex();
  return index && !index->attributes()[HelpLUXIndexAttributeIgnoreLUXKey].boolValue();
}

std::string ZEBHelpindexIndex::description() const {
  return ZEBStringWithFormat("path: %@ hasAnchors=%d searchable=%d", path(), hasAnchors() ? 1 : 0,
                             isSearchable() ? 1 : 0);
}
