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

// A part has about so many words of the book; each part more is one more look over all of them.
constexpr size_t wordsOfPart = size_t{8} << 20U;
constexpr unsigned mostPartBits = 6;

// How many groups are looked up together, so that the memory of all is on its way before the first
// is needed.
constexpr size_t groupsAtOnce = 64;

constexpr uint32_t nothing = 0xFFFFFFFF;

// Of a group, word by word.
uint64_t hashWith(uint64_t hash, uint32_t word) noexcept {
  hash = (hash ^ word) * 0xD6E8FEB86659FD93U;
  return hash ^ hash >> 32U;
}

// The last word has not been spread over all bits yet.
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

// An open table of the numbers of groups, at most half full, in which one looks on from the slot
// that the hash names.
class GroupTable {
 public:
  static constexpr uint32_t none = nothing;

  void prefetch(uint64_t hash) const noexcept { __builtin_prefetch(&_slots[_slotOf(hash)]); }

  // The number of the group of this hash, of which `isGroup(number)` says whether it is the one.
  template <typename IsGroup>
  uint32_t find(uint64_t hash, IsGroup isGroup) const {
    size_t slot = _slotOf(hash);
    while (_slots[slot].number != none &&
           (_slots[slot].tag != _tagOf(hash) || !isGroup(_slots[slot].number))) {
      slot = (slot + 1) & (_slots.size() - 1);
    }
    return _slots[slot].number;
  }

  // Adds the number that comes next, which is not there. `hashOfNumber` has the hash of each.
  template <typename HashOfNumber>
  void add(uint64_t hash, HashOfNumber hashOfNumber) {
    if (size_t{2} * _count >= _slots.size()) {
      const size_t size = _slots.size() * 2;
      _slots = {};
      _slots.resize(size);
      for (uint32_t number = 0; number < _count; ++number) {
        _put(hashOfNumber(number), number);
      }
    }
    _put(hash, _count++);
  }

 private:
  struct Slot {
    uint32_t tag = 0;
    uint32_t number = none;
  };

  size_t _slotOf(uint64_t hash) const noexcept { return (hash >> 16U) & (_slots.size() - 1); }
  static uint32_t _tagOf(uint64_t hash) noexcept { return static_cast<uint32_t>(hash); }

  void _put(uint64_t hash, uint32_t number) noexcept {
    size_t slot = _slotOf(hash);
    while (_slots[slot].number != none) {
      slot = (slot + 1) & (_slots.size() - 1);
    }
    _slots[slot] = {_tagOf(hash), number};
  }

  std::vector<Slot> _slots{std::vector<Slot>(1024)};
  uint32_t _count = 0;
};

// A group at a place of a page.
struct Place {
  uint64_t hash;
  uint32_t at;
  uint32_t length;
};

}  // namespace

struct LUXPhraseFinder::Book {
  const Pages& pages;
  const std::vector<uint32_t>& wordOfNumber;
  size_t threadCount;
  // A word and, in the lowest bit, whether it may stand at the edge of a group, by its number.
  std::vector<uint32_t> markedWords;
  // Where each page's words begin in all of them.
  std::vector<uint32_t> starts;
  // Of each word of the book, whether a pair begins there that may stand for itself but is not in
  // two pages. Known when pairs were found.
  std::vector<uint8_t> isRarePair;

  Book(const Pages& itsPages, const std::vector<uint32_t>& words,
       const std::vector<bool>& mayStandAtEdge, size_t threads)
      : pages(itsPages), wordOfNumber(words), threadCount(std::max<size_t>(threads, 1)) {
    markedWords.reserve(words.size());
    for (const uint32_t word : words) {
      markedWords.push_back(word == none ? 0 : word << 1U | (mayStandAtEdge[word] ? 1U : 0U));
    }
    size_t count = 0;
    for (const LUXWordSequence* const page : pages) {
      starts.push_back(static_cast<uint32_t>(count));
      count += page->words.size();
    }
    if (count >= std::numeric_limits<uint32_t>::max() / 2) {
      throw platform::Exception(platform::invalidArgumentException,
                                "a book too large for semantic data");
    }
    starts.push_back(static_cast<uint32_t>(count));
    isRarePair.resize(count);
  }

  // Different places may be set by different threads.
  void setRarePair(uint32_t page, uint32_t at) noexcept { isRarePair[starts[page] + at] = 1; }

  unsigned partBits() const {
    const size_t parts = std::max(threadCount, (starts.back() + wordsOfPart - 1) / wordsOfPart);
    return std::min(mostPartBits, static_cast<unsigned>(std::bit_width(parts - 1)));
  }
};

struct LUXPhraseFinder::Group {
  std::array<uint32_t, LUXPhraseMaximumLength> words{nothing, nothing, nothing, nothing};
  uint32_t frequency = 0;
  uint32_t pageCount = 0;
  uint32_t lastPage = none;
  uint32_t titleCount = 0;
  uint32_t lastTitle = none;
  // Its number among those of its part that are phrases.
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

