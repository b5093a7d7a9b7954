#include "zebd/HelpFolders.h"

#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string_view>
#include <system_error>

#include "bvmake/PageReader.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Strings.h"

namespace zebd {

namespace {

using platform::stringByAppendingPathComponent;

/// No folder of help that is worth searching has more files; beyond them nothing is looked at.
constexpr size_t maximumFileCount = 200'000;

std::vector<std::string> namesIn(const std::string& folder) {
  return platform::Environment::current()->files->namesInDirectory(folder).value_or(
      std::vector<std::string>());
}

bool isFolder(const std::string& path) {
  bool isDirectory = false;
  return platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) &&
         isDirectory;
}

bool isFile(const std::string& path) {
  bool isDirectory = false;
  return platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) &&
         !isDirectory;
}

std::vector<std::string> foldersIn(const std::string& folder) {
  std::vector<std::string> names = namesIn(folder);
  std::erase_if(names, [&folder](const std::string& name) {
    return !isFolder(stringByAppendingPathComponent(folder, name));
  });
  return names;
}

/// The path without symbolic links; absent when it leads nowhere.
std::optional<std::string> realPath(const std::string& path) {
  std::error_code error;
  const std::filesystem::path real = std::filesystem::canonical(path, error);
  if (error) {
    return std::nullopt;
  }
  return real.string();
}

using Translations = std::map<std::string, std::map<std::string, std::string>>;

/// Adds each application's folders to `found`, by application and language; those found first stay.
void collectSharedHelp(const std::string& share, Translations& found) {
  const std::string help = stringByAppendingPathComponent(share, "help");
  for (const std::string& language : foldersIn(help)) {
    const std::string folder = stringByAppendingPathComponent(help, language);
    for (const std::string& application : foldersIn(folder)) {
      found[application].emplace(language, stringByAppendingPathComponent(folder, application));
    }
  }
}

void collectOwnHelp(const std::string& share, Translations& found) {
  for (const std::string& application : namesIn(share)) {
    const std::string help =
        stringByAppendingPathComponent(stringByAppendingPathComponent(share, application), "help");
    if (application == "help" || application == "doc" || !isFolder(help)) {
      continue;
    }
    for (const std::string& language : foldersIn(help)) {
      found[application].emplace(language, stringByAppendingPathComponent(help, language));
    }
  }
}

bool isForDevelopers(std::string_view package) {
  return package.ends_with("-dev") || package.starts_with("libjs-") || package.starts_with("node-");
}

/// Files that generators of interface descriptions leave beside their pages.
bool isGeneratedReference(const std::string& folder) {
  static constexpr std::string_view marks[] = {"doxygen.css",  "doxygen.svg",
                                               "doxygen.png",  "allclasses-index.html",
                                               "element-list", "package-list"};
  return std::any_of(std::begin(marks), std::end(marks), [&folder](std::string_view mark) {
    return isFile(stringByAppendingPathComponent(folder, mark));
  });
}

/// The package that a folder below `documents` belongs to: the first component.
std::string packageOf(const std::string& folder, const std::string& documents) {
  const std::string_view rest = std::string_view(folder).substr(documents.size() + 1);
  return std::string(rest.substr(0, rest.find('/')));
}

/// What the registry of documents says of one.
struct RegisteredManual {
  std::string name;
  std::string indexPage;
};

/// The value of a line "Name: value", names of either case; absent for other lines.
std::optional<std::string> fieldValue(std::string_view line, std::string_view name) {
  if (line.size() <= name.size() || line[name.size()] != ':' ||
      platform::lowercaseString(line.substr(0, name.size())) != platform::lowercaseString(name)) {
    return std::nullopt;
  }
  line.remove_prefix(name.size() + 1);
  const size_t begin = line.find_first_not_of(" \t");
  const size_t end = line.find_last_not_of(" \t\r");
  return begin == std::string_view::npos ? std::string()
                                         : std::string(line.substr(begin, end + 1 - begin));
}

