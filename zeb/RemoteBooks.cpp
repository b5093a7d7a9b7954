#include "zeb/RemoteBooks.h"

#include <fmt/format.h>

#include <algorithm>
#include <memory>
#include <ostream>
#include <set>
#include <utility>

#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/RunLoop.h"
#include "platform/ThreadSafety.h"
#include "zeb/HelpSearch.h"
#include "zeb/Indexing.h"
#include "zebd/BookFolder.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

using platform::stringByAppendingPathComponent;

/// A publisher's new edition reaches a reader within this time, or with the next `zeb scan`.
constexpr std::chrono::hours refreshInterval{4};
/// When the plug-in last looked at every book: the date of this file.
constexpr const char* markerName = "RemoteBooks.checked";

/// The answer of the service, whichever thread it comes on.
class Answer {
 public:
  void set(std::shared_ptr<const RNXCatalogue> catalogue, std::optional<platform::Error> error) {
    {
      const platform::MutexLock lock(_mutex);
      _isThere = true;
      _catalogue = std::move(catalogue);
      _error = std::move(error);
    }
    platform::RunLoop::main()->stop();
  }
  bool isThere() const {
    const platform::MutexLock lock(_mutex);
    return _isThere;
  }
  std::shared_ptr<const RNXCatalogue> catalogue() const {
    const platform::MutexLock lock(_mutex);
    return _catalogue;
  }
  std::string reason() const {
    const platform::MutexLock lock(_mutex);
    return _error ? _error->description : "there was no answer in time";
  }

 private:
  mutable platform::Mutex _mutex;
  bool _isThere GUARDED_BY(_mutex) = false;
  std::shared_ptr<const RNXCatalogue> _catalogue GUARDED_BY(_mutex);
  std::optional<platform::Error> _error GUARDED_BY(_mutex);
};

/// The address as it is asked for; absent for what is none of a web server.
std::optional<platform::URL> addressOfCatalogue(const std::string& typed) {
  const auto url = URLByEscapingString(addSSLAsNecessary(typed));
  const bool isWeb = url && (url->scheme() == "https" || url->scheme() == "http");
  return isWeb && !ZEBOriginOfURL(*url).empty() ? url : std::nullopt;
}

/// Asks for the catalogue, and waits for what becomes of that.
std::shared_ptr<const Answer> askForCatalogue(const platform::URL& url, const Waiting& waiting) {
  const auto answer = std::make_shared<Answer>();
  RNXObjectManager::sharedObjectManager()->loadCatalogue(
      url,
      [answer](const std::shared_ptr<const RNXCatalogue>& catalogue,
               const std::optional<platform::Error>& error) { answer->set(catalogue, error); });
  zebd::Host::runMainLoopUntil([&] { return answer->isThere(); }, platform::Seconds(waiting.limit));
  return answer;
}

std::shared_ptr<const RNXCatalogue> loadCatalogue(const platform::URL& url, const Waiting& waiting,
                                                  Console& console) {
  const auto answer = askForCatalogue(url, waiting);
  auto catalogue = answer->catalogue();
  if (catalogue == nullptr) {
    console.error(fmt::format("{}: {}", url.absoluteString(), answer->reason()));
  }
  return catalogue;
}

/// The entries to subscribe to; what is wanted and not there is told.
std::vector<const RNXCatalogueEntry*> chosenEntries(const RNXCatalogue& catalogue,
                                                    const AddCommand& command, Console& console) {
  std::set<std::string> wanted(command.books.begin(), command.books.end());
  if (wanted.empty()) {
    for (const RNXCatalogueEntry& entry : catalogue.books) {
      wanted.insert(entry.identifier);
    }
  }
  const std::vector<std::string>& languages =
      command.languages.empty() ? platform::Environment::current()->preferredLanguages
                                : command.languages;
  std::vector<const RNXCatalogueEntry*> chosen;
  for (const std::string& bookID : wanted) {
    // No localization is asked for by name, so a book that has languages is chosen by them.
    if (const auto* entry = catalogue.bookWithIdentifier(bookID, "", languages)) {
      chosen.push_back(entry);
    } else {
      console.error(fmt::format("{}: the catalogue does not have this book", bookID));
    }
  }
  return chosen;
}

CatalogueEntry remoteEntry(const RNXCatalogueEntry& book, const platform::URL& catalogueURL,
                           const std::vector<std::string>& languages) {
  CatalogueEntry entry;
  entry.bookID = book.identifier;
  entry.title = book.title;
  entry.type = ZEBHelpBookType4;
  // Where what is fetched of it is kept.
  entry.folder = stringByAppendingPathComponent(ZEBGeneratedRoot().value_or("/"), book.identifier);
  entry.accessPagePath = stringByAppendingPathComponent(entry.folder, "index.html");
  entry.language = book.locale.value_or("");
  entry.catalogueURL = catalogueURL.absoluteString();
  entry.languages = languages;
  if (book.pages) {
    entry.pagesURL = book.pages->absoluteString();
  }
  return entry;
}

