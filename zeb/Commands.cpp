#include "zeb/Commands.h"

#include <fmt/format.h>
#include <unistd.h>

#include <algorithm>
#include <exception>
#include <functional>
#include <memory>
#include <ostream>
#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Log.h"
#include "platform/Processes.h"
#include "platform/Strings.h"
#include "platform/WorkerThreads.h"
#include "zeb/DaemonBooks.h"
#include "zeb/DaemonClient.h"
#include "zeb/Doctor.h"
#include "zeb/HelpSearch.h"
#include "zeb/Indexing.h"
#include "zeb/Interactive.h"
#include "zeb/Output.h"
#include "zeb/Paths.h"
#include "zeb/Publishing.h"
#include "zeb/RemoteBooks.h"
#include "zeb/Scan.h"
#include "zeb/Status.h"
#include "zeb/Watch.h"
#include "zebd/BookDiscovery.h"
#include "zebd/BookFolder.h"
#include "zebd/Catalogue.h"
#include "zebd/HelpService.h"
#include "zebd/Models.h"
#include "zebd/Subscriptions.h"

namespace zeb {

namespace {

using platform::stringByAppendingPathComponent;

/// The plug-in's work goes on for at most this long after an answer has been given, so that what it
/// has begun need not begin again with the next search.
constexpr platform::Seconds lingering{2};

class Session {
 public:
  Session(Console& console, Catalogue catalogue, const Installation& installation,
          const CommandLine& line)
      : _console(console),
        _catalogue(std::move(catalogue)),
        _installation(installation),
        _waiting(line.waiting),
        _verbosity(line.verbosity),
        _usesDaemon(line.usesDaemon) {}

  ExitCode operator()(const SearchCommand& command);
  ExitCode operator()(const SuggestCommand& command);
  ExitCode operator()(const AnchorCommand& command);
  ExitCode operator()(const ModelsCommand& command);
  ExitCode operator()(const BooksCommand& command);
  ExitCode operator()(const StatusCommand& command);
  ExitCode operator()(const WatchCommand& command);
  ExitCode operator()(const IndexCommand& command);
  ExitCode operator()(const ScanCommand& command);
  ExitCode operator()(const AddCommand& command) {
    if (auto daemon = _startDaemon()) {
      return addBooksWithDaemon(command, std::move(daemon), _waiting, _console);
    }
    return addBooks(command, _catalogue, _installation, _waiting, _console);
  }
  ExitCode operator()(RemoveCommand command);
  ExitCode operator()(const PublishCommand& command);
  ExitCode operator()(const DoctorCommand& command) {
    return examine(command, _catalogue, _installation, _waiting, _usesDaemon, _console);
  }

 private:
  /// Asks the search and shows what it says; absent when the search broke off, else whether
  /// anything was found.
  using Question = std::function<std::optional<bool>(HelpSearch& search)>;

  std::vector<ListedBook> _listedBooks() const;
  ExitCode _searchInteractively(const SearchCommand& command);
  /// `makesIndexes`: whether books that have no index yet are indexed before the question.
  ExitCode _ask(const std::vector<std::string>& bookIDs, const Question& question,
                bool makesIndexes = true);
  std::unique_ptr<HelpSearch> _startSearch(std::vector<CatalogueEntry> entries);
  std::unique_ptr<DaemonClient> _connectToDaemon() const {
    return _usesDaemon ? DaemonClient::connect() : nullptr;
  }
  std::unique_ptr<DaemonClient> _startDaemon() const;
  std::unique_ptr<DaemonClient> _daemon() const;
  std::string _textOf(const std::vector<std::string>& words);
  bool _knowsBooks(const std::vector<CatalogueEntry>& entries,
                   const std::vector<std::string>& bookIDs);
  void _makeMissingIndexes(HelpSearch& search, const std::vector<std::string>& bookIDs);
  bool _hasIdentifierForEach(const std::vector<std::string>& folders,
                             const std::vector<std::string>& bookIDs);
  std::optional<bool> _show(const std::string& asked, const std::optional<Answer>& answer,
                            bool json);

