#include "host/Zebrine/RNXExpectedAssets.h"

#include <utility>

#include "SearchKit/SearchKit.h"
#include "platform/ClassicArchive.h"
#include "platform/Digest.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/Files.h"
#include "platform/PropertyList.h"
#include "platform/URLError.h"
#include "platform/Value.h"

namespace {

constexpr const char* indexDataKey = "SKI_INDEX_DATA";

bool opensAsSearchIndex(const platform::Data& data) {
  try {
    const platform::Value root = platform::ClassicUnarchiver(data).decodeRootObject();
    const platform::Data* index = root[indexDataKey].dataIf();
    return index != nullptr && SKIndexOpenWithData(*index) != nullptr;
  } catch (const platform::Exception&) {
    return false;
  }
}

bool opensAsExactMatchList(const platform::Data& data) {
  const auto list = platform::propertyListFromData(data);
  return list && list->dictionaryIf() != nullptr;
}

}  // namespace

std::optional<platform::Error> RNXExpectedAsset::errorForData(const platform::Data& data) const {
  if (platform::sha256Digest(data.view()) != sha256) {
    return platform::URLError(platform::URLErrorBadServerResponse,
                              "the digest is not that of the catalogue");
  }
  const bool opens =
      kind == Kind::searchIndex ? opensAsSearchIndex(data) : opensAsExactMatchList(data);
  if (!opens) {
    return platform::URLError(platform::URLErrorCannotParseResponse,
                              kind == Kind::searchIndex ? "no help index" : "no exact-match list");
  }
  return std::nullopt;
}

std::optional<platform::Data> RNXExpectedAsset::localData() const {
  const auto files = platform::Environment::current()->files;
  if (!localPath || !files->fileExistsAtPath(*localPath)) {
    return std::nullopt;
  }
  const std::optional<platform::Data> data = files->contentsMappedAtPath(*localPath);
  return data && !errorForData(*data) ? data : std::nullopt;
}

RNXExpectedAssets& RNXExpectedAssets::shared() {
  // Never destroyed: transfers may go on while the process ends.
  static auto& shared = *new RNXExpectedAssets;
  return shared;
}

void RNXExpectedAssets::expect(const platform::URL& url, RNXExpectedAsset asset) {
  const platform::MutexLock lock(_mutex);
  _assets.insert_or_assign(url.absoluteString(), std::move(asset));
}

std::optional<RNXExpectedAsset> RNXExpectedAssets::assetForURL(const platform::URL& url) const {
  const platform::MutexLock lock(_mutex);
  const auto found = _assets.find(url.absoluteString());
  return found == _assets.end() ? std::nullopt : std::optional(found->second);
}
