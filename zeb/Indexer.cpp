#include "zeb/Indexer.h"

#include <fmt/format.h>

#include <string_view>

#include "SearchKit/SearchKit.h"
#include "bvmake/Report.h"
#include "bvmake/Run.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Strings.h"
#include "platform/URL.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "zeb/HelpFolders.h"

namespace zeb {

namespace {

/// Words of fewer letters are on nearly every page.
constexpr size_t minimumTermLength = 3;

/// Part of every fingerprint: raised when indexes made so far should be made again although their
/// pages are the same.
constexpr int recipe = 1;

constexpr const char* informationListName = "Info.plist";

class CollectingReport : public bvmake::Report {
 public:
  explicit CollectingReport(IndexingOutcome& outcome) : _outcome(outcome) {}

  void error(std::string_view text) override { _outcome.errors.emplace_back(text); }
  void warning(std::string_view text) override { _outcome.warnings.emplace_back(text); }
  void progress(int, std::string_view) override {}
  bool wants(int) const noexcept override { return false; }

 private:
  IndexingOutcome& _outcome;
};

bool isFile(const std::string& path) {
  bool isDirectory = false;
  return platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) &&
         !isDirectory;
}

/// The page that opens a folder which does not say. It need not exist: what counts is its folder.
std::string accessPageIn(const std::string& folder) {
  for (const char* name : {"index.html", "index.page", "index.xhtml", "index.htm"}) {
    std::string path = platform::stringByAppendingPathComponent(folder, name);
    if (isFile(path)) {
      return path;
    }
  }
  return platform::stringByAppendingPathComponent(folder, "index.html");
}

/// The title of the access page as the index has it.
std::optional<std::string> titleFromIndex(const CatalogueEntry& entry) {
  const auto record = ZEBHelpindexIndex::initWithPath(entry.indexPath);
  SKIndexRef index = record == nullptr ? nullptr : record->copyIndexRef();
  if (index == nullptr) {
    return std::nullopt;
  }
  std::optional<std::string> title;
  const std::string path = "/" + platform::lastPathComponent(entry.accessPagePath);
  if (const SKDocumentRef page = SKDocumentCreateWithURL(platform::URL::fileURLWithPath(path))) {
    if (const auto properties = SKIndexCopyDocumentProperties(index, *page)) {
      title = (*properties)["T"].stringValue();
    }
  }
  record->disposeIndexRef(index);
  return title && !title->empty() ? title : std::nullopt;
}

bool isReadableIndex(const std::string& path) {
  const auto record = ZEBHelpindexIndex::initWithPath(path);
  if (record == nullptr) {
    return false;
  }
  SKIndexRef index = record->copyIndexRef();
  const bool isReadable = index != nullptr;
  if (isReadable) {
    record->disposeIndexRef(index);
  }
  return isReadable;
}

/// Whether what the catalogue has is what indexing would give once more.
bool isUnchanged(const CatalogueEntry& earlier, const CatalogueEntry& now, bool isUntitled) {
  CatalogueEntry expected = now;
  expected.pageCount = earlier.pageCount;
  if (isUntitled) {
    expected.title = earlier.title;
  }
  return earlier == expected && isReadableIndex(now.indexPath);
}

}  // namespace

std::optional<BookFolder> bookInFolder(const std::string& folder, const Catalogue& catalogue,
                                       const std::optional<std::string>& bookID,
                                       const std::string& language, std::string& reason) {
  bool isDirectory = false;
  if (!platform::Environment::current()->files->fileExistsAtPath(folder, &isDirectory) ||
      !isDirectory) {
    reason = "there is no such folder";
    return std::nullopt;
  }
  BookFolder book;
  CatalogueEntry& entry = book.entry;
  entry.folder = folder;
  if (const std::shared_ptr<ZEBHelpBook> described = ZEBHelpBook::initWithPath(folder)) {
    entry.bookID = described->bookID();
    entry.title = described->title();
    entry.type = described->type();
    entry.language = described->localization();
    entry.accessPagePath = described->accessPagePath().value_or(accessPageIn(folder));
    if (const auto indexPaths = described->indexPaths();
        !indexPaths.empty() && isReadableIndex(indexPaths.front())) {
      entry.indexPath = indexPaths.front();
      entry.indexIsShipped = true;
    }
  } else if (isFile(platform::stringByAppendingPathComponent(folder, informationListName))) {
    reason = "its information list does not describe a book";
    return std::nullopt;
  } else {
    entry.bookID =
        bookID.value_or(platform::stringByRepairingUTF8(platform::lastPathComponent(folder)));
    if (!ZEBHelpBook::isValidBookID(entry.bookID)) {
      reason = fmt::format("\"{}\" cannot be the identifier of a book", entry.bookID);
      return std::nullopt;
    }
    entry.title = entry.bookID;
    entry.language = language;
    entry.accessPagePath = accessPageIn(folder);
    book.isUntitled = true;
  }
  if (entry.indexPath.empty()) {
    entry.indexPath = catalogue.indexPathForBookID(entry.bookID);
  }
  book.pagesFolder = platform::stringByDeletingLastPathComponent(entry.accessPagePath);
  return book;
}

IndexingOutcome indexBook(const BookFolder& book, const Catalogue& catalogue,
                          bool evenIfUnchanged) {
  const auto environment = platform::Environment::current();
  const auto start = environment->clock->elapsed();
  IndexingOutcome outcome;
  CatalogueEntry entry = book.entry;
  // Taken before the pages are read: a page that changes meanwhile is noticed next time.
  entry.fingerprint = fmt::format("{}:{}", recipe, folderFingerprint(book.pagesFolder));

  const std::optional<CatalogueEntry> earlier = catalogue.entry(entry.bookID);
  const auto finish = [&](IndexingOutcome::Kind kind) {
    outcome.kind = kind;
    outcome.bookID = entry.bookID;
    outcome.title = entry.title;
    outcome.language = entry.language;
    outcome.pageCount = entry.pageCount;
    outcome.seconds = (environment->clock->elapsed() - start).count();
    return outcome;
  };
  if (earlier && !evenIfUnchanged && isUnchanged(*earlier, entry, book.isUntitled)) {
    entry = *earlier;
    return finish(IndexingOutcome::Kind::unchanged);
  }

  if (!entry.indexIsShipped) {
    bvmake::CreateOptions options;
    options.folder = book.pagesFolder;
    options.outputPath = entry.indexPath;
    options.anchors = true;
    options.generateSummaries = true;
    options.minimumTermLength = minimumTermLength;
    CollectingReport report(outcome);
    const bvmake::Outcome made = bvmake::run(options, report);
    entry.pageCount = made.pageCount;
    if (made.exitCode != bvmake::ExitCode::success) {
      return finish(IndexingOutcome::Kind::failed);
    }
    if (made.pageCount == 0) {
      catalogue.remove(entry);
      return finish(IndexingOutcome::Kind::empty);
    }
  }
  if (book.isUntitled) {
    entry.title = titleFromIndex(entry).value_or(entry.title);
  }
  if (const auto error = catalogue.store(entry)) {
    outcome.errors.push_back(error->description);
    return finish(IndexingOutcome::Kind::failed);
  }
  return finish(IndexingOutcome::Kind::indexed);
}

}  // namespace zeb
