#include "host/Luxwell/LUXModelAssembler.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <numeric>
#include <utility>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXLatent.h"
#include "host/Luxwell/LUXModelPhrases.h"
#include "host/Luxwell/LUXModelSections.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXParallel.h"
#include "host/Luxwell/LUXScoringProduct.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"

namespace {

using enum LUXTokenKind;

constexpr const char* thresholdsKey = "SuggestionThresholdsPerBook";
constexpr std::array termKinds{stem, bigram, form, title};

[[noreturn]] void throwTooLarge(const char* what) {
  throw platform::Exception(platform::invalidArgumentException,
                            std::string("too many ") + what + " for a model");
}

// By how much more a page of this length has of everything.
double relativeLength(double length, double average, double share, double exponent) noexcept {
  return average > 0 ? 1 - share + share * std::pow(length / average, exponent) : 1;
}

double titleLengthFactor(double length, double average) noexcept {
  return relativeLength(length, average, luxmodel::titleLengthShare, luxmodel::titleLengthExponent);
}

double bodyLengthFactor(double length, double average) noexcept {
  return relativeLength(length, average, luxmodel::bodyLengthShare, luxmodel::bodyLengthExponent);
}

uint32_t impactOf(double count, uint8_t wordsBefore) noexcept {
  const double often = count / (luxmodel::saturation + count);
  const double early = luxmodel::earlyHalfLength / (luxmodel::earlyHalfLength + wordsBefore);
  const double share = (often + luxmodel::earlyShare * early) / (1 + luxmodel::earlyShare);
  return std::max(1U, static_cast<uint32_t>(std::lround(luxposting::maximumImpact * share)));
}

// Turns counts at i + 1 into places where each i begins.
template <typename Integer>
void addUp(std::vector<Integer>& starts) {
  for (size_t i = 1; i < starts.size(); ++i) {
    starts[i] += starts[i - 1];
  }
}

// `row` in 127 steps to each side; gives the size of a step.
float quantise(const float* row, size_t length, int8_t* steps) noexcept {
  float most = 0;
  for (size_t i = 0; i < length; ++i) {
    most = std::max(most, std::abs(row[i]));
  }
  if (!(most > 0)) {
    return 0;
  }
  for (size_t i = 0; i < length; ++i) {
    steps[i] = static_cast<int8_t>(std::lround(row[i] / most * 127));
  }
  return most / 127;
}

}  // namespace

void LUXTextColumn::add(std::string_view string) {
  if (text.size() + string.size() > std::numeric_limits<uint32_t>::max()) {
    throwTooLarge("characters");
  }
  text += string;
  offsets.push_back(static_cast<uint32_t>(text.size()));
}

LUXModelAssembler::LUXModelAssembler(LUXTrainingData data, size_t threadCount)
    : _data(std::move(data)), _threadCount(threadCount) {}

platform::Data LUXModelAssembler::assemble(const platform::Value& options) {
  _writer.addBytes(
      luxmodel::optionsSection,
      platform::dataFromPropertyList(
          options.isAbsent() ? platform::Value(platform::Value::Dictionary()) : options,
          platform::PropertyListFormat::binary));
  _writer.addText(luxmodel::languageSection, _data.language);
  _orderPages();
  _addBooksAndPages();
  _orderTerms();
  _orderPairs();
  std::vector<LUXModelPhrases::Phrase> phrases =
      LUXModelPhrases(_data, _threadCount).phrases(options[thresholdsKey]);
  _data.occurrencesOf(phrase) = {};
  for (const LUXTokenKind kind : termKinds) {
    _addPostings(kind);
    if (kind != stem) {
      _data.occurrencesOf(kind) = {};
    }
  }
  _addMeaning();
  _data.occurrences = {};
  // Phrases are looked up in the model as far as it is there.
  LUXSectionsWriter withoutPhrases = _writer;
  _addNumbers(withoutPhrases, 0);
  const auto view =
      LUXModelView::viewWithSections(LUXSectionedData(withoutPhrases.sections(), LUXModelForm));
  _addNumbers(_writer, static_cast<uint32_t>(phrases.size()));
  LUXModelPhrases::addSections(std::move(phrases), _data, *view, _threadCount, _writer);
  return LUXSectionedData(_writer.sections(), LUXModelForm).write();
}

