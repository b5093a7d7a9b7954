// What a half typed text may become.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "host/Luxwell/LUXQueryTerms.h"

class LUXModelView;

/// A phrase by its number in the model, with what it is worth as a suggestion, from 0 to 1.
struct LUXScoredPhrase {
  uint32_t phrase = 0;
  float score = 0;

  friend bool operator==(const LUXScoredPhrase&, const LUXScoredPhrase&) = default;
};

/// At most `count` phrases of the model, or of one of its books, that begin with the text; best
/// first. Where there are too few, phrases follow that begin with what is left of the text without
/// its first word, its first two words and so on: half a question still completes its last words.
/// The score tells first how much of the text was used, then how good the phrase is (see
/// LUXPhraseScore). Empty when cancelled.
std::vector<LUXScoredPhrase> LUXCompletions(const LUXModelView& view, const LUXQueryTerms& terms,
                                            size_t count, std::optional<uint32_t> book,
                                            const LUXIsCancelled& isCancelled);
