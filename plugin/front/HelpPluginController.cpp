#include "plugin/front/HelpPluginController.h"

#include <utility>

#include "LUXPlugin/LUXSearchController.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/Bundle.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"
#include "plugin/front/LeakChecker.h"
#include "plugin/front/SearchRun.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBIndex.h"

namespace {

constexpr platform::Seconds removalDelay{0.1};

/// An address inside this bundle's code, by which the bundle is found.
void codeOfThisBundle() {}

}  // namespace

HelpPluginController::HelpPluginController(std::shared_ptr<ZEBPluginOwner> owner)
    : _owner(std::move(owner)) {}

HelpPluginController::~HelpPluginController() = default;

std::shared_ptr<HelpPluginController> HelpPluginController::initWithOwner(
    std::shared_ptr<ZEBPluginOwner> owner) {
  std::shared_ptr<HelpPluginController> controller(new HelpPluginController(std::move(owner)));
  controller->_setUp();
  return controller;
}

void HelpPluginController::_setUp() {
  _indexshelf = ZEBIndexshelf::initWithOwner(_owner);
  _indexshelf->setUserLoggedIn(_owner && _owner->userLoggedIn());
  if (_owner && _owner->userLoggedIn()) {
    _indexshelf->addObserver(shared_from_this());
    tellLeakCheckerToIgnore(this);
  }
  _helpindexSearchController = ZEBHelpindexSearchController::init();
  _helpindexSearchController->setPluginOwner(_owner);
  if (_owner && _owner->userLoggedIn()) {
    _luxSearchController = LUXSearchController::initWithOwner(_owner);
    _luxSearchController->setIndexshelf(_indexshelf);
  }
}

std::string HelpPluginController::pluginID() const {
  const auto bundle =
      platform::Bundle::bundleWithCode(reinterpret_cast<const void*>(&codeOfThisBundle));
  return bundle ? bundle->bundleIdentifier() : std::string();
}

std::vector<std::string> HelpPluginController::resultTypes() const {
  return {ZEBHelpArticleResult, ZEBHelpSuggestionResult, ZEBHelpSimilarSuggestionResult,
          ZEBHelpActionResult};
}

void HelpPluginController::startSearchForQuery(const std::shared_ptr<ZEBQuery>& query) {
  SearchRun(shared_from_this(), _owner, *_indexshelf, *_helpindexSearchController,
            _luxSearchController.get(), query)
      .run();
}

void HelpPluginController::completeSearchForQuery(const std::shared_ptr<ZEBQuery>& query) {
  if (_luxSearchController) {
    _luxSearchController->completeSearchQuery(query);
  }
}

void HelpPluginController::finishPopulatingBookWithID(const std::string& bookID) {
  _indexshelf->addRegistrationOperationForBook(_owner ? _owner->bookWithID(bookID) : nullptr);
}

void HelpPluginController::removeIndexForBookWithID(const std::string& bookID) {
  platform::RunLoop::current()->performAfterDelay(
      removalDelay, [shelf = _indexshelf, bookID] { shelf->removeIndexForBookID(bookID); });
}

void HelpPluginController::finishPopulatingKnownBooks() {
  if (!_owner || _owner->shouldBeLazy() || !_owner->userLoggedIn() || !_luxSearchController) {
    return;
  }
  platform::startNamedThread("book-preload",
                             [controller = _luxSearchController] { controller->loadLUXModels(); });
}

void HelpPluginController::notifyEvent(int64_t event, const platform::Value& /*context*/) {
  if (event == ZEBPluginEventLanguageChanged) {
    _indexshelf->_resetForLanguageChange();
  }
}

void HelpPluginController::indexDidChange(const std::shared_ptr<ZEBIndex>& index,
                                          ZEBIndexChange /*didChange*/) {
  if (!_owner) {
    return;
  }
  const std::optional<std::string> bookID = index ? index->bookID() : std::nullopt;
  _owner->notifyBookshelfOfModificationsToBook(bookID ? _owner->bookWithID(*bookID) : nullptr);
}
