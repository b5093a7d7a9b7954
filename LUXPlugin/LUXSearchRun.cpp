#include "LUXPlugin/LUXSearchRun.h"

#include <algorithm>
#include <cmath>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/Strings.h"
#include "platform/WorkerThreads.h"

namespace {

constexpr platform::Seconds pollingInterval{0.010};
/// From here on a result counts as named by the user.
constexpr float namedByUser = 0.99F;
constexpr size_t suggestionLimit = 20;

int queryTypeForKind(const std::string& kind) {
  if (kind == ZEBHelpSuggestionResult) {
    return LUXQueryTypeCompletions;
  }
  if (kind == ZEBHelpSimilarSuggestionResult) {
    return LUXQueryTypeSimilar;
  }
  return kind == ZEBHelpActionResult ? LUXQueryTypeActions : LUXQueryTypeArticles;
}

size_t requestedCountForType(int queryType) { return queryType == LUXQueryTypeActions ? 1000 : 50; }

void sleepForPoll() { platform::Environment::current()->clock->sleep(pollingInterval); }

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

float relevanceOf(const std::shared_ptr<ZEBResult>& result) {
  return static_cast<float>(result->relevance().doubleValue());
}

void sortByRelevance(LUXSearchRun::Results& results) {
  std::stable_sort(results.begin(), results.end(), [](const auto& a, const auto& b) {
    const float left = relevanceOf(a);
    const float right = relevanceOf(b);
    // What is not a number goes last: an order must hold for it too.
    return std::isnan(right) ? !std::isnan(left) : left > right;
  });
}

bool contains(const std::vector<std::string>& strings, const std::string& wanted) {
  return std::find(strings.begin(), strings.end(), wanted) != strings.end();
}

}  // namespace

LUXSearchRun::LUXSearchRun(std::shared_ptr<LUXSearchController> controller,
                           std::shared_ptr<ZEBQuery> query, std::string requestedResultType)
    : _controller(std::move(controller)),
      _query(std::move(query)),
      _requestedResultType(std::move(requestedResultType)) {}

bool LUXSearchRun::_isSuggestion() const {
  return _requestedResultType == ZEBHelpSuggestionResult ||
         _requestedResultType == ZEBHelpSimilarSuggestionResult;
}

LUXSearchRun::Results LUXSearchRun::run(const std::vector<std::string>& ignoringItems,
                                        std::set<std::string>* passingBackSearchedHelpbookIDs) {
  ZEBLog(5, "Starting LUX search for query: \"%@\", scope: %@, desired result: %@",
         _query ? std::optional(_query->queryString()) : std::nullopt,
         _query ? ZEBLogArgument(_query->scope()) : ZEBLogArgument(nullptr), _requestedResultType);
  if (!_query || _query->queryString().empty()) {
    ZEBLog(5, "No query");
    return {};
  }
  if (!_readRequest()) {
    ZEBLog(5, "Couldn't determine target language: %@", _query->preferredLanguages());
    return {};
  }
  _controller->_beginQuery(_query->queryID());
  if (_requestedResultType != ZEBHelpSuggestionResult) {
    // Completions come with every key that is pressed, and must not stop the preload.
    _controller->_setQueryInProgress(true);
  }
  const std::vector<std::string> groups = _groupNames();
  const auto owner = _controller->owner();
  const auto shelf = _controller->indexshelf();
  if (owner && shelf) {
    shelf->setShouldBeLazy(owner->shouldBeLazy());
  }
  for (const std::string& group : groups) {
    if (!HelpLUXModel::modelExistsForGroupName(group, _language)) {
      _startBuild(group);
    }
  }
  _startQueries(groups, passingBackSearchedHelpbookIDs != nullptr);
  if (!_startedQueries.empty() && !_query->isCancelled()) {
    _waitForAnswers();
  }
  Results merged;
  if (!_query->isCancelled()) {
    merged = _mergedAnswers(ignoringItems, passingBackSearchedHelpbookIDs);
  }
  _finish();
  return merged;
}

bool LUXSearchRun::_readRequest() {
  _searchesAllBooks = _query->options()[ZEBQuerySearchAllBooksOptionKey].boolValue();
  if (_query->scope().size() == 1) {
    const auto owner = _controller->owner();
    const auto book = owner ? owner->bookWithID(_query->scope().front()) : nullptr;
    _focusedBookID = book ? std::optional(book->bookID()) : std::nullopt;
    if (!_searchesAllBooks) {
      _scopeBook = book;
    }
  } else {
    _focusedBookID = KROrvHelpbookID;
  }
  const std::vector<std::string> languages =
      _query->preferredLanguages().empty() ? platform::Environment::current()->preferredLanguages
                                           : _query->preferredLanguages();
  const auto localization = languages.empty()
                                ? std::nullopt
                                : HelpTokenizer::luxLocalizationForLanguage(languages.front());
  _language = localization.value_or(std::string());
  return localization.has_value();
}

