#include "zeb/BookEditions.h"

#include <memory>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "zebd/BookFolder.h"

namespace zeb {

namespace {

constexpr std::string_view languageFolderExtension = ".lproj";

/// The book as a reader of that language gets it.
std::shared_ptr<ZEBHelpBook> bookInLanguage(const std::string& folder,
                                            const std::string& language) {
  platform::Environment environment = *platform::Environment::current();
  environment.preferredLanguages = {language};
  const platform::EnvironmentOverride override(std::move(environment));
  return ZEBHelpBook::initWithPath(folder);
}

std::vector<std::string> languagesOfBook(const ZEBHelpBook& book) {
  std::vector<std::string> languages;
  const auto files = platform::Environment::current()->files;
  const auto names = files->namesInDirectory(book.resourcesRootPath().value_or(book.path()));
  for (const std::string& name : names.value_or(std::vector<std::string>())) {
    if (name.ends_with(languageFolderExtension)) {
      languages.push_back(name.substr(0, name.size() - languageFolderExtension.size()));
    }
  }
  return languages;
}

std::optional<BookEdition> editionOfBook(const ZEBHelpBook& book) {
  const std::optional<std::string> accessPage = book.accessPagePath();
  if (!accessPage) {
    return std::nullopt;
  }
  BookEdition edition;
  edition.bookID = book.bookID();
  edition.title = book.title();
  edition.language = book.localization();
  edition.pagesFolder = platform::stringByDeletingLastPathComponent(*accessPage);
  edition.exactMatchPath = book.exactMatchPath();
  for (const auto& path : {book.exactMatchPath(), book.suggestionsPath()}) {
    if (path) {
      edition.otherFiles.push_back(*path);
    }
  }
  for (const std::string& path : book.indexPaths()) {
    edition.otherFiles.push_back(path);
  }
  return edition;
}

std::vector<BookEdition> editionsOfBook(const ZEBHelpBook& book, std::string& reason) {
  std::vector<BookEdition> editions;
  const auto add = [&](const ZEBHelpBook& localized) {
    if (auto edition = editionOfBook(localized)) {
      editions.push_back(std::move(*edition));
    }
  };
  if (book.type() == ZEBHelpBookType4) {
    reason = "it is a remote book itself: its pages are not here";
    return {};
  }
  for (const std::string& language : languagesOfBook(book)) {
    const auto localized = bookInLanguage(book.path(), language);
    if (localized != nullptr && localized->localization() == language) {
      add(*localized);
    }
  }
  if (editions.empty()) {
    add(book);
  }
  if (editions.empty()) {
    reason = "it has no page that opens it";
  }
  return editions;
}

}  // namespace

std::vector<BookEdition> editionsOfFolder(const std::string& folder,
                                          const std::optional<std::string>& bookID,
                                          const std::string& language, std::string& reason) {
  const std::optional<zebd::CatalogueEntry> entry =
      zebd::entryForFolder(folder, bookID, language, reason);
  if (!entry) {
    return {};
  }
  if (const std::shared_ptr<ZEBHelpBook> book = ZEBHelpBook::initWithPath(folder)) {
    return editionsOfBook(*book, reason);
  }
  if (!language.empty() && !ZEBHelpBook::isValidBookID(language)) {
    reason = "\"" + language + "\" cannot be a language";
    return {};
  }
  BookEdition edition;
  edition.bookID = entry->bookID;
  edition.title = entry->title;
  edition.language = language;
  edition.pagesFolder = folder;
  return {std::move(edition)};
}

}  // namespace zeb
