#include "host/Luxwell/LUXCompletion.h"

#include <algorithm>
#include <cstddef>
#include <span>
#include <string_view>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoring.h"
#include "host/Luxwell/LUXScoringBest.h"

namespace {

// Phrases have no more words.
constexpr size_t longestPhrase = 4;
constexpr uint32_t blockLength = LUXModelView::phraseBlockLength;
constexpr size_t usualCount = 64;
// So many blocks are looked at between two questions whether to give up.
constexpr uint32_t stepLength = 256;

}  // namespace

std::vector<LUXScoredPhrase> LUXCompletions(const LUXModelView& view, const LUXQueryTerms& terms,
                                            size_t count, std::optional<uint32_t> book,
                                            const LUXIsCancelled& isCancelled) {
  std::vector<LUXScoredPhrase> found;
  found.reserve(std::min(count, usualCount));
  const size_t words = terms.wordStarts.size();
  const std::span<const float> scores = view.phraseScores();
  const std::span<const float> maxima = view.phraseBlockMaxima();
  if (isCancelled && isCancelled()) {
    return {};
  }
  // What the best phrase gets: half as much for each word that was left aside.
  float most = luxscoring::highestScore;
  for (size_t dropped = words > longestPhrase ? words - longestPhrase : 0;
       dropped < words && found.size() < count; ++dropped, most /= 2) {
    const std::string_view typed =
        std::string_view(terms.foldedText).substr(terms.wordStarts[dropped]);
    const auto [first, last] = view.phraseRangeWithPrefix(typed);
    const uint32_t end = std::min(last, static_cast<uint32_t>(scores.size()));
    LUXBest best(count - found.size());
    for (uint32_t phrase = first; phrase < end;) {
      // Where no phrase of a block is good enough, the block need not be looked at.
      const uint32_t block = phrase / blockLength;
      if (block % stepLength == 0 && isCancelled && isCancelled()) {
        return {};
      }
      const uint32_t blockEnd = std::min(end, (block + 1) * blockLength);
      if (block < maxima.size() && !(maxima[block] >= best.threshold())) {
        phrase = blockEnd;
        continue;
      }
      for (; phrase < blockEnd; ++phrase) {
        if (scores[phrase] >= best.threshold() &&
            (!book || view.phraseOccursInBook(phrase, *book))) {
          best.add(phrase, scores[phrase]);
        }
      }
    }
    const size_t before = found.size();
    for (const LUXBest::Item& item : best.sorted()) {
      const auto isThis = [&](const LUXScoredPhrase& other) { return other.phrase == item.number; };
      const auto former = found.begin() + static_cast<std::ptrdiff_t>(before);
      if (std::none_of(found.begin(), former, isThis)) {
        found.push_back({item.number, most * (1 + std::min(item.score, 1.0F)) / 2});
      }
    }
  }
  return found;
}
