// How good a phrase is as a suggestion.
#pragma once

#include <cstdint>

/// What is known of a phrase in a collection of pages: a book, or all books of a model.
struct LUXPhraseStatistics {
  /// Its words.
  uint32_t length = 1;
  /// How often it occurs, counting the places where it is part of a longer phrase.
  uint64_t frequency = 0;
  /// In how many pages it occurs, and how many pages there are.
  uint32_t pageCount = 0;
  uint32_t totalPageCount = 0;
  /// How many titles hold it.
  uint32_t titleCount = 0;
  /// How many longer phrases it is part of, and how often these occur in all.
  uint32_t longerPhraseCount = 0;
  uint64_t longerPhraseFrequency = 0;
};

/// Phrases found in fewer pages are not suggested.
inline constexpr uint32_t LUXPhraseMinimumPageCount = 3;

/// The score by which phrases are ranked as suggestions; never negative, 0 for one that does not
/// occur. It is the product of
///  - the C-value (K. Frantzi, S. Ananiadou, H. Mima, "Automatic recognition of multi-word terms",
///    2000): the logarithm of the length times the frequency, less what is owed to longer phrases
///    on the average. Single words, which it does not know, get .15 of their frequency, so that
///    phrases surface;
///  - 1 + the residual inverse document frequency (K. Church, W. Gale, "Inverse document frequency:
///    a measure of deviations from Poisson", 1995): words that gather in few pages are about
///    something;
///  - the root of 1 + the number of titles that hold it.
double LUXPhraseScore(const LUXPhraseStatistics& statistics) noexcept;
