#include "zebd/FoundItem.h"

#include <map>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/URL.h"
#include "platform/Value.h"
#include "zebd/Bookshelf.h"

namespace zebd {

namespace {

/// Kind and name.
const std::map<std::string, std::string>& namesOfKinds() {
  static const std::map<std::string, std::string> names = {
      {ZEBHelpArticleResult, "pages"},
      {ZEBHelpSuggestionResult, "suggestions"},
      {ZEBHelpSimilarSuggestionResult, "similar"},
      {ZEBHelpActionResult, "actions"},
  };
  return names;
}

using Records = std::vector<std::shared_ptr<ZEBResult>>;

std::string nameOfPage(const std::string& url) {
  const std::optional<platform::URL> parsed = platform::URL::URLWithString(url);
  const std::string name = parsed ? parsed->lastPathComponent() : std::string();
  return name.empty() ? url : name;
}

FoundItem itemOfRecord(const ZEBResult& record, const Bookshelf& bookshelf) {
  FoundItem item;
  item.kind = record.type();
  item.title = record.title().value_or("");
  item.relevance = record.relevance().doubleValue();
  item.bookID = record.bookID().value_or("");
  const auto book = bookshelf.bookWithID(item.bookID);
  item.bookTitle = book == nullptr ? item.bookID : book->title();
  item.url = record.payloadValueForKey(ZEBResultURLKey).stringValue().value_or("");
  item.abstract = record.payloadValueForKey(ZEBResultAbstractKey).stringValue();
  item.isExactMatch = record.payloadValueForKey(ZEBResultIsExactMatchKey).boolValue();
  if (item.title.empty()) {
    item.title = nameOfPage(item.url);
  }
  return item;
}

FoundItem itemOfText(const std::string& text) {
  FoundItem item;
  item.kind = ZEBHelpSuggestionResult;
  item.title = text;
  return item;
}

}  // namespace

std::string nameOfKind(const std::string& kind) {
  for (const auto& [known, name] : namesOfKinds()) {
    if (known == kind) {
      return name;
    }
  }
  return {};
}

std::optional<std::string> kindOfName(const std::string& name) {
  for (const auto& [kind, known] : namesOfKinds()) {
    if (known == name) {
      return kind;
    }
  }
  return std::nullopt;
}

std::vector<FoundItem> itemsOfBatch(const ZEBResultBatch& batch, const Bookshelf& bookshelf) {
  std::vector<FoundItem> items;
  if (const auto* records = std::get_if<Records>(&batch)) {
    items.reserve(records->size());
    for (const auto& record : *records) {
      items.push_back(itemOfRecord(*record, bookshelf));
    }
  } else if (const auto* texts = std::get_if<std::vector<std::string>>(&batch)) {
    items.reserve(texts->size());
    for (const std::string& text : *texts) {
      items.push_back(itemOfText(text));
    }
  }
  return items;
}

}  // namespace zebd
