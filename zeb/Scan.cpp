#include "zeb/Scan.h"

#include <fmt/format.h>

#include <algorithm>
#include <exception>
#include <functional>
#include <ostream>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "platform/Environment.h"
#include "platform/ThreadSafety.h"
#include "zeb/HelpFolders.h"
#include "zeb/Indexer.h"
#include "zeb/Languages.h"
#include "zeb/Paths.h"

namespace zeb {

namespace {

/// More at once than the machine has processors gain nothing, and each holds a book's words in
/// memory.
size_t workerCount(size_t bookCount) {
  const auto processors =
      static_cast<size_t>(std::max(1, platform::Environment::current()->processorCount()));
  return std::min({processors, bookCount, size_t{8}});
}

/// Hands out books to threads and takes in what became of them.
class Work {
 public:
  using Finished = std::function<void(const IndexingOutcome&, size_t finished, size_t total)>;

  /// `finished` is called by one thread at a time.
  Work(std::vector<BookFolder> books, const Catalogue& catalogue, bool evenIfUnchanged,
       Finished finished)
      : _books(std::move(books)),
        _catalogue(catalogue),
        _evenIfUnchanged(evenIfUnchanged),
        _finished(std::move(finished)) {}

  void run() {
    std::vector<std::thread> threads;
    for (size_t i = 1; i < workerCount(_books.size()); ++i) {
      threads.emplace_back([this] { _work(); });
    }
    _work();
    for (std::thread& thread : threads) {
      thread.join();
    }
  }

 private:
  void _work() EXCLUDES(_mutex) {
    while (true) {
      size_t index = 0;
      {
        const platform::MutexLock lock(_mutex);
        if (_next == _books.size()) {
          return;
        }
        index = _next++;
      }
      const IndexingOutcome outcome = _index(_books[index]);
      const platform::MutexLock lock(_mutex);
      ++_finishedCount;
      _finished(outcome, _finishedCount, _books.size());
    }
  }

  IndexingOutcome _index(const BookFolder& book) const {
    try {
      return indexBook(book, _catalogue, _evenIfUnchanged);
    } catch (const std::exception& exception) {
      IndexingOutcome outcome;
      outcome.bookID = book.entry.bookID;
      outcome.errors.emplace_back(exception.what());
      return outcome;
    }
  }

  const std::vector<BookFolder> _books;
  const Catalogue& _catalogue;
  const bool _evenIfUnchanged;
  const Finished _finished;
  platform::Mutex _mutex;
  size_t _next GUARDED_BY(_mutex) = 0;
  size_t _finishedCount GUARDED_BY(_mutex) = 0;
};

/// The books to index, each identifier once.
class BookList {
 public:
  BookList(const Catalogue& catalogue, Console& console, int verbosity)
      : _catalogue(catalogue), _console(console), _verbosity(verbosity) {}

  bool add(const std::string& folder, const std::optional<std::string>& bookID,
           const std::string& language, std::string& reason) {
    std::optional<BookFolder> book = bookInFolder(folder, _catalogue, bookID, language, reason);
    if (!book) {
      return false;
    }
    if (!_bookIDs.insert(book->entry.bookID).second) {
      if (_verbosity > 0 && !_folders.contains(folder)) {
        passedOver(folder, fmt::format("there is another book \"{}\"", book->entry.bookID));
      }
      return true;
    }
    _folders.insert(folder);
    _books.push_back(std::move(*book));
    return true;
  }

  void addInstalled(const std::vector<HelpFolder>& folders) {
    for (const HelpFolder& found : folders) {
      std::string reason;
      if (!add(found.folder, found.bookID, found.language, reason)) {
        passedOver(found.folder, reason);
      }
    }
  }

  void passedOver(const std::string& folder, const std::string& reason) {
    if (_verbosity > 0) {
      _console.note(fmt::format("passed over {}: {}", folder, reason));
    }
  }

  std::vector<BookFolder> take() { return std::move(_books); }

