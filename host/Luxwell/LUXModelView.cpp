#include "host/Luxwell/LUXModelView.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <new>
#include <utility>
#include <vector>

#include "host/Luxwell/LUXModelSections.h"
#include "host/Luxwell/LUXSectionedData.h"
#include "platform/PropertyList.h"

static_assert(std::endian::native == std::endian::little, "models are read where they lie");

namespace {

constexpr size_t alignment = 8;

/// Finds sections, and remembers whether all were as they have to be.
class Opener {
 public:
  explicit Opener(const LUXSectionedData& sections) : _sections(sections) {}

  platform::Data bytes(uint32_t type) const {
    const LUXSection* section = _sections.sectionWithType(type);
    return section == nullptr ? platform::Data() : section->bytes;
  }

  std::string_view text(uint32_t type) const { return bytes(type).view(); }

  /// A section of any number of items. Sections that are not there have none.
  template <typename Item>
  std::span<const Item> items(uint32_t type) {
    const platform::Data data = bytes(type);
    if (data.length() % sizeof(Item) != 0 ||
        reinterpret_cast<uintptr_t>(data.bytes()) % alignof(Item) != 0) {
      _isSound = false;
      return {};
    }
    return {reinterpret_cast<const Item*>(data.bytes()), data.length() / sizeof(Item)};
  }

  /// A section of so many items.
  template <typename Item>
  std::span<const Item> items(uint32_t type, uint64_t count) {
    const std::span<const Item> found = items<Item>(type);
    require(found.size() == count);
    return found;
  }

  void require(bool condition) { _isSound = _isSound && condition; }
  bool isSound() const { return _isSound; }

 private:
  const LUXSectionedData& _sections;
  bool _isSound = true;
};

/// What lies between two neighbouring offsets; nothing where they make no sense.
std::string_view textBetween(std::span<const uint32_t> offsets, size_t number,
                             std::string_view text) noexcept {
  if (number >= offsets.size() || offsets.size() - number < 2) {
    return {};
  }
  // Read once: the file may change under the mapping.
  const uint32_t from = offsets[number];
  const uint32_t to = offsets[number + 1];
  return from <= to && to <= text.size() ? text.substr(from, to - from) : std::string_view();
}

template <typename Item>
std::span<const Item> itemsBetween(std::span<const uint32_t> starts, size_t number,
                                   std::span<const Item> all) noexcept {
  if (number >= starts.size() || starts.size() - number < 2) {
    return {};
  }
  const uint32_t from = starts[number];
  const uint32_t to = starts[number + 1];
  return from <= to && to <= all.size() ? all.subspan(from, to - from) : std::span<const Item>();
}

}  // namespace

std::string_view LUXModelView::Strings::at(size_t number) const noexcept {
  return textBetween(offsets, number, text);
}

uint32_t LUXModelView::Strings::lowerBound(std::string_view string) const noexcept {
  const uint64_t head = luxmodel::headOf(string);
  // Halves the places without a branch: which way to go is anybody's guess.
  size_t from = 0;
  for (size_t count = heads.size(); count > 0;) {
    const size_t half = (count + 1) / 2;
    from += half * static_cast<size_t>(heads[from + half - 1] < head);
    count -= half;
  }
  // Strings that differ from this one behind the first eight bytes only. There are seldom any.
  size_t reach = 1;
  while (from + reach <= heads.size() && heads[from + reach - 1] == head &&
         at(from + reach - 1) < string) {
    reach *= 2;
  }
  from += reach / 2;
  for (size_t count = std::min(reach - 1 - reach / 2, heads.size() - from); count > 0;) {
    const size_t half = count / 2;
    if (heads[from + half] == head && at(from + half) < string) {
      from += half + 1;
      count -= half + 1;
    } else {
      count = half;
    }
  }
  return static_cast<uint32_t>(from);
}