void LUXModelAssembler::_orderPages() {
  _pages.resize(_data.pages.size());
  std::iota(_pages.begin(), _pages.end(), 0U);
  std::stable_sort(_pages.begin(), _pages.end(), [this](uint32_t a, uint32_t b) {
    const LUXTrainingPage& first = _data.pages[a];
    const LUXTrainingPage& second = _data.pages[b];
    return first.isShown != second.isShown ? first.isShown
                                           : first.isShown && first.book < second.book;
  });
  _shownCount = static_cast<size_t>(std::count_if(_data.pages.begin(), _data.pages.end(),
                                                  [](const auto& page) { return page.isShown; }));
  if (_shownCount > luxposting::maximumPageCount) {
    throwTooLarge("pages");
  }
}

void LUXModelAssembler::_addNumbers(LUXSectionsWriter& writer, uint32_t phraseCount) const {
  std::vector<uint32_t> numbers{HelpTokenizer::version(),
                                static_cast<uint32_t>(_data.books.size()),
                                static_cast<uint32_t>(_shownCount),
                                static_cast<uint32_t>(_pages.size()),
                                _rank,
                                _stride,
                                _termVectorCount,
                                phraseCount};
  for (const auto& terms : _termNumbers) {
    numbers.push_back(static_cast<uint32_t>(terms.size()));
  }
  writer.addItems(luxmodel::numbersSection, std::move(numbers));
}

void LUXModelAssembler::_addBooksAndPages() {
  LUXTextColumn books;
  for (const std::string& book : _data.books) {
    books.add(book);
  }
  LUXTextColumn keys;
  std::vector<uint32_t> starts(_data.books.size() + 1);
  for (size_t i = 0; i < _shownCount; ++i) {
    const LUXTrainingPage& page = _data.pages[_pages[i]];
    keys.add(page.key);
    ++starts[page.book + 1];
  }
  addUp(starts);
  _writer.addItems(luxmodel::bookOffsetsSection, std::move(books.offsets));
  _writer.addText(luxmodel::bookTextSection, std::move(books.text));
  _writer.addItems(luxmodel::pageStartsOfBooksSection, std::move(starts));
  _writer.addItems(luxmodel::pageKeyOffsetsSection, std::move(keys.offsets));
  _writer.addText(luxmodel::pageKeyTextSection, std::move(keys.text));
}

void LUXModelAssembler::_orderTerms() {
  struct Entry {
    uint64_t head;
    uint32_t token;
  };
  struct Columns {
    std::vector<uint64_t> heads;
    LUXTextColumn text;
  };
  constexpr std::array kinds{stem, form, title};
  std::array<Columns, kinds.size()> columns;
  LUXInParallel(kinds.size(), 1, _threadCount, [&](size_t i, size_t) {
    const LUXStringNumbering& strings = _data.stringsOf(kinds[i]);
    std::vector<Entry> entries(strings.size());
    for (uint32_t token = 0; token < entries.size(); ++token) {
      entries[token] = {luxmodel::headOf(strings[token]), token};
    }
    std::sort(entries.begin(), entries.end(), [&](const Entry& a, const Entry& b) {
      return a.head != b.head ? a.head < b.head : strings[a.token] < strings[b.token];
    });
    std::vector<uint32_t>& numbers = _termNumbers[static_cast<size_t>(kinds[i])];
    numbers.resize(entries.size());
    for (const Entry& entry : entries) {
      numbers[entry.token] = static_cast<uint32_t>(columns[i].heads.size());
      columns[i].heads.push_back(entry.head);
      columns[i].text.add(strings[entry.token]);
    }
  });
  for (size_t i = 0; i < kinds.size(); ++i) {
    using namespace luxmodel;
    _writer.addItems(sectionOfKind(kinds[i], termOffsets), std::move(columns[i].text.offsets));
    _writer.addItems(sectionOfKind(kinds[i], termHeads), std::move(columns[i].heads));
    _writer.addText(sectionOfKind(kinds[i], termText), std::move(columns[i].text.text));
  }
}

