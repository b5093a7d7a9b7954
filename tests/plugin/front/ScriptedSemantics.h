// A semantic search controller that answers as a test tells it to.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "LUXPlugin/LUXSearchController.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/WorkerThreads.h"

namespace tests {

/// Thread-safety: confined to one thread.
class ScriptedSemantics : public LUXSearchController {
 public:
  struct Call {
    std::string requestedResultType;
    std::vector<std::shared_ptr<ZEBIndex>> inIndices;
    std::vector<std::string> ignoringItems;
    bool passesBackSearchedBooks;
  };

  ScriptedSemantics() : LUXSearchController(nullptr) {}

  void setIndexshelf(const std::shared_ptr<ZEBIndexshelf>&) override {}
  void useShorterTimeouts(bool useShorterTimeouts) override {
    steps.emplace_back(useShorterTimeouts ? "shorter" : "not shorter");
  }

  Results doSearchForQuery(const std::shared_ptr<ZEBQuery>& query,
                           const std::string& requestedResultType,
                           const std::vector<std::shared_ptr<ZEBIndex>>& inIndices,
                           const std::vector<std::string>& ignoringItems,
                           std::set<std::string>* passingBackSearchedHelpbookIDs) override {
    steps.push_back(requestedResultType);
    calls.push_back(
        {requestedResultType, inIndices, ignoringItems, passingBackSearchedHelpbookIDs != nullptr});
    if (passingBackSearchedHelpbookIDs != nullptr) {
      *passingBackSearchedHelpbookIDs = searchedBooks;
    }
    if (onSearch) {
      onSearch(query);
    }
    const auto answer = answers.find(requestedResultType);
    return answer == answers.end() ? Results() : answer->second;
  }

  void completeSearchQuery(const std::shared_ptr<ZEBQuery>& query) override {
    completed.push_back(query);
  }
  void loadLUXModels() override {
    if (onLoad) {
      onLoad();
    }
  }

  /// By kind of result; a kind that is not there has an empty answer.
  std::map<std::string, Results> answers;
  std::set<std::string> searchedBooks;
  std::function<void(const std::shared_ptr<ZEBQuery>& query)> onSearch;
  std::function<void()> onLoad;

  std::vector<std::string> steps;
  std::vector<Call> calls;
  std::vector<std::shared_ptr<ZEBQuery>> completed;
};

/// A record as a search by meaning makes it.
inline std::shared_ptr<ZEBResult> semanticResult(const std::string& title,
                                                 platform::Value relevance,
                                                 const std::string& bookID,
                                                 const std::string& type = ZEBHelpArticleResult) {
  auto result = ZEBResult::initWithTitle(title, type);
  result->setRelevance(std::move(relevance));
  result->setMutablePayload({{ZEBResultURLKey, "file:///semantic/" + title + ".html"},
                             {ZEBResultBookIDKey, bookID},
                             {ZEBResultUsesExternalViewerKey, false}});
  return result;
}

}  // namespace tests
