#include "host/Luxwell/LUXModelPhrases.h"

#include <algorithm>
#include <utility>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelSections.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXParallel.h"
#include "host/Luxwell/LUXQueryTerms.h"
#include "host/Luxwell/LUXSimilar.h"
#include "host/Luxwell/LUXStemsKey.h"

namespace {

constexpr const char* bigramThresholdKey = "BigramThreshold";
constexpr const char* trigramThresholdKey = "TrigramThreshold";

// A text of more words is no phrase, wherever it comes from.
constexpr size_t longestPhrase = 8;
// Tokens that are folded before they are numbered, and those that one thread takes at once.
constexpr size_t batchLength = 65536;
constexpr size_t pieceLength = 512;

std::vector<std::string> formsOf(const HelpTokenizer* tokenizer, std::string_view text) {
  std::vector<std::string> forms;
  if (tokenizer != nullptr) {
    std::vector<HelpTokenizer::Word> words;
    tokenizer->wordsOfText(text, words);
    for (HelpTokenizer::Word& word : words) {
      forms.push_back(std::move(word.form));
    }
    return forms;
  }
  while (!text.empty()) {
    const size_t end = std::min(text.find(' '), text.size());
    if (end > 0) {
      forms.emplace_back(text.substr(0, end));
    }
    text.remove_prefix(std::min(end + 1, text.size()));
  }
  return forms;
}

std::string foldedText(const std::vector<std::string_view>& forms) {
  std::string text;
  for (const std::string_view form : forms) {
    HelpTokenizer::appendToDisplay(text, form);
  }
  return text;
}

// Counts of phrases in some pages. Forgets in time in proportion to what it counted.
class Counter {
 public:
  explicit Counter(size_t phraseCount) : _statistics(phraseCount), _lastPages(phraseCount, none) {}

  void add(uint32_t phrase, uint32_t page, uint32_t titleCount, uint32_t bodyCount) {
    LUXPhraseStatistics& statistics = _statistics[phrase];
    if (statistics.frequency == 0) {
      _touched.push_back(phrase);
    }
    if (_lastPages[phrase] != page) {
      _lastPages[phrase] = page;
      ++statistics.pageCount;
      statistics.titleCount += titleCount > 0 ? 1 : 0;
    }
    statistics.frequency += uint64_t{titleCount} + bodyCount;
  }

  // Parts of counted phrases that were not counted themselves get no statistics.
  template <typename PartsOf>
  void finish(size_t pageCount, const std::vector<uint32_t>& lengths, const PartsOf& partsOf) {
    for (const uint32_t phrase : _touched) {
      _statistics[phrase].length = lengths[phrase];
      _statistics[phrase].totalPageCount = static_cast<uint32_t>(pageCount);
      for (const uint32_t part : partsOf(phrase)) {
        if (_statistics[part].frequency > 0) {
          ++_statistics[part].longerPhraseCount;
          _statistics[part].longerPhraseFrequency += _statistics[phrase].frequency;
        }
      }
    }
  }

  void forget() {
    for (const uint32_t phrase : _touched) {
      _statistics[phrase] = {};
      _lastPages[phrase] = none;
    }
    _touched.clear();
  }

  const std::vector<uint32_t>& touched() const { return _touched; }
  const LUXPhraseStatistics& operator[](uint32_t phrase) const { return _statistics[phrase]; }

 private:
  static constexpr uint32_t none = LUXStringNumbering::none;

  std::vector<LUXPhraseStatistics> _statistics;
  std::vector<uint32_t> _lastPages;
  std::vector<uint32_t> _touched;
};

}  // namespace

LUXModelPhrases::LUXModelPhrases(const LUXTrainingData& data, size_t threadCount)
    : _data(data), _threadCount(threadCount) {
  _foldTokens();
  _findParts();
}

