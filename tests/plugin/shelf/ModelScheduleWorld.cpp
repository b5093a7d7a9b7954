#include "tests/plugin/shelf/ModelScheduleWorld.h"

#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/WorkerThreads.h"

namespace tests {

namespace {

thread_local double slept = 0;

void raise(std::atomic<double>& longest, double value) {
  double known = longest;
  while (known < value && !longest.compare_exchange_weak(known, value)) {
  }
}

}  // namespace

void ScheduleClock::sleep(platform::Seconds duration) {
  slept += duration.count();
  SimulatedClock::sleep(duration);
}

double ScheduleClock::sleptByThisThread() { return slept; }

void ScheduleOwner::addBook(const std::shared_ptr<ZEBHelpBook>& book) {
  const std::lock_guard lock(_mutex);
  _books[book->bookID()] = book;
}

void ScheduleOwner::forgetBook(const std::string& bookID) {
  const std::lock_guard lock(_mutex);
  _books.erase(bookID);
}

std::map<std::string, std::shared_ptr<ZEBHelpBook>> ScheduleOwner::knownBooks() const {
  const bool isSearch = platform::currentThreadName().starts_with("searcher");
  if (!isSearch && _breaksNextBuild.exchange(false)) {
    ++_brokenBuilds;
    throw platform::Exception("HostException", brokenBuildReason);
  }
  const std::lock_guard lock(_mutex);
  return _books;
}

std::shared_ptr<ZEBHelpBook> ScheduleOwner::bookWithID(const std::string& bookID) const {
  const std::lock_guard lock(_mutex);
  const auto found = _books.find(bookID);
  return found == _books.end() ? nullptr : found->second;
}

void ScheduleOwner::enableShutdown() {
  if (--_guards < 0) {
    _everNegative = true;
  }
}

void ScheduleOwner::pluginFoundResults(const std::shared_ptr<ZEBPlugin>& /*plugin*/,
                                       const ZEBResultBatch& foundResults,
                                       const std::shared_ptr<ZEBQuery>& forQuery) {
  const auto* const results = std::get_if<std::vector<std::shared_ptr<ZEBResult>>>(&foundResults);
  if (results == nullptr) {
    return;
  }
  const std::lock_guard lock(_mutex);
  for (const auto& result : *results) {
    _titles[forQuery->queryID()].push_back(result->title().value_or(std::string()));
  }
}

void ScheduleOwner::pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>& /*plugin*/,
                                                    const std::shared_ptr<ZEBQuery>& /*query*/) {
  ++_finished;
}

std::vector<std::string> ScheduleOwner::titlesFor(const std::string& queryID) const {
  const std::lock_guard lock(_mutex);
  const auto found = _titles.find(queryID);
  return found == _titles.end() ? std::vector<std::string>() : found->second;
}

void ModelScheduleLog::write(int level, std::string_view message) {
  const bool isBrokenBuild = message.find(brokenBuildReason) != std::string_view::npos;
  const bool isFromTheTool = message.starts_with("Task at ");
  const bool isFromARecord = message.starts_with("Error trying to unarchive index data.");
  if ((level <= 0 && !isBrokenBuild && !isFromTheTool && !isFromARecord) ||
      message.starts_with("Attemping to finish wrong activity")) {
    const std::lock_guard lock(_mutex);
    _surprises.emplace_back(message);
  }
}

std::vector<std::string> ModelScheduleLog::surprises() const {
  const std::lock_guard lock(_mutex);
  return _surprises;
}

ScheduleController::Results ScheduleController::doSearchForQuery(
    const std::shared_ptr<ZEBQuery>& query, const std::string& requestedResultType,
    const Indices& inIndices, const std::vector<std::string>& ignoringItems,
    std::set<std::string>* passingBackSearchedHelpbookIDs) {
  const auto clock = platform::Environment::current()->clock;
  const auto start = clock->elapsed();
  const double sleptBefore = ScheduleClock::sleptByThisThread();
  auto results = LUXSearchController::doSearchForQuery(
      query, requestedResultType, inIndices, ignoringItems, passingBackSearchedHelpbookIDs);
  raise(_longestSearch, (clock->elapsed() - start).count());
  raise(_longestSleep, ScheduleClock::sleptByThisThread() - sleptBefore);
  return results;
}

}  // namespace tests