std::vector<std::string> LUXSearchRun::_groupNames() const {
  if (!_scopeBook) {
    return HelpLUXModel::allModelGroupNames();
  }
  const std::string group = zeb_modelGroupNameForHelpbookID(_scopeBook->bookID());
  return group.empty() ? std::vector<std::string>() : std::vector<std::string>{group};
}

void LUXSearchRun::_startBuild(const std::string& group) {
  if (auto build = _controller->startBuildingModelGroupName(group, _language)) {
    _builds.push_back(std::move(build));
  }
}

void LUXSearchRun::_startQueries(const std::vector<std::string>& groups, bool notesBooks) {
  std::vector<std::string> pending = groups;
  size_t position = 0;
  const platform::Clock::Instant start = elapsedNow();
  const auto timedOut = [&] {
    return elapsedNow() - start >=
           platform::Seconds(static_cast<double>(_controller->_acquisitionSeconds()));
  };
  while (!timedOut() && !pending.empty() && !_query->isCancelled()) {
    if (_tryGroup(pending[position], groups.size() == 1, notesBooks)) {
      pending.erase(pending.begin() + static_cast<std::ptrdiff_t>(position));
    } else {
      ++position;
      sleepForPoll();
    }
    if (position >= pending.size()) {
      position = 0;
    }
  }
  if (!pending.empty() && timedOut()) {
    ZEBLog(5, "Timed out waiting for %@ to include in search.", pending);
  }
}

bool LUXSearchRun::_tryGroup(const std::string& group, bool isOnlyGroup, bool notesBooks) {
  if (!HelpLUXModel::modelExistsForGroupName(group, _language)) {
    return false;
  }
  const std::shared_ptr<HelpLUXModel> model =
      _controller->modelForGroupName(group, _language, true, kLUXModelActivityQuerying);
  ZEBLog(4, "model exists: %@", group);
  if (model && model->needsBuild()) {
    _startBuild(group);
    _controller->finishedActivity(kLUXModelActivityQuerying, group, _language);
    ZEBLog(4, "model exists: %@ needs build", group);
    return false;
  }
  ZEBLog(4, "model exists: %@ can be used", group);
  if (!model) {
    return false;
  }
  std::vector<std::string> bookIDs = model->allHelpbookIDs();
  if (_focusedBookID && !_searchesAllBooks && isOnlyGroup && !contains(bookIDs, *_focusedBookID)) {
    _controller->finishedActivity(kLUXModelActivityQuerying, group, _language);
    return true;
  }
  if (notesBooks) {
    _bookIDsOfGroups[group] = std::move(bookIDs);
  }
  _usedGroups.push_back(group);
  _startQuery(group, model);
  return true;
}

void LUXSearchRun::_startQuery(const std::string& group,
                               const std::shared_ptr<HelpLUXModel>& model) {
  const int queryType = queryTypeForKind(_requestedResultType);
  const std::shared_ptr<LUXQuery> luxQuery = LUXQuery::initWithString(
      _query->queryString(), _scopeBook ? std::optional(_scopeBook->bookID()) : std::nullopt,
      requestedCountForType(queryType), _controller, model, _query->copy());
  if (!luxQuery || _query->isCancelled()) {
    return;
  }
  luxQuery->setGroupName(group);
  luxQuery->setLanguage(_language);
  if (_focusedBookID) {
    luxQuery->setFocusedHelpbookID(_focusedBookID);
  }
  luxQuery->setQueryType(queryType);
  if (!_query->isCancelled()) {
    _startedQueries.push_back(luxQuery);
    platform::startNamedThread("query-run", [luxQuery] { luxQuery->run(); });
  }
  if (_scopeBook && queryType == LUXQueryTypeArticles) {
    luxQuery->setLuxIndex(_controller->_luxIndexForHelpbookIdentifier(_scopeBook->bookID()));
  }
}

