#include "zebd/Catalogue.h"

#include <algorithm>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"
#include "platform/Value.h"

namespace zebd {

namespace {

using platform::Data;
using platform::Value;

constexpr const char* entryExtension = "plist";

constexpr const char* bookIDKey = "bookID";
constexpr const char* titleKey = "title";
constexpr const char* typeKey = "type";
constexpr const char* folderKey = "folder";
constexpr const char* accessPageKey = "accessPage";
constexpr const char* languageKey = "language";
constexpr const char* fingerprintKey = "fingerprint";
constexpr const char* catalogueURLKey = "catalogueURL";
constexpr const char* languagesKey = "languages";
constexpr const char* pagesURLKey = "pagesURL";

/// Paths are bytes, strings of a property list are text: a path that is no printable text is kept
/// as data.
Value pathValue(const std::string& path) {
  const bool isText = platform::isValidUTF8(path) &&
                      std::all_of(path.begin(), path.end(),
                                  [](char c) { return static_cast<unsigned char>(c) >= 0x20; }) &&
                      path.find("\xEF\xBF") == std::string::npos;
  return isText ? Value(path) : Value(Data::copy(path));
}

/// An absolute path, or absent.
std::optional<std::string> pathFromValue(const Value& value) {
  std::string path;
  if (const std::string* text = value.stringIf()) {
    path = *text;
  } else if (const Data* data = value.dataIf()) {
    path = std::string(data->view());
  }
  if (!path.starts_with('/') || path.find('\0') != std::string::npos) {
    return std::nullopt;
  }
  return path;
}

Value propertyList(const CatalogueEntry& entry) {
  Value::Dictionary list = {
      {bookIDKey, entry.bookID},
      {titleKey, entry.title},
      {typeKey, entry.type},
      {folderKey, pathValue(entry.folder)},
      {accessPageKey, pathValue(entry.accessPagePath)},
      {languageKey, entry.language},
      {fingerprintKey, entry.fingerprint},
  };
  if (entry.catalogueURL) {
    list[catalogueURLKey] = *entry.catalogueURL;
  }
  if (!entry.languages.empty()) {
    list[languagesKey] = Value::Array(entry.languages.begin(), entry.languages.end());
  }
  if (entry.pagesURL) {
    list[pagesURLKey] = *entry.pagesURL;
  }
  return list;
}

std::optional<CatalogueEntry> entryFromPropertyList(const Value& list) {
  const std::optional<std::string> bookID = list[bookIDKey].stringValue();
  const std::optional<std::string> folder = pathFromValue(list[folderKey]);
  const std::optional<std::string> accessPage = pathFromValue(list[accessPageKey]);
  const int64_t type = list[typeKey].integerValue();
  if (!bookID || !ZEBHelpBook::isValidBookID(*bookID) || !folder || !accessPage ||
      type < ZEBHelpBookType1 || type > ZEBHelpBookType4) {
    return std::nullopt;
  }
  CatalogueEntry entry;
  entry.bookID = *bookID;
  entry.title = list[titleKey].stringValue().value_or(*bookID);
  entry.type = static_cast<int32_t>(type);
  entry.folder = *folder;
  entry.accessPagePath = *accessPage;
  entry.language = list[languageKey].stringValue().value_or("");
  entry.fingerprint = list[fingerprintKey].stringValue().value_or("");
  entry.catalogueURL = list[catalogueURLKey].stringValue();
  entry.pagesURL = list[pagesURLKey].stringValue();
  if (const Value::Array* languages = list[languagesKey].arrayIf()) {
    for (const Value& language : *languages) {
      if (const std::string* tag = language.stringIf()) {
        entry.languages.push_back(*tag);
      }
    }
  }
  return entry;
}

}  // namespace

bool CatalogueEntry::isRemote() const { return type == ZEBHelpBookType4 && catalogueURL; }

std::string Catalogue::_entryPath(std::string_view bookID) const {
  return platform::stringByAppendingPathComponent(_folder,
                                                  std::string(bookID) + '.' + entryExtension);
}

std::vector<CatalogueEntry> Catalogue::entries() const {
  std::vector<CatalogueEntry> entries;
  const std::string suffix = std::string(".") + entryExtension;
  const auto names = platform::Environment::current()->files->namesInDirectory(_folder);
  for (const std::string& name : names.value_or(std::vector<std::string>())) {
    if (!name.ends_with(suffix)) {
      continue;
    }
    if (std::optional<CatalogueEntry> found = entry(name.substr(0, name.size() - suffix.size()))) {
      entries.push_back(std::move(*found));
    }
  }
  std::sort(entries.begin(), entries.end(),
            [](const CatalogueEntry& a, const CatalogueEntry& b) { return a.bookID < b.bookID; });
  return entries;
}

std::optional<CatalogueEntry> Catalogue::entry(const std::string& bookID) const {
  if (!ZEBHelpBook::isValidBookID(bookID)) {
    return std::nullopt;
  }
  const std::optional<Value> list = platform::dictionaryWithContentsOfFile(_entryPath(bookID));
  if (!list) {
    return std::nullopt;
  }
  std::optional<CatalogueEntry> entry = entryFromPropertyList(*list);
  if (!entry || entry->bookID != bookID) {
    return std::nullopt;
  }
  return entry;
}

std::optional<platform::Error> Catalogue::store(const CatalogueEntry& entry) const {
  const auto environment = platform::Environment::current();
  if (auto error = environment->files->createDirectoryWithParents(_folder)) {
    return error;
  }
  Data bytes;
  try {
    bytes = platform::dataFromPropertyList(propertyList(entry), platform::PropertyListFormat::xml);
  } catch (const platform::Exception& exception) {
    return platform::formatError(entry.bookID + ": " + exception.reason());
  }
  return environment->files->writeAtomically(_entryPath(entry.bookID), bytes);
}

std::optional<platform::Error> Catalogue::remove(const std::string& bookID) const {
  const auto files = platform::Environment::current()->files;
  if (!ZEBHelpBook::isValidBookID(bookID)) {
    return std::nullopt;
  }
  const std::string path = _entryPath(bookID);
  auto error = files->removeItem(path);
  return files->fileExistsAtPath(path) ? error : std::nullopt;
}

}  // namespace zebd