void LUXModelPhrases::_foldTokens() {
  const LUXStringNumbering& tokens = _data.stringsOf(LUXTokenKind::phrase);
  _phraseOfToken.assign(tokens.size(), none);
  std::vector<std::vector<std::string>> batch;
  for (size_t start = 0; start < tokens.size(); start += batchLength) {
    batch.assign(std::min(batchLength, tokens.size() - start), {});
    LUXInParallel(batch.size(), pieceLength, _threadCount, [&](size_t from, size_t to) {
      for (size_t i = from; i < to; ++i) {
        batch[i] = formsOf(_data.tokenizer.get(), tokens[start + i]);
      }
    });
    for (size_t i = 0; i < batch.size(); ++i) {
      const std::vector<std::string>& forms = batch[i];
      if (forms.empty() || forms.size() > longestPhrase) {
        continue;
      }
      const uint32_t phrase =
          _folded.numberOf(foldedText(std::vector<std::string_view>(forms.begin(), forms.end())));
      _phraseOfToken[start + i] = phrase;
      if (phrase == _lengths.size()) {
        _lengths.push_back(static_cast<uint32_t>(forms.size()));
        for (const std::string& form : forms) {
          _words.push_back(_forms.numberOf(form));
        }
        _wordStarts.push_back(_words.size());
      }
    }
  }
}

void LUXModelPhrases::_findParts() {
  std::vector<std::vector<uint32_t>> batch;
  for (size_t start = 0; start < _lengths.size(); start += batchLength) {
    batch.assign(std::min(batchLength, _lengths.size() - start), {});
    LUXInParallel(batch.size(), pieceLength, _threadCount, [&](size_t from, size_t to) {
      std::vector<std::string_view> forms;
      for (size_t i = from; i < to; ++i) {
        const size_t length = _lengths[start + i];
        std::vector<uint32_t>& parts = batch[i];
        for (size_t first = 0; first < length; ++first) {
          forms.clear();
          for (size_t last = first; last < length; ++last) {
            forms.push_back(_forms[_words[_wordStarts[start + i] + last]]);
            if (forms.size() == length) {
              break;
            }
            const uint32_t part = _folded.find(foldedText(forms));
            if (part != none && std::find(parts.begin(), parts.end(), part) == parts.end()) {
              parts.push_back(part);
            }
          }
        }
      }
    });
    for (const std::vector<uint32_t>& parts : batch) {
      _parts.insert(_parts.end(), parts.begin(), parts.end());
      _partStarts.push_back(_parts.size());
    }
  }
}

template <typename Body>
void LUXModelPhrases::_forEachCount(size_t page, const Body& body) const {
  for (const LUXOccurrence& occurrence : _data.occurrencesOf(LUXTokenKind::phrase).ofPage(page)) {
    const uint32_t phrase = _phraseOfToken[occurrence.token];
    if (phrase != none) {
      body(phrase, occurrence);
    }
  }
}

