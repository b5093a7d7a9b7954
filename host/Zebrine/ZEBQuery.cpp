#include "host/Zebrine/ZEBQuery.h"

#include <cstdint>
#include <utility>

#include "host/Zebrine/ZEBLog.h"

namespace {

std::string nextQueryID() {
  static std::atomic<uint64_t> lastQueryID{0};
  return std::to_string(lastQueryID.fetch_add(1, std::memory_order_relaxed) + 1);
}

}  // namespace

ZEBQuery::ZEBQuery(std::string queryString)
    : _queryString(std::move(queryString)), _queryID(nextQueryID()) {}

ZEBQuery::ZEBQuery(const ZEBQuery& other)
    : _queryString(other._queryString),
      _options(other._options),
      _resultTypes(other._resultTypes),
      _scope(other._scope),
      _preferredLanguages(other._preferredLanguages),
      _limit(other._limit),
      _queryID(other._queryID),
      _cancelled(other.cancelled()) {}

std::shared_ptr<ZEBQuery> ZEBQuery::initWithQueryString(std::string queryString) {
  return std::shared_ptr<ZEBQuery>(new ZEBQuery(std::move(queryString)));
}

std::shared_ptr<ZEBQuery> ZEBQuery::copy() const {
  return std::shared_ptr<ZEBQuery>(new ZEBQuery(*this));
}

std::string ZEBQuery::description() const {
  return ZEBStringWithFormat("query %@: \"%@\" in %@ for %@", _queryID, _queryString, _scope,
                             _resultTypes);
}
