#include "host/Luxwell/LUXModelTrainer.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelAssembler.h"

namespace {

constexpr uint32_t unknown = 0xFFFFFFFF;
// A pair that is none.
constexpr uint32_t ignored = 0xFFFFFFFE;

template <typename Integer>
Integer clamped(uint32_t count) noexcept {
  return static_cast<Integer>(std::min<uint32_t>(count, std::numeric_limits<Integer>::max()));
}

// Puts the occurrences from `from` on in order, each token once.
void merge(std::vector<LUXOccurrence>& all, size_t from) {
  const auto begin = all.begin() + static_cast<std::ptrdiff_t>(from);
  std::sort(begin, all.end(),
            [](const LUXOccurrence& a, const LUXOccurrence& b) { return a.token < b.token; });
  auto last = begin;
  for (auto it = begin; it != all.end(); ++it) {
    if (it == last) {
      continue;
    }
    if (it->token == last->token) {
      last->titleCount = clamped<uint8_t>(uint32_t{last->titleCount} + it->titleCount);
      last->bodyCount = clamped<uint16_t>(uint32_t{last->bodyCount} + it->bodyCount);
      last->wordsBefore = std::min(last->wordsBefore, it->wordsBefore);
    } else {
      *++last = *it;
    }
  }
  if (begin != all.end()) {
    all.erase(last + 1, all.end());
  }
}

}  // namespace

LUXModelTrainer::LUXModelTrainer(std::string language) {
  _data.tokenizer = HelpTokenizer::tokenizerForLanguage(language);
  _data.language = std::move(language);
}

uint32_t LUXModelTrainer::_bookNumber(std::string_view bookID) {
  // The pages of a book mostly come one after the other, and books are few.
  const auto found = std::find(_data.books.rbegin(), _data.books.rend(), bookID);
  return found == _data.books.rend() ? LUXTrainingPage::noBook
                                     : static_cast<uint32_t>(_data.books.rend() - found - 1);
}

void LUXModelTrainer::addBook(std::string_view bookID) {
  if (_bookNumber(bookID) == LUXTrainingPage::noBook) {
    _data.books.emplace_back(bookID);
  }
}

uint32_t LUXModelTrainer::_tokenNumber(const LUXTokenCount& count) {
  if (count.kind != LUXTokenKind::bigram) {
    return _data.stringsOf(count.kind).numberOf(count.token);
  }
  const size_t blank = count.token.find(' ');
  if (blank == std::string_view::npos) {
    return ignored;
  }
  LUXStringNumbering& stems = _data.stringsOf(LUXTokenKind::stem);
  const uint32_t first = stems.numberOf(count.token.substr(0, blank));
  return _data.pairs.numberOf({first, stems.numberOf(count.token.substr(blank + 1))});
}

void LUXModelTrainer::addPage(const LUXTokenCounts& tokenCounts,
                              const std::optional<std::string>& key,
                              const std::optional<std::vector<std::string>>& keywords,
                              std::string_view bookID) {
  if (_table != tokenCounts.table()) {
    _table = tokenCounts.table();
    _numbers.assign(_table->size(), unknown);
  }
  LUXTrainingPage page;
  if (key) {
    addBook(bookID);
    page.isShown = true;
    page.key = *key;
  }
  page.book = _bookNumber(bookID);
  for (size_t i = 0; i < tokenCounts.size(); ++i) {
    const LUXTokenCount count = tokenCounts[i];
    uint32_t& number = _numbers[tokenCounts.tokenNumber(i)];
    if (number == unknown) {
      number = _tokenNumber(count);
    }
    if (number != ignored && (count.titleCount > 0 || count.bodyCount > 0)) {
      _data.occurrencesOf(count.kind)
          .all.push_back({number, clamped<uint16_t>(count.bodyCount),
                          clamped<uint8_t>(count.titleCount), count.wordsBefore});
    }
  }
  if (keywords) {
    _addKeywords(*keywords);
  }
  for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
    LUXOccurrences& occurrences = _data.occurrences[kind];
    for (size_t i = occurrences.starts.back(); i < occurrences.all.size(); ++i) {
      page.titleLengths[kind] += occurrences.all[i].titleCount;
      page.bodyLengths[kind] += occurrences.all[i].bodyCount;
    }
    occurrences.starts.push_back(occurrences.all.size());
  }
  _data.pages.push_back(std::move(page));
}

void LUXModelTrainer::_addKeywords(const std::vector<std::string>& keywords) {
  if (_data.tokenizer == nullptr) {
    return;
  }
  std::vector<HelpTokenizer::Word> words;
  for (const std::string& keyword : keywords) {
    _data.tokenizer->wordsOfText(keyword, words);
  }
  for (const HelpTokenizer::Word& word : words) {
    _data.occurrencesOf(LUXTokenKind::form)
        .all.push_back({_data.stringsOf(LUXTokenKind::form).numberOf(word.form), 0, 1, 0});
    if (!word.isStopWord) {
      _data.occurrencesOf(LUXTokenKind::stem)
          .all.push_back({_data.stringsOf(LUXTokenKind::stem).numberOf(word.stem), 0, 1, 0});
    }
  }
  for (const LUXTokenKind kind : {LUXTokenKind::stem, LUXTokenKind::form}) {
    LUXOccurrences& occurrences = _data.occurrencesOf(kind);
    merge(occurrences.all, occurrences.starts.back());
  }
}

platform::Data LUXModelTrainer::finish(const platform::Value& options, size_t threadCount) {
  _table.reset();
  _numbers = {};
  return LUXModelAssembler(std::move(_data), threadCount).assemble(options);
}