/// Absent for a document without web pages, and for a file that is no registration.
std::optional<RegisteredManual> registeredManual(std::string_view text) {
  RegisteredManual manual;
  bool isHTML = false;
  while (!text.empty()) {
    const size_t end = std::min(text.find('\n'), text.size());
    const std::string_view line = text.substr(0, end);
    text.remove_prefix(std::min(end + 1, text.size()));
    if (const auto name = fieldValue(line, "Document")) {
      manual.name = *name;
    } else if (const auto format = fieldValue(line, "Format")) {
      isHTML = platform::lowercaseString(*format) == "html";
    } else if (const auto page = fieldValue(line, "Index"); page && isHTML) {
      manual.indexPage = *page;
      break;
    }
  }
  return manual.name.empty() || manual.indexPage.empty() ? std::nullopt : std::optional(manual);
}

/// The manuals of one data folder.
class Manuals {
 public:
  Manuals(const std::string& dataFolder, std::string documents, const PassedOver& passedOver,
          std::vector<HelpFolder>& found)
      : _dataFolder(dataFolder),
        _documents(std::move(documents)),
        _passedOver(passedOver),
        _found(found) {}

  void addFolders();
  void addRegistered();

 private:
  void _addFolder(const std::string& folder, const std::string& accessPage);

  const std::string& _dataFolder;
  const std::string _documents;
  const PassedOver& _passedOver;
  std::vector<HelpFolder>& _found;
  std::set<std::string> _seen;
  std::set<std::string> _packages;
};

void Manuals::_addFolder(const std::string& folder, const std::string& accessPage) {
  const std::optional<std::string> real = realPath(folder);
  if (!real || !real->starts_with(_documents + '/')) {
    _passedOver(folder, "it is a link to another place");
    return;
  }
  if (_seen.contains(*real)) {
    if (*real != folder) {
      _passedOver(folder, "it is another name for " + *real);
    }
    return;
  }
  const std::string package = packageOf(*real, _documents);
  const std::string bookID = "doc." + package;
  if (_packages.contains(package)) {
    _passedOver(folder, "another folder of the package was taken");
  } else if (isForDevelopers(package)) {
    _passedOver(folder, "the package is for developers");
  } else if (isGeneratedReference(*real)) {
    _passedOver(folder, "it is an interface description made by a generator");
  } else if (!ZEBHelpBook::isValidBookID(bookID)) {
    _passedOver(folder, noNameReason);
  } else {
    _found.push_back({bookID, *real, {}, accessPage});
    _seen.insert(*real);
    _packages.insert(package);
  }
}

void Manuals::addFolders() {
  for (const std::string& name : namesIn(_documents)) {
    const std::string packageFolder = stringByAppendingPathComponent(_documents, name);
    for (const char* place : {"html", "manual", ""}) {
      const std::string folder =
          *place == '\0' ? packageFolder : stringByAppendingPathComponent(packageFolder, place);
      if (isFile(stringByAppendingPathComponent(folder, "index.html"))) {
        _addFolder(folder, {});
      }
    }
  }
}

void Manuals::addRegistered() {
  const auto files = platform::Environment::current()->files;
  const std::string registry = stringByAppendingPathComponent(_dataFolder, "doc-base");
  const std::string shownDocuments = stringByAppendingPathComponent(_dataFolder, "doc") + '/';
  for (const std::string& name : namesIn(registry)) {
    const std::string path = stringByAppendingPathComponent(registry, name);
    const auto text = files->contentsAtPath(path);
    const auto manual = text ? registeredManual(text->view()) : std::nullopt;
    if (!manual) {
      continue;
    }
    // Registrations name places of the running system; here that may be below another root.
    constexpr std::string_view usual = "/usr/share/doc/";
    std::string page = platform::stringByStandardizingPath(manual->indexPage);
    if (page.starts_with(usual)) {
      page.replace(0, usual.size(), shownDocuments);
    }
    if (!page.starts_with(shownDocuments) || !isFile(page)) {
      _passedOver(path, "the page that it names is not there");
      continue;
    }
    _addFolder(platform::stringByDeletingLastPathComponent(page), page);
  }
}

}  // namespace

bool holdsPages(const std::string& folder) {
  std::error_code error;
  const auto options = std::filesystem::directory_options::skip_permission_denied;
  std::filesystem::recursive_directory_iterator walk(folder, options, error);
  for (size_t count = 0; !error && walk != std::filesystem::recursive_directory_iterator() &&
                         count < maximumFileCount;
       walk.increment(error), ++count) {
    if (bvmake::pageKindOfFileName(walk->path().filename().native())) {
      return true;
    }
  }
  return false;
}

