// Reads book folders; the format is described in docs/formats/help-book.md.
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLocalization.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Environment.h"
#include "platform/PropertyList.h"

namespace {

constexpr const char* informationListName = "Info.plist";
constexpr const char* resourcesFolderName = "Resources";
constexpr const char* languageFolderExtension = ".lproj";
constexpr const char* defaultAccessPage = "index.html";
constexpr size_t maximumInformationListLength = size_t{1} << 20U;

constexpr const char* identifierKey = "ZEBBookIdentifier";
constexpr const char* typeKey = "ZEBBookType";
constexpr const char* titleKey = "ZEBBookTitle";
constexpr const char* developmentLanguageKey = "ZEBBookDevelopmentLanguage";
constexpr const char* accessPageKey = "ZEBBookAccessPage";
constexpr const char* indexFilesKey = "ZEBBookIndexFiles";
constexpr const char* exactMatchFileKey = "ZEBBookExactMatchFile";
constexpr const char* suggestionsFileKey = "ZEBBookSuggestionsFile";
constexpr const char* remoteRootKey = "ZEBBookRemoteRoot";
constexpr const char* catalogueKey = "ZEBBookCatalogue";
constexpr const char* usesExternalViewerKey = "ZEBBookUsesExternalViewer";
constexpr const char* appIdentifierKey = "ZEBBookAppIdentifier";
constexpr const char* appVersionKey = "ZEBBookAppVersion";

const platform::FileManager& files(const platform::Environment& environment) {
  return *environment.files;
}

bool isFolder(const platform::Environment& environment, const std::string& path) {
  bool isDirectory = false;
  return files(environment).fileExistsAtPath(path, &isDirectory) && isDirectory;
}

bool isFile(const platform::Environment& environment, const std::string& path) {
  bool isDirectory = false;
  return files(environment).fileExistsAtPath(path, &isDirectory) && !isDirectory;
}

/// The dictionary in a folder's information list, or absent.
platform::Value informationList(const platform::Environment& environment,
                                const std::string& folder) {
  const std::string path = platform::stringByAppendingPathComponent(folder, informationListName);
  // Mapping a file tells its length for nothing; the content is read into memory of our own, for
  // people edit these files in place.
  const auto mapped = files(environment).contentsMappedAtPath(path);
  if (!mapped || mapped->length() > maximumInformationListLength) {
    return {};
  }
  const auto bytes = files(environment).contentsAtPath(path);
  if (!bytes || bytes->length() > maximumInformationListLength) {
    return {};
  }
  platform::Value list = platform::propertyListFromData(*bytes).value_or(platform::Value());
  return list.dictionaryIf() != nullptr ? list : platform::Value();
}

/// Whether a path from an information list stays within the folder that it is relative to.
bool isPathWithinFolder(std::string_view path) {
  if (path.empty() || path.front() == '/' || path.find('\0') != std::string_view::npos) {
    return false;
  }
  while (true) {
    const size_t slash = path.find('/');
    if (path.substr(0, slash) == "..") {
      return false;
    }
    if (slash == std::string_view::npos) {
      return true;
    }
    path.remove_prefix(slash + 1);
  }
}

/// An information list and, laid over it, that of the language in use. What is there has to be of
/// the right kind; isBroken() tells whether anything was not.
class Information {
 public:
  explicit Information(platform::Value list) : _list(std::move(list)) {}

  void setLocalizedList(platform::Value list) { _localizedList = std::move(list); }

  bool isBroken() const { return _isBroken; }
  void setBroken() { _isBroken = true; }

  const platform::Value& value(std::string_view key) const {
    const platform::Value& localized = _localizedList[key];
    return localized.isAbsent() ? _list[key] : localized;
  }

  std::optional<std::string> string(std::string_view key) {
    const platform::Value& content = value(key);
    if (!content.isAbsent() && (content.stringIf() == nullptr || content.stringIf()->empty())) {
      setBroken();
    }
    return content.stringValue();
  }

  bool boolean(std::string_view key) {
    const platform::Value& content = value(key);
    if (!content.isAbsent() && content.kind() != platform::Value::Kind::boolean) {
      setBroken();
    }
    return content.boolValue();
  }

  /// One path, or a list of them, none of which leaves the book.
  std::vector<std::string> paths(std::string_view key) {
    const platform::Value& content = value(key);
    platform::Value::Array single = {content};
    const platform::Value::Array& list = content.arrayIf() != nullptr ? *content.arrayIf() : single;
    std::vector<std::string> result;
    if (content.isAbsent()) {
      return result;
    }
    for (const platform::Value& path : list) {
      if (path.stringIf() == nullptr || !isPathWithinFolder(*path.stringIf())) {
        setBroken();
        return {};
      }
      result.push_back(*path.stringIf());
    }
    return result;
  }

  std::optional<std::string> path(std::string_view key) {
    if (value(key).arrayIf() != nullptr) {
      setBroken();
    }
    const std::vector<std::string> list = paths(key);
    return list.empty() ? std::nullopt : std::optional(list.front());
  }