std::vector<LUXModelPhrases::Phrase> LUXModelPhrases::phrases(
    const platform::Value& thresholds) const {
  const auto partsOf = [this](uint32_t phrase) {
    return std::span(_parts).subspan(_partStarts[phrase],
                                     _partStarts[phrase + 1] - _partStarts[phrase]);
  };
  Counter counter(_lengths.size());
  std::vector<uint64_t> tokenFrequencies(_phraseOfToken.size());
  for (size_t page = 0; page < _data.pages.size(); ++page) {
    _forEachCount(page, [&](uint32_t phrase, const LUXOccurrence& occurrence) {
      counter.add(phrase, static_cast<uint32_t>(page), occurrence.titleCount, occurrence.bodyCount);
      tokenFrequencies[occurrence.token] += occurrence.count();
    });
  }
  counter.finish(_data.pages.size(), _lengths, partsOf);

  // Places of the phrases that are good enough for the model, in what comes out.
  std::vector<uint32_t> places(_lengths.size(), none);
  std::vector<Phrase> result;
  for (uint32_t phrase = 0; phrase < _lengths.size(); ++phrase) {
    const double score = LUXPhraseScore(counter[phrase]);
    if (counter[phrase].pageCount >= LUXPhraseMinimumPageCount && score > 0) {
      places[phrase] = static_cast<uint32_t>(result.size());
      result.push_back({std::string(_folded[phrase]), {}, counter[phrase], score, {}});
    }
  }
  counter.forget();

  std::vector<uint64_t> displayFrequencies(result.size());
  for (uint32_t token = 0; token < _phraseOfToken.size(); ++token) {
    const uint32_t place = _phraseOfToken[token] == none ? none : places[_phraseOfToken[token]];
    if (place == none) {
      continue;
    }
    const std::string_view text = _data.stringsOf(LUXTokenKind::phrase)[token];
    Phrase& phrase = result[place];
    if (tokenFrequencies[token] > displayFrequencies[place] ||
        (tokenFrequencies[token] == displayFrequencies[place] && text < phrase.text)) {
      displayFrequencies[place] = tokenFrequencies[token];
      phrase.text = text;
    }
  }

  std::vector<std::vector<uint32_t>> pagesOfBooks(_data.books.size());
  for (uint32_t page = 0; page < _data.pages.size(); ++page) {
    if (_data.pages[page].book < pagesOfBooks.size()) {
      pagesOfBooks[_data.pages[page].book].push_back(page);
    }
  }
  std::vector<bool> isGoodEnough(result.size(), false);
  for (uint32_t book = 0; book < pagesOfBooks.size(); ++book) {
    const platform::Value& own = thresholds[_data.books[book]];
    const double forShort = own[bigramThresholdKey].doubleValue();
    const double forLong = own[trigramThresholdKey].doubleValue();
    for (const uint32_t page : pagesOfBooks[book]) {
      _forEachCount(page, [&](uint32_t phrase, const LUXOccurrence& occurrence) {
        counter.add(phrase, page, occurrence.titleCount, occurrence.bodyCount);
        if (places[phrase] != none && _data.pages[page].isShown) {
          std::vector<uint32_t>& books = result[places[phrase]].books;
          if (books.empty() || books.back() != book) {
            books.push_back(book);
          }
        }
      });
    }
    counter.finish(pagesOfBooks[book].size(), _lengths, partsOf);
    for (const uint32_t phrase : counter.touched()) {
      const uint32_t place = places[phrase];
      if (place != none && !result[place].books.empty() && result[place].books.back() == book) {
        isGoodEnough[place] =
            isGoodEnough[place] ||
            LUXPhraseScore(counter[phrase]) >= (_lengths[phrase] > 2 ? forLong : forShort);
      }
    }
    counter.forget();
  }

  std::vector<Phrase> kept;
  for (size_t place = 0; place < result.size(); ++place) {
    if (isGoodEnough[place]) {
      kept.push_back(std::move(result[place]));
    }
  }
  std::sort(kept.begin(), kept.end(),
            [](const Phrase& a, const Phrase& b) { return a.foldedText < b.foldedText; });
  return kept;
}

