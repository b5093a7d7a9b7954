#include "zeb/BookExamination.h"

#include <fmt/format.h>

#include <algorithm>
#include <filesystem>
#include <memory>
#include <optional>
#include <set>
#include <system_error>
#include <utility>

#include "bvmake/Check.h"
#include "bvmake/PageReader.h"
#include "bvmake/Report.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "zebd/BookDiscovery.h"
#include "zebd/BookFolder.h"
#include "zebd/HelpFolders.h"
#include "zebd/Languages.h"

namespace zeb {

namespace {

namespace fs = std::filesystem;
using zebd::CatalogueEntry;

constexpr const char* rightsAdvice = "see to it that you may read it";

std::shared_ptr<platform::FileManager> files() { return platform::Environment::current()->files; }

bool isFolder(const std::string& path) {
  bool isDirectory = false;
  return files()->fileExistsAtPath(path, &isDirectory) && isDirectory;
}

std::vector<std::string> preferredLanguages() {
  return platform::Environment::current()->preferredLanguages;
}

/// What cannot be read of a folder of pages.
struct Unreadable {
  size_t count = 0;
  std::string firstPath;
  std::string reason;

  void add(const std::string& path, std::string why) {
    if (count++ == 0) {
      firstPath = path;
      reason = std::move(why);
    }
  }
};

/// Looks at the folder and all below; symbolic links are not followed, as they are not by the tool.
void collectUnreadable(const std::string& folder, Unreadable& unreadable) {
  const auto names = files()->namesInDirectory(folder);
  if (!names) {
    unreadable.add(folder, "the folder cannot be listed");
    return;
  }
  for (const std::string& name : *names) {
    const std::string path = platform::stringByAppendingPathComponent(folder, name);
    std::error_code unknown;
    const fs::file_status status = fs::symlink_status(path, unknown);
    if (fs::is_directory(status)) {
      collectUnreadable(path, unreadable);
    } else if (fs::is_regular_file(status) && bvmake::pageKindOfFileName(name)) {
      platform::Error error;
      if (!files()->contentsMappedAtPath(path, &error)) {
        unreadable.add(path, error.description);
      }
    }
  }
}

/// Keeps what the check cannot read to itself: that is told in other words.
class QuietReport : public bvmake::Report {
 public:
  void error(std::string_view text) override { _error = std::string(text); }
  void warning(std::string_view /*text*/) override {}
  void progress(int /*verbosity*/, std::string_view /*text*/) override {}
  bool wants(int /*verbosity*/) const noexcept override { return false; }

  const std::string& lastError() const { return _error; }

