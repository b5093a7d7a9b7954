// A world with a controller, an owner and records, for tests of search and look-up.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBResult.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/HelpIndexWorld.h"

namespace tests {

class KeywordWorld : public HelpIndexWorld {
 public:
  KeywordWorld()
      : owner(std::make_shared<BookOwner>()), controller(ZEBHelpindexSearchController::init()) {
    controller->setPluginOwner(owner);
  }

  /// A record over a file with these pages, of the book "book".
  std::shared_ptr<ZEBHelpindexIndex> index(std::vector<searchkit::Document> pages,
                                           const std::string& name = "book/a.helpindex",
                                           platform::Value::Dictionary further = {}) const {
    further["SKI_INDEX_DATA"] = keywordIndex(std::move(pages));
    auto record = ZEBHelpindexIndex::initWithPath(write(name, std::move(further)));
    if (record) {
      record->setBookID("book");
    }
    log->clear();
    return record;
  }

  std::string fileURL(const std::string& name) const { return "file://" + folder.path(name); }

  const std::shared_ptr<BookOwner> owner;
  const std::shared_ptr<ZEBHelpindexSearchController> controller;
};

inline std::string urlOf(const std::shared_ptr<ZEBResult>& result) {
  return result->payloadValueForKey(ZEBResultURLKey).stringValue().value_or("(none)");
}

inline std::vector<std::string> urlsOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::vector<std::string> urls;
  urls.reserve(results.size());
  for (const auto& result : results) {
    urls.push_back(urlOf(result));
  }
  return urls;
}

inline std::vector<std::string> titlesOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::vector<std::string> titles;
  titles.reserve(results.size());
  for (const auto& result : results) {
    titles.push_back(result->title().value_or("(none)"));
  }
  return titles;
}

}  // namespace tests
