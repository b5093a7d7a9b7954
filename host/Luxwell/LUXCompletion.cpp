#include "host/Luxwell/LUXCompletion.h"

#include <algorithm>
#include <span>
#include <string_view>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoring.h"
#include "host/Luxwell/LUXScoringBest.h"

namespace {

// Phrases have no more words.
constexpr size_t longestPhrase = 4;
// So many phrases are looked at between two questions whether to give up.
constexpr uint32_t stepLength = 16384;

struct BestFirst {
  bool operator()(const LUXScoredPhrase& a, const LUXScoredPhrase& b) const {
    return a.score != b.score ? a.score > b.score : a.phrase < b.phrase;
  }
};

}  // namespace

std::vector<LUXScoredPhrase> LUXCompletions(const LUXModelView& view, const LUXQueryTerms& terms,
                                            size_t count, std::optional<uint32_t> book,
                                            const LUXIsCancelled& isCancelled) {
  std::vector<LUXScoredPhrase> found;
  const size_t words = terms.wordStarts.size();
  const std::span<const float> scores = view.phraseScores();
  // What the best phrase gets: half as much for each word that was left aside.
  float most = luxscoring::highestScore;
  for (size_t dropped = words > longestPhrase ? words - longestPhrase : 0;
       dropped < words && found.size() < count; ++dropped, most /= 2) {
    const std::string_view typed =
        std::string_view(terms.foldedText).substr(terms.wordStarts[dropped]);
    const auto [first, last] = view.phraseRangeWithPrefix(typed);
    const uint32_t end = std::min(last, static_cast<uint32_t>(scores.size()));
    LUXBest<LUXScoredPhrase, BestFirst> best(count - found.size(), BestFirst());
    for (uint32_t phrase = first; phrase < end; ++phrase) {
      if ((phrase - first) % stepLength == 0 && isCancelled && isCancelled()) {
        return {};
      }
      if (scores[phrase] >= best.threshold() && (!book || view.phraseOccursInBook(phrase, *book))) {
        best.add({phrase, scores[phrase]});
      }
    }
    for (const LUXScoredPhrase& phrase : best.sorted()) {
      const auto isThis = [&](const LUXScoredPhrase& other) {
        return other.phrase == phrase.phrase;
      };
      if (std::none_of(found.begin(), found.end(), isThis)) {
        found.push_back({phrase.phrase, most * (1 + phrase.score) / 2});
      }
    }
  }
  return found;
}
