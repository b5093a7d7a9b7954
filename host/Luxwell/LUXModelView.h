// A saved language model, read where it lies.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "host/Luxwell/LUXTokenCounts.h"
#include "platform/Data.h"
#include "platform/Value.h"

class LUXSectionedData;

/// How much a page is worth for a term, and which page: what a list of postings consists of.
///
/// The impact is round(1023 * (tf / (k1 + tf) + e * early) / (1 + e)), at least 1, where tf is the
/// page's count of the term, weighted by field and divided by the field's relative length
/// (S. Robertson, H. Zaragoza, "The probabilistic relevance framework: BM25 and beyond", 2009), and
/// `early` is 1 for a term that the page begins with and falls to 1/2 after h words: pages say
/// first what they are about. luxmodel has the constants. A query multiplies it by the term's own
/// weight and has nothing else to compute.
namespace luxposting {

inline constexpr unsigned impactBits = 10;
inline constexpr uint32_t maximumImpact = (uint32_t{1} << impactBits) - 1;
inline constexpr uint32_t maximumPageCount = uint32_t{1} << (32 - impactBits);

inline constexpr uint32_t page(uint32_t posting) noexcept { return posting >> impactBits; }
inline constexpr uint32_t impact(uint32_t posting) noexcept { return posting & maximumImpact; }
inline constexpr uint32_t posting(uint32_t page, uint32_t impact) noexcept {
  return page << impactBits | impact;
}

}  // namespace luxposting

/// The constants that are built into a model. docs/quality.md tells what else was tried.
namespace luxmodel {

/// How fast repetitions stop counting, and how much more one occurrence in a title counts.
inline constexpr double saturation = 2.25;
inline constexpr double titleWeight = 4;
/// A field that is longer than the average has more of everything by chance: counts are divided by
/// 1 - share + share * (length / average)^exponent. Long bodies are not that much less about their
/// subject than their length says. Pairs of stems have one field that is as long as both.
inline constexpr double titleLengthShare = 0.5;
inline constexpr double titleLengthExponent = 1;
inline constexpr double bodyLengthShare = 0.9;
inline constexpr double bodyLengthExponent = 0.55;
/// What it is worth beside all occurrences that a page begins with a term (e), and after how many
/// words it is worth half of that (h).
inline constexpr double earlyShare = 0.25;
inline constexpr double earlyHalfLength = 30;

/// Pages from which on there are neighbourhoods.
inline constexpr size_t neighbourhoodPageCount = 512;

/// Vectors are filled up with zeros to a multiple of this, and no longer than that.
inline constexpr uint32_t vectorBlock = 32;
inline constexpr uint32_t maximumStride = 320;

}  // namespace luxmodel

/// What a model knows: pages, terms with the pages that they are in, the meaning of terms and pages
/// as vectors, and phrases that can be offered as suggestions. docs/formats/lux-model.md has the
/// bytes.
///
/// Pages that may be found are numbered from 0, those of one book after another. Terms of a kind
/// are numbered from 0 in order of bytes (pairs of stems: of the one stem, then the other), phrases
/// in order of bytes of their folded text.
///
/// Opening reads the header and the table of sections, not the sections: it takes the same time
/// whatever the size. So what is read later may be damaged, or may become so while it is open.
/// Every function therefore answers something for whatever the file says, and reads nothing outside
/// of it: what does not fit counts as not there. That leaves to the caller: the pages that postings
/// and phrases name, and the phrases that pages name, may be above what there is, and lists may not
/// be in order.
///
/// Strings and spans lie in the bytes of the model and live as long as the view.
/// Thread-safety: immutable.
class LUXModelView {
 public:
  /// Null for what is no model, is of another version, or does not have all of its bytes.
  static std::shared_ptr<const LUXModelView> viewWithData(const platform::Data& data);
  /// The same for a model that is not written yet. Sections must start at multiples of 8.
  static std::shared_ptr<const LUXModelView> viewWithSections(LUXSectionedData sections);

  ~LUXModelView();
  LUXModelView(const LUXModelView&) = delete;
  LUXModelView& operator=(const LUXModelView&) = delete;

  /// Reads all bytes and tells whether they are those that were written. Linear in the size.
  bool checksumsMatch() const;