 private:
  const Catalogue& _catalogue;
  Console& _console;
  int _verbosity;
  std::set<std::string> _bookIDs;
  std::set<std::string> _folders;
  std::vector<BookFolder> _books;
};

void addInstalledBooks(const ScanCommand& command, BookList& books) {
  const std::string root = absolutePath(command.root);
  const PassedOver passedOver = [&books](const std::string& folder, const std::string& reason) {
    books.passedOver(folder, reason);
  };
  const auto languages = languageFallbacks(
      command.languages.empty() ? platform::Environment::current()->preferredLanguages
                                : command.languages);
  books.addInstalled(applicationHelpFolders(root, languages, passedOver));
  books.addInstalled(manualFolders(root, passedOver));
}

/// Books that were added by name before are looked at again; those that are gone are forgotten.
void addKnownBooks(const Catalogue& catalogue, BookList& books, size_t& forgottenCount) {
  for (const CatalogueEntry& entry : catalogue.entries()) {
    bool isDirectory = false;
    if (!platform::Environment::current()->files->fileExistsAtPath(entry.folder, &isDirectory) ||
        !isDirectory) {
      catalogue.remove(entry);
      ++forgottenCount;
      continue;
    }
    const bool isIndexOurs = entry.indexPath == catalogue.indexPathForBookID(entry.bookID);
    std::string reason;
    if ((isIndexOurs || entry.indexIsShipped) &&
        !books.add(entry.folder, entry.bookID, entry.language, reason)) {
      books.passedOver(entry.folder, reason);
    }
  }
}

/// Says what became of the books as it happens, and keeps count.
class Progress {
 public:
  Progress(Console& console, int verbosity) : _console(console), _verbosity(verbosity) {}

  void report(const IndexingOutcome& outcome, size_t finished, size_t total) {
    switch (outcome.kind) {
      case IndexingOutcome::Kind::indexed:
        ++indexedCount;
        _console.clearProgress();
        _console.out() << fmt::format("{}  {}{} pages  {:.1f} s\n",
                                      _console.styled(Style::book, singleLine(outcome.bookID)),
                                      outcome.language.empty() ? "" : outcome.language + "  ",
                                      outcome.pageCount, outcome.seconds)
                       << std::flush;
        break;
      case IndexingOutcome::Kind::unchanged:
        ++unchangedCount;
        break;
      case IndexingOutcome::Kind::empty:
        if (_verbosity > 0) {
          _console.note(fmt::format("{}: there are no pages in it", outcome.bookID));
        }
        break;
      case IndexingOutcome::Kind::failed:
        ++failedCount;
        for (const std::string& error : outcome.errors) {
          _console.error(fmt::format("{}: {}", outcome.bookID, error));
        }
        break;
    }
    if (_verbosity > 0) {
      for (const std::string& warning : outcome.warnings) {
        _console.warning(fmt::format("{}: {}", outcome.bookID, warning));
      }
    } else if (!outcome.warnings.empty()) {
      _console.warning(fmt::format("{}: {} pages or folders could not be read", outcome.bookID,
                                   outcome.warnings.size()));
    }
    _console.progress(fmt::format("{} of {} books", finished, total));
  }

  size_t indexedCount = 0;
  size_t unchangedCount = 0;
  size_t failedCount = 0;

 private:
  Console& _console;
  int _verbosity;
};

}  // namespace

ExitCode scan(const ScanCommand& command, const Catalogue& catalogue, Console& console,
              int verbosity) {
  BookList books(catalogue, console, verbosity);
  size_t brokenCount = 0;
  for (const std::string& folder : command.folders) {
    std::string reason;
    const std::string path = absolutePath(folder);
    if (!books.add(path, std::nullopt, {}, reason)) {
      console.error(fmt::format("{}: {}", path, reason));
      ++brokenCount;
    }
  }
  if (command.installedBooks) {
    console.progress("looking for books");
    addInstalledBooks(command, books);
  }
  size_t forgottenCount = 0;
  addKnownBooks(catalogue, books, forgottenCount);

  Progress progress(console, verbosity);
  Work work(books.take(), catalogue, command.evenIfUnchanged,
            [&progress](const IndexingOutcome& outcome, size_t finished, size_t total) {
              progress.report(outcome, finished, total);
            });
  work.run();
  console.clearProgress();
  console.out() << fmt::format("{} indexed, {} unchanged, {} forgotten, {} failed\n",
                               progress.indexedCount, progress.unchangedCount, forgottenCount,
                               progress.failedCount + brokenCount);
  return progress.failedCount + brokenCount == 0 ? ExitCode::success : ExitCode::failure;
}

}  // namespace zeb
