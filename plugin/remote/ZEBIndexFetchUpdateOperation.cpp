#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"

#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/DispatchQueue.h"
#include "plugin/shelf/ShutdownGuard.h"

ZEBIndexFetchUpdateOperation::ZEBIndexFetchUpdateOperation(
    std::shared_ptr<ZEBIndexshelf> indexshelf, ZEBIndexFetchParameters params)
    : _indexshelf(std::move(indexshelf)), _params(std::move(params)) {}

std::shared_ptr<ZEBIndexFetchUpdateOperation> ZEBIndexFetchUpdateOperation::init() {
  return initWithIndexshelf(nullptr, {});
}

std::shared_ptr<ZEBIndexFetchUpdateOperation> ZEBIndexFetchUpdateOperation::initWithIndexshelf(
    std::shared_ptr<ZEBIndexshelf> indexshelf, ZEBIndexFetchParameters params) {
  return std::shared_ptr<ZEBIndexFetchUpdateOperation>(
      new ZEBIndexFetchUpdateOperation(std::move(indexshelf), std::move(params)));
}

const std::string* ZEBIndexFetchUpdateOperation::bookID() const {
  return _params.book ? &_params.book->bookID() : nullptr;
}

void ZEBIndexFetchUpdateOperation::main() {
  const ShutdownGuard guard(_indexshelf ? _indexshelf->owner() : nullptr);
  if (_indexshelf && _params.book && _params.book->resourcesRootPath()) {
    platform::DispatchQueue::main()->sync(
        [&] { _indexshelf->_startFetchingUpdatedIndexForType3BookWithParams(_params); });
  }
}
