#include "zebd/HelpService.h"

#include <algorithm>
#include <utility>

#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/OperationQueue.h"
#include "platform/RunLoop.h"
#include "platform/Strings.h"
#include "zebd/BookFolder.h"

namespace zebd {

namespace {

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

bool isKind(const std::string& kind) {
  return kind == ZEBHelpArticleResult || kind == ZEBHelpSuggestionResult ||
         kind == ZEBHelpSimilarSuggestionResult || kind == ZEBHelpActionResult;
}

}  // namespace

HelpService::HelpService(std::unique_ptr<Host> host, BookKeeper::Settings books,
                         std::shared_ptr<SearchListener> listener)
    : _host(std::move(host)),
      _start(elapsedNow()),
      _books(*_host, std::move(books)),
      _searches(*_host, std::move(listener)),
      _watcher([this] { _books.scan({}); }),
      _self(std::make_shared<HelpService*>(this)) {
  _books.setScanObserver([this] { _watch(); });
  _host->owner().setBookModifiedHandler(
      [observer = _observer](const std::shared_ptr<ZEBHelpBook>& book) {
        platform::RunLoop::main()->perform([observer, book] {
          if (*observer) {
            const bool isIndexed = book != nullptr && indexPathOfBook(*book);
            (*observer)(book == nullptr ? std::string() : book->bookID(), isIndexed);
          }
        });
      });
}

HelpService::~HelpService() { *_observer = nullptr; }

void HelpService::begin() {
  _books.begin();
  _books.scan({});
}

void HelpService::addRemote(const std::string& address, WantedBooks wanted,
                            std::function<void(const AddedBooks& added)> done) {
  const std::optional<platform::URL> url = addressOfCatalogue(address);
  if (!url) {
    done({"\"" + address + "\" is no address of a web server", {}, {}});
    return;
  }
  _host->owner().disableShutdown();
  RNXObjectManager::sharedObjectManager()->loadCatalogue(
      *url, [weak = std::weak_ptr<HelpService*>(_self), url = *url, wanted = std::move(wanted),
             done = std::move(done)](const std::shared_ptr<const RNXCatalogue>& published,
                                     const std::optional<platform::Error>& error) {
        platform::RunLoop::main()->perform([weak, url, wanted, done, published, error] {
          if (const auto self = weak.lock()) {
            (*self)->_add(url, published, error, wanted, done);
            (*self)->_host->owner().enableShutdown();
          }
        });
      });
}

void HelpService::_add(const platform::URL& address,
                       const std::shared_ptr<const RNXCatalogue>& published,
                       const std::optional<platform::Error>& error, WantedBooks wanted,
                       const std::function<void(const AddedBooks& added)>& done) {
  if (published == nullptr) {
    done({address.absoluteString() + ": " + (error ? error->description : "there is no catalogue"),
          {},
          {}});
    return;
  }
  const auto added = std::make_shared<AddedBooks>();
  // Until the catalogue has been changed: a scan may break off before that.
  added->problem = "the books of this computer cannot be looked through";
  ScanRequest request;
  request.change = [added, published, address,
                    wanted = std::move(wanted)](const Catalogue& catalogue) {
    added->problem.reset();
    added->entries = subscribe(*published, address, wanted, catalogue, added->failures);
  };
  scan(std::move(request), [added, done](const BookChanges&) { done(*added); });
}

void HelpService::removeRemote(const std::string& name,
                               std::function<void(const RemovedBooks& removed)> done) {
  const auto removed = std::make_shared<RemovedBooks>();
  ScanRequest request;
  request.change = [removed, name](const Catalogue& catalogue) {
    removed->wasLookedFor = true;
    std::vector<CatalogueEntry> entries = unsubscribe(name, catalogue, removed->wasFound);
    // One on this computer stands for itself, and would be found again at once.
    if (std::erase_if(entries, [](const auto& entry) { return !entry.isRemote(); }) > 0) {
      removed->wasFound = !entries.empty();
    }
    for (const CatalogueEntry& entry : entries) {
      if (const auto error = catalogue.remove(entry.bookID)) {
        removed->problem = entry.bookID + ": " + error->description;
      } else {
        removed->bookIDs.push_back(entry.bookID);
      }
    }
  };
  scan(std::move(request), [removed, done = std::move(done)](const BookChanges&) {
    if (!removed->wasLookedFor) {
      removed->problem = "the books could not be looked through";
    }
    done(*removed);
  });
}

void HelpService::_watch() { _watcher.watch(_books.watchedFolders(), _books.watchedTrees()); }

std::optional<std::string> HelpService::objection(const SearchRequest& request) {
  if (request.text.size() > maximumTextLength) {
    return "the text is too long";
  }
  if (!platform::isValidUTF8(request.text) || request.text.find('\0') != std::string::npos) {
    return "the text is no text";
  }
  if (request.bookIDs.size() > maximumBookCount) {
    return "there are too many books";
  }
  for (const std::string& bookID : request.bookIDs) {
    if (!ZEBHelpBook::isValidBookID(bookID)) {
      return "\"" + bookID + "\" cannot be a book's identifier";
    }
  }
  if (request.kinds.empty() || !std::all_of(request.kinds.begin(), request.kinds.end(), isKind)) {
    return "there is no such kind of result";
  }
  if (request.limit > maximumResultCount) {
    return "the limit is too high";
  }
  if (request.languages.size() > maximumBookCount) {
    return "there are too many languages";
  }
  return std::nullopt;
}

std::vector<BookStatus> HelpService::books() const {
  std::vector<BookStatus> books;
  for (const auto& entry : _host->bookshelf().books()) {
    const ZEBHelpBook& book = *entry.second;
    books.push_back({book.bookID(), book.title(), book.localization(), book.path(), book.type(),
                     indexPathOfBook(book)});
  }
  return books;
}

ServiceStatus HelpService::status() const {
  ServiceStatus status;
  for (const BookStatus& book : books()) {
    ++status.bookCount;
    status.indexedBookCount += book.indexPath ? 1 : 0;
  }
  status.searchCount = _searches.count();
  status.watchedFolderCount = _watcher.count();
  status.isScanning = _books.isScanning();
  status.guardCount = _host->owner().shutdownGuardCount();
  status.operationCount = platform::OperationQueue::unfinishedOperationCount();
  status.running = elapsedNow() - _start;
  return status;
}

}  // namespace zebd
