#include "zeb/Publishing.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <ostream>
#include <set>
#include <system_error>

#include "bvmake/Report.h"
#include "bvmake/Run.h"
#include "bvmake/SemanticData.h"
#include "host/Zebrine/ZEBConstants.h"
#include "platform/Digest.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/PropertyList.h"
#include "zeb/BookEditions.h"
#include "zeb/Console.h"
#include "zeb/SiteFolder.h"

namespace zeb {

namespace {

constexpr const char* catalogueName = "catalogue.json";
constexpr const char* booksFolderName = "books";
/// Of the edition of a book that has no languages.
constexpr const char* defaultLanguageName = "default";
constexpr const char* pagesFolderName = "pages";
constexpr const char* informationListName = "Info.plist";
/// Digests are cut to this for names of files and editions: enough to be different.
constexpr size_t nameLength = 16;
constexpr size_t minimumTermLength = 3;

/// Any URL: what is relative to it is kept as it is spelled.
platform::URL nominalURL() {
  return *platform::URL::URLWithString("https://localhost/catalogue.json");
}

/// The indexing tool's messages as this program's.
class ConsoleReport : public bvmake::Report {
 public:
  explicit ConsoleReport(Console& console) : _console(console) {}
  void error(std::string_view text) override { _console.error(text); }
  void warning(std::string_view text) override { _console.warning(text); }
  void progress(int /*verbosity*/, std::string_view /*text*/) override {}
  bool wants(int /*verbosity*/) const noexcept override { return false; }

 private:
  Console& _console;
};

/// A folder for one file, gone with the object.
class ScratchFolder {
 public:
  ScratchFolder() {
    std::string pattern = (std::filesystem::temp_directory_path() / "zeb-publish-XXXXXX").string();
    _path = ::mkdtemp(pattern.data()) == nullptr ? "" : pattern;
  }
  ~ScratchFolder() {
    std::error_code ignored;
    if (!_path.empty()) {
      std::filesystem::remove_all(_path, ignored);
    }
  }
  ScratchFolder(const ScratchFolder&) = delete;
  ScratchFolder& operator=(const ScratchFolder&) = delete;

  const std::string& path() const { return _path; }