void LUXModelAssembler::_orderPairs() {
  const std::vector<uint32_t>& stems = _termNumbers[static_cast<size_t>(stem)];
  const LUXPairNumbering& pairs = _data.pairs;
  std::vector<uint32_t> starts(stems.size() + 1);
  for (size_t i = 0; i < pairs.size(); ++i) {
    ++starts[stems[pairs[i].first] + 1];
  }
  addUp(starts);
  std::vector<uint32_t> order(pairs.size());
  std::vector<uint32_t> next(starts.begin(), starts.end() - 1);
  for (uint32_t i = 0; i < pairs.size(); ++i) {
    order[next[stems[pairs[i].first]]++] = i;
  }
  std::vector<uint32_t>& numbers = _termNumbers[static_cast<size_t>(bigram)];
  numbers.resize(pairs.size());
  std::vector<uint32_t> seconds(pairs.size());
  constexpr size_t stemsAtOnce = 256;
  LUXInParallel(stems.size(), stemsAtOnce, _threadCount, [&](size_t from, size_t to) {
    for (size_t first = from; first < to; ++first) {
      std::sort(
          order.begin() + starts[first], order.begin() + starts[first + 1],
          [&](uint32_t a, uint32_t b) { return stems[pairs[a].second] < stems[pairs[b].second]; });
      for (uint32_t place = starts[first]; place < starts[first + 1]; ++place) {
        numbers[order[place]] = place;
        seconds[place] = stems[pairs[order[place]].second];
      }
    }
  });
  _data.pairs = {};
  _writer.addItems(luxmodel::pairStartsSection, std::move(starts));
  _writer.addItems(luxmodel::pairSecondsSection, std::move(seconds));
}

void LUXModelAssembler::_addPostings(LUXTokenKind kind) {
  const LUXOccurrences& occurrences = _data.occurrencesOf(kind);
  const std::vector<uint32_t>& numbers = _termNumbers[static_cast<size_t>(kind)];
  std::vector<uint32_t> starts(numbers.size() + 1);
  std::vector<uint32_t> hidden(_shownCount == _pages.size() ? 0 : numbers.size());
  uint64_t titleLength = 0;
  uint64_t bodyLength = 0;
  uint64_t shown = 0;
  for (size_t i = 0; i < _pages.size(); ++i) {
    const LUXTrainingPage& page = _data.pages[_pages[i]];
    titleLength += page.titleLengths[static_cast<size_t>(kind)];
    bodyLength += page.bodyLengths[static_cast<size_t>(kind)];
    for (const LUXOccurrence& occurrence : occurrences.ofPage(_pages[i])) {
      if (i < _shownCount) {
        ++starts[numbers[occurrence.token] + 1];
        ++shown;
      } else {
        ++hidden[numbers[occurrence.token]];
      }
    }
  }
  if (shown > std::numeric_limits<uint32_t>::max()) {
    throwTooLarge("postings");
  }
  addUp(starts);
  const auto pageCount = static_cast<double>(std::max<size_t>(_pages.size(), 1));
  const double averageTitle = static_cast<double>(titleLength) / pageCount;
  const double averageBody = static_cast<double>(bodyLength) / pageCount;
  std::vector<uint32_t> postings(shown);
  std::vector<uint32_t> next(starts.begin(), starts.end() - 1);
  for (uint32_t i = 0; i < _shownCount; ++i) {
    const LUXTrainingPage& page = _data.pages[_pages[i]];
    const double titles = page.titleLengths[static_cast<size_t>(kind)];
    const double bodies = page.bodyLengths[static_cast<size_t>(kind)];
    double titleFactor = luxmodel::titleWeight / titleLengthFactor(titles, averageTitle);
    double bodyFactor = 1 / bodyLengthFactor(bodies, averageBody);
    if (kind == bigram) {
      bodyFactor = 1 / bodyLengthFactor(titles + bodies, averageTitle + averageBody);
      titleFactor = bodyFactor;
    }
    for (const LUXOccurrence& occurrence : occurrences.ofPage(_pages[i])) {
      const uint32_t impact =
          kind == title
              ? luxposting::maximumImpact
              : impactOf(occurrence.titleCount * titleFactor + occurrence.bodyCount * bodyFactor,
                         occurrence.wordsBefore);
      postings[next[numbers[occurrence.token]]++] = luxposting::posting(i, impact);
    }
  }
  if (kind == stem) {
    _stemFrequencies.resize(numbers.size());
    for (size_t i = 0; i < numbers.size(); ++i) {
      _stemFrequencies[i] = starts[i + 1] - starts[i] + (hidden.empty() ? 0 : hidden[i]);
    }
  }
  std::vector<uint32_t> hiddenTerms;
  std::vector<uint32_t> hiddenCounts;
  for (uint32_t i = 0; i < hidden.size(); ++i) {
    if (hidden[i] > 0) {
      hiddenTerms.push_back(i);
      hiddenCounts.push_back(hidden[i]);
    }
  }
  using namespace luxmodel;
  _writer.addItems(sectionOfKind(kind, postingStarts), std::move(starts));
  _writer.addItems(sectionOfKind(kind, luxmodel::postings), std::move(postings));
  _writer.addItems(sectionOfKind(kind, luxmodel::hiddenTerms), std::move(hiddenTerms));
  _writer.addItems(sectionOfKind(kind, luxmodel::hiddenCounts), std::move(hiddenCounts));
}