std::pair<uint32_t, uint32_t> LUXModelView::Strings::rangeWithPrefix(
    std::string_view prefix) const noexcept {
  const auto all = static_cast<uint32_t>(heads.size());
  const uint32_t first = lowerBound(prefix);
  uint32_t end = first;
  uint32_t count = all - first;
  while (count > 0) {
    const uint32_t half = count / 2;
    if (at(end + half).starts_with(prefix)) {
      end += half + 1;
      count -= half + 1;
    } else {
      count = half;
    }
  }
  return {first, end};
}

LUXModelView::LUXModelView() = default;
LUXModelView::~LUXModelView() = default;

std::shared_ptr<const LUXModelView> LUXModelView::viewWithData(const platform::Data& data) {
  platform::Data bytes = data;
  if (reinterpret_cast<uintptr_t>(data.bytes()) % alignment != 0) {
    auto copy = std::make_shared<std::vector<uint64_t>>(data.length() / alignment + 1);
    std::memcpy(copy->data(), data.bytes(), data.length());
    const void* start = copy->data();
    bytes = platform::Data::wrap(start, data.length(), std::move(copy));
  }
  std::optional<LUXSectionedData> sections = LUXSectionedData::read(bytes, LUXModelForm);
  return sections ? viewWithSections(std::move(*sections)) : nullptr;
}

std::shared_ptr<const LUXModelView> LUXModelView::viewWithSections(LUXSectionedData sections) {
  std::shared_ptr<LUXModelView> view(new LUXModelView);
  view->_sections = std::make_unique<const LUXSectionedData>(std::move(sections));
  return view->_open() ? view : nullptr;
}

