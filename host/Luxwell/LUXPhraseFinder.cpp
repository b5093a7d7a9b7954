#include "host/Luxwell/LUXPhraseFinder.h"

#include <algorithm>
#include <bit>
#include <functional>
#include <span>

#include "host/Luxwell/LUXPairTable.h"
#include "host/Luxwell/LUXParallel.h"
#include "platform/Exception.h"

namespace {

constexpr size_t pagesAtOnce = 64;

// More threads would mostly read the same pages once more each.
constexpr unsigned mostPartBits = 3;

// How many pairs are looked up together, so that the memory of all is on its way before the first
// is needed.
constexpr size_t pairsAtOnce = 64;

struct Pair {
  uint64_t hash;
  uint32_t first;
  uint32_t second;
  uint32_t page;
  bool inTitle;
  size_t at;
};

uint64_t hashOfPair(uint32_t first, uint32_t second) noexcept {
  uint64_t hash = (static_cast<uint64_t>(first) << 32U | second) * 0xD6E8FEB86659FD93U;
  hash ^= hash >> 32U;
  return hash * 0xD6E8FEB86659FD93U;
}

// Two bits for each hash: whether it was there, and whether it was there again.
class SeenTwice {
 public:
  explicit SeenTwice(size_t pairCount)
      : _words(std::max<size_t>(64, std::bit_ceil(pairCount * slotsPerPair / slotsPerWord))) {}

  void prefetch(uint64_t hash) const noexcept { __builtin_prefetch(&_words[_place(hash)]); }

  void note(uint64_t hash) noexcept {
    uint64_t& word = _words[_place(hash)];
    const uint64_t seen = uint64_t{1} << _shift(hash);
    word |= (word & seen) << 1U | seen;
  }

  bool test(uint64_t hash) const noexcept {
    return (_words[_place(hash)] >> _shift(hash) & 2U) != 0;
  }

 private:
  static constexpr size_t slotsPerPair = 4;
  static constexpr size_t slotsPerWord = 32;

  size_t _place(uint64_t hash) const noexcept { return (hash >> 5U) & (_words.size() - 1); }
  static unsigned _shift(uint64_t hash) noexcept {
    return static_cast<unsigned>(hash & (slotsPerWord - 1)) * 2;
  }

  std::vector<uint64_t> _words;
};

}  // namespace

void LUXPhraseFinder::Group::count(uint32_t page, bool inTitle) noexcept {
  ++frequency;
  pageCount += lastPage == page ? 0 : 1;
  lastPage = page;
  if (inTitle) {
    titleCount += lastTitle == page ? 0 : 1;
    lastTitle = page;
  }
}

void LUXPhraseFinder::find(const Pages& pages, const std::vector<uint32_t>& wordOfNumber,
                           const std::vector<bool>& mayStandAtEdge, size_t threadCount) {
  _threadCount = threadCount;
  _partBits = std::min(mostPartBits,
                       static_cast<unsigned>(std::bit_width(std::max<size_t>(threadCount, 1)) - 1));
  _partMask = (1U << _partBits) - 1;
  size_t count = 0;
  for (const LUXWordSequence* const page : pages) {
    _starts.push_back(count);
    count += page->words.size();
  }
  _starts.push_back(count);
  if (count >> (31U - mostPartBits) != 0) {
    throw platform::Exception(platform::invalidArgumentException,
                              "a book too large for semantic data");
  }
  _longer.resize(pages.size());
  _findSingleWords(pages, wordOfNumber, mayStandAtEdge.size());
  _keep(pages.size(), mayStandAtEdge);
  _phraseOfWord.resize(mayStandAtEdge.size(), none);
  for (uint32_t word = 0; word < _phraseOfWord.size(); ++word) {
    _phraseOfWord[word] = _group(0, word).phrase;
  }
  _settle(pages);
  _nextPositions.resize(count);
  for (size_t length = 2; length <= LUXPhraseMaximumLength; ++length) {
    _findLonger(pages);
    _keep(pages.size(), mayStandAtEdge);
    _settle(pages);
  }
  std::vector<uint32_t>().swap(_positions);
  std::vector<uint32_t>().swap(_nextPositions);
  _countLongerPhrases();
  std::vector<Groups>().swap(_levels);
  std::vector<uint32_t>().swap(_groupOfPhrase);
}