void LUXModelAssembler::_addMeaning() {
  constexpr uint32_t none = 0xFFFFFFFF;
  const LUXOccurrences& occurrences = _data.occurrencesOf(stem);
  const std::vector<uint32_t>& numbers = _termNumbers[static_cast<size_t>(stem)];

  // Columns are the stems in two pages or more, in order.
  std::vector<uint32_t> columns(numbers.size(), none);
  uint32_t columnCount = 0;
  for (size_t i = 0; i < columns.size(); ++i) {
    if (_stemFrequencies[i] >= 2) {
      columns[i] = columnCount++;
    }
  }
  LUXSparseMatrix matrix;
  matrix.rowCount = static_cast<uint32_t>(_pages.size());
  matrix.columnCount = columnCount;
  std::vector<uint64_t> frequencies(columnCount);
  std::vector<uint32_t> counts;
  for (const uint32_t page : _pages) {
    for (const LUXOccurrence& occurrence : occurrences.ofPage(page)) {
      const uint32_t column = columns[numbers[occurrence.token]];
      if (column != none) {
        matrix.columns.push_back(column);
        counts.push_back(occurrence.count());
        frequencies[column] += occurrence.count();
      }
    }
    matrix.starts.push_back(matrix.columns.size());
  }
  // Entropy weights (S. Dumais, "Improving the retrieval of information from external sources",
  // 1991): 1 for a stem that is in one page only, 0 for one that is evenly in all.
  std::vector<double> weights(columnCount);
  for (size_t i = 0; i < counts.size(); ++i) {
    const double share = counts[i] / static_cast<double>(frequencies[matrix.columns[i]]);
    weights[matrix.columns[i]] += share * std::log2(share);
  }
  const double pageBits = std::log2(static_cast<double>(std::max<size_t>(_pages.size(), 2)));
  for (double& weight : weights) {
    weight = std::max(0.0, 1 + weight / pageBits);
  }
  matrix.values.resize(counts.size());
  constexpr size_t rowsAtOnce = 256;
  LUXInParallel(matrix.rowCount, rowsAtOnce, _threadCount, [&](size_t from, size_t to) {
    for (size_t row = from; row < to; ++row) {
      double squares = 0;
      for (size_t i = matrix.starts[row]; i < matrix.starts[row + 1]; ++i) {
        const double value = std::log2(1.0 + counts[i]) * weights[matrix.columns[i]];
        matrix.values[i] = static_cast<float>(value);
        squares += value * value;
      }
      const double scale = squares > 0 ? 1 / std::sqrt(squares) : 0;
      for (size_t i = matrix.starts[row]; i < matrix.starts[row + 1]; ++i) {
        matrix.values[i] = static_cast<float>(matrix.values[i] * scale);
      }
    }
  });
  counts = {};

  const LUXFactorisation factors =
      LUXFactorise(matrix, luxlatent::rankForPageCount(_pages.size()), _threadCount);
  _rank = static_cast<uint32_t>(factors.singularValues.size());
  if (_rank == 0) {
    return;
  }
  _stride = (_rank + luxmodel::vectorBlock - 1) / luxmodel::vectorBlock * luxmodel::vectorBlock;
  _termVectorCount = columnCount;
  std::vector<int8_t> pageVectors(_shownCount * _stride);
  std::vector<float> pageScales(_shownCount);
  for (size_t page = 0; page < _shownCount; ++page) {
    const float* row = factors.rows.row(page);
    double squares = 0;
    for (size_t i = 0; i < _rank; ++i) {
      squares += static_cast<double>(row[i]) * row[i];
    }
    const float step = quantise(row, _rank, &pageVectors[page * _stride]);
    pageScales[page] = squares > 0 ? static_cast<float>(step / std::sqrt(squares)) : 0;
  }
  _addNeighbourhoods(pageVectors, pageScales);
  std::vector<int8_t> termVectors(size_t{columnCount} * _stride);
  std::vector<float> termScales(columnCount);
  for (size_t column = 0; column < columnCount; ++column) {
    const float step = quantise(factors.columns.row(column), _rank, &termVectors[column * _stride]);
    termScales[column] = static_cast<float>(step * weights[column]);
  }
  using namespace luxmodel;
  _writer.addItems(pageVectorsSection, std::move(pageVectors));
  _writer.addItems(pageScalesSection, std::move(pageScales));
  _writer.addItems(termVectorNumbersSection, std::move(columns));
  _writer.addItems(termVectorsSection, std::move(termVectors));
  _writer.addItems(termScalesSection, std::move(termScales));
}