bool LUXModelView::_open() {
  using namespace luxmodel;
  Opener opener(*_sections);
  const auto numbers = opener.items<uint32_t>(numbersSection);
  constexpr size_t fixedCount = 8;
  if (numbers.size() != fixedCount + LUXTokenKindCount) {
    return false;
  }
  _numbers = {numbers[0], numbers[1], numbers[2], numbers[3],
              numbers[4], numbers[5], numbers[6], numbers[7]};
  std::copy(numbers.begin() + fixedCount, numbers.end(), _numbers.termCounts.begin());
  _language = opener.text(languageSection);
  _optionsBytes = opener.bytes(optionsSection);

  const uint64_t pages = _numbers.pageCount;
  const uint64_t books = _numbers.bookCount;
  opener.require(pages <= _numbers.totalPageCount && pages <= luxposting::maximumPageCount);
  _bookOffsets = opener.items<uint32_t>(bookOffsetsSection, books + 1);
  _bookText = opener.text(bookTextSection);
  _pageStartsOfBooks = opener.items<uint32_t>(pageStartsOfBooksSection, books + 1);
  _pageKeyOffsets = opener.items<uint32_t>(pageKeyOffsetsSection, pages + 1);
  _pageKeyText = opener.text(pageKeyTextSection);

  for (size_t i = 0; i < LUXTokenKindCount; ++i) {
    const auto kind = static_cast<LUXTokenKind>(i);
    const uint64_t count = _numbers.termCounts[i];
    if (kind == LUXTokenKind::phrase) {
      opener.require(count == 0);
      continue;
    }
    Terms& terms = _terms[i];
    if (kind == LUXTokenKind::bigram) {
      _pairStarts = opener.items<uint32_t>(
          pairStartsSection, uint64_t{_numbers.termCounts[size_t(LUXTokenKind::stem)]} + 1);
      _pairSeconds = opener.items<uint32_t>(pairSecondsSection, count);
    } else {
      terms.strings.offsets = opener.items<uint32_t>(sectionOfKind(kind, termOffsets), count + 1);
      terms.strings.heads = opener.items<uint64_t>(sectionOfKind(kind, termHeads), count);
      terms.strings.text = opener.text(sectionOfKind(kind, termText));
    }
    terms.postingStarts = opener.items<uint32_t>(sectionOfKind(kind, postingStarts), count + 1);
    terms.postings = opener.items<uint32_t>(sectionOfKind(kind, luxmodel::postings));
    terms.hiddenTerms = opener.items<uint32_t>(sectionOfKind(kind, hiddenTerms));
    terms.hiddenCounts =
        opener.items<uint32_t>(sectionOfKind(kind, hiddenCounts), terms.hiddenTerms.size());
  }

  const uint64_t stems = _numbers.termCounts[size_t(LUXTokenKind::stem)];
  opener.require(_numbers.rank <= _numbers.stride && _numbers.stride % vectorBlock == 0 &&
                 _numbers.stride <= maximumStride);
  const uint64_t vectors = _numbers.rank == 0 ? 0 : pages;
  _pageVectors = opener.items<int8_t>(pageVectorsSection, vectors * _numbers.stride);
  _pageScales = opener.items<float>(pageScalesSection, vectors);
  _neighbourhoodCentres = opener.items<uint32_t>(neighbourhoodCentresSection);
  _neighbourhoodStarts =
      opener.items<uint32_t>(neighbourhoodStartsSection,
                             _neighbourhoodCentres.empty() ? 0 : _neighbourhoodCentres.size() + 1);
  _pagesOfNeighbourhoods = opener.items<uint32_t>(pagesOfNeighbourhoodsSection);
  _termVectorNumbers =
      opener.items<uint32_t>(termVectorNumbersSection, _numbers.rank == 0 ? 0 : stems);
  _termVectors = opener.items<int8_t>(termVectorsSection,
                                      uint64_t{_numbers.termVectorCount} * _numbers.stride);
  _termScales = opener.items<float>(termScalesSection, _numbers.termVectorCount);

  const uint64_t phrases = _numbers.phraseCount;
  const uint64_t ifPhrases = phrases == 0 ? 0 : 1;
  _phrases.offsets = opener.items<uint32_t>(phraseFoldedOffsetsSection, phrases + ifPhrases);
  _phrases.heads = opener.items<uint64_t>(phraseFoldedHeadsSection, phrases);
  _phrases.text = opener.text(phraseFoldedTextSection);
  _phraseTextOffsets = opener.items<uint32_t>(phraseTextOffsetsSection, phrases + ifPhrases);
  _phraseText = opener.text(phraseTextSection);
  _phraseScores = opener.items<float>(phraseScoresSection, phrases);
  _phraseBlockMaxima = opener.items<float>(phraseBlockMaximaSection,
                                           (phrases + phraseBlockLength - 1) / phraseBlockLength);
  _phraseStemsKeys = opener.items<uint32_t>(phraseStemsKeysSection, phrases);
  _pagesOfPhraseStarts = opener.items<uint32_t>(pagesOfPhraseStartsSection, phrases + ifPhrases);
  _pagesOfPhrases = opener.items<Share>(pagesOfPhrasesSection);
  _phrasesOfPageStarts =
      opener.items<uint32_t>(phrasesOfPageStartsSection, ifPhrases * (pages + 1));
  _phrasesOfPages = opener.items<Share>(phrasesOfPagesSection);
  _booksOfPhraseStarts = opener.items<uint32_t>(booksOfPhraseStartsSection, phrases + ifPhrases);
  _booksOfPhrases = opener.items<uint32_t>(booksOfPhrasesSection);
  return opener.isSound();
}

bool LUXModelView::checksumsMatch() const {
  const auto& sections = _sections->sections();
  return std::all_of(sections.begin(), sections.end(),
                     [](const LUXSection& section) { return section.checksumMatches(); });
}

platform::Value LUXModelView::options() const {
  return platform::propertyListFromData(_optionsBytes).value_or(platform::Value());
}

std::string_view LUXModelView::bookID(uint32_t book) const noexcept {
  return textBetween(_bookOffsets, book, _bookText);
}

std::optional<uint32_t> LUXModelView::bookNumber(std::string_view bookID) const noexcept {
  for (uint32_t book = 0; book < _numbers.bookCount; ++book) {
    if (this->bookID(book) == bookID) {
      return book;
    }
  }
  return std::nullopt;
}

