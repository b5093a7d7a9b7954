#include "zeb/DaemonBooks.h"

#include <fmt/format.h>

#include <algorithm>
#include <map>
#include <ostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "zeb/DaemonClient.h"
#include "zeb/HelpSearch.h"
#include "zeb/Paths.h"

namespace zeb {

namespace {

using zebd::BookChanges;
using zebd::BookFailure;
using zebd::BookStatus;

platform::Seconds limitOf(const Waiting& waiting) { return platform::Seconds(waiting.patience()); }

void tellFailures(const std::vector<BookFailure>& failures, Console& console) {
  for (const BookFailure& failure : failures) {
    console.error(fmt::format("{}: {}", failure.what, failure.reason));
  }
}

std::map<std::string, BookStatus> booksByID(const DaemonClient& daemon) {
  std::map<std::string, BookStatus> books;
  for (BookStatus& book : daemon.books().value_or(std::vector<BookStatus>())) {
    std::string bookID = book.bookID;
    books.emplace(std::move(bookID), std::move(book));
  }
  return books;
}

void tellBook(const std::string& bookID, const std::string& language, const std::string& title,
              Console& console) {
  console.out() << fmt::format("{}  {}{}\n", console.styled(Style::book, singleLine(bookID)),
                               language.empty() ? "" : language + "  ", singleLine(title))
                << std::flush;
}

struct Counts {
  size_t indexed = 0;
  size_t failed = 0;
  size_t left = 0;
};

/// Waits for the indexes of books that were looked at, and says which are there.
Counts waitForIndexes(HelpSearch& search, const std::map<std::string, BookStatus>& books,
                      const std::vector<std::string>& bookIDs, const Waiting& waiting,
                      Console& console) {
  Counts counts;
  if (!waiting.waits) {
    counts.left = bookIDs.size();
    return counts;
  }
  if (bookIDs.empty()) {
    return counts;
  }
  console.progress(fmt::format("0 of {} books", bookIDs.size()));
  const HelpSearch::Indexing indexing = search.waitForIndexes(
      bookIDs, platform::Seconds(waiting.limit), [&](const std::string& bookID, size_t count) {
        console.clearProgress();
        const auto book = books.find(bookID);
        if (book != books.end()) {
          tellBook(bookID, book->second.language, book->second.title, console);
        }
        console.progress(fmt::format("{} of {} books", count, bookIDs.size()));
      });
  console.clearProgress();
  counts.indexed = bookIDs.size() - indexing.missing.size();
  if (!indexing.ended) {
    counts.left = indexing.missing.size();
    console.note(fmt::format("gave up waiting after {:g} seconds", waiting.limit));
    return counts;
  }
  for (const std::string& bookID : indexing.missing) {
    console.error(fmt::format("{}: it could not be indexed", bookID));
  }
  counts.failed = indexing.missing.size();
  return counts;
}

/// Waits for what is fetched; returns whether all of the books have an index then.
bool waitForDownloads(HelpSearch& search, const std::vector<std::string>& bookIDs,
                      const Waiting& waiting, Console& console) {
  console.progress(fmt::format("asking for {} books", bookIDs.size()));
  const bool ended = search.fetchIndexes(bookIDs, platform::Seconds(waiting.limit));
  console.clearProgress();
  if (!ended) {
    console.note(fmt::format("gave up waiting after {:g} seconds", waiting.limit));
  }
  bool all = true;
  const auto books = booksByID(*search.daemon());
  for (const std::string& bookID : bookIDs) {
    const auto book = books.find(bookID);
    if (book == books.end() || !book->second.indexPath) {
      console.warning(
          fmt::format("{}: its index could not be fetched; --verbose says more", bookID));
      all = false;
    }
  }
  return all;
}

std::optional<BookChanges> scanned(DaemonClient& daemon, const zebd::ScanRequest& request,
                                   const Waiting& waiting, Console& console) {
  console.progress("looking for books");
  std::string problem;
  std::optional<BookChanges> changes = daemon.scan(request, limitOf(waiting), problem);
  console.clearProgress();
  if (!changes) {
    console.error(fmt::format("the help daemon: {}", problem));
    return std::nullopt;
  }
  tellFailures(changes->failures, console);
  return changes;
}

}  // namespace

ExitCode scanWithDaemon(const ScanCommand& command, std::unique_ptr<DaemonClient> daemon,
                        const Waiting& waiting, Console& console) {
  zebd::ScanRequest request;
  for (const std::string& folder : command.folders) {
    request.folders.push_back({absolutePath(folder), std::nullopt});
  }
  request.installedBooks = command.installedBooks;
  request.languages = command.languages;
  request.allBooksEvenIfUnchanged = command.evenIfUnchanged;
  request.asksServers = waiting.waits;
  const std::optional<BookChanges> changes = scanned(*daemon, request, waiting, console);
  if (!changes) {
    return ExitCode::failure;
  }
  const std::map<std::string, BookStatus> books = booksByID(*daemon);
  std::vector<std::string> here;
  std::vector<std::string> remote;
  size_t unchangedCount = changes->unchanged;
  const std::set<std::string> changed(changes->changedBooks.begin(), changes->changedBooks.end());
  for (const auto& [bookID, book] : books) {
    if (book.type == ZEBHelpBookType4) {
      remote.push_back(bookID);
    } else if (changed.contains(bookID)) {
      here.push_back(bookID);
    } else if (!book.indexPath) {
      // The daemon may have found it a moment ago.
      here.push_back(bookID);
      unchangedCount -= std::min<size_t>(unchangedCount, 1);
    }
  }
  const auto search = HelpSearch::withDaemon(std::move(daemon));
  const Counts counts = waitForIndexes(*search, books, here, waiting, console);
  const size_t failedCount = counts.failed + changes->failed + changes->failures.size();
  if (!remote.empty() && waiting.waits) {
    (void)waitForDownloads(*search, remote, waiting, console);
  }
  console.out() << fmt::format("{} indexed, {} unchanged, {} forgotten, {} failed", counts.indexed,
                               unchangedCount, changes->forgotten, failedCount);
  if (!remote.empty()) {
    console.out() << fmt::format(", {} on servers", remote.size());
  }
  if (counts.left > 0) {
    console.out() << fmt::format(", {} still to be indexed", counts.left);
  }
  console.out() << '\n';
  return failedCount == 0 ? ExitCode::success : ExitCode::failure;
}

ExitCode indexWithDaemon(const IndexCommand& command, std::unique_ptr<DaemonClient> daemon,
                         const Waiting& waiting, Console& console) {
  zebd::ScanRequest request;
  for (size_t i = 0; i < command.folders.size(); ++i) {
    request.folders.push_back(
        {absolutePath(command.folders[i]),
         command.bookIDs.empty() ? std::nullopt : std::optional(command.bookIDs[i])});
  }
  request.installedBooks = false;
  request.folderBooksEvenIfUnchanged = true;
  const std::optional<BookChanges> changes = scanned(*daemon, request, waiting, console);
  if (!changes) {
    return ExitCode::failure;
  }
  const std::map<std::string, BookStatus> books = booksByID(*daemon);
  const auto search = HelpSearch::withDaemon(std::move(daemon));
  const Counts counts = waitForIndexes(*search, books, changes->folderBooks, waiting, console);
  const bool succeeded = changes->failures.empty() && changes->failed + counts.failed == 0;
  return succeeded ? ExitCode::success : ExitCode::failure;
}

ExitCode addBooksWithDaemon(const AddCommand& command, std::unique_ptr<DaemonClient> daemon,
                            const Waiting& waiting, Console& console) {
  const auto address = zebd::addressOfCatalogue(command.url);
  if (!address) {
    console.error(fmt::format("\"{}\" is no address of a web server", command.url));
    return ExitCode::usage;
  }
  const zebd::AddedBooks added =
      daemon->addRemote(command.url, {command.books, command.languages}, limitOf(waiting));
  if (added.problem) {
    console.error(*added.problem);
    return ExitCode::failure;
  }
  tellFailures(added.failures, console);
  std::vector<std::string> bookIDs;
  for (const zebd::CatalogueEntry& entry : added.entries) {
    tellBook(entry.bookID, entry.language, entry.title, console);
    bookIDs.push_back(entry.bookID);
  }
  if (bookIDs.empty()) {
    console.note("nothing was added");
    return ExitCode::failure;
  }
  const auto search = HelpSearch::withDaemon(std::move(daemon));
  const bool fetched = !waiting.waits || waitForDownloads(*search, bookIDs, waiting, console);
  return fetched && added.failures.empty() ? ExitCode::success : ExitCode::failure;
}

ExitCode removeRemoteBooksWithDaemon(RemoveCommand& command, const zebd::Catalogue& catalogue,
                                     DaemonClient& daemon, const Waiting& waiting,
                                     Console& console) {
  bool succeeded = true;
  std::erase_if(command.names, [&](const std::string& name) {
    bool isOnServer = false;
    for (const zebd::CatalogueEntry& entry : catalogue.entries()) {
      const auto address = zebd::addressOfCatalogue(name);
      isOnServer = isOnServer || (entry.bookID == name && entry.isRemote()) ||
                   (address && entry.catalogueURL == address->absoluteString());
    }
    if (isOnServer) {
      if (const auto problem = daemon.removeRemote(name, limitOf(waiting))) {
        console.error(fmt::format("{}: the help daemon could not remove it: {}", name, *problem));
        succeeded = false;
      }
    }
    return isOnServer;
  });
  return succeeded ? ExitCode::success : ExitCode::failure;
}

}  // namespace zeb