void LUXPhraseFinder::_findSingleWords(const Pages& pages,
                                       const std::vector<uint32_t>& wordOfNumber,
                                       size_t wordCount) {
  _positions.resize(_starts.back());
  LUXInParallel(pages.size(), pagesAtOnce, _threadCount, [&](size_t from, size_t to) {
    for (size_t page = from; page < to; ++page) {
      std::transform(
          pages[page]->words.begin(), pages[page]->words.end(),
          _positions.begin() + static_cast<std::ptrdiff_t>(_starts[page]),
          [&](const LUXWordSequence::Word& word) { return wordOfNumber[word.number()]; });
    }
  });
  Groups groups(_partMask + 1);
  LUXInParallel(groups.size(), 1, _threadCount, [&](size_t part, size_t) {
    groups[part].resize((wordCount + _partMask) >> _partBits);
    for (uint32_t page = 0; page < pages.size(); ++page) {
      const size_t titleEnd = _starts[page] + pages[page]->titleLength;
      for (size_t at = _starts[page]; at < _starts[page + 1]; ++at) {
        const uint32_t word = _positions[at];
        if ((word & _partMask) == part) {
          Group& group = groups[part][word >> _partBits];
          group.first = word;
          group.count(page, at < titleEnd);
        }
      }
    }
  });
  _levels.push_back(std::move(groups));
}

template <typename Prepare, typename Take>
void LUXPhraseFinder::_forEachPair(const Pages& pages, uint32_t part, Prepare prepare,
                                   Take take) const {
  const bool partsAreWords = _levels.size() == 1;
  std::array<Pair, pairsAtOnce> batch;
  size_t waiting = 0;
  for (uint32_t page = 0; page < pages.size(); ++page) {
    const size_t begin = _starts[page];
    const size_t titleEnd = begin + pages[page]->titleLength;
    for (size_t at = begin; at + 1 < _starts[page + 1]; ++at) {
      const uint32_t first = _positions[at];
      const uint32_t second = _positions[at + 1];
      if (first == none || second == none ||
          (partsAreWords && pages[page]->words[at + 1 - begin].breaksChain())) {
        continue;
      }
      const uint64_t hash = hashOfPair(first, second);
      if ((hash >> (64U - mostPartBits) & _partMask) != part) {
        continue;
      }
      prepare(hash);
      batch[waiting] = {hash, first, second, page, at < titleEnd, at};
      if (++waiting == batch.size()) {
        take(std::span<Pair>(batch));
        waiting = 0;
      }
    }
  }
  take(std::span<Pair>(batch.data(), waiting));
}

void LUXPhraseFinder::_findPart(const Pages& pages, uint32_t part, std::vector<Group>& groups) {
  SeenTwice seen(_starts.back() >> _partBits);
  const auto prefetch = [&](uint64_t hash) { seen.prefetch(hash); };
  _forEachPair(pages, part, prefetch, [&](std::span<Pair> pairs) {
    for (const Pair& pair : pairs) {
      seen.note(pair.hash);
    }
  });
  LUXPairTable numbers;
  _forEachPair(pages, part, prefetch, [&](std::span<Pair> pairs) {
    size_t count = 0;
    for (const Pair& pair : pairs) {
      if (seen.test(pair.hash)) {
        numbers.prefetch(pair.first, pair.second);
        pairs[count++] = pair;
      }
    }
    for (Pair& pair : pairs.first(count)) {
      const auto [number, isNew] = numbers.numberOf(pair.first, pair.second);
      if (isNew) {
        groups.emplace_back();
        groups.back().first = pair.first;
        groups.back().second = pair.second;
      }
      __builtin_prefetch(&groups[number], 1);
      pair.first = number;
      _nextPositions[pair.at] = number << _partBits | part;
    }
    for (const Pair& pair : pairs.first(count)) {
      groups[pair.first].count(pair.page, pair.inTitle);
    }
  });
}

void LUXPhraseFinder::_findLonger(const Pages& pages) {
  std::fill(_nextPositions.begin(), _nextPositions.end(), none);
  Groups groups(_partMask + 1);
  LUXInParallel(groups.size(), 1, _threadCount, [&](size_t part, size_t) {
    _findPart(pages, static_cast<uint32_t>(part), groups[part]);
  });
  _levels.push_back(std::move(groups));
  _positions.swap(_nextPositions);
}

uint32_t LUXPhraseFinder::_wordOf(size_t level, uint32_t group, size_t i) const {
  while (level > 0) {
    const Group& whole = _group(level, group);
    // The i-th word is in the part without the first word, but for the first.
    group = i > 0 ? whole.second : whole.first;
    i = i > 0 ? i - 1 : 0;
    --level;
  }
  return group;
}

