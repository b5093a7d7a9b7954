#include "host/Luxwell/LUXPhraseFinder.h"

#include <algorithm>
#include <bit>
#include <functional>
#include <limits>
#include <span>

#include "host/Luxwell/LUXParallel.h"
#include "platform/Exception.h"

namespace {

constexpr size_t pagesAtOnce = 64;

// More threads would mostly read the same pages once more each.
constexpr unsigned mostPartBits = 3;

// How many groups are looked up together, so that the memory of all is on its way before the first
// is needed.
constexpr size_t groupsAtOnce = 64;

constexpr uint32_t nothing = 0xFFFFFFFF;

// Of a group, word by word.
uint64_t hashWith(uint64_t hash, uint32_t word) noexcept {
  hash = (hash ^ word) * 0xD6E8FEB86659FD93U;
  return hash ^ hash >> 32U;
}

// What a hash was made of is spread over its bits once more, as the last word has not been.
uint64_t finished(uint64_t hash) noexcept { return hash * 0x9E3779B97F4A7C15U; }

uint64_t hashOf(const uint32_t* words, size_t length) noexcept {
  uint64_t hash = 0;
  for (size_t i = 0; i < length; ++i) {
    hash = hashWith(hash, words[i]);
  }
  return finished(hash);
}

// Two bits for each hash: whether it was there, and whether it was there again.
class SeenTwice {
 public:
  explicit SeenTwice(size_t count)
      : _words(std::max<size_t>(64, std::bit_ceil(count * slotsPerGroup / slotsPerWord))) {}

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
  static constexpr size_t slotsPerGroup = 4;
  static constexpr size_t slotsPerWord = 32;

  size_t _place(uint64_t hash) const noexcept { return (hash >> 5U) & (_words.size() - 1); }
  static unsigned _shift(uint64_t hash) noexcept {
    return static_cast<unsigned>(hash & (slotsPerWord - 1)) * 2;
  }

  std::vector<uint64_t> _words;
};

// A group at a place of a page.
struct Place {
  uint64_t hash;
  uint32_t at;
  uint32_t length;
  uint32_t number;
};

// Walks over the groups of two words and more of pages whose hash is in one part. What is shared by
// the threads that do so: a word and, in the lowest bit, whether it may stand at the edge of a
// group, by its number.
class Walk {
 public:
  Walk(const std::vector<const LUXWordSequence*>& pages, const std::vector<uint32_t>& markedWords,
       uint32_t part, unsigned partBits)
      : _pages(pages), _markedWords(markedWords), _part(part), _shift(63U - partBits) {}

  // Calls `prepare(hash)` for each, and soon after `take(page, words, places)` for several.
  template <typename Prepare, typename Take>
  void forEach(Prepare prepare, Take take) {
    std::array<Place, groupsAtOnce> places;
    for (uint32_t page = 0; page < _pages.size(); ++page) {
      _readPage(*_pages[page]);
      size_t count = 0;
      const auto size = static_cast<uint32_t>(_words.size());
      for (uint32_t at = 0; at + 1 < size; ++at) {
        if ((_words[at] & 1U) == 0) {
          continue;
        }
        uint64_t hash = hashWith(0, _words[at] >> 1U);
        const uint32_t end = std::min<uint32_t>(size, at + LUXPhraseMaximumLength);
        for (uint32_t last = at + 1; last < end && !_breaksChain(page, last); ++last) {
          hash = hashWith(hash, _words[last] >> 1U);
          const uint64_t whole = finished(hash);
          // The lowest bit of the shift is for one part alone.
          if ((_words[last] & 1U) == 0 || whole >> 1U >> _shift != _part) {
            continue;
          }
          prepare(whole);
          places[count] = {whole, at, last - at + 1, nothing};
          if (++count == places.size()) {
            take(page, std::span<Place>(places));
            count = 0;
          }
        }
      }
      take(page, std::span<Place>(places.data(), count));
    }
  }

  uint32_t word(size_t at) const noexcept { return _words[at] >> 1U; }

 private:
  bool _breaksChain(uint32_t page, size_t at) const noexcept {
    return _pages[page]->words[at].breaksChain();
  }

  void _readPage(const LUXWordSequence& page) {
    _words.resize(page.words.size());
    std::transform(page.words.begin(), page.words.end(), _words.begin(),
                   [&](LUXWordSequence::Word word) { return _markedWords[word.number()]; });
  }

  const std::vector<const LUXWordSequence*>& _pages;
  const std::vector<uint32_t>& _markedWords;
  const uint32_t _part;
  const unsigned _shift;
  std::vector<uint32_t> _words;
};

}  // namespace

struct LUXPhraseFinder::Group {
  std::array<uint32_t, LUXPhraseMaximumLength> words{nothing, nothing, nothing, nothing};
  uint32_t frequency = 0;
  uint32_t pageCount = 0;
  uint32_t lastPage = none;
  uint32_t titleCount = 0;
  uint32_t lastTitle = none;
  uint32_t phrase = none;

