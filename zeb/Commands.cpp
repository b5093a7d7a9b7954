#include "zeb/Commands.h"

#include <fmt/format.h>

#include <algorithm>
#include <exception>
#include <ostream>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Log.h"
#include "platform/Strings.h"
#include "zeb/Catalogue.h"
#include "zeb/HelpSearch.h"
#include "zeb/Indexer.h"
#include "zeb/Output.h"
#include "zeb/Paths.h"
#include "zeb/Scan.h"

namespace zeb {

namespace {

using platform::stringByAppendingPathComponent;

class Session {
 public:
  Session(Console& console, Catalogue catalogue, int verbosity)
      : _console(console), _catalogue(std::move(catalogue)), _verbosity(verbosity) {}

  ExitCode operator()(const SearchCommand& command);
  ExitCode operator()(const AnchorCommand& command);
  ExitCode operator()(const BooksCommand& command);
  ExitCode operator()(const IndexCommand& command);
  ExitCode operator()(const ScanCommand& command) {
    return scan(command, _catalogue, _console, _verbosity);
  }

 private:
  std::optional<std::vector<CatalogueEntry>> _books(const std::vector<std::string>& bookIDs);
  void _warnOfUnreadableBooks(const HelpSearch& search);
  ExitCode _show(const std::string& query, const Answer& answer, bool json);

