// The word groups of a book that may be worth suggesting.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/Luxwell/LUXPhraseScore.h"
#include "host/Luxwell/LUXWordSequence.h"

inline constexpr size_t LUXPhraseMaximumLength = 4;

struct LUXPhrase {
  std::array<uint32_t, LUXPhraseMaximumLength> words{};
  LUXPhraseStatistics statistics;
};

/// Finds every group of up to four words that follow one another, neither the first nor the last of
/// which is a word that must not stand there, in at least two pages; single words in any number of
/// pages.
///
/// Most groups are there once, though: a first look over the pages notes in two bits, found by a
/// hash, whether a group may be there twice, and only those get a place in a table (the idea is
/// that of J. Park, M. Chen, P. Yu, "An effective hash-based algorithm for mining association
/// rules", 1995). So what is found once takes neither time nor memory to speak of. Pairs come
/// first, then all that is longer, where each two words that are a pair were found to be in two
/// pages. Groups that begin or end in words such as "of", of which there are more than of all
/// others, are never counted. Books of many millions of words are looked at in parts, by the hash:
/// what is needed meanwhile does not grow with the book.
/// Thread-safety: confined to one thread; once find() has returned, immutable.
class LUXPhraseFinder {
 public:
  static constexpr uint32_t minimumPageCount = 2;

  /// The numbers in the pages stand for words by way of `wordOfNumber`: several may be one word.
  /// `mayStandAtEdge` has one entry for each word. Up to `threadCount` threads take part; what is
  /// found does not depend on their number, but the order of the phrases does. May be called once.
  /// Throws platform::Exception "InvalidArgumentException" for two thousand million words.
  void find(const std::vector<const LUXWordSequence*>& pages,
            const std::vector<uint32_t>& wordOfNumber, const std::vector<bool>& mayStandAtEdge,
            size_t threadCount = 1);

  const std::vector<LUXPhrase>& phrases() const noexcept { return _phrases; }
  /// Gives back what phrases() returns; they keep their numbers.
  void forgetPhrases() { std::vector<LUXPhrase>().swap(_phrases); }

  /// Calls `sink(uint32_t phrase, bool inTitle)` for each place of a page at which a phrase is, in
  /// no particular order. `words` and `wordOfNumber` are those that find() had.
  template <typename Sink>
  void forEachPhraseOfPage(size_t page, const LUXWordSequence& sequence,
                           const std::vector<uint32_t>& wordOfNumber, Sink sink) const {
    for (size_t at = 0; at < sequence.words.size(); ++at) {
      const uint32_t phrase = _phraseOfWord[wordOfNumber[sequence.words[at].number()]];
      if (phrase != none) {
        sink(phrase, at < sequence.titleLength);
      }
    }
    for (const Occurrence occurrence : _longer[page]) {
      sink(occurrence >> 1U, (occurrence & 1U) != 0);
    }
  }

  /// Gives back what is kept of a page, which has no phrases from then on. Different pages may be
  /// forgotten, and asked for phrases, by different threads at once.
  void forgetPage(size_t page) { std::vector<Occurrence>().swap(_longer[page]); }

 private:
  static constexpr uint32_t none = 0xFFFFFFFF;

  using Pages = std::vector<const LUXWordSequence*>;
  /// A phrase of two words or more, and in the lowest bit whether it is in the title.
  using Occurrence = uint32_t;

  /// A group of words that occurs.
  struct Group;
  /// What all of find() works on.
  struct Book;
  /// The groups whose hash says that they belong together. Each part is found by one thread.
  struct Part;

  void _findWords(const Book& book, const std::vector<bool>& mayStandAtEdge);
  void _findGroups(Book& book, size_t shortest, size_t longest);
  void _countLongerPhrases();

  std::vector<LUXPhrase> _phrases;
  std::vector<uint32_t> _phraseOfWord;
  std::vector<std::vector<Occurrence>> _longer;
};

/// The score of the last phrase that still gets into a budget of `budget` phrases of `shortest` to
/// `longest` words, of those in LUXPhraseMinimumPageCount pages or more; 0 where all get in.
double LUXPhraseThreshold(const std::vector<LUXPhrase>& phrases, uint32_t shortest,
                          uint32_t longest, size_t budget);
