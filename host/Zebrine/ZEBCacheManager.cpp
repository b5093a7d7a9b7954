#include "host/Zebrine/ZEBCacheManager.h"

#include "host/Zebrine/RNXAssetURLProtocol.h"
#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"

namespace {

using Kind = RNXExpectedAsset::Kind;

std::optional<RNXCatalogueEntry> entryOfBook(const ZEBHelpBook& book) {
  const std::optional<platform::URL> url = book.catalogueURL();
  if (!url) {
    return std::nullopt;
  }
  const auto service = RNXObjectManager::sharedObjectManager();
  const std::shared_ptr<const RNXCatalogue> catalogue = service->knownCatalogue(*url);
  service->loadCatalogue(*url, nullptr);
  // Another language is no newer version of this one.
  const RNXCatalogueEntry* entry =
      catalogue ? catalogue->bookInLocalization(book.bookID(), book.localization()) : nullptr;
  return entry == nullptr ? std::nullopt : std::optional(*entry);
}

/// The index that is in use: the one that was generated or fetched, else the one that the book has.
std::string indexInUse(const ZEBHelpBook& book, const std::string& installed) {
  const std::optional<std::string> root = ZEBGeneratedRoot();
  if (!root) {
    return installed;
  }
  std::string generated =
      ZEBGeneratedFilePath(*root, book.bookID(), book.localization(), ZEBHelpindexExtension);
  return platform::Environment::current()->files->fileExistsAtPath(generated) ? generated
                                                                              : installed;
}

std::optional<platform::URL> expectedURL(const std::optional<RNXAsset>& asset, Kind kind,
                                         const std::string& localPath) {
  if (!asset) {
    return std::nullopt;
  }
  RNXExpectedAsset expected{kind, asset->sha256, localPath};
  if (expected.localData()) {
    return std::nullopt;
  }
  RNXExpectedAssets::shared().expect(asset->url, std::move(expected));
  // Whoever fetches it may be the first in this process who fetches anything.
  RNXAssetURLProtocol::ensureRegistration();
  return asset->url.absoluteURL();
}

std::optional<platform::URL> pageURL(const std::optional<platform::URL>& pages,
                                     const std::optional<std::string>& accessPage,
                                     const std::string& path) {
  const std::string folder =
      accessPage ? platform::stringByDeletingLastPathComponent(*accessPage) + "/" : std::string();
  if (!pages || folder.size() < 2 || !path.starts_with(folder) || path.size() == folder.size()) {
    return std::nullopt;
  }
  const auto relative = platform::URL::URLWithString(
      "./" + platform::stringByEscapingPath(path.substr(folder.size())));
  const auto url = relative ? platform::URL::URLWithStringRelativeToURL(relative->relativeString(),
                                                                        pages->absoluteURL())
                            : std::nullopt;
  return url ? std::optional(url->absoluteURL()) : std::nullopt;
}

}  // namespace

std::optional<platform::URL> ZEBCacheManager::remoteURLForLocalURL(
    const platform::URL& localURL, const std::shared_ptr<ZEBHelpBook>& inBook) {
  if (!inBook || !localURL.isFileURL()) {
    return std::nullopt;
  }
  const std::optional<RNXCatalogueEntry> entry = entryOfBook(*inBook);
  if (!entry) {
    return std::nullopt;
  }
  const std::string path = platform::stringByStandardizingPath(localURL.path());
  const std::vector<std::string> indexPaths = inBook->indexPaths();
  if (!indexPaths.empty() && path == platform::stringByStandardizingPath(indexPaths.front())) {
    return expectedURL(entry->searchIndex, Kind::searchIndex, indexInUse(*inBook, path));
  }
  if (const auto list = inBook->exactMatchPath();
      list && path == platform::stringByStandardizingPath(*list)) {
    return expectedURL(entry->exactMatch, Kind::exactMatch, path);
  }
  return pageURL(entry->pages, inBook->accessPagePath(), path);
}