/// What is to be remembered of the book; absent, and told, when another one has its place.
std::optional<CatalogueEntry> entryToStore(const RNXCatalogueEntry& book,
                                           const platform::URL& catalogueURL,
                                           const AddCommand& command, const Catalogue& catalogue,
                                           Console& console) {
  std::optional<CatalogueEntry> former = catalogue.entry(book.identifier);
  if (!former || former->isRemote()) {
    return remoteEntry(book, catalogueURL, command.languages);
  }
  if (former->type == ZEBHelpBookType3) {
    former->catalogueURL = catalogueURL.absoluteString();
    return former;
  }
  console.error(fmt::format("{}: there is a book of this identifier on this computer ({})",
                            book.identifier, former->folder));
  return std::nullopt;
}

bool hasIndex(const CatalogueEntry& entry) {
  const auto book = zebd::bookOfEntry(entry);
  return book != nullptr && zebd::indexPathOfBook(*book);
}

/// Fetches what the books need; returns whether all have an index then.
bool fetchIndexes(const std::vector<CatalogueEntry>& entries, const Installation& installation,
                  const Waiting& waiting, Console& console) {
  forgetKnownIndices();
  platform::Error error;
  const std::unique_ptr<HelpSearch> search = HelpSearch::start(entries, installation, error);
  if (search == nullptr) {
    console.error(error.description);
    return false;
  }
  std::vector<std::string> bookIDs;
  bookIDs.reserve(entries.size());
  for (const CatalogueEntry& entry : entries) {
    bookIDs.push_back(entry.bookID);
  }
  console.progress(fmt::format("asking for {} books", bookIDs.size()));
  const bool ended = search->fetchIndexes(bookIDs, platform::Seconds(waiting.limit));
  console.clearProgress();
  if (!ended) {
    console.note(fmt::format("gave up waiting after {:g} seconds", waiting.limit));
  }
  bool all = true;
  for (const CatalogueEntry& entry : entries) {
    if (!hasIndex(entry)) {
      console.warning(
          fmt::format("{}: its index could not be fetched; --verbose says more", entry.bookID));
      all = false;
    }
  }
  return all;
}

std::optional<std::string> fileAmongHelpCaches(const std::string& name) {
  const std::optional<std::string> caches = platform::Environment::current()->cachesDirectory;
  return caches ? std::optional(stringByAppendingPathComponent(
                      stringByAppendingPathComponent(*caches, ZEBDaemonBundleID), name))
                : std::nullopt;
}

}  // namespace

void forgetKnownIndices() {
  const auto environment = platform::Environment::current();
  const auto known = fileAmongHelpCaches(ZEBKnownIndicesFileName);
  const auto marker = fileAmongHelpCaches(markerName);
  if (!known || !marker) {
    return;
  }
  if (environment->files->fileExistsAtPath(*known)) {
    (void)environment->files->removeItem(*known);
  }
  (void)environment->files->createDirectoryWithParents(
      platform::stringByDeletingLastPathComponent(*marker));
  (void)environment->files->writeAtomically(*marker, {});
}

void forgetKnownIndicesWhenDue(const std::vector<CatalogueEntry>& entries) {
  const bool concernsAny =
      std::any_of(entries.begin(), entries.end(), [](const CatalogueEntry& entry) {
        return entry.type == ZEBHelpBookType3 || entry.type == ZEBHelpBookType4;
      });
  const auto marker = fileAmongHelpCaches(markerName);
  if (!concernsAny || !marker) {
    return;
  }
  const auto environment = platform::Environment::current();
  const auto last = environment->files->modificationDate(*marker);
  const auto now = environment->clock->now();
  // A date to come is no date: clocks are set back.
  if (!last || *last > now || now - *last >= refreshInterval) {
    forgetKnownIndices();
  }
}

void followLanguages(const Catalogue& catalogue, std::vector<CatalogueEntry>& entries) {
  std::vector<CatalogueEntry> changed;
  for (CatalogueEntry& entry : entries) {
    const auto book = entry.isRemote() ? zebd::bookOfEntry(entry) : nullptr;
    if (book == nullptr || book->localization() == entry.language) {
      continue;
    }
    entry.language = book->localization();
    const std::optional<platform::URL> pages = book->remoteURL();
    entry.pagesURL = pages ? std::optional(pages->absoluteString()) : std::nullopt;
    changed.push_back(entry);
  }
  if (changed.empty()) {
    return;
  }
  forgetKnownIndices();
  // Whoever has the catalogue to himself may be removing one of them; the next time will do.
  if (const auto lock = platform::FileLock::tryLock(lockPathOfCatalogue(catalogue))) {
    for (const CatalogueEntry& entry : changed) {
      if (catalogue.entry(entry.bookID)) {
        (void)catalogue.store(entry);
      }
    }
  }
}