 private:
  std::string _error;
};

/// What is wrong with the help-index file; empty when it is sound.
std::string problemOfIndex(const std::string& path) {
  QuietReport report;
  std::string lines;
  switch (bvmake::check(path, lines, report)) {
    case bvmake::ExitCode::success:
      return {};
    case bvmake::ExitCode::damaged: {
      const auto count = std::count(lines.begin(), lines.end(), '\n') - 1;
      std::string first = lines.substr(0, lines.find('\n'));
      if (first.starts_with(path + ": ")) {
        first.erase(0, path.size() + 2);
      }
      return fmt::format("its index is damaged: {}{}", first,
                         count > 1 ? fmt::format(", and {} more", count - 1) : "");
    }
    default:
      return fmt::format("its index cannot be read: {}", report.lastError());
  }
}

/// The best that a reader of the entry's book may hope for.
std::vector<std::string> languagesWanted(const CatalogueEntry& entry) {
  return zebd::languageFallbacks(entry.languages.empty() ? preferredLanguages() : entry.languages);
}

/// Whether the folder may be what somebody means who names the book: folders are called after
/// applications and packages.
bool mayBeMeant(const std::string& folder, const std::string& bookID) {
  constexpr std::string_view ofManuals = "doc.";
  const std::string name = bookID.starts_with(ofManuals) ? bookID.substr(ofManuals.size()) : bookID;
  const fs::path path(folder);
  return std::any_of(path.begin(), path.end(), [&](const fs::path& component) {
    return component == name || component == bookID;
  });
}

}  // namespace

void BookExamination::_add(std::string name, const CatalogueEntry& entry, std::string path,
                           std::string text, std::string advice) {
  _findings.push_back(
      {std::move(name), entry.bookID, std::move(path), std::move(text), std::move(advice)});
}

void BookExamination::_lookForBooks() {
  zebd::BookDiscovery discovery([this](const std::string& folder, const std::string& reason) {
    _passedOver.push_back({folder, reason});
  });
  discovery.addInstalled(platform::Environment::current()->dataDirectories, preferredLanguages());
  for (const CatalogueEntry& entry : discovery.books()) {
    _there.emplace(entry.bookID, entry);
  }
}

/// Whoever may not look into these sees no book that is in them.
void BookExamination::_examinePlaces() {
  for (const std::string& place :
       zebd::placesOfHelpFolders(platform::Environment::current()->dataDirectories)) {
    if (isFolder(place) && !files()->namesInDirectory(place)) {
      _findings.push_back({"unreadable", std::nullopt, place,
                           "the folder cannot be listed, and books in it are not seen",
                           rightsAdvice});
    }
  }
}

void BookExamination::_examineFolder(const CatalogueEntry& entry) {
  const std::string pages = zebd::pagesFolderOf(entry);
  if (!isFolder(entry.folder) || !isFolder(pages)) {
    _add("gone", entry, isFolder(entry.folder) ? pages : entry.folder,
         "its folder is no longer there", "'zeb scan' forgets it, or finds its new place");
    return;
  }
  if (zebd::bookOfEntry(entry) == nullptr) {
    _add("not-a-book", entry, entry.folder, zebd::noBookReason, "correct its Info.plist");
    return;
  }
  Unreadable unreadable;
  collectUnreadable(pages, unreadable);
  if (unreadable.count > 0) {
    _add(
        "unreadable", entry, unreadable.firstPath,
        fmt::format("{}{}", unreadable.reason,
                    unreadable.count > 1 ? fmt::format(", and {} more", unreadable.count - 1) : ""),
        rightsAdvice);
    return;
  }
  const auto known = _there.find(entry.bookID);
  std::string reason;
  const std::optional<CatalogueEntry> now =
      known != _there.end() && known->second.folder == entry.folder
          ? std::optional(known->second)
          : zebd::entryForFolder(entry.folder, entry.bookID, entry.language, reason,
                                 entry.accessPagePath);
  if (!now) {
    _add(reason == zebd::noPagesReason ? "no-pages" : "not-a-book", entry, entry.folder, reason,
         "install the book again, or forget it: 'zeb remove'");
  } else if (now->fingerprint != entry.fingerprint) {
    _add("old-index", entry, pages, "its pages have changed since they were last looked at",
         "'zeb scan' indexes it again");
  }
}

void BookExamination::_examineLanguage(const CatalogueEntry& entry) {
  const auto now = _there.find(entry.bookID);
  if (!entry.isRemote() && now != _there.end() && now->second.language != entry.language) {
    _add("language", entry, entry.folder,
         fmt::format("it is listed in the language \"{}\", but \"{}\" suits you better",
                     entry.language, now->second.language),
         "'zeb scan' takes the other");
  } else if (!entry.language.empty() &&
             !zebd::bestLanguage({entry.language}, languagesWanted(entry))) {
    _add("language", entry, entry.folder,
         fmt::format("it is in the language \"{}\", which is none of yours", entry.language),
         "install its translation, or add its language to yours (LANGUAGE)");
  }
}

void BookExamination::_examineIndex(const CatalogueEntry& entry) {
  const auto book = zebd::bookOfEntry(entry);
  if (book == nullptr) {
    return;
  }
  const std::optional<std::string> index = zebd::indexPathOfBook(*book);
  if (!index && entry.isRemote()) {
    _add("server", entry, entry.catalogueURL.value_or(""),
         "its index has not been fetched from the server",
         "'zeb scan' tries again; 'zeb doctor --network' asks the server");
  } else if (!index) {
    _add("no-index", entry, entry.folder, "it has no index yet",
         "'zeb scan', or the next search, has it made");
  } else if (std::string problem = problemOfIndex(*index); !problem.empty()) {
    _add("damaged-index", entry, *index, std::move(problem),
         entry.isRemote() ? "remove the file; 'zeb scan' fetches it again"
                          : "'zeb scan --force' makes it again");
  }
}

void BookExamination::_examineEntry(const CatalogueEntry& entry) {
  _progress(entry.bookID);
  ++_count;
  if (!entry.isRemote()) {
    _examineFolder(entry);
  }
  _examineLanguage(entry);
  _examineIndex(entry);
}

void BookExamination::_examineUnlisted(const CatalogueEntry& entry) {
  _add("unlisted", entry, entry.folder, "it is installed, but not on the list of books",
       "'zeb scan' enters it");
}

void BookExamination::_examinePassedOver(const PassedOver& folder) {
  const auto add = [&](const char* name, const char* advice) {
    _findings.push_back({name, std::nullopt, folder.folder, folder.reason, advice});
  };
  if (isFolder(folder.folder) && !files()->namesInDirectory(folder.folder)) {
    _findings.push_back(
        {"unreadable", std::nullopt, folder.folder, "the folder cannot be listed", rightsAdvice});
  } else if (folder.reason == zebd::noLanguageReason) {
    add("language", "install its translation, or add its language to yours (LANGUAGE)");
  } else if (folder.reason == zebd::noPagesReason) {
    add("no-pages", "install the package again that it belongs to");
  } else if (folder.reason == zebd::noBookReason) {
    add("not-a-book", "correct its Info.plist");
  } else if (folder.reason == zebd::noNameReason) {
    add("not-a-book", "rename the folder");
  }
  // All others are left out on purpose.
}

void BookExamination::_examineUnknown(const std::string& bookID) {
  bool isExplained = false;
  for (const PassedOver& folder : _passedOver) {
    if (mayBeMeant(folder.folder, bookID)) {
      _findings.push_back({"passed-over", bookID, folder.folder, folder.reason,
                           "'zeb scan FOLDER' makes any folder of pages a book"});
      isExplained = true;
    }
  }
  if (!isExplained) {
    _findings.push_back({"unknown", bookID, std::nullopt,
                         "there is no such book in any of the places that are looked at",
                         "'zeb books' lists those there are; 'zeb scan FOLDER' adds one"});
  }
}

std::vector<Finding> BookExamination::run(const std::vector<std::string>& bookIDs) {
  _lookForBooks();
  const std::set<std::string> wanted(bookIDs.begin(), bookIDs.end());
  const auto isWanted = [&wanted](const std::string& bookID) {
    return wanted.empty() || wanted.contains(bookID);
  };
  std::set<std::string> explained;
  std::set<std::string> folders;
  for (const CatalogueEntry& entry : _catalogue.entries()) {
    explained.insert(entry.bookID);
    folders.insert(entry.folder);
    if (isWanted(entry.bookID)) {
      _examineEntry(entry);
    }
  }
  for (const auto& [bookID, entry] : _there) {
    if (explained.insert(bookID).second && isWanted(bookID)) {
      _examineUnlisted(entry);
    }
  }
  if (wanted.empty()) {
    _examinePlaces();
    for (const PassedOver& folder : _passedOver) {
      if (!folders.contains(folder.folder)) {
        _examinePassedOver(folder);
      }
    }
  }
  for (const std::string& bookID : wanted) {
    if (!explained.contains(bookID)) {
      _examineUnknown(bookID);
    }
  }
  return std::move(_findings);
}

}  // namespace zeb