void LUXModelPhrases::addSections(std::vector<Phrase> phrases, const LUXTrainingData& data,
                                  const LUXModelView& view, size_t threadCount,
                                  LUXSectionsWriter& writer) {
  using namespace luxmodel;
  using Share = LUXModelView::Share;
  if (phrases.empty()) {
    return;
  }
  std::vector<std::vector<Share>> pagesOfPhrase(phrases.size());
  std::vector<uint32_t> stemsKeys(phrases.size());
  constexpr size_t queriesAtOnce = 64;
  LUXInParallel(phrases.size(), queriesAtOnce, threadCount, [&](size_t from, size_t to) {
    for (size_t i = from; i < to; ++i) {
      if (data.tokenizer == nullptr) {
        const std::vector<std::string> forms = formsOf(nullptr, phrases[i].text);
        stemsKeys[i] = LUXStemsKey({forms.begin(), forms.end()});
        continue;
      }
      // The blank says that the last word is whole.
      const LUXQueryTerms terms =
          LUXQueryTerms::termsOfText(*data.tokenizer, phrases[i].text + ' ', {});
      std::vector<std::string_view> stems;
      for (const LUXQueryTerms::Term& term : terms.stems) {
        stems.emplace_back(term.token);
      }
      stemsKeys[i] = LUXStemsKey(std::move(stems));
      for (const LUXScoredPage& page : LUXProfile(view, terms, {}, {})) {
        pagesOfPhrase[i].push_back({page.page, page.score});
      }
    }
  });

  LUXTextColumn folded;
  LUXTextColumn texts;
  std::vector<uint64_t> heads;
  std::vector<float> scores;
  std::vector<float> maxima((phrases.size() + LUXModelView::phraseBlockLength - 1) /
                            LUXModelView::phraseBlockLength);
  std::vector<uint32_t> pageStarts{0};
  std::vector<Share> pages;
  std::vector<uint32_t> bookStarts{0};
  std::vector<uint32_t> books;
  std::vector<uint32_t> phraseStarts(view.pageCount() + 1);
  const double best =
      std::max_element(phrases.begin(), phrases.end(), [](const Phrase& a, const Phrase& b) {
        return a.score < b.score;
      })->score;
  for (size_t i = 0; i < phrases.size(); ++i) {
    folded.add(phrases[i].foldedText);
    heads.push_back(headOf(phrases[i].foldedText));
    texts.add(phrases[i].text);
    scores.push_back(static_cast<float>(phrases[i].score / best));
    float& maximum = maxima[i / LUXModelView::phraseBlockLength];
    maximum = std::max(maximum, scores.back());
    pages.insert(pages.end(), pagesOfPhrase[i].begin(), pagesOfPhrase[i].end());
    pageStarts.push_back(static_cast<uint32_t>(pages.size()));
    books.insert(books.end(), phrases[i].books.begin(), phrases[i].books.end());
    bookStarts.push_back(static_cast<uint32_t>(books.size()));
    for (const Share& share : pagesOfPhrase[i]) {
      ++phraseStarts[share.number + 1];
    }
  }
  for (size_t i = 1; i < phraseStarts.size(); ++i) {
    phraseStarts[i] += phraseStarts[i - 1];
  }
  std::vector<Share> phrasesOfPages(pages.size());
  std::vector<uint32_t> next(phraseStarts.begin(), phraseStarts.end() - 1);
  for (uint32_t i = 0; i < pagesOfPhrase.size(); ++i) {
    for (const Share& share : pagesOfPhrase[i]) {
      phrasesOfPages[next[share.number]++] = {i, share.weight};
    }
  }
  writer.addItems(phraseFoldedOffsetsSection, std::move(folded.offsets));
  writer.addItems(phraseFoldedHeadsSection, std::move(heads));
  writer.addText(phraseFoldedTextSection, std::move(folded.text));
  writer.addItems(phraseTextOffsetsSection, std::move(texts.offsets));
  writer.addText(phraseTextSection, std::move(texts.text));
  writer.addItems(phraseScoresSection, std::move(scores));
  writer.addItems(phraseBlockMaximaSection, std::move(maxima));
  writer.addItems(phraseStemsKeysSection, std::move(stemsKeys));
  writer.addItems(pagesOfPhraseStartsSection, std::move(pageStarts));
  writer.addItems(pagesOfPhrasesSection, std::move(pages));
  writer.addItems(phrasesOfPageStartsSection, std::move(phraseStarts));
  writer.addItems(phrasesOfPagesSection, std::move(phrasesOfPages));
  writer.addItems(booksOfPhraseStartsSection, std::move(bookStarts));
  writer.addItems(booksOfPhrasesSection, std::move(books));
}
