#include "zebd/HelpService.h"

#include <algorithm>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
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
      _watcher([this] { _books.scan([this](const BookChanges&) { _watch(); }); }) {}

HelpService::~HelpService() = default;

void HelpService::begin() {
  _books.begin();
  _books.scan([this](const BookChanges&) { _watch(); });
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
  status.running = elapsedNow() - _start;
  return status;
}

}  // namespace zebd