std::pair<uint32_t, uint32_t> LUXModelView::pageRangeOfBook(uint32_t book) const noexcept {
  if (book >= _numbers.bookCount) {
    return {0, 0};
  }
  const uint32_t from = _pageStartsOfBooks[book];
  const uint32_t to = _pageStartsOfBooks[book + 1];
  return from < to && to <= _numbers.pageCount ? std::pair(from, to)
                                               : std::pair<uint32_t, uint32_t>(0, 0);
}

LUXModelView::Page LUXModelView::page(uint32_t page) const noexcept {
  if (page >= _numbers.pageCount) {
    return {};
  }
  const auto after = std::upper_bound(_pageStartsOfBooks.begin(), _pageStartsOfBooks.end(), page);
  const auto book = after - _pageStartsOfBooks.begin();
  return {book > 0 && book <= static_cast<std::ptrdiff_t>(_numbers.bookCount)
              ? static_cast<uint32_t>(book - 1)
              : 0,
          textBetween(_pageKeyOffsets, page, _pageKeyText)};
}

size_t LUXModelView::termCount(LUXTokenKind kind) const noexcept {
  const auto i = static_cast<size_t>(kind);
  return i < LUXTokenKindCount ? _numbers.termCounts[i] : 0;
}

std::optional<uint32_t> LUXModelView::termNumber(LUXTokenKind kind,
                                                 std::string_view token) const noexcept {
  if (kind == LUXTokenKind::bigram) {
    const size_t blank = token.find(' ');
    if (blank == std::string_view::npos) {
      return std::nullopt;
    }
    const auto first = termNumber(LUXTokenKind::stem, token.substr(0, blank));
    const auto second = termNumber(LUXTokenKind::stem, token.substr(blank + 1));
    if (!first || !second) {
      return std::nullopt;
    }
    return pairNumber(*first, *second);
  }
  if (termCount(kind) == 0) {
    return std::nullopt;
  }
  const Strings& strings = _terms[static_cast<size_t>(kind)].strings;
  const uint32_t number = strings.lowerBound(token);
  return number < strings.heads.size() && strings.at(number) == token ? std::optional(number)
                                                                      : std::nullopt;
}

std::optional<uint32_t> LUXModelView::pairNumber(uint32_t firstStem,
                                                 uint32_t secondStem) const noexcept {
  const auto seconds = itemsBetween(_pairStarts, firstStem, _pairSeconds);
  const auto found = std::lower_bound(seconds.begin(), seconds.end(), secondStem);
  if (found == seconds.end() || *found != secondStem) {
    return std::nullopt;
  }
  return static_cast<uint32_t>(&*found - _pairSeconds.data());
}

std::pair<uint32_t, uint32_t> LUXModelView::termRangeWithPrefix(
    LUXTokenKind kind, std::string_view prefix) const noexcept {
  if (kind == LUXTokenKind::bigram || termCount(kind) == 0) {
    return {0, 0};
  }
  return _terms[static_cast<size_t>(kind)].strings.rangeWithPrefix(prefix);
}

std::string LUXModelView::term(LUXTokenKind kind, uint32_t number) const {
  if (number >= termCount(kind)) {
    return {};
  }
  if (kind != LUXTokenKind::bigram) {
    return std::string(_terms[static_cast<size_t>(kind)].strings.at(number));
  }
  const auto after = std::upper_bound(_pairStarts.begin(), _pairStarts.end(), number);
  if (after == _pairStarts.begin()) {
    return {};
  }
  const auto first = static_cast<uint32_t>(after - _pairStarts.begin() - 1);
  return term(LUXTokenKind::stem, first) + ' ' + term(LUXTokenKind::stem, _pairSeconds[number]);
}

