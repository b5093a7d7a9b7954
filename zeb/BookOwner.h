// The smallest host that the search needs: it knows the catalogue's books.
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBPluginOwner.h"
#include "zeb/Catalogue.h"

namespace zeb {

/// Answers for the books of a catalogue, as it was when the owner was made. There is no daemon
/// behind it: shutdown guards, idle delays and deliveries of results have nothing to act on and are
/// ignored.
/// Thread-safety: immutable.
class BookOwner : public ZEBPluginOwner {
 public:
  explicit BookOwner(const std::vector<CatalogueEntry>& entries);

  bool userLoggedIn() const override { return false; }
  bool shouldBeLazy() const override { return true; }
  void setShouldBeLazy(bool) override {}
  bool isOnline() const override { return false; }
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override { return _books; }
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override;
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>&) override {}
  void disableShutdown() override {}
  void enableShutdown() override {}
  void setIdleTimeOutDelay(const platform::Value&) override {}
  std::optional<std::string> userHelpCachesDirectoryPath() const override;
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>&, const ZEBResultBatch&,
                          const std::shared_ptr<ZEBQuery>&) override {}
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>&,
                                       const std::shared_ptr<ZEBQuery>&) override {}

 private:
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> _books;
};

}  // namespace zeb
