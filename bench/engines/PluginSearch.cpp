#include "bench/engines/PluginSearch.h"

#include <fstream>
#include <map>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBHelpindexIndex.h"

namespace engines {

namespace {

using BooksByID = std::map<std::string, std::shared_ptr<ZEBHelpBook>>;

class Owner : public ZEBPluginOwner {
 public:
  bool userLoggedIn() const override { return false; }
  bool shouldBeLazy() const override { return true; }
  void setShouldBeLazy(bool) override {}
  bool isOnline() const override { return true; }
  BooksByID knownBooks() const override { return books; }
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override {
    const auto book = books.find(bookID);
    return book == books.end() ? nullptr : book->second;
  }
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>&) override {}
  void disableShutdown() override {}
  void enableShutdown() override {}
  void setIdleTimeOutDelay(const platform::Value&) override {}
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return std::nullopt; }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>&, const ZEBResultBatch&,
                          const std::shared_ptr<ZEBQuery>&) override {}
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>&,
                                       const std::shared_ptr<ZEBQuery>&) override {}

  BooksByID books;
};

}  // namespace

struct PluginSearch::World {
  std::shared_ptr<Owner> owner = std::make_shared<Owner>();
  std::shared_ptr<ZEBHelpindexSearchController> controller = ZEBHelpindexSearchController::init();
  ZEBHelpindexSearchController::Indices records;
};

PluginSearch::PluginSearch(const Images& indexes, const std::string& folder)
    : _world(std::make_unique<World>()) {
  _world->controller->setPluginOwner(_world->owner);
  for (size_t i = 0; i < indexes.size(); ++i) {
    const std::string bookID = "org.example.book" + std::to_string(i);
    const platform::Data archive =
        platform::classicArchiveWithRootObject(platform::Value::Dictionary{
            {"SKI_INDEX_DATA",
             platform::Data::wrap(indexes[i].bytes, indexes[i].length, nullptr)}});
    writeImage(folder, i, archive.bytes(), archive.length());
    const std::string path = imagePath(folder, i);
    auto book = ZEBHelpBook::bookWithID(bookID, ZEBHelpBookType1, folder);
    book->setIndexPaths({path});
    _world->owner->books[bookID] = book;
    auto record = ZEBHelpindexIndex::initWithPath(path);
    record->setBookID(bookID);
    _world->records.push_back(std::move(record));
  }
}

PluginSearch::~PluginSearch() = default;

size_t PluginSearch::search(const std::string& text) {
  return _world->controller->doSearchForString(text, _world->records, {}).size();
}

}  // namespace engines