  Console& _console;
  const Catalogue _catalogue;
  const Installation& _installation;
  const Waiting _waiting;
  const int _verbosity;
  bool _usesDaemon;
};

/// Whether there are books, and these among them; says what is wrong where not.
bool Session::_knowsBooks(const std::vector<CatalogueEntry>& entries,
                          const std::vector<std::string>& bookIDs) {
  if (entries.empty()) {
    _console.error("no book has been indexed yet; 'zeb scan' looks for some");
    return false;
  }
  for (const std::string& bookID : bookIDs) {
    if (std::none_of(entries.begin(), entries.end(),
                     [&bookID](const CatalogueEntry& entry) { return entry.bookID == bookID; })) {
      _console.error(fmt::format("there is no book \"{}\"; 'zeb books' lists all", bookID));
      return false;
    }
  }
  return true;
}

std::string countOfBooks(size_t count, std::string_view one, std::string_view several) {
  return count == 1 ? fmt::format("1 book {}", one) : fmt::format("{} books {}", count, several);
}

void Session::_makeMissingIndexes(HelpSearch& search, const std::vector<std::string>& bookIDs) {
  const std::vector<std::string> missing = search.booksWithoutIndex(bookIDs);
  if (missing.empty()) {
    return;
  }
  if (!_waiting.waits) {
    _console.note(countOfBooks(missing.size(), "is not indexed yet", "are not indexed yet"));
    return;
  }
  _console.note(countOfBooks(missing.size(), "is being indexed for the first time",
                             "are being indexed for the first time"));
  _console.progress(fmt::format("0 of {} books", missing.size()));
  const HelpSearch::Indexing indexing = search.makeIndexes(
      missing, platform::Seconds(_waiting.limit), [&](const std::string& /*bookID*/, size_t count) {
        _console.progress(fmt::format("{} of {} books", count, missing.size()));
      });
  _console.clearProgress();
  if (!indexing.ended) {
    _console.note(fmt::format(
        "gave up waiting after {:g} seconds; {}", _waiting.limit,
        countOfBooks(indexing.missing.size(), "is not indexed yet", "are not indexed yet")));
    return;
  }
  for (const std::string& bookID : indexing.missing) {
    _console.warning(fmt::format("{}: it could not be indexed", bookID));
  }
}

std::optional<bool> Session::_show(const std::string& asked, const std::optional<Answer>& answer,
                                   bool json) {
  if (!answer) {
    return std::nullopt;
  }
  if (json) {
    printAnswerAsJSON(asked, *answer, _console);
  } else if (answer->pages.empty()) {
    _console.note(fmt::format("nothing found for {}", asked));
  } else {
    printAnswer(*answer, _console);
  }
  return !answer->pages.empty();
}

/// The daemon, if it is to be asked and can be had: one that is installed but does not start is
/// none.
std::unique_ptr<DaemonClient> Session::_startDaemon() const {
  auto daemon = _connectToDaemon();
  if (daemon != nullptr) {
    if (daemon->start()) {
      _console.note("the help daemon cannot be started; 'zeb doctor' says more");
      return nullptr;
    }
  }
  return daemon;
}

/// The daemon, with books.
std::unique_ptr<DaemonClient> Session::_daemon() const {
  auto daemon = _startDaemon();
  if (daemon != nullptr && _catalogue.entries().empty()) {
    // It has just begun, and looks for books anyway.
    _console.progress("looking for books");
    std::string problem;
    (void)daemon->scan({}, platform::Seconds(_waiting.patience()), problem);
    _console.clearProgress();
  }
  return daemon;
}

/// A host in this process; null where it cannot be had, which has been said then.
std::unique_ptr<HelpSearch> Session::_startSearch(std::vector<CatalogueEntry> entries) {
  zebd::followLanguages(_catalogue, entries);
  platform::Error error;
  auto search = HelpSearch::start(entries, _installation, error);
  if (search == nullptr) {
    _console.error(error.description);
  }
  return search;
}

ExitCode Session::_ask(const std::vector<std::string>& bookIDs, const Question& question,
                       bool makesIndexes) {
  auto daemon = _daemon();
  std::vector<CatalogueEntry> entries = _catalogue.entries();
  if (!_knowsBooks(entries, bookIDs)) {
    return ExitCode::failure;
  }
  const std::unique_ptr<HelpSearch> search = daemon != nullptr
                                                 ? HelpSearch::withDaemon(std::move(daemon))
                                                 : _startSearch(std::move(entries));
  if (search == nullptr) {
    return ExitCode::failure;
  }
  if (makesIndexes) {
    _makeMissingIndexes(*search, bookIDs);
  }
  const std::optional<bool> found = question(*search);
  if (!found) {
    _console.error("the search broke off; --verbose says more");
    return ExitCode::failure;
  }
  if (_waiting.waits && _console.flush()) {
    search->settle(lingering);
  }
  return *found ? ExitCode::success : ExitCode::nothingFound;
}

/// Whether a message of the bus can hold these folders: paths are bytes, its strings are text.
bool canBeTold(const std::vector<std::string>& folders) {
  return folders.size() <= zebd::HelpService::maximumBookCount &&
         std::all_of(folders.begin(), folders.end(), [](const std::string& folder) {
           const std::string path = absolutePath(folder);
           return platform::isValidUTF8(path) && path.size() <= maximumTextLength;
         });
}

/// What is to be searched for. The daemon takes no text that is longer than its bounds; this
/// process does.
std::string Session::_textOf(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) {
    text += text.empty() ? "" : " ";
    text += platform::stringByRepairingUTF8(word);
  }
  _usesDaemon = _usesDaemon && text.size() <= maximumTextLength;
  return text;
}

ExitCode Session::_searchInteractively(const SearchCommand& command) {
  if (!_console.isInteractive()) {
    _console.error("search: words are needed where there is no terminal to type them");
    return ExitCode::usage;
  }
  return _ask(command.books, [&](HelpSearch& search) -> std::optional<bool> {
    Terminal terminal(STDIN_FILENO, STDOUT_FILENO);
    searchInteractively(search, command.books, terminal, [](const std::string& url) {
      // The handler may take its time, or not be there; neither is to stop the typing.
      platform::startNamedThread("open-page", [url] {
        platform::Environment::current()->processLauncher->launchAndWait("/usr/bin/xdg-open",
                                                                         {addressForViewer(url)});
      });
    });
    return true;
  });
}

ExitCode Session::operator()(const SearchCommand& command) {
  if (command.words.empty()) {
    return _searchInteractively(command);
  }
  const std::string words = _textOf(command.words);
  return _ask(command.books, [&](HelpSearch& search) {
    return _show(words,
                 command.actions ? search.searchActions(words, command.books, command.limit)
                                 : search.search(words, command.books, command.limit),
                 command.json);
  });
}

ExitCode Session::operator()(const SuggestCommand& command) {
  const std::string words = _textOf(command.words);
  return _ask(command.books, [&](HelpSearch& search) -> std::optional<bool> {
    const auto suggestions = command.kind == SuggestCommand::Kind::similar
                                 ? search.similarSearches(words, command.books, command.limit)
                                 : search.suggestions(words, command.books, command.limit);
    if (!suggestions) {
      return std::nullopt;
    }
    if (command.json) {
      printSuggestionsAsJSON(words, *suggestions, _console);
    } else if (suggestions->empty()) {
      _console.note(fmt::format("nothing found for {}", words));
    } else {
      printSuggestions(*suggestions, _console);
    }
    return !suggestions->empty();
  });
}

ExitCode Session::operator()(const AnchorCommand& command) {
  const std::string name = _textOf({command.name});
  return _ask(command.books, [&](HelpSearch& search) {
    return _show(name, search.lookUpAnchor(name, command.books), command.json);
  });
}

ExitCode Session::operator()(const ModelsCommand& command) {
  const std::vector<ListedModel> models = zebd::savedModels();
  if (command.json) {
    printModelsAsJSON(models, _console);
  } else if (models.empty()) {
    _console.note("no model has been built yet; 'zeb scan' has them built");
  } else {
    printModels(models, _console);
  }
  return models.empty() ? ExitCode::nothingFound : ExitCode::success;
}

ExitCode Session::operator()(const StatusCommand& command) {
  const auto daemon = _connectToDaemon();
  const StatusReport report = statusReport(_listedBooks(), daemon.get());
  if (command.json) {
    printStatusAsJSON(report, _console);
  } else {
    printStatus(report, _console);
  }
  return ExitCode::success;
}

ExitCode Session::operator()(const WatchCommand& command) {
  const std::string words = _textOf(command.words);
  return _ask(
      command.books,
      [&](HelpSearch& search) {
        return watch(search, command, words, _console, [] { return false; });
      },
      command.once);
}

std::vector<ListedBook> Session::_listedBooks() const {
  std::vector<ListedBook> books;
  for (CatalogueEntry& entry : _catalogue.entries()) {
    const std::shared_ptr<ZEBHelpBook> book = zebd::bookOfEntry(entry);
    if (book != nullptr && entry.isRemote()) {
      // As it would be searched.
      entry.language = book->localization();
    }
    books.push_back(
        {std::move(entry), book == nullptr ? std::nullopt : zebd::indexPathOfBook(*book)});
  }
  return books;
}

ExitCode Session::operator()(const BooksCommand& command) {
  const std::vector<ListedBook> books = _listedBooks();
  if (command.json) {
    printBooksAsJSON(books, _console);
  } else if (books.empty()) {
    _console.note("no book has been indexed yet; 'zeb scan' looks for some");
  } else {
    printBooks(books, _console);
  }
  return books.empty() ? ExitCode::nothingFound : ExitCode::success;
}

bool Session::_hasIdentifierForEach(const std::vector<std::string>& folders,
                                    const std::vector<std::string>& bookIDs) {
  if (bookIDs.empty() || bookIDs.size() == folders.size()) {
    return true;
  }
  _console.error(fmt::format("{} folders, but {} --book-id: give one for each, or none",
                             folders.size(), bookIDs.size()));
  return false;
}

ExitCode Session::operator()(const IndexCommand& command) {
  if (!_hasIdentifierForEach(command.folders, command.bookIDs)) {
    return ExitCode::usage;
  }
  if (auto daemon = canBeTold(command.folders) ? _startDaemon() : nullptr) {
    return indexWithDaemon(command, std::move(daemon), _waiting, _console);
  }
  bool succeeded = true;
  zebd::BookDiscovery books([](const std::string& /*folder*/, const std::string& /*reason*/) {});
  for (size_t i = 0; i < command.folders.size(); ++i) {
    const std::string folder = absolutePath(command.folders[i]);
    const auto bookID = command.bookIDs.empty() ? std::nullopt : std::optional(command.bookIDs[i]);
    std::string reason;
    if (!books.add(folder, bookID, {}, reason)) {
      _console.error(fmt::format("{}: {}", folder, reason));
      succeeded = false;
    }
  }
  const IndexingCounts counts =
      Update(_catalogue, _waiting, _console).run(books.books(), {}, _installation, true);
  return succeeded && counts.failed == 0 ? ExitCode::success : ExitCode::failure;
}

ExitCode Session::operator()(const ScanCommand& command) {
  // What lies elsewhere is not the daemon's.
  const bool isForDaemon = command.root == "/" && canBeTold(command.folders);
  if (auto daemon = isForDaemon ? _startDaemon() : nullptr) {
    return scanWithDaemon(command, std::move(daemon), _waiting, _console);
  }
  return scan(command, _catalogue, _installation, _waiting, _console, _verbosity);
}

ExitCode Session::operator()(RemoveCommand command) {
  ExitCode code = ExitCode::success;
  if (const auto daemon = _startDaemon()) {
    code = removeRemoteBooksWithDaemon(command, _catalogue, *daemon, _waiting, _console);
  }
  const ExitCode rest = command.names.empty()
                            ? ExitCode::success
                            : removeBooks(command, _catalogue, _installation, _console);
  return code == ExitCode::success ? rest : code;
}

ExitCode Session::operator()(const PublishCommand& command) {
  if (!_hasIdentifierForEach(command.folders, command.bookIDs)) {
    return ExitCode::usage;
  }
  bool succeeded = true;
  Publishing publishing(absolutePath(command.site), _console);
  for (size_t i = 0; i < command.folders.size(); ++i) {
    const auto bookID = command.bookIDs.empty() ? std::nullopt : std::optional(command.bookIDs[i]);
    succeeded =
        publishing.publish(absolutePath(command.folders[i]), bookID, command.language) && succeeded;
  }
  return succeeded ? ExitCode::success : ExitCode::failure;
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

ExitCode runCommand(const CommandLine& line, const Installation& installation, Console& console) {
  console.setColorMode(line.color);
  const std::optional<std::string> folder = cacheFolder(line);
  if (!folder) {
    console.error("there is no caches folder; name one with --cache-dir");
    return ExitCode::failure;
  }
  platform::Environment environment = *platform::Environment::current();
  // What goes wrong is told in the user's terms; the log is for those who ask for it.
  environment.log = platform::standardErrorLogSink(line.verbosity - 1);
  // Results are all that this program prints there.
  environment.standardOutput = [log = environment.log](const std::string& text) {
    log->write(5, text);
  };
  if (line.cacheFolder) {
    environment.cachesDirectory = folder;
  }
  if (!installation.indexingToolPath.empty()) {
    environment.processLauncher =
        platform::substitutingProcessLauncher("/usr/bin/bvmake", installation.indexingToolPath);
  }
  const platform::EnvironmentOverride override(std::move(environment));

  Session session(console, Catalogue(stringByAppendingPathComponent(*folder, "books")),
                  installation, line);
  return std::visit(session, line.command);
}

}  // namespace

ExitCode run(const std::vector<std::string>& arguments, const Installation& installation,
             Console& console) {
  try {
    ExitCode code = ExitCode::success;
    const std::optional<CommandLine> line = parseCommandLine(arguments, console, code);
    if (line) {
      code = runCommand(*line, installation, console);
    }
    if (!console.flush()) {
      console.error("cannot write the results");
      return ExitCode::failure;
    }
    return code;
  } catch (const std::exception& exception) {
    console.error(exception.what());
    return ExitCode::failure;
  }
}

}  // namespace zeb