  void count(uint32_t page, bool inTitle) noexcept {
    ++frequency;
    pageCount += lastPage == page ? 0 : 1;
    lastPage = page;
    if (inTitle) {
      titleCount += lastTitle == page ? 0 : 1;
      lastTitle = page;
    }
  }

  size_t length() const noexcept {
    return static_cast<size_t>(std::find(words.begin() + 1, words.end(), nothing) - words.begin());
  }

  LUXPhrase asPhrase(size_t totalPageCount) const {
    LUXPhrase result;
    std::replace_copy(words.begin(), words.end(), result.words.begin(), nothing, 0U);
    result.statistics.length = static_cast<uint32_t>(length());
    result.statistics.frequency = frequency;
    result.statistics.pageCount = pageCount;
    result.statistics.totalPageCount = static_cast<uint32_t>(totalPageCount);
    result.statistics.titleCount = titleCount;
    return result;
  }
};

// An open table of numbers, at most half full, in which one looks on from the slot that the hash
// names.
struct LUXPhraseFinder::Part {
  struct Slot {
    uint64_t hash = 0;
    uint32_t number = none;
  };

  std::vector<Group> groups;
  std::vector<Slot> slots{std::vector<Slot>(1024)};
  // Page by page the groups that are there, and where each page's end.
  std::vector<Occurrence> occurrences;
  std::vector<size_t> ends;

  size_t slotOf(uint64_t hash) const noexcept { return (hash >> 16U) & (slots.size() - 1); }
  void prefetch(uint64_t hash) const noexcept { __builtin_prefetch(&slots[slotOf(hash)]); }

  size_t find(uint64_t hash, const uint32_t* words, size_t length) const noexcept {
    size_t slot = slotOf(hash);
    while (slots[slot].number != none &&
           (slots[slot].hash != hash || !isGroup(slots[slot].number, words, length))) {
      slot = (slot + 1) & (slots.size() - 1);
    }
    return slot;
  }

  bool isGroup(uint32_t number, const uint32_t* words, size_t length) const noexcept {
    const auto& group = groups[number].words;
    return std::equal(words, words + length, group.begin()) &&
           (length == group.size() || group[length] == nothing);
  }

  uint32_t numberOf(uint64_t hash, const uint32_t* words, size_t length) {
    if (groups.size() * 2 >= slots.size()) {
      grow();
    }
    Slot& slot = slots[find(hash, words, length)];
    if (slot.number == none) {
      slot = {hash, static_cast<uint32_t>(groups.size())};
      std::copy(words, words + length, groups.emplace_back().words.begin());
    }
    return slot.number;
  }

  void grow() {
    std::vector<Slot> former(slots.size() * 2);
    former.swap(slots);
    for (const Slot& moved : former) {
      if (moved.number == none) {
        continue;
      }
      size_t slot = slotOf(moved.hash);
      while (slots[slot].number != none) {
        slot = (slot + 1) & (slots.size() - 1);
      }
      slots[slot] = moved;
    }
  }

  void fill(Walk walk, const Pages& pages, size_t wordCount) {
    SeenTwice seen(wordCount);
    const auto prefetchSeen = [&](uint64_t hash) { seen.prefetch(hash); };
    walk.forEach(prefetchSeen, [&](uint32_t, std::span<Place> places) {
      for (const Place& place : places) {
        seen.note(place.hash);
      }
    });
    ends.reserve(pages.size());
    walk.forEach(prefetchSeen, [&](uint32_t page, std::span<Place> places) {
      size_t count = 0;
      for (const Place& place : places) {
        if (seen.test(place.hash)) {
          prefetch(place.hash);
          places[count++] = place;
        }
      }
      for (Place& place : places.first(count)) {
        std::array<uint32_t, LUXPhraseMaximumLength> words;
        for (uint32_t i = 0; i < place.length; ++i) {
          words[i] = walk.word(place.at + i);
        }
        place.number = numberOf(place.hash, words.data(), place.length);
      }
      for (const Place& place : places.first(count)) {
        const bool inTitle = place.at < pages[page]->titleLength;
        groups[place.number].count(page, inTitle);
        occurrences.push_back(place.number << 1U | (inTitle ? 1U : 0U));
      }
      ends.resize(page + 1);
      ends[page] = occurrences.size();
    });
  }
};

