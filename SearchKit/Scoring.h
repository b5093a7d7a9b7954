// How relevant a page is to a term: BM25 over weighted frequencies.
//
// A word in the title says more of what a page is about than one in a heading, and that more than
// one in running text. So the writer counts each occurrence with the weight of its field, and the
// index keeps that one sum per page and term (S. Robertson, H. Zaragoza, M. Taylor, "Simple BM25
// Extension to Multiple Weighted Fields", 2004). The sum then saturates: the tenth occurrence adds
// less than the second.
//
//   score = idf(n) * f (k1 + 1) / (f + k1 (1 - b + b length / averageLength))
//   idf(n) = ln(1 + (N - n + 1/2) / (n + 1/2))
//
// f: the page's weighted frequency, summed over all terms that a prefix or pattern matches, with
// those terms that are not the typed word itself counting a quarter. n: pages that have the term;
// for a prefix the sum over its terms, at most N. N: pages in the index. A page's score is the sum
// over the terms of the query that it has. This form of idf is above zero for every n up to N, so
// every score is above zero, and all are finite.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>

namespace searchkit {

/// Weights of one occurrence. A title of one word outweighs a heading and half a dozen mentions in
/// the text; a page cannot be lifted above it by repetition alone, since frequencies saturate.
inline constexpr uint32_t bodyWeight = 1;
inline constexpr uint32_t headingWeight = 3;
inline constexpr uint32_t titleWeight = 10;

/// An occurrence of the typed word counts this many times one of a word that merely begins with it:
/// "print*" means first of all print, then printer and printing.
inline constexpr float exactFactor = 4;

/// Where frequencies saturate and how far length matters. The customary 1.2 and 0.75; b is lower
/// here because help pages are short for lack of things to say, not for being to the point.
inline constexpr float saturation = 1.2F;
inline constexpr float lengthInfluence = 0.5F;

/// Scores pages of one index. Thread-safety: immutable.
class Scorer {
 public:
  Scorer() = default;
  Scorer(uint32_t documentCount, uint64_t wordCount) noexcept
      : _documentCount(static_cast<double>(std::max<uint32_t>(documentCount, 1))) {
    // The counts come from outside: whatever they are, the average is a number of at least one.
    const double average = std::max(1.0, static_cast<double>(wordCount) / _documentCount);
    _lengthFactor = static_cast<float>(saturation * lengthInfluence / average);
  }

  /// The weight of a term that `documentCount` pages have (more than there are counts as all).
  float inverseDocumentFrequency(uint64_t documentCount) const noexcept {
    const double n = std::clamp(static_cast<double>(documentCount), 1.0, _documentCount);
    // The sum under the logarithm is this quotient, which is above one whatever n is.
    return static_cast<float>(std::log((_documentCount + 1) / (n + 0.5)));
  }

  /// `frequency` is in units of 1 / exactFactor and above zero.
  float score(float inverseDocumentFrequency, float frequency, uint32_t length) const noexcept {
    const float f = frequency / exactFactor;
    const float norm =
        saturation * (1 - lengthInfluence) + _lengthFactor * static_cast<float>(length);
    return inverseDocumentFrequency * f * (saturation + 1) / (f + norm);
  }

 private:
  double _documentCount = 1;
  float _lengthFactor = 0;
};

}  // namespace searchkit