 private:
  std::string _path;
};

/// A path below the site as a relative URL. A '%' in a name is no escape.
platform::URL relativeURL(const std::string& path) {
  std::string escaped;
  for (const char c : path) {
    escaped += c == '%' ? "%25" : std::string(1, c);
  }
  return *platform::URL::URLWithString(platform::stringByEscapingPath(escaped));
}

std::string editionFolder(const std::string& bookID, const std::string& language) {
  return fmt::format("{}/{}/{}", booksFolderName, bookID,
                     language.empty() ? defaultLanguageName : language);
}

bool isPageFile(const BookEdition& edition, const std::string& path) {
  const std::string name = platform::lastPathComponent(path);
  return name != informationListName && platform::pathExtension(name) != ZEBHelpindexExtension &&
         std::find(edition.otherFiles.begin(), edition.otherFiles.end(), path) ==
             edition.otherFiles.end();
}

/// The names, within an edition's folder, of the files that an entry names.
std::set<std::string> namedFiles(const RNXCatalogueEntry& entry) {
  std::set<std::string> names;
  for (const auto& asset : {entry.searchIndex, entry.exactMatch}) {
    if (asset) {
      names.insert(asset->url.lastPathComponent());
    }
  }
  return names;
}

}  // namespace

bool Publishing::_fail(const std::string& what, const std::string& reason) {
  _console.error(fmt::format("{}: {}", what, reason));
  return false;
}

bool Publishing::_readCatalogue(RNXCatalogue& catalogue) {
  const auto files = platform::Environment::current()->files;
  const std::string path = platform::stringByAppendingPathComponent(_site, catalogueName);
  if (!files->fileExistsAtPath(path)) {
    return true;
  }
  platform::Error error;
  const auto bytes = files->contentsMappedAtPath(path, &error);
  auto read = bytes ? RNXCatalogue::catalogueWithData(*bytes, nominalURL(), &error) : std::nullopt;
  if (!read) {
    // Books of others may be in it: it is not for us to replace.
    return _fail(path, error.description);
  }
  catalogue = std::move(*read);
  return true;
}

std::optional<platform::Data> Publishing::_index(const BookEdition& edition,
                                                 const std::string& pages, size_t& pageCount) {
  const ScratchFolder scratch;
  if (scratch.path().empty()) {
    _fail(edition.bookID, "there is no folder for temporary files");
    return std::nullopt;
  }
  bvmake::CreateOptions options;
  options.folder = pages;
  options.outputPath = scratch.path() + "/book." + ZEBHelpindexExtension;
  options.anchors = true;
  options.generateSummaries = true;
  options.minimumTermLength = minimumTermLength;
  if (bvmake::isLanguage(edition.language)) {
    options.language = edition.language;
  }
  ConsoleReport report(_console);
  const bvmake::Outcome outcome = bvmake::run(options, report);
  if (outcome.exitCode != bvmake::ExitCode::success) {
    return std::nullopt;
  }
  if (outcome.pageCount == 0) {
    _fail(edition.bookID, "there are no pages in it");
    return std::nullopt;
  }
  pageCount = outcome.pageCount;
  return platform::Environment::current()->files->contentsAtPath(options.outputPath);
}

/// An edition whose files are on the site.
struct Publishing::Published {
  RNXCatalogueEntry entry;
  SiteFolder folder;
  size_t pageCount = 0;
  size_t searchByteCount = 0;
};

bool Publishing::_publishEdition(const BookEdition& edition, std::vector<Published>& published) {
  const std::string name = editionFolder(edition.bookID, edition.language);
  Published made{{}, SiteFolder(platform::stringByAppendingPathComponent(_site, name))};
  const auto failed = [&](const platform::Error& error) {
    return _fail(edition.bookID, error.description);
  };
  if (const auto error = made.folder.copyTree(
          edition.pagesFolder, pagesFolderName,
          [&](const std::string& path) { return isPageFile(edition, path); })) {
    return failed(*error);
  }
  made.entry.identifier = edition.bookID;
  made.entry.title = edition.title;
  if (!edition.language.empty()) {
    made.entry.locale = edition.language;
  }
  made.entry.pages = relativeURL(name + "/" + pagesFolderName + "/");
  const auto add = [&](std::optional<RNXAsset>& asset, const platform::Data& bytes,
                       const std::string& extension) {
    const std::string digest = platform::sha256Digest(bytes.view());
    const std::string file = digest.substr(0, nameLength) + "." + extension;
    asset = RNXAsset{relativeURL(name + "/" + file), digest};
    made.searchByteCount += bytes.length();
    return made.folder.write(file, bytes);
  };
  const auto index = _index(edition, made.folder.path(pagesFolderName), made.pageCount);
  if (!index) {
    return false;
  }
  if (const auto error = add(made.entry.searchIndex, *index, ZEBHelpindexExtension)) {
    return failed(*error);
  }
  if (edition.exactMatchPath) {
    platform::Error error;
    const auto list =
        platform::Environment::current()->files->contentsAtPath(*edition.exactMatchPath, &error);
    if (!list) {
      return failed(error);
    }
    if (const auto parsed = platform::propertyListFromData(*list);
        !parsed || parsed->dictionaryIf() == nullptr) {
      return _fail(*edition.exactMatchPath, "is no exact-match list");
    }
    if (const auto failure = add(made.entry.exactMatch, *list, ZEBExactMatchListExtension)) {
      return failed(*failure);
    }
  }
  made.entry.version = made.folder.digest().substr(0, nameLength);
  published.push_back(std::move(made));
  return true;
}

bool Publishing::_replaceCatalogue(const RNXCatalogue& former, std::vector<Published>& published) {
  const std::string& bookID = published.front().entry.identifier;
  RNXCatalogue catalogue;
  std::map<std::string, std::set<std::string>> formerFiles;
  for (const RNXCatalogueEntry& entry : former.books) {
    if (entry.identifier != bookID) {
      catalogue.books.push_back(entry);
    } else {
      formerFiles[editionFolder(bookID, entry.locale.value_or(""))] = namedFiles(entry);
    }
  }
  for (const Published& edition : published) {
    catalogue.books.push_back(edition.entry);
  }
  SiteFolder site(_site);
  if (const auto error = site.write(catalogueName, platform::Data::copy(catalogue.text()))) {
    return _fail(_site, error->description);
  }
  if (site.changeCount() == 0) {
    // Whatever is left over was to stay.
    return true;
  }
  for (Published& edition : published) {
    const auto kept = formerFiles.extract(editionFolder(bookID, edition.entry.locale.value_or("")));
    edition.folder.removeOthers(
        [&](const std::string& name) { return !kept.empty() && kept.mapped().contains(name); });
  }
  // What is left are languages that the book no longer has.
  for (const auto& entry : formerFiles) {
    (void)platform::Environment::current()->files->removeItem(
        platform::stringByAppendingPathComponent(_site, entry.first));
  }
  return true;
}

bool Publishing::publish(const std::string& folder, const std::optional<std::string>& bookID,
                         const std::string& language) {
  std::string reason;
  const std::vector<BookEdition> editions = editionsOfFolder(folder, bookID, language, reason);
  if (editions.empty()) {
    return _fail(folder, reason);
  }
  RNXCatalogue former;
  if (!_readCatalogue(former)) {
    return false;
  }
  std::vector<Published> published;
  for (const BookEdition& edition : editions) {
    if (!_publishEdition(edition, published)) {
      return false;
    }
  }
  if (!_replaceCatalogue(former, published)) {
    return false;
  }
  for (const Published& edition : published) {
    const size_t changes = edition.folder.changeCount();
    _console.out() << fmt::format(
        "{}{}  {} pages, {} files, {} bytes, of these {} for searching; {}\n",
        _console.styled(Style::book, singleLine(edition.entry.identifier)),
        edition.entry.locale ? "  " + singleLine(*edition.entry.locale) : "", edition.pageCount,
        edition.folder.fileCount(), edition.folder.byteCount(), edition.searchByteCount,
        changes == 0 ? "nothing to change" : fmt::format("{} changes", changes));
  }
  return true;
}

}  // namespace zeb