void LUXPhraseFinder::find(const Pages& pages, const std::vector<uint32_t>& wordOfNumber,
                           const std::vector<bool>& mayStandAtEdge, size_t threadCount) {
  size_t wordCount = 0;
  for (const LUXWordSequence* const page : pages) {
    wordCount += page->words.size();
  }
  if (wordCount >= std::numeric_limits<uint32_t>::max() / 2) {
    throw platform::Exception(platform::invalidArgumentException,
                              "a book too large for semantic data");
  }
  const unsigned partBits = std::min(
      mostPartBits, static_cast<unsigned>(std::bit_width(std::max<size_t>(threadCount, 1)) - 1));
  std::vector<uint32_t> markedWords;
  markedWords.reserve(wordOfNumber.size());
  for (const uint32_t word : wordOfNumber) {
    markedWords.push_back(word == none ? 0 : word << 1U | (mayStandAtEdge[word] ? 1U : 0U));
  }
  std::vector<Part> parts(size_t{1} << partBits);
  // The words, and the groups of each part.
  LUXInParallel(parts.size() + 1, 1, threadCount, [&](size_t piece, size_t) {
    if (piece == parts.size()) {
      _countWords(pages, wordOfNumber, mayStandAtEdge);
    } else {
      parts[piece].fill(Walk(pages, markedWords, static_cast<uint32_t>(piece), partBits), pages,
                        wordCount >> partBits);
    }
  });
  _nameGroups(parts, pages.size());
  _countLongerPhrases(parts);
  _longer.resize(pages.size());
  LUXInParallel(pages.size(), pagesAtOnce, threadCount, [&](size_t from, size_t to) {
    std::vector<Occurrence> phrases;
    for (size_t page = from; page < to; ++page) {
      phrases.clear();
      for (const Part& part : parts) {
        for (size_t at = page == 0 ? 0 : part.ends[page - 1]; at < part.ends[page]; ++at) {
          const uint32_t phrase = part.groups[part.occurrences[at] >> 1U].phrase;
          if (phrase != none) {
            phrases.push_back(phrase << 1U | (part.occurrences[at] & 1U));
          }
        }
      }
      _longer[page].assign(phrases.begin(), phrases.end());
    }
  });
}

void LUXPhraseFinder::_countWords(const Pages& pages, const std::vector<uint32_t>& wordOfNumber,
                                  const std::vector<bool>& mayStandAtEdge) {
  std::vector<Group> words(mayStandAtEdge.size());
  for (uint32_t page = 0; page < pages.size(); ++page) {
    for (size_t at = 0; at < pages[page]->words.size(); ++at) {
      words[wordOfNumber[pages[page]->words[at].number()]].count(page,
                                                                 at < pages[page]->titleLength);
    }
  }
  _phraseOfWord.resize(words.size(), none);
  for (uint32_t word = 0; word < words.size(); ++word) {
    if (words[word].pageCount > 0 && mayStandAtEdge[word]) {
      words[word].words[0] = word;
      _phraseOfWord[word] = static_cast<uint32_t>(_phrases.size());
      _phrases.push_back(words[word].asPhrase(pages.size()));
    }
  }
}

void LUXPhraseFinder::_nameGroups(std::vector<Part>& parts, size_t pageCount) {
  for (size_t length = 2; length <= LUXPhraseMaximumLength; ++length) {
    for (Part& part : parts) {
      for (Group& group : part.groups) {
        if (group.pageCount >= minimumPageCount && group.length() == length) {
          group.phrase = static_cast<uint32_t>(_phrases.size());
          _phrases.push_back(group.asPhrase(pageCount));
        }
      }
    }
  }
}

uint32_t LUXPhraseFinder::_phraseOf(const std::vector<Part>& parts, const uint32_t* words,
                                    size_t length) const {
  if (length == 1) {
    return _phraseOfWord[words[0]];
  }
  const uint64_t hash = hashOf(words, length);
  const unsigned partBits = static_cast<unsigned>(std::bit_width(parts.size()) - 1);
  const Part& part = parts[hash >> 1U >> (63U - partBits)];
  const uint32_t number = part.slots[part.find(hash, words, length)].number;
  return number == none ? none : part.groups[number].phrase;
}

void LUXPhraseFinder::_countLongerPhrases(const std::vector<Part>& parts) {
  constexpr size_t mostInner = LUXPhraseMaximumLength * (LUXPhraseMaximumLength + 1) / 2;
  for (const LUXPhrase& phrase : _phrases) {
    const size_t length = phrase.statistics.length;
    std::array<uint32_t, mostInner> seen;
    uint32_t* end = seen.data();
    for (size_t innerLength = 1; innerLength < length; ++innerLength) {
      for (size_t at = 0; at + innerLength <= length; ++at) {
        const uint32_t inner = _phraseOf(parts, phrase.words.data() + at, innerLength);
        if (inner != none && std::find(seen.data(), end, inner) == end) {
          *end++ = inner;
        }
      }
    }
    for (const uint32_t* inner = seen.data(); inner != end; ++inner) {
      LUXPhraseStatistics& statistics = _phrases[*inner].statistics;
      ++statistics.longerPhraseCount;
      statistics.longerPhraseFrequency += phrase.statistics.frequency;
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