  /// HelpTokenizer::version() of the process that made the model.
  uint32_t tokenizerVersion() const noexcept { return _numbers.tokenizerVersion; }
  /// Folder name of the language.
  std::string_view language() const noexcept { return _language; }
  /// What HelpLUXModel::saveWithOptions() was given; absent when that cannot be read.
  platform::Value options() const;

  // Books, in the order in which they were added.

  size_t bookCount() const noexcept { return _numbers.bookCount; }
  /// The full identifier, versions included; empty for a number that is too high.
  std::string_view bookID(uint32_t book) const noexcept;
  std::optional<uint32_t> bookNumber(std::string_view bookID) const noexcept;
  /// The numbers of its first page and of the one after its last. Both 0 when there are none.
  std::pair<uint32_t, uint32_t> pageRangeOfBook(uint32_t book) const noexcept;

  // Pages.

  struct Page {
    uint32_t book = 0;
    /// Path within the book, without a slash before it.
    std::string_view key;
  };

  /// Pages that may be found.
  size_t pageCount() const noexcept { return _numbers.pageCount; }
  /// All pages, also those that only lend the model their words.
  size_t totalPageCount() const noexcept { return _numbers.totalPageCount; }
  /// Book 0 and an empty key for a number that is too high.
  Page page(uint32_t page) const noexcept;

  // Terms: every kind but phrases.

  size_t termCount(LUXTokenKind kind) const noexcept;
  std::optional<uint32_t> termNumber(LUXTokenKind kind, std::string_view token) const noexcept;
  /// The terms that begin with `prefix`: the first and the one after the last. None for bigrams.
  std::pair<uint32_t, uint32_t> termRangeWithPrefix(LUXTokenKind kind,
                                                    std::string_view prefix) const noexcept;
  std::string term(LUXTokenKind kind, uint32_t number) const;
  /// termNumber() of a pair whose stems' numbers are known.
  std::optional<uint32_t> pairNumber(uint32_t firstStem, uint32_t secondStem) const noexcept;
  /// Out of totalPageCount(). At least the number of postings.
  uint32_t documentFrequency(LUXTokenKind kind, uint32_t number) const noexcept;
  /// luxposting, in order of pages, each page once. Pages that may not be found have none.
  /// The impact of a title is always the highest.
  std::span<const uint32_t> postings(LUXTokenKind kind, uint32_t number) const noexcept;

  // Meaning. A vector has rank() numbers from -127 to 127 and zeros up to stride(), a multiple of
  // 32; times its scale it is what it stands for. A scale of 0 means that there is none.

  size_t rank() const noexcept { return _numbers.rank; }
  size_t stride() const noexcept { return _numbers.stride; }
  /// The page in the space of meaning, of length 1. Null for a number that is too high and for
  /// models without that space.
  const int8_t* pageVector(uint32_t page) const noexcept;
  float pageScale(uint32_t page) const noexcept;
  /// All of them: pageCount() scales and as many vectors; nothing where there is no such space.
  std::span<const float> pageScales() const noexcept { return _pageScales; }
  const int8_t* pageVectors() const noexcept {
    return _pageScales.empty() ? nullptr : _pageVectors.data();
  }
  /// The direction of a stem; the scale holds its global weight too, so that a query is the sum of
  /// log2(1 + count) * termScale() * termVector(). Null for stems that have none.
  const int8_t* termVector(uint32_t stem) const noexcept;
  float termScale(uint32_t stem) const noexcept;

  // Neighbourhoods: pages of similar meaning, so that those near a query are found without looking
  // at all. Each page that has a vector is in the one whose centre it is nearest to. There are none
  // in small models.

  size_t neighbourhoodCount() const noexcept { return _neighbourhoodCentres.size(); }
  /// A page; 0 for a number that is too high.
  uint32_t neighbourhoodCentre(size_t neighbourhood) const noexcept;
  /// Rising.
  std::span<const uint32_t> pagesOfNeighbourhood(size_t neighbourhood) const noexcept;

  // Phrases for suggestions.

  /// A page with the share that it has in a phrase, or a phrase with the share of a page. The
  /// weights of a phrase are squared scores of its pages, divided by their Euclidean length.
  struct Share {
    uint32_t number = 0;
    float weight = 0;
  };

  static constexpr size_t phraseBlockLength = 64;
  static constexpr size_t maximumPagesOfPhrase = 5;

