#include "zeb/HelpFolders.h"

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

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Strings.h"

namespace zeb {

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

bool isPageName(std::string_view name) {
  static constexpr std::string_view extensions[] = {"html", "htm", "xhtml", "xht", "page"};
  const std::string extension = platform::lowercaseString(platform::pathExtension(name));
  return std::find(std::begin(extensions), std::end(extensions), extension) != std::end(extensions);
}

/// Whether there is a page in the folder or a few levels below.
bool hasPages(const std::string& folder) {
  std::error_code error;
  std::filesystem::recursive_directory_iterator walk(folder, error);
  for (size_t count = 0; !error && walk != std::filesystem::recursive_directory_iterator();
       walk.increment(error)) {
    if (isPageName(walk->path().filename().string())) {
      return true;
    }
    if (++count > 1000) {
      return false;
    }
  }
  return false;
}

using Translations = std::map<std::string, std::map<std::string, std::string>>;

/// Adds each application's folders to `found`, by application and language.
void collectSharedHelp(const std::string& share, Translations& found) {
  const std::string help = stringByAppendingPathComponent(share, "help");
  for (const std::string& language : foldersIn(help)) {
    const std::string folder = stringByAppendingPathComponent(help, language);
    for (const std::string& application : foldersIn(folder)) {
      found[application][language] = stringByAppendingPathComponent(folder, application);
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

}  // namespace

std::vector<HelpFolder> applicationHelpFolders(const std::string& root,
                                               const std::vector<std::string>& fallbacks,
                                               const PassedOver& passedOver) {
  const std::string share = stringByAppendingPathComponent(root, "usr/share");
  Translations found;
  collectSharedHelp(share, found);
  collectOwnHelp(share, found);

  std::vector<HelpFolder> folders;
  for (const auto& [application, translations] : found) {
    std::vector<std::string> languages;
    for (const auto& [language, folder] : translations) {
      if (hasPages(folder)) {
        languages.push_back(language);
      }
    }
    const std::string& anyFolder = translations.begin()->second;
    if (languages.empty()) {
      passedOver(anyFolder, "there are no pages in it");
      continue;
    }
    const std::optional<std::string> language = bestLanguage(languages, fallbacks);
    if (!language) {
      passedOver(anyFolder, "it is in none of the user's languages");
    } else if (!ZEBHelpBook::isValidBookID(application)) {
      passedOver(anyFolder, "its name cannot be a book's identifier");
    } else {
      folders.push_back({application, translations.at(*language), *language});
    }
  }
  return folders;
}

std::vector<HelpFolder> manualFolders(const std::string& root, const PassedOver& passedOver) {
  std::vector<HelpFolder> folders;
  const std::optional<std::string> documents =
      realPath(stringByAppendingPathComponent(root, "usr/share/doc"));
  if (!documents) {
    return folders;
  }
  std::set<std::string> seen;
  std::set<std::string> packages;
  for (const std::string& name : namesIn(*documents)) {
    const std::string packageFolder = stringByAppendingPathComponent(*documents, name);
    for (const char* place : {"html", "manual", ""}) {
      const std::string folder =
          *place == '\0' ? packageFolder : stringByAppendingPathComponent(packageFolder, place);
      if (!isFile(stringByAppendingPathComponent(folder, "index.html"))) {
        continue;
      }
      const std::optional<std::string> real = realPath(folder);
      if (!real || !real->starts_with(*documents + '/')) {
        passedOver(folder, "it is a link to another place");
        continue;
      }
      const std::string package = packageOf(*real, *documents);
      if (seen.contains(*real)) {
        if (*real != folder) {
          passedOver(folder, "it is another name for " + *real);
        }
        continue;
      }
      if (packages.contains(package)) {
        passedOver(folder, "another folder of the package was taken");
        continue;
      }
      const std::string bookID = "doc." + package;
      if (isForDevelopers(package)) {
        passedOver(folder, "the package is for developers");
      } else if (isGeneratedReference(*real)) {
        passedOver(folder, "it is an interface description made by a generator");
      } else if (!ZEBHelpBook::isValidBookID(bookID)) {
        passedOver(folder, "its name cannot be a book's identifier");
      } else {
        folders.push_back({bookID, *real, {}});
        seen.insert(*real);
        packages.insert(package);
      }
    }
  }
  return folders;
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

}  // namespace zeb