  bool isOf(const uint32_t* others, size_t length) const noexcept {
    return std::equal(others, others + length, words.begin()) &&
           (length == words.size() || words[length] == nothing);
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

struct LUXPhraseFinder::Part {
  uint32_t number = 0;
  unsigned bits = 0;
  size_t shortest = 0;
  size_t longest = 0;
  // What is found: phrases, where they are page by page, and where each page's places end.
  std::vector<LUXPhrase> phrases;
  std::vector<Occurrence> occurrences;
  std::vector<uint32_t> ends;

  // Calls `prepare(hash)` for each group of the part, and soon after `take(page, words, places)`
  // for several of one page; the last call for each page may have none.
  template <typename Prepare, typename Take>
  void forEachGroup(const Book& book, Prepare prepare, Take take) const {
    std::array<Place, groupsAtOnce> places;
    std::vector<uint32_t> words;
    for (uint32_t page = 0; page < book.pages.size(); ++page) {
      const std::vector<LUXWordSequence::Word>& written = book.pages[page]->words;
      const auto size = static_cast<uint32_t>(written.size());
      words.resize(size);
      std::transform(written.begin(), written.end(), words.begin(),
                     [&](LUXWordSequence::Word word) { return book.markedWords[word.number()]; });
      const uint8_t* const isRarePair =
          shortest == 2 ? nullptr : book.isRarePair.data() + book.starts[page];
      size_t count = 0;
      for (uint32_t at = 0; at + shortest <= size; ++at) {
        if ((words[at] & 1U) == 0) {
          continue;
        }
        uint64_t hash = hashWith(0, words[at] >> 1U);
        const auto end = static_cast<uint32_t>(std::min<size_t>(size, at + longest));
        for (uint32_t last = at + 1; last < end && !written[last].breaksChain() &&
                                     (isRarePair == nullptr || isRarePair[last - 1] == 0);
             ++last) {
          hash = hashWith(hash, words[last] >> 1U);
          if ((words[last] & 1U) == 0 || last - at + 1 < shortest) {
            continue;
          }
          const uint64_t whole = finished(hash);
          // Shifted twice, as there may be one part alone.
          if (whole >> 1U >> (63U - bits) != number) {
            continue;
          }
          prepare(whole);
          places[count] = {whole, at, last - at + 1};
          if (++count == places.size()) {
            take(page, words, std::span<const Place>(places));
            count = 0;
          }
        }
      }
      take(page, words, std::span<const Place>(places.data(), count));
    }
  }

  void find(Book& book) {
    SeenTwice seen(book.starts.back() >> bits);
    const auto prefetchSeen = [&](uint64_t hash) { seen.prefetch(hash); };
    forEachGroup(book, prefetchSeen,
                 [&](uint32_t, const std::vector<uint32_t>&, std::span<const Place> places) {
                   for (const Place& place : places) {
                     seen.note(place.hash);
                   }
                 });
    std::vector<Group> groups;
    GroupTable table;
    struct Found {
      uint32_t group;
      uint32_t at;
    };
    std::vector<Found> found;
    std::vector<uint32_t> foundEnds(book.pages.size());
    std::array<Place, groupsAtOnce> again;
    forEachGroup(
        book, prefetchSeen,
        [&](uint32_t page, const std::vector<uint32_t>& words, std::span<const Place> places) {
          size_t count = 0;
          for (const Place& place : places) {
            if (seen.test(place.hash)) {
              table.prefetch(place.hash);
              again[count++] = place;
            } else if (place.length == 2) {
              book.setRarePair(page, place.at);
            }
          }
          const size_t first = found.size();
          for (const Place& place : std::span<const Place>(again.data(), count)) {
            found.push_back({_numberOf(place, words, groups, table), place.at});
            __builtin_prefetch(&groups[found.back().group], 1);
          }
          for (size_t i = first; i < found.size(); ++i) {
            groups[found[i].group].count(page, found[i].at < book.pages[page]->titleLength);
          }
          foundEnds[page] = static_cast<uint32_t>(found.size());
        });
    _name(groups, book.pages.size());
    ends.reserve(book.pages.size());
    size_t at = 0;
    for (uint32_t page = 0; page < book.pages.size(); ++page) {
      for (; at < foundEnds[page]; ++at) {
        const Group& group = groups[found[at].group];
        if (group.phrase != none) {
          const bool inTitle = found[at].at < book.pages[page]->titleLength;
          occurrences.push_back(group.phrase << 1U | (inTitle ? 1U : 0U));
        } else if (group.length() == 2) {
          book.setRarePair(page, found[at].at);
        }
      }
      ends.push_back(static_cast<uint32_t>(occurrences.size()));
    }
    occurrences.shrink_to_fit();
  }

 private:
  static uint32_t _numberOf(const Place& place, const std::vector<uint32_t>& markedWords,
                            std::vector<Group>& groups, GroupTable& table) {
    std::array<uint32_t, LUXPhraseMaximumLength> words;
    for (uint32_t i = 0; i < place.length; ++i) {
      words[i] = markedWords[place.at + i] >> 1U;
    }
    uint32_t number = table.find(
        place.hash, [&](uint32_t other) { return groups[other].isOf(words.data(), place.length); });
    if (number == GroupTable::none) {
      number = static_cast<uint32_t>(groups.size());
      table.add(place.hash, [&](uint32_t other) {
        return hashOf(groups[other].words.data(), groups[other].length());
      });
      std::copy_n(words.begin(), place.length, groups.emplace_back().words.begin());
    }
    return number;
  }

  void _name(std::vector<Group>& groups, size_t pageCount) {
    phrases.reserve(
        static_cast<size_t>(std::count_if(groups.begin(), groups.end(), [](const Group& group) {
          return group.pageCount >= minimumPageCount;
        })));
    for (size_t length = shortest; length <= longest; ++length) {
      for (Group& group : groups) {
        if (group.pageCount >= minimumPageCount && group.length() == length) {
          group.phrase = static_cast<uint32_t>(phrases.size());
          phrases.push_back(group.asPhrase(pageCount));
        }
      }
    }
  }
};

void LUXPhraseFinder::find(const Pages& pages, const std::vector<uint32_t>& wordOfNumber,
                           const std::vector<bool>& mayStandAtEdge, size_t threadCount) {
  Book book(pages, wordOfNumber, mayStandAtEdge, threadCount);
  _longer.resize(pages.size());
  _findWords(book, mayStandAtEdge);
  _findGroups(book, 2, 2);
  _findGroups(book, 3, LUXPhraseMaximumLength);
  _countLongerPhrases();
}

void LUXPhraseFinder::_findWords(const Book& book, const std::vector<bool>& mayStandAtEdge) {
  std::vector<Group> words(mayStandAtEdge.size());
  for (uint32_t page = 0; page < book.pages.size(); ++page) {
    const LUXWordSequence& sequence = *book.pages[page];
    for (size_t at = 0; at < sequence.words.size(); ++at) {
      const uint32_t word = book.wordOfNumber[sequence.words[at].number()];
      words[word].count(page, at < sequence.titleLength);
    }
  }
  _phraseOfWord.resize(words.size(), none);
  for (uint32_t word = 0; word < words.size(); ++word) {
    if (words[word].pageCount > 0 && mayStandAtEdge[word]) {
      words[word].words[0] = word;
      _phraseOfWord[word] = static_cast<uint32_t>(_phrases.size());
      _phrases.push_back(words[word].asPhrase(book.pages.size()));
    }
  }
}

void LUXPhraseFinder::_findGroups(Book& book, size_t shortest, size_t longest) {
  std::vector<Part> parts(size_t{1} << book.partBits());
  LUXInParallel(parts.size(), 1, book.threadCount, [&](size_t number, size_t) {
    Part& part = parts[number];
    part.number = static_cast<uint32_t>(number);
    part.bits = book.partBits();
    part.shortest = shortest;
    part.longest = longest;
    part.find(book);
  });
  std::vector<uint32_t> firstPhrases;
  size_t count = _phrases.size();
  for (const Part& part : parts) {
    firstPhrases.push_back(static_cast<uint32_t>(count));
    count += part.phrases.size();
  }
  _phrases.reserve(count);
  for (Part& part : parts) {
    _phrases.insert(_phrases.end(), part.phrases.begin(), part.phrases.end());
    part.phrases = {};
  }
  LUXInParallel(book.pages.size(), pagesAtOnce, book.threadCount, [&](size_t from, size_t to) {
    std::vector<Occurrence> all;
    for (size_t page = from; page < to; ++page) {
      all = _longer[page];
      for (size_t number = 0; number < parts.size(); ++number) {
        const Part& part = parts[number];
        for (size_t at = page == 0 ? 0 : part.ends[page - 1]; at < part.ends[page]; ++at) {
          all.push_back(part.occurrences[at] + (firstPhrases[number] << 1U));
        }
      }
      std::vector<Occurrence>(all).swap(_longer[page]);
    }
  });
}

void LUXPhraseFinder::_countLongerPhrases() {
  const auto hashOfPhrase = [this](uint32_t number) {
    return hashOf(_phrases[number].words.data(), _phrases[number].statistics.length);
  };
  GroupTable table;
  for (uint32_t number = 0; number < _phrases.size(); ++number) {
    table.add(hashOfPhrase(number), hashOfPhrase);
  }
  const auto phraseOf = [&](const uint32_t* words, size_t length) {
    return length == 1 ? _phraseOfWord[*words]
                       : table.find(hashOf(words, length), [&](uint32_t number) {
                           const LUXPhrase& phrase = _phrases[number];
                           return phrase.statistics.length == length &&
                                  std::equal(words, words + length, phrase.words.begin());
                         });
  };
  constexpr size_t mostInner = LUXPhraseMaximumLength * (LUXPhraseMaximumLength + 1) / 2;
  for (const LUXPhrase& phrase : _phrases) {
    const size_t length = phrase.statistics.length;
    std::array<uint32_t, mostInner> seen;
    uint32_t* end = seen.data();
    for (size_t innerLength = 1; innerLength < length; ++innerLength) {
      for (size_t at = 0; at + innerLength <= length; ++at) {
        const uint32_t inner = phraseOf(phrase.words.data() + at, innerLength);
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
