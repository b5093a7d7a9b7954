#include "plugin/front/SearchMerging.h"

#include <algorithm>
#include <cmath>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"
#include "host/Zebrine/ZEBResult.h"

namespace {

/// From here on a semantic result is taken as named by the user.
constexpr double namedByUser = 0.99;
/// How far below its place the best keyword result stays, so that the semantic one comes first.
constexpr double keywordStep = 0.0001;

double relevanceOf(const std::shared_ptr<ZEBResult>& result) {
  return result->relevance().doubleValue();
}

/// The weight, absent for the primary book and where none is given.
std::optional<double> givenWeight(const ZEBResult& result,
                                  const std::optional<std::string>& primaryBookID) {
  const std::optional<std::string> bookID = result.bookID();
  // An absent identifier equals nothing, not even another absent one.
  if (bookID && primaryBookID && *bookID == *primaryBookID) {
    return std::nullopt;
  }
  const std::string identifier = bookID.value_or(std::string());
  const float groupWeight =
      HelpLUXModel::combiningWeightForModelGroupName(zeb_modelGroupNameForHelpbookID(identifier));
  const float bookWeight = zeb_combiningWeightForHelpbookID(identifier);
  if (bookWeight != 0) {
    return static_cast<double>(bookWeight);
  }
  return groupWeight != 0 ? std::optional(static_cast<double>(groupWeight)) : std::nullopt;
}

}  // namespace

double weightOfResult(const ZEBResult& result, const std::optional<std::string>& primaryBookID) {
  return givenWeight(result, primaryBookID).value_or(1.0);
}

void weightResult(ZEBResult& result, const std::optional<std::string>& primaryBookID) {
  if (const std::optional<double> weight = givenWeight(result, primaryBookID)) {
    result.setRelevance(result.relevance().doubleValue() * *weight);
  }
}

void sortByRelevance(std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::stable_sort(results.begin(), results.end(), [](const auto& a, const auto& b) {
    const double left = relevanceOf(a);
    const double right = relevanceOf(b);
    // What is not a number goes last: an order must hold for it too.
    return std::isnan(right) ? !std::isnan(left) : left > right;
  });
}

double keywordScale(const std::vector<std::shared_ptr<ZEBResult>>& semantic) {
  if (semantic.empty()) {
    return 1.0;
  }
  const auto place = std::find_if(semantic.begin(), semantic.end(), [](const auto& result) {
    return relevanceOf(result) < namedByUser;
  });
  return relevanceOf(place == semantic.end() ? semantic.back() : *place);
}

std::vector<std::shared_ptr<ZEBResult>> mergedResults(
    const std::vector<std::shared_ptr<ZEBResult>>& semantic,
    std::vector<std::shared_ptr<ZEBResult>> keyword,
    const std::optional<std::string>& primaryBookID) {
  sortByRelevance(keyword);
  const double top = relevanceOf(keyword.front());
  const double scale = keywordScale(semantic);
  for (const auto& result : keyword) {
    const double rescaled = relevanceOf(result) / top * scale - keywordStep;
    result->setRelevance(rescaled * weightOfResult(*result, primaryBookID));
  }
  keyword.insert(keyword.end(), semantic.begin(), semantic.end());
  sortByRelevance(keyword);
  return keyword;
}