  Console& _console;
  const Catalogue _catalogue;
  const int _verbosity;
};

/// The catalogue's entries for these identifiers, or all; absent, and said, when there are none or
/// one is unknown.
std::optional<std::vector<CatalogueEntry>> Session::_books(
    const std::vector<std::string>& bookIDs) {
  std::vector<CatalogueEntry> entries = _catalogue.entries();
  if (entries.empty()) {
    _console.error("no book has been indexed yet; 'zeb scan' looks for some");
    return std::nullopt;
  }
  for (const std::string& bookID : bookIDs) {
    if (std::none_of(entries.begin(), entries.end(),
                     [&bookID](const CatalogueEntry& entry) { return entry.bookID == bookID; })) {
      _console.error(fmt::format("there is no book \"{}\"; 'zeb books' lists all", bookID));
      return std::nullopt;
    }
  }
  if (!bookIDs.empty()) {
    std::erase_if(entries, [&bookIDs](const CatalogueEntry& entry) {
      return std::find(bookIDs.begin(), bookIDs.end(), entry.bookID) == bookIDs.end();
    });
  }
  return entries;
}

void Session::_warnOfUnreadableBooks(const HelpSearch& search) {
  for (const CatalogueEntry& book : search.unreadableBooks()) {
    _console.warning(fmt::format("the index of {} cannot be read; 'zeb scan' makes it again ({})",
                                 book.bookID, book.indexPath));
  }
}

ExitCode Session::_show(const std::string& query, const Answer& answer, bool json) {
  if (json) {
    printAnswerAsJSON(query, answer, _console);
  } else if (answer.pages.empty()) {
    _console.note(fmt::format("nothing found for {}", query));
  } else {
    printAnswer(answer, _console);
  }
  return answer.pages.empty() ? ExitCode::nothingFound : ExitCode::success;
}

ExitCode Session::operator()(const SearchCommand& command) {
  const auto books = _books(command.books);
  if (!books) {
    return ExitCode::failure;
  }
  std::string words;
  for (const std::string& word : command.words) {
    words += words.empty() ? "" : " ";
    words += platform::stringByRepairingUTF8(word);
  }
  const HelpSearch search(*books);
  _warnOfUnreadableBooks(search);
  if (search.unreadableBooks().size() == books->size()) {
    return ExitCode::failure;
  }
  return _show(words, search.search(words, command.limit), command.json);
}

ExitCode Session::operator()(const AnchorCommand& command) {
  const auto books = _books(command.books);
  if (!books) {
    return ExitCode::failure;
  }
  const HelpSearch search(*books);
  _warnOfUnreadableBooks(search);
  if (search.unreadableBooks().size() == books->size()) {
    return ExitCode::failure;
  }
  return _show(command.name, search.lookUpAnchor(command.name, SIZE_MAX), command.json);
}

ExitCode Session::operator()(const BooksCommand& command) {
  std::vector<ListedBook> books;
  for (CatalogueEntry& entry : _catalogue.entries()) {
    bool isDirectory = false;
    const bool exists =
        platform::Environment::current()->files->fileExistsAtPath(entry.indexPath, &isDirectory);
    books.push_back({std::move(entry), exists && !isDirectory});
  }
  if (command.json) {
    printBooksAsJSON(books, _console);
  } else if (books.empty()) {
    _console.note("no book has been indexed yet; 'zeb scan' looks for some");
  } else {
    printBooks(books, _console);
  }
  return books.empty() ? ExitCode::nothingFound : ExitCode::success;
}

ExitCode Session::operator()(const IndexCommand& command) {
  if (!command.bookIDs.empty() && command.bookIDs.size() != command.folders.size()) {
    _console.error(fmt::format("{} folders, but {} --book-id: give one for each, or none",
                               command.folders.size(), command.bookIDs.size()));
    return ExitCode::usage;
  }
  ExitCode code = ExitCode::success;
  for (size_t i = 0; i < command.folders.size(); ++i) {
    const std::string folder = absolutePath(command.folders[i]);
    const auto bookID = command.bookIDs.empty() ? std::nullopt : std::optional(command.bookIDs[i]);
    std::string reason;
    std::optional<BookFolder> book = bookInFolder(folder, _catalogue, bookID, {}, reason);
    if (!book) {
      _console.error(fmt::format("{}: {}", folder, reason));
      code = ExitCode::failure;
      continue;
    }
    CatalogueEntry& entry = book->entry;
    entry.indexIsShipped = false;
    entry.indexPath = _catalogue.indexPathForBookID(entry.bookID);
    if (command.output) {
      entry.indexPath = absolutePath(*command.output);
      if (command.folders.size() > 1) {
        entry.indexPath = stringByAppendingPathComponent(
            entry.indexPath, entry.bookID + '.' + ZEBHelpindexExtension);
      }
    }
    _console.progress(fmt::format("indexing {}", folder));
    const IndexingOutcome outcome = indexBook(*book, _catalogue, true);
    for (const std::string& warning : outcome.warnings) {
      _console.warning(warning);
    }
    for (const std::string& error : outcome.errors) {
      _console.error(error);
    }
    if (outcome.kind == IndexingOutcome::Kind::indexed) {
      _console.clearProgress();
      _console.out() << fmt::format(
          "{}  {} pages  {:.1f} s  {}\n", _console.styled(Style::book, singleLine(outcome.bookID)),
          outcome.pageCount, outcome.seconds, singleLine(entry.indexPath));
    } else {
      if (outcome.kind == IndexingOutcome::Kind::empty) {
        _console.error(fmt::format("{}: there are no pages in it", folder));
      }
      code = ExitCode::failure;
    }
  }
  return code;
}

std::optional<std::string> cacheFolder(const CommandLine& line) {
  if (line.cacheFolder) {
    return absolutePath(*line.cacheFolder);
  }
  const std::optional<std::string> caches = platform::Environment::current()->cachesDirectory;
  if (!caches) {
    return std::nullopt;
  }
  return stringByAppendingPathComponent(*caches, "zeb");
}

ExitCode runCommand(const CommandLine& line, Console& console) {
  console.setColorMode(line.color);
  // What goes wrong is told in the user's terms below; the log is for those who ask for it.
  platform::Environment environment = *platform::Environment::current();
  environment.log = platform::standardErrorLogSink(line.verbosity - 1);
  const platform::EnvironmentOverride quiet(std::move(environment));

  const std::optional<std::string> folder = cacheFolder(line);
  if (!folder) {
    console.error("there is no caches folder; name one with --cache-dir");
    return ExitCode::failure;
  }
  Session session(console, Catalogue(stringByAppendingPathComponent(*folder, "books")),
                  line.verbosity);
  const ExitCode code = std::visit(session, line.command);
  if (!console.flush()) {
    console.error("cannot write the results");
    return ExitCode::failure;
  }
  return code;
}

}  // namespace

ExitCode run(const std::vector<std::string>& arguments, Console& console) {
  try {
    ExitCode code = ExitCode::success;
    const std::optional<CommandLine> line = parseCommandLine(arguments, console, code);
    return line ? runCommand(*line, console) : code;
  } catch (const std::exception& exception) {
    console.error(exception.what());
    return ExitCode::failure;
  }
}

}  // namespace zeb
