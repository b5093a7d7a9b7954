#include <chrono>
#include <exception>
#include <utility>

#include "host/Zebrine/ZEBCheckClass.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/KeyedArchive.h"
#include "platform/Strings.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexshelf.h"

using platform::KeyedObject;
using platform::KeyedUnarchiver;

namespace {

constexpr const char* cacheLanguageKey = "CacheLanguage";
constexpr const char* knownIndicesKey = "KnownIndices";
constexpr const char* cacheVersionKey = "CacheVersion";
constexpr const char* cacheVersion = "1.2";
constexpr std::chrono::seconds maximumAge{28800};

std::optional<std::string> firstPreferredLanguage() {
  const auto environment = platform::Environment::current();
  const std::vector<std::string>& languages = environment->preferredLanguages;
  return languages.empty() ? std::nullopt : std::optional(languages.front());
}

KeyedObject archivedForm(const std::map<std::string, ZEBIndexshelf::Indices>& indices) {
  KeyedObject::Dictionary books;
  for (const auto& entry : indices) {
    KeyedObject::Array records;
    for (const auto& record : entry.second) {
      if (const auto codable = zebCheckClass<ZEBHelpindexIndex>(record)) {
        records.emplace_back(std::shared_ptr<const platform::KeyedCodable>(codable));
      }
    }
    books.emplace(entry.first, std::move(records));
  }
  return KeyedObject::mutableDictionary(std::move(books));
}

std::optional<std::map<std::string, ZEBIndexshelf::Indices>> indicesFromArchivedForm(
    const KeyedObject& object) {
  const KeyedObject::Dictionary* books = object.dictionaryIf();
  if (books == nullptr || !object.isMutable()) {
    return std::nullopt;
  }
  std::map<std::string, ZEBIndexshelf::Indices> indices;
  for (const auto& entry : *books) {
    ZEBIndexshelf::Indices records;
    if (const KeyedObject::Array* array = entry.second.arrayIf()) {
      for (const KeyedObject& element : *array) {
        // The archive made the record for this reader alone; nobody else holds it yet.
        if (auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(
                std::const_pointer_cast<platform::KeyedCodable>(element.object()))) {
          records.push_back(std::move(record));
        }
      }
    }
    indices.emplace(entry.first, std::move(records));
  }
  return indices;
}

std::optional<std::string> decodeString(KeyedUnarchiver& coder, const char* key) {
  return zebCheckClass<std::string>(
      coder.decodeObjectOfClasses({KeyedUnarchiver::stringClass}, key).value());
}

}  // namespace

void ZEBIndexshelf::archiveKnownIndices() {
  const platform::MonitorLock lock(_monitor);
  if (!_cachePath) {
    return;
  }
  try {
    platform::KeyedArchiver coder;
    const std::optional<std::string> language = firstPreferredLanguage();
    coder.encodeObject(language ? KeyedObject(platform::Value(*language)) : KeyedObject(),
                       cacheLanguageKey);
    coder.encodeObject(archivedForm(_indices), knownIndicesKey);
    coder.encodeObject(platform::Value(cacheVersion), cacheVersionKey);
    const platform::Data bytes = coder.finishEncoding();
    const auto files = platform::Environment::current()->files;
    const std::string folder = platform::stringByDeletingLastPathComponent(*_cachePath);
    if (!files->fileExistsAtPath(*_cachePath)) {
      (void)files->createDirectoryWithParents(folder);
    }
    platform::removeAbandonedFiles(folder);
    if (const auto error = files->writeAtomically(*_cachePath, bytes)) {
      ZEBLog(1, "Failed to save indexindex to: %@ (error: %@)", *_cachePath, *error);
    }
  } catch (const std::exception& exception) {
    ZEBLog(3, "Failed to save indexindex to: %@ (exception: %@)", *_cachePath, exception.what());
  }
}

std::optional<std::map<std::string, ZEBIndexshelf::Indices>>
ZEBIndexshelf::unarchiveKnownIndices() {
  const std::optional<std::string> path = _helpIndexCachePath();
  const auto environment = platform::Environment::current();
  if (!path || !environment->files->fileExistsAtPath(*path)) {
    return std::nullopt;
  }
  const auto modified = environment->files->modificationDate(*path);
  if (!modified || environment->clock->now() - *modified >= maximumAge) {
    return std::nullopt;
  }
  platform::Error error;
  const std::optional<platform::Data> bytes =
      environment->files->contentsMappedAtPath(*path, &error);
  if (!bytes) {
    ZEBLog(1, "Error loading help index cache from %@ (error: %@)", *path, error);
    return std::nullopt;
  }
  try {
    KeyedUnarchiver coder(*bytes);
    const std::optional<std::string> version = decodeString(coder, cacheVersionKey);
    const std::optional<std::string> language = decodeString(coder, cacheLanguageKey);
    if (!_validateHelpIndexCacheVersion(version, language)) {
      coder.finishDecoding();
      return std::nullopt;
    }
    const KeyedObject known = coder.decodeObjectOfClasses(
        {KeyedUnarchiver::mutableDictionaryClass, KeyedUnarchiver::arrayClass,
         ZEBHelpindexIndex::archivedClassName},
        knownIndicesKey);
    coder.finishDecoding();
    return indicesFromArchivedForm(known);
  } catch (const std::exception& exception) {
    // The reason alone, in the place of the path: that is how this message has always read.
    ZEBLog(1, "Error loading help index cache from %@ (exception: %@)", exception.what());
    return std::nullopt;
  }
}

bool ZEBIndexshelf::_validateHelpIndexCacheVersion(const std::optional<std::string>& version,
                                                   const std::optional<std::string>& language) {
  if (!version || !language || platform::numericCompare(cacheVersion, *version) > 0) {
    return false;
  }
  return language == firstPreferredLanguage();
}
