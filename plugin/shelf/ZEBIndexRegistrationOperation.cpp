#include "plugin/shelf/ZEBIndexRegistrationOperation.h"

#include <utility>

#include "platform/Environment.h"
#include "plugin/shelf/ShutdownGuard.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

// Registration in the background is paced: a search that needs a book sooner registers it itself.
constexpr platform::Seconds pauseBeforeBook{2};

}  // namespace

ZEBIndexRegistrationOperation::ZEBIndexRegistrationOperation(
    std::shared_ptr<ZEBIndexshelf> indexshelf)
    : _indexshelf(std::move(indexshelf)) {}

std::shared_ptr<ZEBIndexRegistrationOperation> ZEBIndexRegistrationOperation::init() {
  return initWithIndexshelf(nullptr);
}

std::shared_ptr<ZEBIndexRegistrationOperation> ZEBIndexRegistrationOperation::initWithIndexshelf(
    std::shared_ptr<ZEBIndexshelf> indexshelf) {
  return std::shared_ptr<ZEBIndexRegistrationOperation>(
      new ZEBIndexRegistrationOperation(std::move(indexshelf)));
}

void ZEBIndexRegistrationOperation::main() {
  const ShutdownGuard guard(_indexshelf ? _indexshelf->owner() : nullptr);
  platform::Environment::current()->clock->sleep(pauseBeforeBook);
  if (_indexshelf) {
    _indexshelf->_registerNextBook();
  }
}