  size_t phraseCount() const noexcept { return _numbers.phraseCount; }
  /// For showing.
  std::string_view phraseText(uint32_t phrase) const noexcept;
  /// The forms of its words, put together by HelpTokenizer::appendToDisplay(). Each phrase has
  /// another.
  std::string_view phraseFoldedText(uint32_t phrase) const noexcept;
  /// The phrases whose folded text begins with `prefix`.
  std::pair<uint32_t, uint32_t> phraseRangeWithPrefix(std::string_view prefix) const noexcept;
  /// LUXPhraseScore() as a share of the best phrase's, 0 to 1; one for each phrase.
  std::span<const float> phraseScores() const noexcept { return _phraseScores; }
  /// The highest score of each phraseBlockLength phrases.
  std::span<const float> phraseBlockMaxima() const noexcept { return _phraseBlockMaxima; }
  /// Equal for phrases that have the same stems, in whatever order (LUXStemsKey()).
  uint32_t phraseStemsKey(uint32_t phrase) const noexcept;
  /// The pages that the phrase finds as a query, best first, at most maximumPagesOfPhrase.
  std::span<const Share> pagesOfPhrase(uint32_t phrase) const noexcept;
  /// The phrases among whose pages this one is, by number.
  std::span<const Share> phrasesOfPage(uint32_t page) const noexcept;
  /// Whether a page of the book that may be found holds the phrase.
  bool phraseOccursInBook(uint32_t phrase, uint32_t book) const noexcept;

  /// The fixed numbers of a model, as its first section has them.
  struct Numbers {
    uint32_t tokenizerVersion = 0;
    uint32_t bookCount = 0;
    uint32_t pageCount = 0;
    uint32_t totalPageCount = 0;
    uint32_t rank = 0;
    uint32_t stride = 0;
    uint32_t termVectorCount = 0;
    uint32_t phraseCount = 0;
    /// By LUXTokenKind; that of phrases is 0.
    std::array<uint32_t, LUXTokenKindCount> termCounts{};
  };

 private:
  /// Strings one after the other in order of bytes, found by their first eight bytes.
  struct Strings {
    std::span<const uint32_t> offsets;
    std::span<const uint64_t> heads;
    std::string_view text;

    std::string_view at(size_t number) const noexcept;
    uint32_t lowerBound(std::string_view string) const noexcept;
    std::pair<uint32_t, uint32_t> rangeWithPrefix(std::string_view prefix) const noexcept;
  };
  struct Terms {
    Strings strings;
    std::span<const uint32_t> postingStarts;
    std::span<const uint32_t> postings;
    /// Terms of pages that may not be found, and in how many of those each is.
    std::span<const uint32_t> hiddenTerms;
    std::span<const uint32_t> hiddenCounts;
  };

  LUXModelView();
  bool _open();

  std::unique_ptr<const LUXSectionedData> _sections;
  platform::Data _optionsBytes;
  Numbers _numbers;
  std::string_view _language;
  std::span<const uint32_t> _bookOffsets;
  std::string_view _bookText;
  std::span<const uint32_t> _pageStartsOfBooks;
  std::span<const uint32_t> _pageKeyOffsets;
  std::string_view _pageKeyText;
  std::array<Terms, LUXTokenKindCount> _terms;
  /// Of pairs: where those of each first stem start, and the second stem of each.
  std::span<const uint32_t> _pairStarts;
  std::span<const uint32_t> _pairSeconds;
  std::span<const int8_t> _pageVectors;
  std::span<const float> _pageScales;
  std::span<const uint32_t> _neighbourhoodCentres;
  std::span<const uint32_t> _neighbourhoodStarts;
  std::span<const uint32_t> _pagesOfNeighbourhoods;
  std::span<const uint32_t> _termVectorNumbers;
  std::span<const int8_t> _termVectors;
  std::span<const float> _termScales;
  Strings _phrases;
  std::span<const uint32_t> _phraseTextOffsets;
  std::string_view _phraseText;
  std::span<const float> _phraseScores;
  std::span<const float> _phraseBlockMaxima;
  std::span<const uint32_t> _phraseStemsKeys;
  std::span<const uint32_t> _pagesOfPhraseStarts;
  std::span<const Share> _pagesOfPhrases;
  std::span<const uint32_t> _phrasesOfPageStarts;
  std::span<const Share> _phrasesOfPages;
  std::span<const uint32_t> _booksOfPhraseStarts;
  std::span<const uint32_t> _booksOfPhrases;
};
