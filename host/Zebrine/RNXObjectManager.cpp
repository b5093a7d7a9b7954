#include "host/Zebrine/RNXObjectManager.h"

#include <utility>

#include "host/Zebrine/RNXAssetURLProtocol.h"
#include "host/Zebrine/RNXBook.h"
#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXConfig.h"
#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/ZEBAuthChallengeHandler.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/URLCache.h"
#include "platform/URLProtocol.h"
#include "platform/URLSession.h"

namespace {

constexpr platform::Seconds catalogueTimeout{30.0};
/// So long a catalogue counts as just asked for: all books of a publisher make one request.
constexpr platform::Seconds freshness{60.0};
constexpr int catalogueResourceType = 0;
constexpr int statusOK = 200;

platform::Error serviceError(RNXErrorCode code, std::string description) {
  return {RNXErrorDomain, code, std::move(description)};
}

std::optional<platform::URLRequest> requestForCatalogue(const platform::URL& url) {
  auto request = platform::URLRequest::requestWithURL(
      url, platform::URLRequestCachePolicy::useProtocolCachePolicy, catalogueTimeout);
  if (request) {
    // A catalogue that is a guess old is no use: its server is asked each time, for a 304 as a
    // rule.
    request->setValueForHTTPHeaderField("no-cache", "Cache-Control");
    platform::URLProtocol::setProperty(true, RNXAssetURLProtocolRequest, *request);
  }
  return request;
}

platform::Value::Dictionary attributesOfEntry(const RNXCatalogueEntry& entry) {
  platform::Value::Dictionary attributes;
  if (entry.searchIndex) {
    attributes[RNXBook::remoteSearchIndexKey] = entry.searchIndex->url.absoluteURL();
  }
  if (entry.exactMatch) {
    attributes[RNXBook::remoteExactMatchKey] = entry.exactMatch->url.absoluteURL();
  }
  return attributes;
}

void expectAssetsOfEntry(const RNXCatalogueEntry& entry) {
  using Kind = RNXExpectedAsset::Kind;
  const std::optional<std::string> root = ZEBGeneratedRoot();
  const auto expect = [&](const std::optional<RNXAsset>& asset, Kind kind,
                          std::string_view extension) {
    if (asset) {
      RNXExpectedAssets::shared().expect(
          asset->url, {kind, asset->sha256,
                       root ? std::optional(ZEBGeneratedFilePath(
                                  *root, entry.identifier, entry.locale.value_or(""), extension))
                            : std::nullopt});
    }
  };
  expect(entry.searchIndex, Kind::searchIndex, ZEBHelpindexExtension);
  expect(entry.exactMatch, Kind::exactMatch, ZEBExactMatchListExtension);
}

std::vector<std::string> languagesOfReader(const ZEBHelpBook& helpBook) {
  std::vector<std::string> languages = helpBook.preferredLanguages();
  return languages.empty() ? platform::Environment::current()->preferredLanguages : languages;
}

bool hasGeneratedFile(const ZEBHelpBook& helpBook, const std::string& localization,
                      std::string_view extension) {
  const std::optional<std::string> root = ZEBGeneratedRoot();
  return root && platform::Environment::current()->files->fileExistsAtPath(
                     ZEBGeneratedFilePath(*root, helpBook.bookID(), localization, extension));
}

/// The book's pages are where those of its index are: neither changes before the other.
void takeLocalizationOfEntry(const RNXCatalogueEntry& entry, ZEBHelpBook& helpBook) {
  const std::string localization = entry.locale.value_or("");
  const std::string former = helpBook.localization();
  if (localization != former) {
    if (!hasGeneratedFile(helpBook, localization, ZEBHelpindexExtension) &&
        hasGeneratedFile(helpBook, former, ZEBHelpindexExtension)) {
      return;
    }
    helpBook.setLocalization(localization);
    const std::string list =
        ZEBGeneratedFilePath(ZEBGeneratedRoot().value_or("/"), helpBook.bookID(), localization,
                             ZEBExactMatchListExtension);
    helpBook.setExactMatchPath(hasGeneratedFile(helpBook, localization, ZEBExactMatchListExtension)
                                   ? std::optional(list)
                                   : std::nullopt);
    helpBook.setRemoteURL(std::nullopt);
  }
  if (entry.pages) {
    helpBook.setRemoteURL(entry.pages->absoluteURL());
  }
}

/// What the catalogue says becomes what the book is.
std::shared_ptr<RNXBook> bookOfEntry(const RNXCatalogueEntry& entry, ZEBHelpBook& helpBook) {
  expectAssetsOfEntry(entry);
  takeLocalizationOfEntry(entry, helpBook);
  helpBook.setMiscAttributes(attributesOfEntry(entry));
  auto book =
      RNXBook::bookWithID(entry.identifier, entry.version, entry.locale, attributesOfEntry(entry));
  helpBook.setRemoteSearchIndex(book->remoteSearchIndex());
  helpBook.setRemoteExactMatch(book->remoteExactMatch());
  helpBook.setRnxBook(book);
  return book;
}

class SharedObjectManager {
 public:
  static SharedObjectManager& shared() {
    static auto& shared = *new SharedObjectManager;
    return shared;
  }
  std::shared_ptr<RNXObjectManager> get() {
    const platform::MutexLock lock(_mutex);
    if (!_manager) {
      _manager = RNXObjectManager::init();
    }
    return _manager;
  }
  void set(std::shared_ptr<RNXObjectManager> manager) {
    const platform::MutexLock lock(_mutex);
    std::swap(_manager, manager);
  }