std::vector<HelpFolder> applicationHelpFolders(const std::vector<std::string>& dataFolders,
                                               const std::vector<std::string>& fallbacks,
                                               const PassedOver& passedOver) {
  Translations found;
  for (const std::string& share : dataFolders) {
    collectSharedHelp(share, found);
    collectOwnHelp(share, found);
  }

  std::vector<HelpFolder> folders;
  for (const auto& [application, translations] : found) {
    std::vector<std::string> languages;
    for (const auto& [language, folder] : translations) {
      if (holdsPages(folder)) {
        languages.push_back(language);
      }
    }
    const std::string& anyFolder = translations.begin()->second;
    if (languages.empty()) {
      passedOver(anyFolder, noPagesReason);
      continue;
    }
    const std::optional<std::string> language = bestLanguage(languages, fallbacks);
    if (!language) {
      passedOver(anyFolder, noLanguageReason);
    } else if (!ZEBHelpBook::isValidBookID(application)) {
      passedOver(anyFolder, noNameReason);
    } else {
      folders.push_back({application, translations.at(*language), *language, {}});
    }
  }
  return folders;
}

std::vector<HelpFolder> manualFolders(const std::vector<std::string>& dataFolders,
                                      const PassedOver& passedOver) {
  std::vector<HelpFolder> folders;
  for (const std::string& dataFolder : dataFolders) {
    if (auto documents = realPath(stringByAppendingPathComponent(dataFolder, "doc"))) {
      Manuals manuals(dataFolder, std::move(*documents), passedOver, folders);
      manuals.addFolders();
      manuals.addRegistered();
    }
  }
  return folders;
}

std::vector<HelpFolder> bookFolders(const std::vector<std::string>& dataFolders) {
  std::vector<HelpFolder> folders;
  for (const std::string& dataFolder : dataFolders) {
    const std::string books = stringByAppendingPathComponent(dataFolder, "zeb/books");
    for (const std::string& name : foldersIn(books)) {
      const std::string folder = stringByAppendingPathComponent(books, name);
      if (isFile(stringByAppendingPathComponent(folder, "Info.plist"))) {
        folders.push_back({{}, folder, {}, {}});
      }
    }
  }
  return folders;
}

std::vector<std::string> placesOfHelpFolders(const std::vector<std::string>& dataFolders) {
  std::vector<std::string> places;
  for (const std::string& dataFolder : dataFolders) {
    for (const char* name : {"help", "doc", "doc-base", "zeb/books"}) {
      places.push_back(stringByAppendingPathComponent(dataFolder, name));
    }
    for (const std::string& language :
         foldersIn(stringByAppendingPathComponent(dataFolder, "help"))) {
      places.push_back(stringByAppendingPathComponent(
          stringByAppendingPathComponent(dataFolder, "help"), language));
    }
  }
  return places;
}

std::string folderFingerprint(const std::string& folder) {
  const auto files = platform::Environment::current()->files;
  const std::string indexExtension = '.' + ZEBHelpindexExtension;
  std::vector<std::string> paths;
  std::error_code error;
  std::filesystem::recursive_directory_iterator walk(
      folder, std::filesystem::directory_options::skip_permission_denied, error);
  while (!error && walk != std::filesystem::recursive_directory_iterator() &&
         paths.size() < maximumFileCount) {
    // An index written into the folder is none of its contents, and would change it each time.
    if (!walk->is_directory(error) && walk->path().extension() != indexExtension) {
      paths.push_back(walk->path().string());
    }
    walk.increment(error);
  }
  std::sort(paths.begin(), paths.end());

  // FNV-1a, 64 bits: <http://www.isthe.com/chongo/tech/comp/fnv/>.
  uint64_t hash = 0xcbf29ce484222325;
  const auto mix = [&hash](std::string_view bytes) {
    for (const char c : bytes) {
      hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3;
    }
  };
  for (const std::string& path : paths) {
    mix(std::string_view(path).substr(folder.size()));
    const auto date = files->modificationDate(path);
    const int64_t ticks = date ? date->time_since_epoch().count() : 0;
    mix(fmt::format("\n{}\n", ticks));
  }
  return fmt::format("{}:{:016x}", paths.size(), hash);
}

}  // namespace zebd
