// Other ways to ask for what a text asks for.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "host/Luxwell/LUXCompletion.h"
#include "host/Luxwell/LUXQueryTerms.h"
#include "host/Luxwell/LUXScoring.h"

class LUXModelView;

/// A result profile is what a text finds: its best pages, each with the square of its score, as a
/// vector of unit length; pages that hardly answer it do not count. Texts that find the same pages
/// ask for the same thing, whatever words they use.
inline constexpr size_t LUXProfileLength = 5;

/// The profile of a text in the model; the scores are the components, in order of score.
std::vector<LUXScoredPage> LUXProfile(const LUXModelView& view, const LUXQueryTerms& terms,
                                      const LUXPageScope& scope, const LUXIsCancelled& isCancelled);

/// At most `count` phrases of the model, or of one of its books, by the cosine of their profile and
/// the text's, best first; of those with the same cosine, better phrases first. Phrases that have
/// the stems of the text, or of a phrase before them, say nothing new and are left out. `scope` are
/// the book's pages, or all. Empty when cancelled.
std::vector<LUXScoredPhrase> LUXSimilarPhrases(const LUXModelView& view, const LUXQueryTerms& terms,
                                               size_t count, const LUXPageScope& scope,
                                               std::optional<uint32_t> book,
                                               const LUXIsCancelled& isCancelled);