 private:
  platform::Mutex _mutex;
  std::shared_ptr<RNXObjectManager> _manager GUARDED_BY(_mutex);
};

}  // namespace

RNXObjectManager::RNXObjectManager()
    : _authHandler(
          ZEBAuthChallengeHandler::initWithServiceName(RNXConfig::sharedConfig()->serviceName())) {
  _authHandler->setResourceType(catalogueResourceType);
}

RNXObjectManager::~RNXObjectManager() = default;

std::shared_ptr<RNXObjectManager> RNXObjectManager::init() {
  return std::shared_ptr<RNXObjectManager>(new RNXObjectManager);
}

std::shared_ptr<RNXObjectManager> RNXObjectManager::sharedObjectManager() {
  return SharedObjectManager::shared().get();
}

void RNXObjectManager::setSharedObjectManager(std::shared_ptr<RNXObjectManager> manager) {
  SharedObjectManager::shared().set(std::move(manager));
}

void RNXObjectManager::_requestBookWithHelpBook(const std::shared_ptr<ZEBHelpBook>& helpBook,
                                                CompletionHandler completionHandler) {
  const std::optional<platform::URL> url = helpBook ? helpBook->catalogueURL() : std::nullopt;
  if (!url) {
    completionHandler(nullptr, serviceError(RNXErrorNoCatalogue, "no catalogue is known"));
    return;
  }
  loadCatalogue(*url, [helpBook, url = *url, completionHandler = std::move(completionHandler)](
                          const std::shared_ptr<const RNXCatalogue>& catalogue,
                          const std::optional<platform::Error>& error) {
    if (error) {
      completionHandler(nullptr, error);
      return;
    }
    const RNXCatalogueEntry* entry = catalogue->bookWithIdentifier(
        helpBook->bookID(), helpBook->localization(), languagesOfReader(*helpBook));
    if (entry == nullptr) {
      completionHandler(nullptr,
                        serviceError(RNXErrorNoSuchBook, "the catalogue " + url.absoluteString() +
                                                             " does not have the book"));
      return;
    }
    completionHandler(bookOfEntry(*entry, *helpBook), std::nullopt);
  });
}

void RNXObjectManager::takeLocalization(const std::shared_ptr<ZEBHelpBook>& helpBook) {
  const std::optional<platform::URL> url =
      helpBook && helpBook->type() == ZEBHelpBookType4 ? helpBook->catalogueURL() : std::nullopt;
  const auto catalogue = url ? knownCatalogue(*url) : nullptr;
  const RNXCatalogueEntry* entry =
      catalogue ? catalogue->bookWithIdentifier(helpBook->bookID(), helpBook->localization(),
                                                languagesOfReader(*helpBook))
                : nullptr;
  if (entry != nullptr) {
    takeLocalizationOfEntry(*entry, *helpBook);
  }
}

