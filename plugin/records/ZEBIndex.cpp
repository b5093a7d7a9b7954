#include "plugin/records/ZEBIndex.h"

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/Files.h"
#include "plugin/records/ZEBHelpindexIndex.h"

namespace {

std::atomic<int32_t> lastIndexID{0};

}  // namespace

std::shared_ptr<ZEBIndex> ZEBIndex::indexWithPath(const std::optional<std::string>& path) {
  if (path && platform::pathExtension(*path) == ZEBHelpindexExtension) {
    return ZEBHelpindexIndex::initWithPath(path);
  }
  return nullptr;
}

std::shared_ptr<ZEBIndex> ZEBIndex::initWithPath(const std::optional<std::string>& path) {
  std::shared_ptr<ZEBIndex> record(new ZEBIndex);
  return record->_initWithPath(path) ? record : nullptr;
}

std::shared_ptr<ZEBIndex> ZEBIndex::init() {
  std::shared_ptr<ZEBIndex> record(new ZEBIndex);
  return record->_init() ? record : nullptr;
}

bool ZEBIndex::_init() { return _initWithPath(std::nullopt); }

bool ZEBIndex::_initWithPath(const std::optional<std::string>& path) {
  _setUpVariables();
  _path.set(path);
  return true;
}

void ZEBIndex::_setUpVariables() noexcept {
  _indexID.store(lastIndexID.fetch_add(1) + 1);
  _isReinitialized.store(false);
  _loadedFromGeneratedCache.store(false);
}

bool ZEBIndex::reinitializeWithData(const platform::Data& /*data*/) {
  throw platform::Exception("ZEBVirtualFunctionException",
                            "-[ZEBIndex reinitializeWithData:] called on a virtual function");
}

bool ZEBIndex::setPath(const std::string& path) {
  bool isDirectory = false;
  if (!platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) ||
      isDirectory) {
    return false;
  }
  _path.set(path);
  return true;
}

std::optional<platform::URL> ZEBIndex::remoteURL() const {
  if (std::optional<platform::URL> known = _remoteURL.get()) {
    return known;
  }
  const std::optional<std::string> root = remoteRoot();
  const std::optional<std::string> file = path();
  if (!root || !file) {
    return std::nullopt;
  }
  const std::optional<platform::URL> fileURL =
      URLByEscapingString(platform::lastPathComponent(*file));
  const std::optional<platform::URL> rootURL = URLByEscapingString(*root);
  if (!fileURL || !rootURL) {
    return std::nullopt;
  }
  std::optional<platform::URL> url =
      platform::URL::URLWithStringRelativeToURL(fileURL->absoluteString(), *rootURL);
  _remoteURL.set(url);
  return url;
}

std::string ZEBIndex::description() const { return ZEBStringWithFormat("path: %@", path()); }
