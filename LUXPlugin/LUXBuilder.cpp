// Building models: the half of LUXSearchController that makes what the other half searches.
#include <exception>
#include <utility>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"
#include "LUXPlugin/LUXSearchController.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/LUXTokenCounts.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/AbandonedFiles.h"
#include "platform/Applications.h"
#include "platform/Assertion.h"
#include "platform/Bundle.h"
#include "platform/OperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ShutdownGuard.h"

namespace {

using platform::Value;

constexpr double buildAcquisitionWait = 5.0;

Value thresholdsOfIndex(const HelpLUXIndex& index) {
  Value::Dictionary thresholds;
  const Value& attributes = index.attributes();
  const auto copy = [&](const char* attribute, const char* name) {
    if (const Value& threshold = attributes[attribute]; !threshold.isAbsent()) {
      thresholds.emplace(name, threshold);
    }
  };
  copy(HelpLUXIndexAttributeBigramThresholdKey, "BigramThreshold");
  copy(HelpLUXIndexAttributeTrigramThresholdKey, "TrigramThreshold");
  return thresholds;
}

void addDocuments(HelpLUXModel& model, const HelpLUXIndex& index, const std::string& bookID,
                  bool smoothingOnly) {
  // The table of tokens is made once for all counts that live together.
  std::shared_ptr<const LUXTokenTable> table;
  for (const std::string& key : index.keyEnumerator()) {
    const LUXTokenCounts counts = index.tokenCountsForKey(key);
    table = counts.table();
    const bool excluded =
        smoothingOnly ||
        index.fileProperitesForKey(key)[HelpDocPropertyExcludeFromSearch].boolValue();
    if (counts.empty()) {
      ZEBLog(3, "No tokens found for %@, skipping!", key);
      continue;
    }
    model.addTokenCounts(counts, excluded ? std::nullopt : std::optional(key), std::nullopt,
                         bookID);
  }
}

/// One string or several; absent for anything else.
std::optional<std::vector<std::string>> stringsOfValue(const Value& value) {
  if (const std::string* one = value.stringIf()) {
    return std::vector{*one};
  }
  const Value::Array* several = value.arrayIf();
  if (several == nullptr) {
    return std::nullopt;
  }
  std::vector<std::string> strings;
  for (const Value& element : *several) {
    strings.push_back(element.stringValue().value_or(std::string()));
  }
  return strings;
}

}  // namespace

std::shared_ptr<LUXModelBuildOperation> LUXSearchController::startBuildingModelGroupName(
    const std::string& modelGroupName, const std::string& language) {
  auto operation = LUXModelBuildOperation::blockOperationWithBlock(
      [controller = shared_from_this(), modelGroupName, language] {
        if (const auto model = controller->aquiredModelWithGroupName(
                modelGroupName, language, kLUXModelActivityBuilding, buildAcquisitionWait)) {
          controller->_updateModelWithParams({modelGroupName, language, model});
        }
      });
  operation->setModelGroupName(modelGroupName);
  _serialModelUpdateQueue->addOperation(operation);
  return operation;
}

bool LUXSearchController::updateExistingModel(
    const std::shared_ptr<HelpLUXModel>& existingModelWithBuildingActivity,
    const std::string& language, const std::optional<std::string>& modelGroupName) {
  platform::assertCondition(existingModelWithBuildingActivity != nullptr,
                            "existingModelWithBuildingActivity != nil");
  platform::assertCondition(modelGroupName.has_value(), "modelGroupName != nil");
  platform::assertCondition(
      existingModelWithBuildingActivity->activity() == kLUXModelActivityBuilding,
      "existingModelWithBuildingActivity.activity == kLUXModelActivityBuilding");
  _updateModelWithParams({*modelGroupName, language, existingModelWithBuildingActivity});
  return true;
}

void LUXSearchController::_updateModelWithParams(const LUXModelBuildParameters& params) {
  const ShutdownGuard guard(owner());
  try {
    _buildModel(params);
  } catch (const std::exception& exception) {
    // The model stays marked as building: nobody can tell in which state it was left.
    ZEBLog(0, "%@", exception);
  }
}

