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

bool isOfBook(const ZEBResult& result, const std::optional<std::string>& wantedBookID) {
  // An absent identifier equals nothing, not even another absent one.
  const std::optional<std::string> bookID = result.bookID();
  return bookID && wantedBookID && *bookID == *wantedBookID;
}

}  // namespace

double weightOfResult(const ZEBResult& result, const std::optional<std::string>& primaryBookID) {
  if (isOfBook(result, primaryBookID)) {
    return 1;
  }
  const std::string bookID = result.bookID().value_or(std::string());
  const float groupWeight =
      HelpLUXModel::combiningWeightForModelGroupName(zeb_modelGroupNameForHelpbookID(bookID));
  const float bookWeight = zeb_combiningWeightForHelpbookID(bookID);
  if (bookWeight != 0) {
    return static_cast<double>(bookWeight);
  }
  return groupWeight != 0 ? static_cast<double>(groupWeight) : 1;
}

void weightResult(ZEBResult& result, const std::optional<std::string>& primaryBookID) {
  if (!isOfBook(result, primaryBookID)) {
    result.setRelevance(result.relevance().doubleValue() * weightOfResult(result, primaryBookID));
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
  double scale = relevanceOf(semantic.front());
  if (scale >= namedByUser) {
    for (size_t i = 1; i < semantic.size(); ++i) {
      scale = relevanceOf(semantic[i]);
      if (scale < namedByUser) {
        break;
      }
    }
  }
  return scale;
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
