// The sections of a model file, by type. docs/formats/lux-model.md has their content.
#pragma once

#include <cstddef>
#include <cstdint>

#include "host/Luxwell/LUXSectionedData.h"
#include "host/Luxwell/LUXTokenCounts.h"

/// A model in the container that book data uses too.
inline constexpr LUXContainerForm LUXModelForm{"LUXMODEL", 2, 0};

namespace luxmodel {

enum Section : uint32_t {
  numbersSection = 1,
  languageSection = 2,
  optionsSection = 3,

  bookOffsetsSection = 4,
  bookTextSection = 5,
  pageStartsOfBooksSection = 6,
  pageKeyOffsetsSection = 7,
  pageKeyTextSection = 8,

  pairStartsSection = 9,
  pairSecondsSection = 10,

  pageVectorsSection = 11,
  pageScalesSection = 12,
  termVectorNumbersSection = 13,
  termVectorsSection = 14,
  termScalesSection = 15,

  neighbourhoodCentresSection = 72,
  neighbourhoodStartsSection = 73,
  pagesOfNeighbourhoodsSection = 74,

  phraseFoldedOffsetsSection = 16,
  phraseFoldedHeadsSection = 17,
  phraseFoldedTextSection = 18,
  phraseTextOffsetsSection = 19,
  phraseTextSection = 20,
  phraseScoresSection = 21,
  phraseBlockMaximaSection = 22,
  phraseStemsKeysSection = 23,
  pagesOfPhraseStartsSection = 24,
  pagesOfPhrasesSection = 25,
  phrasesOfPageStartsSection = 26,
  phrasesOfPagesSection = 27,
  booksOfPhraseStartsSection = 28,
  booksOfPhrasesSection = 29,

  /// The sections of a kind's terms begin here, `sectionsOfKind` for each kind.
  firstTermSection = 32,
};

inline constexpr uint32_t sectionsOfKind = 8;

enum TermSection : uint32_t {
  termOffsets = 0,
  termHeads = 1,
  termText = 2,
  postingStarts = 3,
  postings = 4,
  hiddenTerms = 5,
  hiddenCounts = 6,
};

inline constexpr uint32_t sectionOfKind(LUXTokenKind kind, TermSection section) noexcept {
  return firstTermSection + sectionsOfKind * static_cast<uint32_t>(kind) + section;
}

/// The first eight bytes of a string as a number that orders as the bytes do, zeros behind a
/// shorter string.
inline constexpr uint64_t headOf(std::string_view string) noexcept {
  uint64_t head = 0;
  for (size_t i = 0; i < 8; ++i) {
    head = head << 8U | (i < string.size() ? static_cast<uint8_t>(string[i]) : 0U);
  }
  return head;
}

}  // namespace luxmodel
