// A query's terms found in a model, with all that does not depend on the page.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "host/Luxwell/LUXQueryTerms.h"

class LUXModelView;

/// What LUXScoring adds up. Lists are views into the model or into `unions`.
/// Thread-safety: immutable.
struct LUXScoringPlan {
  struct List {
    /// See LUXModelView::postings().
    std::span<const uint32_t> postings;
    /// What one step of the impact adds to `lexical`.
    float weight = 0;
  };

  std::vector<List> lists;
  /// Postings made for words that are still being typed.
  std::vector<std::vector<uint32_t>> unions;
  /// Pages whose title the query is.
  std::span<const uint32_t> titlePages;
  /// Share of the query that the model knows.
  float known = 0;
  /// The weight of meaning in the score.
  float latentWeight = 0;
  /// The query in latent space, of the model's stride, and what makes it a unit vector; empty when
  /// none of its terms has a place there.
  std::vector<int8_t> latent;
  float latentScale = 0;

  LUXScoringPlan() = default;
  LUXScoringPlan(LUXScoringPlan&&) = default;
  LUXScoringPlan& operator=(LUXScoringPlan&&) = default;
  LUXScoringPlan(const LUXScoringPlan&) = delete;
  LUXScoringPlan& operator=(const LUXScoringPlan&) = delete;

  static LUXScoringPlan planForTerms(const LUXModelView& view, const LUXQueryTerms& terms,
                                     const LUXIsCancelled& isCancelled);
};
