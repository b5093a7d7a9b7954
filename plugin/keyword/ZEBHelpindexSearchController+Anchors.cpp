#include <utility>

#include "SearchKit/SearchKit.h"
#include "host/Zebrine/ZEBCheckClass.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBResult.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Files.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBHelpindexIndex.h"

using platform::URL;
using platform::Value;

namespace {

// The URL of a page on disk, spelled as the keyword search spells it.
std::optional<URL> fileURLOfPage(const std::optional<std::string>& parentPath,
                                 const std::optional<std::string>& path) {
  if (!path || !parentPath) {
    return std::nullopt;
  }
  std::optional<URL> folder = URLByEscapingString(*parentPath);
  const std::optional<URL> again =
      folder ? URLByEscapingString(folder->absoluteString()) : std::nullopt;
  std::string joined =
      again ? platform::stringByAppendingPathComponent(again->absoluteString(), *path)
            : std::string();
  if (joined.empty()) {
    return folder;
  }
  if (!joined.starts_with("file:")) {
    joined.insert(0, "file://");
  }
  return URLByEscapingString(joined);
}

std::optional<URL> urlOfPage(const std::shared_ptr<ZEBHelpBook>& book,
                             const std::optional<std::string>& parentPath,
                             const std::optional<std::string>& path) {
  if (!book || book->type() != ZEBHelpBookType4) {
    return fileURLOfPage(parentPath, path);
  }
  return path ? ZEBHelpBook::_urlForType4HelpBookResult(*path, book->bookID()) : std::nullopt;
}

std::shared_ptr<ZEBResult> resultForPage(const ZEBHelpindexIndex& index, const Value& properties,
                                         const URL& url) {
  std::shared_ptr<ZEBResult> result =
      ZEBResult::resultWithTitle(properties["T"].stringValue(), ZEBHelpArticleResult);
  result->setRelevance(1);
  Value::Dictionary payload;
  if (const std::optional<std::string> abstract = properties["D"].stringValue()) {
    payload.emplace(ZEBResultAbstractKey, *abstract);
  }
  payload.emplace(ZEBResultIndexIDKey, index.indexID());
  if (const std::optional<std::string> bookID = index.bookID()) {
    payload.emplace(ZEBResultBookIDKey, *bookID);
  }
  payload.emplace(ZEBResultURLKey, url.absoluteString());
  result->setMutablePayload(std::move(payload));
  return result;
}

}  // namespace

ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::doLookupOfAnchor(
    std::string_view anchor, const Indices& inIndices) {
  Results results;
  for (const std::shared_ptr<ZEBIndex>& candidate : inIndices) {
    const auto index = zebCheckClass<ZEBHelpindexIndex>(candidate);
    if (!index || !index->hasAnchors() || !index->isSearchable()) {
      continue;
    }
    const Value anchors = index->anchorDictionary();
    // What is no array counts as no array: the file may hold anything under the name.
    const Value paths = anchors[anchor].arrayIf() ? anchors[anchor] : Value();
    ZEBLog(3, "Path array for index: %@", paths);
    if (paths.arrayIf() && !paths.arrayIf()->empty()) {
      _lookUpPaths(*index, *paths.arrayIf(), results);
    }
  }
  return results;
}

void ZEBHelpindexSearchController::_lookUpPaths(ZEBHelpindexIndex& index, const Value::Array& paths,
                                                Results& results) {
  const std::shared_ptr<ZEBHelpBook> book = _bookOfIndex(index);
  for (const Value& element : paths) {
    const std::optional<std::string> path = element.stringValue();
    const std::optional<std::string> parentPath = _parentPath(index, book);
    ZEBLog(3, "parent path: %@", parentPath);
    const SKDocumentRef document =
        path ? SKDocumentCreateWithURL(URL::fileURLWithPath(*path)) : nullptr;
    SKIndexRef indexRef = index.copyIndexRef();
    if (!indexRef) {
      continue;
    }
    const std::optional<URL> url = urlOfPage(book, parentPath, path);
    std::optional<Value> properties;
    if (document) {
      properties = SKIndexCopyDocumentProperties(indexRef, *document);
    } else {
      // The words name the reference although it is the document that is missing: they are what
      // people search their logs for.
      ZEBLog(1, "No index ref in the index at %@", index.path());
    }
    index.disposeIndexRef(indexRef);
    if (properties && url) {
      results.push_back(resultForPage(index, *properties, *url));
    }
  }
}