void LUXSearchController::_buildModel(const LUXModelBuildParameters& params) {
  const BookTable books = _copyAllBooksForLanguage(params.language);
  params.model->reset();
  // By now the folder is there.
  _markAsBuilding(*params.model, params.modelGroupName, params.language);
  // Processes that ended in the middle of a build leave unfinished files here too.
  platform::removeAbandonedFiles(_savedIndexDataFolder(params.model->modelDirectoryPath()));
  Value::Dictionary thresholds;
  ZEBLog(4, "Starting build of %@", params.modelGroupName);
  const std::set<std::string> members =
      HelpLUXModel::copyHelpbookIDsForModelGroupName(params.modelGroupName, true);
  for (const auto& entry : books) {
    const std::string& bookID = entry.second->bookID();
    if (members.contains(ZEBHelpBook::unversionedbookIDFromBookID(bookID)) ||
        zeb_modelGroupNameForHelpbookID(bookID) == params.modelGroupName) {
      _addBookToModel(entry.second, params, thresholds);
    }
  }
  (void)params.model->saveWithOptions(
      Value::Dictionary{{"SuggestionThresholdsPerBook", std::move(thresholds)}});
  ZEBLog(4, "Finished build of %@", params.modelGroupName);
  finishedActivity(kLUXModelActivityBuilding, params.modelGroupName, params.language);
  params.model->currentThreadIsAboutToComplete();
}

void LUXSearchController::_addBookToModel(const std::shared_ptr<ZEBHelpBook>& book,
                                          const LUXModelBuildParameters& params,
                                          Value::Dictionary& thresholds) {
  const std::shared_ptr<ZEBIndexshelf> shelf = indexshelf();
  if (!shelf) {
    return;
  }
  shelf->ensureRegistrationForBook(book);
  const ZEBIndexshelf::Indices indices = shelf->indicesForBook(book);
  const auto record =
      indices.empty() ? nullptr : std::dynamic_pointer_cast<ZEBHelpindexIndex>(indices.front());
  const std::optional<platform::Data> data = record ? record->luxIndexData() : std::nullopt;
  if (!record || !record->shouldUseLUXIndex()) {
    return;
  }
  const std::string& bookID = book->bookID();
  const std::shared_ptr<HelpLUXIndex> index = record->luxIndex();
  if (!index) {
    ZEBLog(3, "ERROR while indexing book ID: %@", bookID);
    return;
  }
  const bool smoothingOnly =
      zeb_helpbookPropertiesForHelpbookID(bookID, params.modelGroupName)["SmoothingOnly"]
          .boolValue();
  (void)_saveVersionedLUXIndexData(
      data, bookID,
      HelpLUXModel::directoryPathForModelGroupName(params.modelGroupName, params.language));
  thresholds[bookID] = thresholdsOfIndex(*index);
  if (!smoothingOnly) {
    params.model->addHelpbookID(bookID);
  }
  addDocuments(*params.model, *index, bookID, smoothingOnly);
}

LUXSearchController::BookTable LUXSearchController::_copyAllBooksForLanguage(
    const std::string& /*language*/) const {
  const std::shared_ptr<ZEBPluginOwner> host = owner();
  return host ? host->knownBooks() : BookTable();
}

void LUXSearchController::_addBooksToTableFromAllApps(BookTable& table,
                                                      const std::string& language) {
  std::vector<std::string> appPaths;
  std::vector<platform::URL> installed;
  if (platform::LSCopyAllApplicationURLs(installed) == 0) {
    // The applications to look at are chosen one by one, and none is chosen: books of applications
    // reach the table through the host. The walk stays, so that choosing is all that is missing.
    const std::vector<platform::URL> applications;
    for (const platform::URL& application : applications) {
      bool isKnown = false;
      for (const auto& entry : table) {
        isKnown = entry.second->path().starts_with(application.path());
      }
      if (!isKnown) {
        appPaths.push_back(application.path());
      }
    }
  }
  _addBooksToTableFromAppPaths(table, appPaths, language);
}

void LUXSearchController::_addBooksToTableFromAppPaths(BookTable& table,
                                                       const std::vector<std::string>& appPaths,
                                                       const std::string& language) {
  for (const std::string& appPath : appPaths) {
    const auto bundle = platform::Bundle::bundleWithPath(appPath);
    if (!bundle) {
      continue;
    }
    const auto identifiers = stringsOfValue(bundle->infoDictionary()[ZEBCFBundleHelpBookID]);
    const auto folders = stringsOfValue(bundle->infoDictionary()[ZEBCFBundleHelpBookFolder]);
    if (!identifiers || !folders || identifiers->size() != folders->size()) {
      continue;
    }
    for (size_t i = 0; i < identifiers->size(); ++i) {
      if (table.contains((*identifiers)[i])) {
        continue;
      }
      const std::optional<std::string> path =
          bundle->pathForResource((*folders)[i], std::nullopt, std::nullopt, language);
      const auto book = path ? ZEBHelpBook::initWithPath(*path) : nullptr;
      if (book) {
        // Under its own name, which may differ from the application's; an entry that is there
        // already stays.
        table.emplace(book->bookID(), book);
      } else {
        ZEBLog(1, "ERROR: Unable to create help book from %@", path);
      }
    }
  }
}