 private:
  const platform::Value _list;
  platform::Value _localizedList;
  bool _isBroken = false;
};

/// The folders in which the files of a book are looked for, the one to ask first at the front.
using SearchPath = std::vector<std::string>;

std::optional<std::string> existingFile(const platform::Environment& environment,
                                        const SearchPath& folders, const std::string& name) {
  for (const std::string& folder : folders) {
    std::string path = platform::stringByAppendingPathComponent(folder, name);
    if (isFile(environment, path)) {
      return path;
    }
  }
  return std::nullopt;
}

std::optional<std::string> existingFile(const platform::Environment& environment,
                                        const SearchPath& folders,
                                        const std::optional<std::string>& name) {
  return name ? existingFile(environment, folders, *name) : std::nullopt;
}

/// The names, without extension, of the language folders in `folder`.
std::vector<std::string> languagesIn(const platform::Environment& environment,
                                     const std::string& folder) {
  std::vector<std::string> languages;
  for (std::string& name :
       files(environment).namesInDirectory(folder).value_or(std::vector<std::string>())) {
    const std::string path = platform::stringByAppendingPathComponent(folder, name);
    if (!name.ends_with(languageFolderExtension) || !isFolder(environment, path)) {
      continue;
    }
    name.resize(name.size() - std::string_view(languageFolderExtension).size());
    if (ZEBHelpBook::isValidBookID(name)) {
      languages.push_back(std::move(name));
    }
  }
  return languages;
}

std::optional<platform::URL> remoteAddress(Information& information, const char* key) {
  const std::optional<std::string> string = information.string(key);
  if (!string) {
    return std::nullopt;
  }
  std::optional<platform::URL> url = URLByEscapingString(addSSLAsNecessary(*string));
  if (!url || url->scheme().empty()) {
    information.setBroken();
    return std::nullopt;
  }
  return url;
}

void readFiles(const platform::Environment& environment, Information& information,
               const SearchPath& folders, ZEBHelpBook& book) {
  const std::string accessPage = information.path(accessPageKey).value_or(defaultAccessPage);
  book.setAccessPagePath(existingFile(environment, folders, accessPage));
  std::vector<std::string> indexPaths;
  for (const std::string& name : information.paths(indexFilesKey)) {
    if (auto path = existingFile(environment, folders, name)) {
      indexPaths.push_back(std::move(*path));
    }
  }
  book.setIndexPaths(std::move(indexPaths));
  book.setExactMatchPath(existingFile(environment, folders, information.path(exactMatchFileKey)));
  book.setSuggestionsPath(existingFile(environment, folders, information.path(suggestionsFileKey)));
}

int32_t typeOf(Information& information) {
  const platform::Value& type = information.value(typeKey);
  if (type.isAbsent()) {
    return ZEBHelpBookType1;
  }
  const int64_t number = type.kind() == platform::Value::Kind::integer ? type.integerValue() : 0;
  if (number < ZEBHelpBookType1 || number > ZEBHelpBookType4) {
    information.setBroken();
    return ZEBHelpBookType1;
  }
  return static_cast<int32_t>(number);
}

}  // namespace

std::shared_ptr<ZEBHelpBook> ZEBHelpBook::initWithPath(const std::string& path) {
  const auto environment = platform::Environment::current();
  std::string folder = path;
  while (folder.size() > 1 && folder.ends_with('/')) {
    folder.pop_back();
  }
  Information information(informationList(*environment, folder));
  const std::string identifier = information.string(identifierKey).value_or(std::string());
  const int32_t type = typeOf(information);
  std::shared_ptr<ZEBHelpBook> book = bookWithID(identifier, type, folder);
  if (book == nullptr) {
    return nullptr;
  }

  std::string root = folder;
  if (type == ZEBHelpBookType2 || type == ZEBHelpBookType3) {
    const std::string resources =
        platform::stringByAppendingPathComponent(folder, resourcesFolderName);
    if (isFolder(*environment, resources)) {
      root = resources;
      book->setResourcesRootPath(resources);
    }
  }
  SearchPath folders = {root};
  const std::string developmentLanguage =
      information.string(developmentLanguageKey).value_or(std::string());
  if (const auto language = ZEBBestLocalization(
          languagesIn(*environment, root), environment->preferredLanguages, developmentLanguage)) {
    book->setLocalization(*language);
    const std::string languageFolder =
        platform::stringByAppendingPathComponent(root, *language + languageFolderExtension);
    folders.insert(folders.begin(), languageFolder);
    information.setLocalizedList(informationList(*environment, languageFolder));
  }

  if (auto title = information.string(titleKey)) {
    book->setTitle(std::move(*title));
  }
  book->setUsesExternalViewer(information.boolean(usesExternalViewerKey));
  book->setAppBundleID(information.string(appIdentifierKey));
  book->setAppBundleVersion(information.string(appVersionKey));
  book->setRemoteURL(remoteAddress(information, remoteRootKey));
  book->setCatalogueURL(remoteAddress(information, catalogueKey));
  readFiles(*environment, information, folders, *book);
  return information.isBroken() ? nullptr : book;
}