void RNXObjectManager::loadCatalogue(const platform::URL& url, const CatalogueHandler& handler) {
  const platform::Clock::Instant now = platform::Environment::current()->clock->elapsed();
  std::shared_ptr<const RNXCatalogue> fresh;
  bool isFirst = false;
  {
    const platform::MutexLock lock(_mutex);
    Entry& entry = _entries[url.absoluteString()];
    if (entry.catalogue && !entry.isLoading && entry.loaded && now - *entry.loaded < freshness) {
      fresh = entry.catalogue;
    } else {
      entry.waiting.push_back(handler);
      isFirst = !std::exchange(entry.isLoading, true);
    }
  }
  if (fresh) {
    if (handler) {
      handler(fresh, std::nullopt);
    }
  } else if (isFirst) {
    _ask(url);
  }
}

void RNXObjectManager::_ask(const platform::URL& url) {
  auto configuration = platform::URLSessionConfiguration::defaultSessionConfiguration();
  configuration.setMaximumBodyLength(RNXCatalogue::maximumLength);
  configuration.setProtocolClasses(
      {RNXAssetURLProtocol::protocolClassWithAuthHandler(_authHandler)});
  const auto session = platform::URLSession::sessionWithConfiguration(std::move(configuration));
  auto request = requestForCatalogue(url);
  const auto task = request ? session->dataTaskWithRequest(
                                  std::move(*request),
                                  [self = shared_from_this(), url](
                                      const std::optional<platform::Data>& data,
                                      const std::shared_ptr<const platform::URLResponse>& response,
                                      std::optional<platform::Error> error) {
                                    self->_catalogueDidLoad(url, data, response, std::move(error));
                                  })
                            : nullptr;
  if (!task) {
    _catalogueDidLoad(url, std::nullopt, nullptr,
                      serviceError(RNXErrorNoCatalogue, "no URL: " + url.absoluteString()));
    return;
  }
  task->resume();
  session->finishTasksAndInvalidate();
}

void RNXObjectManager::_catalogueDidLoad(
    const platform::URL& url, const std::optional<platform::Data>& data,
    const std::shared_ptr<const platform::URLResponse>& response,
    std::optional<platform::Error> error) {
  std::shared_ptr<const RNXCatalogue> catalogue;
  if (!error && (!data || !response || response->statusCode() != statusOK)) {
    error =
        serviceError(RNXErrorBadAnswer, "the server answered " +
                                            std::to_string(response ? response->statusCode() : 0) +
                                            " for " + url.absoluteString());
  } else if (!error) {
    platform::Error reason;
    // URLs are relative to where the catalogue was asked for, wherever its server sent us.
    if (auto read = RNXCatalogue::catalogueWithData(*data, url, &reason)) {
      catalogue = std::make_shared<const RNXCatalogue>(std::move(*read));
    } else {
      error = std::move(reason);
    }
  }
  std::vector<CatalogueHandler> waiting;
  {
    const platform::MutexLock lock(_mutex);
    Entry& entry = _entries[url.absoluteString()];
    if (catalogue) {
      entry.catalogue = catalogue;
      entry.loaded = platform::Environment::current()->clock->elapsed();
    }
    entry.isLoading = false;
    waiting.swap(entry.waiting);
  }
  for (const CatalogueHandler& handler : waiting) {
    if (handler) {
      handler(catalogue, error);
    }
  }
}

std::shared_ptr<const RNXCatalogue> RNXObjectManager::knownCatalogue(const platform::URL& url) {
  {
    const platform::MutexLock lock(_mutex);
    const auto found = _entries.find(url.absoluteString());
    if (found != _entries.end() && found->second.catalogue) {
      return found->second.catalogue;
    }
  }
  const auto request = requestForCatalogue(url);
  const auto cached =
      request ? platform::URLCache::sharedURLCache()->cachedResponseForRequest(*request) : nullptr;
  if (!cached || cached->response()->statusCode() != statusOK) {
    return nullptr;
  }
  auto read = RNXCatalogue::catalogueWithData(cached->data(), url);
  if (!read) {
    return nullptr;
  }
  auto catalogue = std::make_shared<const RNXCatalogue>(std::move(*read));
  const platform::MutexLock lock(_mutex);
  Entry& entry = _entries[url.absoluteString()];
  if (!entry.catalogue) {
    // For all other books in it; its server is asked all the same.
    entry.catalogue = std::move(catalogue);
  }
  return entry.catalogue;
}
