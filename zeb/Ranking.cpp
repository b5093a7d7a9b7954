#include "zeb/Ranking.h"

#include <algorithm>
#include <cmath>

namespace zeb {

namespace {

double scoreWithoutSize(const RankedPage& page) {
  return page.score / std::log(2.0 + static_cast<double>(page.bookPageCount));
}

double titleShare(const RankedPage& page, const std::vector<std::string>& queryTerms) {
  if (queryTerms.empty()) {
    return 0;
  }
  const auto count =
      std::count_if(queryTerms.begin(), queryTerms.end(), [&page](const std::string& word) {
        return std::any_of(page.titleTerms.begin(), page.titleTerms.end(),
                           [&word](const std::string& term) { return term.starts_with(word); });
      });
  return static_cast<double>(count) / static_cast<double>(queryTerms.size());
}

}  // namespace

std::vector<double> relevances(const std::vector<RankedPage>& pages,
                               const std::vector<std::string>& queryTerms) {
  std::vector<double> relevances;
  relevances.reserve(pages.size());
  double best = 0;
  for (const RankedPage& page : pages) {
    best = std::max(best, scoreWithoutSize(page));
  }
  for (const RankedPage& page : pages) {
    const double share = best > 0 ? scoreWithoutSize(page) / best : 0;
    relevances.push_back((share + titleShare(page, queryTerms)) / 2);
  }
  return relevances;
}

}  // namespace zeb
