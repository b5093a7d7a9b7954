#include "zeb/RemoteBooks.h"

#include <fmt/format.h>

#include <algorithm>
#include <memory>
#include <ostream>
#include <utility>

#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/RunLoop.h"
#include "platform/ThreadSafety.h"
#include "zeb/HelpSearch.h"
#include "zeb/Indexing.h"
#include "zebd/BookFolder.h"
#include "zebd/Host.h"
#include "zebd/Subscriptions.h"

namespace zeb {

namespace {

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

bool hasIndex(const CatalogueEntry& entry) {
  const auto book = zebd::bookOfEntry(entry);
  return book != nullptr && zebd::indexPathOfBook(*book);
}

/// Fetches what the books need; returns whether all have an index then.
bool fetchIndexes(const std::vector<CatalogueEntry>& entries, const Installation& installation,
                  const Waiting& waiting, Console& console) {
  zebd::forgetKnownIndices();
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

}  // namespace

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
  const std::optional<platform::URL> url = zebd::addressOfCatalogue(command.url);
  if (!url) {
    console.error(fmt::format("\"{}\" is no address of a web server", command.url));
    return ExitCode::usage;
  }
  const auto published = loadCatalogue(*url, waiting, console);
  if (published == nullptr) {
    return ExitCode::failure;
  }
  const auto lock = lockCatalogue(catalogue, console);
  std::vector<zebd::BookFailure> failures;
  const std::vector<CatalogueEntry> entries =
      zebd::subscribe(*published, *url, {command.books, command.languages}, catalogue, failures);
  for (const zebd::BookFailure& failure : failures) {
    console.error(fmt::format("{}: {}", failure.what, failure.reason));
  }
  for (const CatalogueEntry& entry : entries) {
    console.out() << fmt::format(
        "{}  {}{}\n", console.styled(Style::book, singleLine(entry.bookID)),
        entry.language.empty() ? "" : entry.language + "  ", singleLine(entry.title));
  }
  if (entries.empty()) {
    console.note("nothing was added");
    return ExitCode::failure;
  }
  const bool fetched = !waiting.waits || fetchIndexes(entries, installation, waiting, console);
  return fetched && failures.empty() ? ExitCode::success : ExitCode::failure;
}

ExitCode removeBooks(const RemoveCommand& command, const Catalogue& catalogue,
                     const Installation& installation, Console& console) {
  const auto lock = lockCatalogue(catalogue, console);
  std::vector<CatalogueEntry> gone;
  bool succeeded = true;
  for (const std::string& name : command.names) {
    bool wasFound = false;
    for (CatalogueEntry& entry : zebd::unsubscribe(name, catalogue, wasFound)) {
      gone.push_back(std::move(entry));
    }
    if (!wasFound) {
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
    if (const auto problem = catalogue.remove(bookID)) {
      console.error(fmt::format("{}: {}", bookID, problem->description));
      succeeded = false;
    }
  }
  return succeeded ? ExitCode::success : ExitCode::failure;
}

size_t refreshRemoteBooks(const Catalogue& catalogue, const Installation& installation,
                          const Waiting& waiting, Console& console) {
  std::vector<CatalogueEntry> concerned = catalogue.entries();
  std::erase_if(concerned, [](const CatalogueEntry& entry) { return !entry.catalogueURL; });
  zebd::followLanguages(catalogue, concerned);
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