uint32_t LUXModelView::documentFrequency(LUXTokenKind kind, uint32_t number) const noexcept {
  if (number >= termCount(kind)) {
    return 0;
  }
  const Terms& terms = _terms[static_cast<size_t>(kind)];
  const auto shown = static_cast<uint32_t>(postings(kind, number).size());
  const auto hidden = std::lower_bound(terms.hiddenTerms.begin(), terms.hiddenTerms.end(), number);
  if (hidden == terms.hiddenTerms.end() || *hidden != number) {
    return shown;
  }
  const uint32_t count =
      terms.hiddenCounts[static_cast<size_t>(hidden - terms.hiddenTerms.begin())];
  return shown + std::min(count, _numbers.totalPageCount - _numbers.pageCount);
}

std::span<const uint32_t> LUXModelView::postings(LUXTokenKind kind,
                                                 uint32_t number) const noexcept {
  if (number >= termCount(kind)) {
    return {};
  }
  const Terms& terms = _terms[static_cast<size_t>(kind)];
  const auto found = itemsBetween(terms.postingStarts, number, terms.postings);
  // No term is in a page twice.
  return found.first(std::min<size_t>(found.size(), _numbers.pageCount));
}

const int8_t* LUXModelView::pageVector(uint32_t page) const noexcept {
  return page < _pageScales.size() ? _pageVectors.data() + size_t{page} * _numbers.stride : nullptr;
}

float LUXModelView::pageScale(uint32_t page) const noexcept {
  return page < _pageScales.size() ? _pageScales[page] : 0;
}

uint32_t LUXModelView::neighbourhoodCentre(size_t neighbourhood) const noexcept {
  return neighbourhood < _neighbourhoodCentres.size() ? _neighbourhoodCentres[neighbourhood] : 0;
}

std::span<const uint32_t> LUXModelView::pagesOfNeighbourhood(size_t neighbourhood) const noexcept {
  const auto found = itemsBetween(_neighbourhoodStarts, neighbourhood, _pagesOfNeighbourhoods);
  return found.first(std::min<size_t>(found.size(), _numbers.pageCount));
}

const int8_t* LUXModelView::termVector(uint32_t stem) const noexcept {
  const uint32_t row = stem < _termVectorNumbers.size() ? _termVectorNumbers[stem] : ~uint32_t{0};
  return row < _termScales.size() ? _termVectors.data() + size_t{row} * _numbers.stride : nullptr;
}

float LUXModelView::termScale(uint32_t stem) const noexcept {
  const uint32_t row = stem < _termVectorNumbers.size() ? _termVectorNumbers[stem] : ~uint32_t{0};
  return row < _termScales.size() ? _termScales[row] : 0;
}

std::string_view LUXModelView::phraseText(uint32_t phrase) const noexcept {
  return textBetween(_phraseTextOffsets, phrase, _phraseText);
}

std::string_view LUXModelView::phraseFoldedText(uint32_t phrase) const noexcept {
  return _phrases.at(phrase);
}

std::pair<uint32_t, uint32_t> LUXModelView::phraseRangeWithPrefix(
    std::string_view prefix) const noexcept {
  return _phrases.rangeWithPrefix(prefix);
}

uint32_t LUXModelView::phraseStemsKey(uint32_t phrase) const noexcept {
  return phrase < _phraseStemsKeys.size() ? _phraseStemsKeys[phrase] : 0;
}

std::span<const LUXModelView::Share> LUXModelView::pagesOfPhrase(uint32_t phrase) const noexcept {
  const auto found = itemsBetween(_pagesOfPhraseStarts, phrase, _pagesOfPhrases);
  return found.first(std::min(found.size(), maximumPagesOfPhrase));
}

std::span<const LUXModelView::Share> LUXModelView::phrasesOfPage(uint32_t page) const noexcept {
  const auto found = itemsBetween(_phrasesOfPageStarts, page, _phrasesOfPages);
  return found.first(std::min<size_t>(found.size(), _numbers.phraseCount));
}

bool LUXModelView::phraseOccursInBook(uint32_t phrase, uint32_t book) const noexcept {
  const auto books = itemsBetween(_booksOfPhraseStarts, phrase, _booksOfPhrases);
  return std::binary_search(books.begin(), books.end(), book);
}