void LUXSearchRun::_waitForAnswers() const {
  const platform::Clock::Instant start = elapsedNow();
  while (true) {
    sleepForPoll();
    if (_controller->_answerCount() >= _startedQueries.size() || _query->isCancelled() ||
        elapsedNow() - start >=
            platform::Seconds(static_cast<double>(_controller->_searchSeconds()))) {
      return;
    }
  }
}

void LUXSearchRun::_finish() {
  if (_query->isCancelled()) {
    // They have a copy of the host's query, which hears nothing of that.
    for (const auto& query : _startedQueries) {
      query->cancel();
    }
  }
  for (const std::string& group : _usedGroups) {
    _controller->finishedActivity(kLUXModelActivityQuerying, group, _language);
  }
  for (const auto& build : _builds) {
    if (!build->isFinished()) {
      ZEBLog(5, "Cancel model build task for group: %@", build->modelGroupName());
      build->cancel();
    }
  }
}

LUXSearchRun::Results LUXSearchRun::_mergedAnswers(
    const std::vector<std::string>& ignoringItems,
    std::set<std::string>* passingBackSearchedHelpbookIDs) const {
  std::map<std::string, Results> answers = _controller->_answersOfQuery(_query->queryID());
  if (passingBackSearchedHelpbookIDs != nullptr) {
    for (const auto& group : _bookIDsOfGroups) {
      passingBackSearchedHelpbookIDs->insert(group.second.begin(), group.second.end());
    }
  }
  const bool comparesTitles = _requestedResultType == ZEBHelpSimilarSuggestionResult;
  const auto isIgnored = [&](const std::shared_ptr<ZEBResult>& result) {
    const std::optional<std::string> content =
        comparesTitles ? result->title()
                       : result->payloadValueForKey(ZEBResultURLKey).stringValue();
    return content &&
           std::any_of(ignoringItems.begin(), ignoringItems.end(), [&](const std::string& item) {
             return comparesTitles ? platform::caseInsensitiveCompare(*content, item) == 0
                                   : *content == item;
           });
  };
  if (!ignoringItems.empty()) {
    for (auto& answer : answers) {
      std::erase_if(answer.second, isIgnored);
    }
  }
  if (answers.size() == 1) {
    return std::move(answers.begin()->second);
  }
  return _isSuggestion() ? _mergedSuggestions(answers) : _mergedArticles(answers);
}

LUXSearchRun::Results LUXSearchRun::_mergedArticles(
    const std::map<std::string, Results>& answers) const {
  float top = 0;
  for (const std::string& group : _usedGroups) {
    const auto answer = answers.find(group);
    if (answer != answers.end() && !answer->second.empty()) {
      top = std::max(top, relevanceOf(answer->second.front()));
    }
  }
  Results merged;
  for (const std::string& group : _usedGroups) {
    const auto answer = answers.find(group);
    if (answer == answers.end()) {
      continue;
    }
    const float groupWeight = HelpLUXModel::combiningWeightForModelGroupName(group);
    for (const auto& result : answer->second) {
      const std::optional<std::string> bookID = result->bookID();
      float relevance = relevanceOf(result);
      const bool isNamed = relevance >= namedByUser && bookID && bookID == _focusedBookID;
      if (!isNamed) {
        const float bookWeight = zeb_combiningWeightForHelpbookID(bookID.value_or(std::string()));
        relevance /= top;
        if (bookWeight != 0) {
          relevance *= bookWeight;
        } else if (groupWeight != 0) {
          relevance *= groupWeight;
        }
      }
      result->setRelevance(static_cast<double>(relevance));
      merged.push_back(result);
    }
  }
  sortByRelevance(merged);
  return merged;
}

LUXSearchRun::Results LUXSearchRun::_mergedSuggestions(
    const std::map<std::string, Results>& answers) const {
  Results merged;
  for (const std::string& group : _usedGroups) {
    const auto answer = answers.find(group);
    if (answer == answers.end()) {
      continue;
    }
    if (merged.empty()) {
      merged = answer->second;
      continue;
    }
    for (const auto& result : answer->second) {
      const auto same = std::find_if(merged.begin(), merged.end(), [&](const auto& other) {
        return result->title() && other->title() == result->title();
      });
      if (same == merged.end()) {
        merged.push_back(result);
      } else {
        (*same)->setRelevance(static_cast<double>(relevanceOf(*same) + relevanceOf(result)));
      }
    }
  }
  sortByRelevance(merged);
  const size_t limit = _query->limit() == 0 ? suggestionLimit : _query->limit();
  if (merged.size() > limit) {
    merged.resize(limit);
  }
  return merged;
}