std::optional<std::string> problemOfCatalogue(const std::string& url, const Waiting& waiting) {
  const auto address = platform::URL::URLWithString(url);
  if (!address) {
    return "its address is none";
  }
  const auto answer = askForCatalogue(*address, waiting);
  return answer->catalogue() == nullptr ? std::optional(answer->reason()) : std::nullopt;
}

ExitCode addBooks(const AddCommand& command, const Catalogue& catalogue,
                  const Installation& installation, const Waiting& waiting, Console& console) {
  const std::optional<platform::URL> url = addressOfCatalogue(command.url);
  if (!url) {
    console.error(fmt::format("\"{}\" is no address of a web server", command.url));
    return ExitCode::usage;
  }
  const auto published = loadCatalogue(*url, waiting, console);
  if (published == nullptr) {
    return ExitCode::failure;
  }
  const auto lock = lockCatalogue(catalogue, console);
  const auto chosen = chosenEntries(*published, command, console);
  std::vector<CatalogueEntry> entries;
  for (const RNXCatalogueEntry* book : chosen) {
    std::optional<CatalogueEntry> entry = entryToStore(*book, *url, command, catalogue, console);
    if (!entry) {
      continue;
    }
    if (const auto error = catalogue.store(*entry)) {
      console.error(fmt::format("{}: {}", entry->bookID, error->description));
      continue;
    }
    console.out() << fmt::format(
        "{}  {}{}\n", console.styled(Style::book, singleLine(entry->bookID)),
        entry->language.empty() ? "" : entry->language + "  ", singleLine(entry->title));
    entries.push_back(std::move(*entry));
  }
  if (entries.empty()) {
    console.note("nothing was added");
    return ExitCode::failure;
  }
  const bool complete =
      entries.size() == (command.books.empty()
                             ? chosen.size()
                             : std::set(command.books.begin(), command.books.end()).size());
  if (!waiting.waits) {
    return complete ? ExitCode::success : ExitCode::failure;
  }
  const bool fetched = fetchIndexes(entries, installation, waiting, console);
  return complete && fetched ? ExitCode::success : ExitCode::failure;
}

ExitCode removeBooks(const RemoveCommand& command, const Catalogue& catalogue,
                     const Installation& installation, Console& console) {
  const auto lock = lockCatalogue(catalogue, console);
  const std::vector<CatalogueEntry> entries = catalogue.entries();
  std::vector<CatalogueEntry> gone;
  bool succeeded = true;
  for (const std::string& name : command.names) {
    const auto url = addressOfCatalogue(name);
    bool isKnown = false;
    for (const CatalogueEntry& entry : entries) {
      const bool isOfCatalogue =
          url && entry.catalogueURL && *entry.catalogueURL == url->absoluteString();
      if (entry.bookID == name || (isOfCatalogue && entry.isRemote())) {
        gone.push_back(entry);
        isKnown = true;
      } else if (isOfCatalogue) {
        CatalogueEntry unsubscribed = entry;
        unsubscribed.catalogueURL.reset();
        succeeded = !catalogue.store(unsubscribed) && succeeded;
        isKnown = true;
      }
    }
    if (!isKnown) {
      console.error(fmt::format("there is no book \"{}\"; 'zeb books' lists all", name));
      succeeded = false;
    }
  }
  if (gone.empty()) {
    return succeeded ? ExitCode::success : ExitCode::failure;
  }
  platform::Error error;
  const std::unique_ptr<HelpSearch> search = HelpSearch::start(gone, installation, error);
  if (search == nullptr) {
    console.error(error.description);
    return ExitCode::failure;
  }
  std::vector<std::string> bookIDs;
  bookIDs.reserve(gone.size());
  for (const CatalogueEntry& entry : gone) {
    bookIDs.push_back(entry.bookID);
  }
  if (!search->removeIndexes(bookIDs)) {
    console.warning("not all indexes could be removed");
  }
  for (const std::string& bookID : bookIDs) {
    catalogue.remove(bookID);
  }
  return succeeded ? ExitCode::success : ExitCode::failure;
}

size_t refreshRemoteBooks(const Catalogue& catalogue, const Installation& installation,
                          const Waiting& waiting, Console& console) {
  std::vector<CatalogueEntry> concerned = catalogue.entries();
  std::erase_if(concerned, [](const CatalogueEntry& entry) { return !entry.catalogueURL; });
  followLanguages(catalogue, concerned);
  if (!concerned.empty() && waiting.waits) {
    // Installed books go by what is known of their catalogues when the plug-in looks at them.
    for (const CatalogueEntry& entry : concerned) {
      const auto url = platform::URL::URLWithString(*entry.catalogueURL);
      if (url && !entry.isRemote()) {
        (void)askForCatalogue(*url, waiting);
      }
    }
    (void)fetchIndexes(concerned, installation, waiting, console);
  }
  return static_cast<size_t>(
      std::count_if(concerned.begin(), concerned.end(),
                    [](const CatalogueEntry& entry) { return entry.isRemote(); }));
}

}  // namespace zeb