void LUXModelAssembler::_addNeighbourhoods(const std::vector<int8_t>& vectors,
                                           const std::vector<float>& scales) {
  if (_shownCount < luxmodel::neighbourhoodPageCount) {
    return;
  }
  const auto count = static_cast<size_t>(std::lround(std::sqrt(static_cast<double>(_shownCount))));
  std::vector<uint32_t> centres;
  for (size_t i = 0; i < count; ++i) {
    const auto page = static_cast<uint32_t>(i * _shownCount / count);
    if (scales[page] > 0) {
      centres.push_back(page);
    }
  }
  if (centres.empty()) {
    return;
  }
  constexpr uint32_t nowhere = 0xFFFFFFFF;
  std::vector<uint32_t> places(_shownCount, nowhere);
  constexpr size_t pagesAtOnce = 256;
  LUXInParallel(_shownCount, pagesAtOnce, _threadCount, [&](size_t from, size_t to) {
    for (size_t page = from; page < to; ++page) {
      float best = -1;
      for (uint32_t i = 0; scales[page] > 0 && i < centres.size(); ++i) {
        const int32_t product = LUXInnerProduct(&vectors[page * _stride],
                                                &vectors[size_t{centres[i]} * _stride], _stride);
        const float cosine = static_cast<float>(product) * scales[centres[i]] * scales[page];
        if (places[page] == nowhere || cosine > best) {
          best = cosine;
          places[page] = i;
        }
      }
    }
  });
  std::vector<uint32_t> starts(centres.size() + 1);
  for (const uint32_t place : places) {
    if (place != nowhere) {
      ++starts[place + 1];
    }
  }
  addUp(starts);
  std::vector<uint32_t> pages(starts.back());
  std::vector<uint32_t> next(starts.begin(), starts.end() - 1);
  for (uint32_t page = 0; page < places.size(); ++page) {
    if (places[page] != nowhere) {
      pages[next[places[page]]++] = page;
    }
  }
  _writer.addItems(luxmodel::neighbourhoodCentresSection, std::move(centres));
  _writer.addItems(luxmodel::neighbourhoodStartsSection, std::move(starts));
  _writer.addItems(luxmodel::pagesOfNeighbourhoodsSection, std::move(pages));
}
