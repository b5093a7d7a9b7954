#include "host/Luxwell/LUXPhraseFinder.h"

#include <algorithm>
#include <functional>

#include "host/Luxwell/LUXPairTable.h"
#include "host/Luxwell/LUXParallel.h"

void LUXPhraseFinder::find(const std::vector<const LUXWordSequence*>& pages,
                           const std::vector<uint32_t>& wordOfNumber,
                           const std::vector<bool>& mayStandAtEdge, size_t threadCount) {
  _threadCount = threadCount;
  _counts.resize(pages.size());
  _findSingleWords(pages, wordOfNumber, mayStandAtEdge.size());
  _keep(pages, mayStandAtEdge);
  for (size_t length = 2; length <= LUXPhraseMaximumLength; ++length) {
    _findLonger(pages);
    _keep(pages, mayStandAtEdge);
  }
  _countLongerPhrases();
  _positions.clear();
  _levels.clear();
}

void LUXPhraseFinder::_findSingleWords(const Pages& pages,
                                       const std::vector<uint32_t>& wordOfNumber,
                                       size_t wordCount) {
  Groups groups(wordCount);
  _positions.resize(pages.size());
  for (uint32_t page = 0; page < pages.size(); ++page) {
    std::vector<uint32_t>& positions = _positions[page];
    positions.reserve(pages[page]->words.size());
    for (const LUXWordSequence::Word& place : pages[page]->words) {
      const uint32_t word = wordOfNumber[place.number];
      Group& group = groups[word];
      group.first = word;
      group.pageCount += group.lastPage == page ? 0 : 1;
      group.lastPage = page;
      positions.push_back(word);
    }
  }
  _levels.push_back(std::move(groups));
}

void LUXPhraseFinder::_findLonger(const Pages& pages) {
  const Groups& parts = _levels.back();
  const bool partsAreWords = _levels.size() == 1;
  const auto isFrequent = [&](uint32_t part) {
    return part != none && parts[part].pageCount >= minimumPageCount;
  };
  Groups groups;
  LUXPairTable numbers;
  for (uint32_t page = 0; page < pages.size(); ++page) {
    std::vector<uint32_t>& positions = _positions[page];
    for (size_t at = 0; at < positions.size(); ++at) {
      const uint32_t first = positions[at];
      const bool hasNext = at + 1 < positions.size();
      const uint32_t second = hasNext ? positions[at + 1] : none;
      positions[at] = none;
      if (!isFrequent(first) || !isFrequent(second) ||
          (partsAreWords && pages[page]->words[at + 1].breaksChain)) {
        continue;
      }
      const auto [number, isNew] = numbers.numberOf(first, second);
      if (isNew) {
        groups.push_back({first, second, 0, none, none});
      }
      Group& group = groups[number];
      group.pageCount += group.lastPage == page ? 0 : 1;
      group.lastPage = page;
      positions[at] = number;
    }
  }
  _levels.push_back(std::move(groups));
}

uint32_t LUXPhraseFinder::_wordOf(size_t level, uint32_t group, size_t i) const {
  while (level > 0) {
    const Group& whole = _levels[level][group];
    // The i-th word is in the part without the first word, but for the first.
    group = i > 0 ? whole.second : whole.first;
    i = i > 0 ? i - 1 : 0;
    --level;
  }
  return group;
}

void LUXPhraseFinder::_keep(const Pages& pages, const std::vector<bool>& mayStandAtEdge) {
  const size_t level = _levels.size() - 1;
  const uint32_t minimum = level == 0 ? 1 : minimumPageCount;
  uint32_t kept = 0;
  for (uint32_t number = 0; number < _levels[level].size(); ++number) {
    Group& group = _levels[level][number];
    if (group.pageCount < minimum || !mayStandAtEdge[_wordOf(level, number, 0)] ||
        !mayStandAtEdge[_wordOf(level, number, level)]) {
      continue;
    }
    group.phrase = static_cast<uint32_t>(_phrases.size());
    ++kept;
    LUXPhrase phrase;
    for (size_t i = 0; i <= level; ++i) {
      phrase.words[i] = _wordOf(level, number, i);
    }
    phrase.statistics.length = static_cast<uint32_t>(level + 1);
    phrase.statistics.pageCount = group.pageCount;
    phrase.statistics.totalPageCount = static_cast<uint32_t>(pages.size());
    _phrases.push_back(phrase);
    _groupOfPhrase.push_back(number);
  }
  constexpr size_t pagesAtOnce = 64;
  LUXInParallel(pages.size(), pagesAtOnce, _threadCount, [&](size_t from, size_t to) {
    for (size_t page = from; page < to; ++page) {
      _countInPage(level, page, pages[page]->titleLength);
    }
  });
  const uint32_t firstPhrase = static_cast<uint32_t>(_phrases.size()) - kept;
  for (const std::vector<Count>& counts : _counts) {
    for (auto count = counts.rbegin(); count != counts.rend() && count->phrase >= firstPhrase;
         ++count) {
      LUXPhraseStatistics& statistics = _phrases[count->phrase].statistics;
      statistics.frequency += count->titleCount + count->bodyCount;
      statistics.titleCount += count->titleCount > 0 ? 1 : 0;
    }
  }
}

void LUXPhraseFinder::_countInPage(size_t level, size_t page, size_t titleLength) {
  std::vector<uint32_t> inTitle;
  std::vector<uint32_t> all;
  for (size_t at = 0; at < _positions[page].size(); ++at) {
    const uint32_t group = _positions[page][at];
    if (group != none && _levels[level][group].phrase != none) {
      all.push_back(_levels[level][group].phrase);
      if (at < titleLength) {
        inTitle.push_back(all.back());
      }
    }
  }
  std::sort(all.begin(), all.end());
  std::sort(inTitle.begin(), inTitle.end());
  auto title = inTitle.begin();
  for (auto from = all.begin(); from != all.end();) {
    const auto to = std::find_if(from, all.end(), [&](uint32_t other) { return other != *from; });
    Count count{*from, 0, 0};
    for (; title != inTitle.end() && *title == *from; ++title) {
      ++count.titleCount;
    }
    count.bodyCount = static_cast<uint32_t>(to - from) - count.titleCount;
    _counts[page].push_back(count);
    from = to;
  }
}

void LUXPhraseFinder::_countLongerPhrases() {
  struct Part {
    size_t level;
    uint32_t group;
  };
  for (size_t number = 0; number < _phrases.size(); ++number) {
    const size_t level = _phrases[number].statistics.length - 1;
    std::vector<Part> parts{{level, _groupOfPhrase[number]}};
    std::vector<uint32_t> seen;
    for (size_t i = 0; i < parts.size(); ++i) {
      const Part part = parts[i];
      if (i > 0) {
        const uint32_t phrase = _levels[part.level][part.group].phrase;
        if (phrase != none && std::find(seen.begin(), seen.end(), phrase) == seen.end()) {
          seen.push_back(phrase);
        }
      }
      if (part.level > 0) {
        parts.push_back({part.level - 1, _levels[part.level][part.group].first});
        parts.push_back({part.level - 1, _levels[part.level][part.group].second});
      }
    }
    for (const uint32_t phrase : seen) {
      ++_phrases[phrase].statistics.longerPhraseCount;
      _phrases[phrase].statistics.longerPhraseFrequency += _phrases[number].statistics.frequency;
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
