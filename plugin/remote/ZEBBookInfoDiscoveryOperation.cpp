#include "plugin/remote/ZEBBookInfoDiscoveryOperation.h"

#include <optional>
#include <utility>

#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"

ZEBBookInfoDiscoveryOperation::ZEBBookInfoDiscoveryOperation(std::shared_ptr<ZEBHelpBook> book)
    : _book(std::move(book)) {}

std::shared_ptr<ZEBBookInfoDiscoveryOperation> ZEBBookInfoDiscoveryOperation::initWithBook(
    std::shared_ptr<ZEBHelpBook> book) {
  return std::shared_ptr<ZEBBookInfoDiscoveryOperation>(
      new ZEBBookInfoDiscoveryOperation(std::move(book)));
}

void ZEBBookInfoDiscoveryOperation::main() {
  if (_book && !_book->remoteBookInfo()[ZEBBookLocalizationKey].isAbsent()) {
    finishWithError(std::nullopt);
    return;
  }
  ZEBLog(3, "Making book request to TVO for %@",
         _book ? std::optional(_book->bookID()) : std::nullopt);
  const auto self = std::static_pointer_cast<ZEBBookInfoDiscoveryOperation>(shared_from_this());
  RNXObjectManager::sharedObjectManager()->_requestBookWithHelpBook(
      _book,
      [self](const std::shared_ptr<RNXBook>& rnxBook, const std::optional<platform::Error>& error) {
        if (!error) {
          self->_rnxBook.set(rnxBook);
        }
        self->finishWithError(error);
      });
}
