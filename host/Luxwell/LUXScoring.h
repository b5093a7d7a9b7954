// Which pages of a model answer a query best.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <limits>
#include <span>
#include <vector>

#include "host/Luxwell/LUXQueryTerms.h"

class LUXModelView;

/// A page by its number in the model, with what it is worth as an answer, from 0 to 1.
struct LUXScoredPage {
  uint32_t page = 0;
  float score = 0;

  friend bool operator==(const LUXScoredPage&, const LUXScoredPage&) = default;
};

/// Pages from `first` to before `end`. Those from `focusFirst` to before `focusEnd` come first
/// among pages of the same score.
struct LUXPageScope {
  uint32_t first = 0;
  uint32_t end = std::numeric_limits<uint32_t>::max();
  uint32_t focusFirst = 0;
  uint32_t focusEnd = 0;
};

/// The constants of the score. docs/quality.md tells what else was tried.
namespace luxscoring {

/// Share of word pairs beside single words.
inline constexpr float bigramWeight = 0.2F;
/// Share of words as they stand beside their stems: commands and options are no words to be bent.
inline constexpr float formWeight = 0.15F;
/// The most that meaning may count for, and the number of terms over which it comes up to that.
inline constexpr float latentWeight = 0.2F;
inline constexpr float latentTerms = 6;
/// The most that longer words count for beside a known one that is still being typed.
inline constexpr float continuationWeight = 0.6F;
/// Exact titles have 1; whatever else is found stays below what counts as named by the user.
inline constexpr float exactTitleScore = 1;
inline constexpr float highestScore = 0.989F;
/// Questions of this many terms or more seldom have all their words in one page. The score that is
/// to them what `cutoff` is to shorter ones is moved there, the scores around it in proportion.
inline constexpr size_t longQueryTerms = 6;
inline constexpr float longQueryCutoff = 0.12F;
inline constexpr float cutoff = 0.20F;
/// Where the best page is above the cut-off, so is every page that has more than this share of its
/// score: the cut-off tells whether a query has an answer at all, not how long the answer is.
inline constexpr float shareAboveCutoff = 0.3F;

}  // namespace luxscoring

/// Scores the pages of one model.
///
///     score = known² * ((1 - w) * lexical + w * max(0, cosine))
///
/// `lexical` is BM25F over stems (S. Robertson, H. Zaragoza, M. Taylor, "Simple BM25 extension to
/// multiple weighted fields", 2004) with smaller shares for pairs of stems and for words as they
/// stand, divided by what a page could reach at most that had nothing but these words. `cosine` is
/// that of query and page in the latent space of the model (S. Deerwester and others, "Indexing by
/// latent semantic analysis", 1990); w grows with the number of terms. `known` is the share that
/// the words known to the model have in the query, by inverse document frequency, words never seen
/// counting as the rarest: without it queries about other subjects find something by their common
/// words. A page whose title is the query has 1.
///
/// A last word that is still being typed and is unknown counts as whichever words begin with it; so
/// does any other word that is unknown, but it stays half unknown. One that is known may still
/// become a longer word: pages that have a longer one alone count a share of what that is worth,
/// the share that they are of all pages with either. A query of stop words alone is looked up by
/// forms, without meaning.
///
/// Pages that share no word with the query can have w * cosine at most. They are looked at only
/// where fewer pages than wanted share a word with it.
///
/// Costs: one addition for each page of each term; inner products for those pages alone that may
/// still come among the best. Thread-safety: immutable; the view must outlive it.
class LUXScoring {
 public:
  explicit LUXScoring(const LUXModelView& view) : _view(view) {}

  /// At most `count` pages with a score above 0, best first; equal ones in order of their numbers.
  /// Empty when cancelled.
  std::vector<LUXScoredPage> bestPages(const LUXQueryTerms& terms, size_t count,
                                       const LUXPageScope& scope = {},
                                       const LUXIsCancelled& isCancelled = {}) const;

 private:
  const LUXModelView& _view;
};

/// Moves luxscoring::shareAboveCutoff of the best score to the cut-off, and all scores but the best
/// in proportion, where the best is above the cut-off and that share of it is not. `pages` is in
/// order of scores, and stays so.
void LUXLiftAboveCutoff(std::span<LUXScoredPage> pages);
