#include "host/Luxwell/LUXSimilar.h"

#include <algorithm>
#include <cmath>
#include <span>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXStemsKey.h"

namespace {

// A quarter of what is shown at all: what scores less says nothing of what is asked for.
constexpr float leastScore = luxscoring::cutoff / 4;

uint32_t stemsKey(const LUXQueryTerms& terms) {
  std::vector<std::string_view> stems;
  for (const LUXQueryTerms::Term& term : terms.stems) {
    stems.emplace_back(term.token);
  }
  return LUXStemsKey(std::move(stems));
}

// What is no number has no place in an order.
float goodness(float score) { return score > 0 ? score : 0; }

}  // namespace

std::vector<LUXScoredPage> LUXProfile(const LUXModelView& view, const LUXQueryTerms& terms,
                                      const LUXPageScope& scope,
                                      const LUXIsCancelled& isCancelled) {
  std::vector<LUXScoredPage> profile =
      LUXScoring(view).bestPages(terms, LUXProfileLength, scope, isCancelled);
  std::erase_if(profile, [](const LUXScoredPage& page) { return page.score < leastScore; });
  float squares = 0;
  for (LUXScoredPage& page : profile) {
    page.score *= page.score;
    squares += page.score * page.score;
  }
  if (!(squares > 0)) {
    return {};
  }
  for (LUXScoredPage& page : profile) {
    page.score /= std::sqrt(squares);
  }
  return profile;
}

std::vector<LUXScoredPhrase> LUXSimilarPhrases(const LUXModelView& view, const LUXQueryTerms& terms,
                                               size_t count, const LUXPageScope& scope,
                                               std::optional<uint32_t> book,
                                               const LUXIsCancelled& isCancelled) {
  const std::span<const float> scores = view.phraseScores();
  std::vector<LUXScoredPhrase> products;
  for (const LUXScoredPage& page : LUXProfile(view, terms, scope, isCancelled)) {
    const auto former = static_cast<std::ptrdiff_t>(products.size());
    for (const LUXModelView::Share& share : view.phrasesOfPage(page.page)) {
      // A damaged model may hold what is no number.
      if (share.number < scores.size() && share.weight > 0) {
        products.push_back({share.number, page.score * std::min(share.weight, 1.0F)});
      }
    }
    // Each page has its phrases in order.
    std::inplace_merge(products.begin(), products.begin() + former, products.end(),
                       [](const auto& a, const auto& b) { return a.phrase < b.phrase; });
  }
  std::vector<LUXScoredPhrase> cosines;
  for (const LUXScoredPhrase& product : products) {
    if (cosines.empty() || cosines.back().phrase != product.phrase) {
      cosines.push_back(product);
    } else {
      cosines.back().score += product.score;
    }
  }
  const auto isWorse = [&](const LUXScoredPhrase& a, const LUXScoredPhrase& b) {
    if (a.score != b.score) {
      return a.score < b.score;
    }
    const float aScore = goodness(scores[a.phrase]);
    const float bScore = goodness(scores[b.phrase]);
    return aScore != bScore ? aScore < bScore : a.phrase > b.phrase;
  };
  // A heap, since few of many are taken, and it is not known how many have to be passed over.
  std::make_heap(cosines.begin(), cosines.end(), isWorse);
  std::unordered_set<uint32_t> keys{stemsKey(terms)};
  std::vector<LUXScoredPhrase> found;
  while (!cosines.empty() && found.size() < count) {
    if (isCancelled && isCancelled()) {
      return {};
    }
    std::pop_heap(cosines.begin(), cosines.end(), isWorse);
    const LUXScoredPhrase phrase = cosines.back();
    cosines.pop_back();
    if ((!book || view.phraseOccursInBook(phrase.phrase, *book)) &&
        keys.insert(view.phraseStemsKey(phrase.phrase)).second) {
      found.push_back({phrase.phrase, std::min(phrase.score, luxscoring::highestScore)});
    }
  }
  return found;
}