void LUXPhraseFinder::_keep(size_t pageCount, const std::vector<bool>& mayStandAtEdge) {
  const size_t level = _levels.size() - 1;
  const uint32_t minimum = level == 0 ? 1 : minimumPageCount;
  for (uint32_t part = 0; part <= _partMask; ++part) {
    for (size_t place = 0; place < _levels[level][part].size(); ++place) {
      Group& group = _levels[level][part][place];
      const uint32_t number = static_cast<uint32_t>(place) << _partBits | part;
      if (group.pageCount < minimum || !mayStandAtEdge[_wordOf(level, number, 0)] ||
          !mayStandAtEdge[_wordOf(level, number, level)]) {
        continue;
      }
      group.phrase = static_cast<uint32_t>(_phrases.size());
      LUXPhrase phrase;
      for (size_t i = 0; i <= level; ++i) {
        phrase.words[i] = _wordOf(level, number, i);
      }
      phrase.statistics.length = static_cast<uint32_t>(level + 1);
      phrase.statistics.frequency = group.frequency;
      phrase.statistics.pageCount = group.pageCount;
      phrase.statistics.totalPageCount = static_cast<uint32_t>(pageCount);
      phrase.statistics.titleCount = group.titleCount;
      _phrases.push_back(phrase);
      _groupOfPhrase.push_back(number);
    }
  }
}

// Notes where the phrases are that were just found, and forgets the groups that nothing longer can
// be made of.
void LUXPhraseFinder::_settle(const Pages& pages) {
  const size_t level = _levels.size() - 1;
  LUXInParallel(pages.size(), pagesAtOnce, _threadCount, [&](size_t from, size_t to) {
    for (size_t page = from; page < to; ++page) {
      const size_t titleEnd = _starts[page] + pages[page]->titleLength;
      for (size_t at = _starts[page]; at < _starts[page + 1]; ++at) {
        if (_positions[at] == none) {
          continue;
        }
        const Group& group = _group(level, _positions[at]);
        if (level > 0 && group.phrase != none) {
          _longer[page].push_back(group.phrase << 1U | (at < titleEnd ? 1U : 0U));
        }
        if (group.pageCount < minimumPageCount) {
          _positions[at] = none;
        }
      }
    }
  });
}

void LUXPhraseFinder::_countLongerPhrases() {
  struct Part {
    size_t level;
    uint32_t group;
  };
  // Each group has two parts, these two each, and so on.
  constexpr size_t mostParts = (size_t{1} << LUXPhraseMaximumLength) - 1;
  for (size_t number = 0; number < _phrases.size(); ++number) {
    std::array<Part, mostParts> parts;
    size_t count = 0;
    std::array<uint32_t, mostParts> seen;
    size_t seenCount = 0;
    parts[count++] = {_phrases[number].statistics.length - 1, _groupOfPhrase[number]};
    for (size_t i = 0; i < count; ++i) {
      const Part part = parts[i];
      const Group& group = _group(part.level, part.group);
      uint32_t* const seenEnd = seen.data() + seenCount;
      if (i > 0 && group.phrase != none &&
          std::find(seen.data(), seenEnd, group.phrase) == seenEnd) {
        seen[seenCount++] = group.phrase;
      }
      if (part.level > 0) {
        parts[count++] = {part.level - 1, group.first};
        parts[count++] = {part.level - 1, group.second};
      }
    }
    for (size_t i = 0; i < seenCount; ++i) {
      LUXPhraseStatistics& inner = _phrases[seen[i]].statistics;
      ++inner.longerPhraseCount;
      inner.longerPhraseFrequency += _phrases[number].statistics.frequency;
    }
  }
}

double LUXPhraseThreshold(const std::vector<LUXPhrase>& phrases, uint32_t shortest,
                          uint32_t longest, size_t budget) {
  std::vector<double> scores;
  for (const LUXPhrase& phrase : phrases) {
    const LUXPhraseStatistics& statistics = phrase.statistics;
    if (statistics.length >= shortest && statistics.length <= longest &&
        statistics.pageCount >= LUXPhraseMinimumPageCount) {
      scores.push_back(LUXPhraseScore(statistics));
    }
  }
  if (budget == 0 || scores.size() <= budget) {
    return 0;
  }
  const auto last = scores.begin() + static_cast<std::ptrdiff_t>(budget - 1);
  std::nth_element(scores.begin(), last, scores.end(), std::greater<>());
  return *last;
}
