// A shelf whose content service says what the test tells it to say.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/URL.h"
#include "platform/URLCache.h"
#include "tests/plugin/remote/ScriptedObjectManager.h"
#include "tests/plugin/shelf/ShelfWorld.h"

namespace tests {

inline platform::URL testURL(const std::string& spelling) {
  return platform::URL::URLWithString(spelling).value();
}

class RemoteWorld : public ShelfWorld {
 public:
  RemoteWorld() { RNXObjectManager::setSharedObjectManager(manager); }
  ~RemoteWorld() {
    manager->release();
    dropShelf();
    RNXObjectManager::setSharedObjectManager(nullptr);
  }

  /// A type-4 book that the owner knows and about which the service says that its files are at
  /// these URLs; without any, an empty string.
  std::shared_ptr<ZEBHelpBook> makeRemoteBook(const std::string& bookID,
                                              const std::string& searchIndex,
                                              const std::string& exactMatch = {},
                                              std::optional<std::string> locale = "en") const {
    const auto book = makeBook(bookID, ZEBHelpBookType4);
    owner->books[bookID] = book;
    platform::Value::Dictionary attributes;
    if (!searchIndex.empty()) {
      attributes[RNXBook::remoteSearchIndexKey] = testURL(searchIndex);
    }
    if (!exactMatch.empty()) {
      attributes[RNXBook::remoteExactMatchKey] = testURL(exactMatch);
    }
    manager->setAnswer(
        bookID, {RNXBook::bookWithID(bookID, "1", std::move(locale), std::move(attributes)), {}});
    return book;
  }

  /// Runs the main loop until no download of the book is under way.
  bool finishDownload(const std::shared_ptr<ZEBHelpBook>& book) const {
    return runMainLoopUntil([&] { return !shelf->isIndexDownloadingForBook(book); });
  }

  /// The messages of a level, but for what records say while they read their files.
  std::vector<std::string> messages(int level) const {
    std::vector<std::string> found;
    for (const LogEntry& entry : logged()) {
      if (entry.level == level) {
        found.push_back(entry.message);
      }
    }
    return found;
  }

  const std::shared_ptr<ScriptedObjectManager> manager = std::make_shared<ScriptedObjectManager>();
};

}  // namespace tests
