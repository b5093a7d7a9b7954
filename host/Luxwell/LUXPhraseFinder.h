// The word groups of a book that may be worth suggesting.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/Luxwell/LUXPhraseScore.h"

inline constexpr size_t LUXPhraseMaximumLength = 4;

/// The words of one page by number, in order.
struct LUXWordSequence {
  struct Word {
    uint32_t number = 0;
    /// No phrase reaches from the word before to this one.
    bool breaksChain = false;
  };

  std::vector<Word> words;
  /// So many words at the beginning are the title; the first after them breaks the chain.
  size_t titleLength = 0;
};

struct LUXPhrase {
  std::array<uint32_t, LUXPhraseMaximumLength> words{};
  /// totalPageCount, longer phrases and all else filled in.
  LUXPhraseStatistics statistics;
};

/// Finds every group of up to four words that follow one another, neither the first nor the last of
/// which is a word that must not stand there, in at least two pages; single words in any number of
/// pages. Longer groups are only looked for where all their parts are in two pages, so that what is
/// found once takes little memory.
/// Thread-safety: confined to one thread.
class LUXPhraseFinder {
 public:
  struct Count {
    uint32_t phrase = 0;
    uint32_t titleCount = 0;
    uint32_t bodyCount = 0;
  };

  static constexpr uint32_t minimumPageCount = 2;

  /// The numbers in the pages stand for words by way of `wordOfNumber`: several may be one word.
  /// `mayStandAtEdge` has one entry for each word. The pages are not used afterwards. Up to
  /// `threadCount` threads take part; what is found does not depend on their number.
  void find(const std::vector<const LUXWordSequence*>& pages,
            const std::vector<uint32_t>& wordOfNumber, const std::vector<bool>& mayStandAtEdge,
            size_t threadCount = 1);

  const std::vector<LUXPhrase>& phrases() const noexcept { return _phrases; }

  /// The phrases of each page, in order of their numbers, which are positions in phrases().
  const std::vector<std::vector<Count>>& countsOfPages() const noexcept { return _counts; }

 private:
  static constexpr uint32_t none = 0xFFFFFFFF;

  /// A group of words that occurs; its parts are the groups that lack its last or first word.
  struct Group {
    uint32_t first = none;
    uint32_t second = none;
    uint32_t pageCount = 0;
    uint32_t lastPage = none;
    uint32_t phrase = none;
  };
  using Groups = std::vector<Group>;
  using Positions = std::vector<std::vector<uint32_t>>;

  using Pages = std::vector<const LUXWordSequence*>;

  void _findSingleWords(const Pages& pages, const std::vector<uint32_t>& wordOfNumber,
                        size_t wordCount);
  void _findLonger(const Pages& pages);
  void _keep(const Pages& pages, const std::vector<bool>& mayStandAtEdge);
  void _countInPage(size_t level, size_t page, size_t titleLength);
  void _countLongerPhrases();
  uint32_t _wordOf(size_t level, uint32_t group, size_t i) const;

  size_t _threadCount = 1;
  /// By length less one.
  std::vector<Groups> _levels;
  /// The group that begins at each word of each page, of the longest length so far.
  Positions _positions;
  std::vector<LUXPhrase> _phrases;
  /// Which group a phrase is, by number.
  std::vector<uint32_t> _groupOfPhrase;
  std::vector<std::vector<Count>> _counts;
};

/// The score of the last phrase that still gets into a budget of `budget` phrases of `shortest` to
/// `longest` words, of those in LUXPhraseMinimumPageCount pages or more; 0 where all get in.
double LUXPhraseThreshold(const std::vector<LUXPhrase>& phrases, uint32_t shortest,
                          uint32_t longest, size_t budget);
