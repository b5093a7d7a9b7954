#include "tests/Luxwell/LUXModelUse.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <string>
#include <string_view>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXCompletion.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXQueryTerms.h"
#include "host/Luxwell/LUXScoring.h"
#include "host/Luxwell/LUXSimilar.h"

namespace tests {

namespace {

// Numbers around what there is and far above.
constexpr uint32_t furtherNumbers[] = {0x7FFFFFFF, 0xFFFFFFFE, 0xFFFFFFFF};
// Of damaged models that say that they have millions of everything.
constexpr uint32_t mostThatAreAsked = 200;

volatile uint64_t sink = 0;

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void touch(std::string_view text) {
  uint64_t sum = 0;
  for (const char byte : text) {
    sum += static_cast<uint8_t>(byte);
  }
  sink = sink + sum;
}

template <typename Body>
void forNumbersUpTo(size_t count, const Body& body) {
  for (uint32_t i = 0; i <= std::min<size_t>(count, mostThatAreAsked); ++i) {
    body(i);
  }
  for (const uint32_t number : furtherNumbers) {
    body(number);
  }
}

void useTerms(const LUXModelView& view, LUXTokenKind kind) {
  forNumbersUpTo(view.termCount(kind), [&](uint32_t number) {
    touch(view.term(kind, number));
    const auto postings = view.postings(kind, number);
    require(postings.size() <= view.pageCount());
    require(view.documentFrequency(kind, number) <= view.totalPageCount());
    require(view.documentFrequency(kind, number) >= postings.size());
    for (const uint32_t posting : postings) {
      sink = sink + posting;
    }
  });
  for (const char* token :
       {"", "print", "print queue", "queue print", "printer", "zz", " ", "a "}) {
    if (const auto number = view.termNumber(kind, token)) {
      require(*number < view.termCount(kind));
    }
    const auto [first, end] = view.termRangeWithPrefix(kind, token);
    require(first <= end && end <= view.termCount(kind));
  }
}

void usePages(const LUXModelView& view) {
  forNumbersUpTo(view.bookCount(), [&](uint32_t book) {
    touch(view.bookID(book));
    const auto [first, end] = view.pageRangeOfBook(book);
    require(first <= end && end <= view.pageCount());
  });
  // Goes through all books, so not for models that say they have millions.
  if (view.bookCount() <= mostThatAreAsked) {
    view.bookNumber("org.zeb.second");
  }
  const auto useVector = [&](const int8_t* vector) {
    for (size_t i = 0; vector != nullptr && i < view.stride(); ++i) {
      sink = sink + static_cast<uint64_t>(vector[i]);
    }
  };
  forNumbersUpTo(view.pageCount(), [&](uint32_t page) {
    touch(view.page(page).key);
    require(view.page(page).book < std::max<size_t>(view.bookCount(), 1));
    useVector(view.pageVector(page));
    sink = sink + (std::isnan(view.pageScale(page)) ? 1 : 0);
    for (const auto& share : view.phrasesOfPage(page)) {
      sink = sink + share.number;
    }
  });
  forNumbersUpTo(view.termCount(LUXTokenKind::stem), [&](uint32_t stem) {
    useVector(view.termVector(stem));
    sink = sink + (std::isnan(view.termScale(stem)) ? 1 : 0);
  });
  forNumbersUpTo(view.neighbourhoodCount(), [&](uint32_t neighbourhood) {
    sink = sink + view.neighbourhoodCentre(neighbourhood);
    for (const uint32_t page : view.pagesOfNeighbourhood(neighbourhood)) {
      sink = sink + page;
    }
  });
}

void usePhrases(const LUXModelView& view) {
  require(view.phraseScores().size() == view.phraseCount());
  forNumbersUpTo(view.phraseCount(), [&](uint32_t phrase) {
    touch(view.phraseText(phrase));
    touch(view.phraseFoldedText(phrase));
    sink = sink + view.phraseStemsKey(phrase);
    require(view.pagesOfPhrase(phrase).size() <= LUXModelView::maximumPagesOfPhrase);
    for (const auto& share : view.pagesOfPhrase(phrase)) {
      sink = sink + share.number;
    }
    for (const uint32_t book : {0U, 1U, 0xFFFFFFFFU}) {
      sink = sink + (view.phraseOccursInBook(phrase, book) ? 1 : 0);
    }
  });
  for (const char* prefix : {"", "p", "print queue", "zz"}) {
    const auto [first, end] = view.phraseRangeWithPrefix(prefix);
    require(first <= end && end <= view.phraseCount());
  }
}

void query(const LUXModelView& view) {
  static const auto& tokenizer = *HelpTokenizer::tokenizerForLanguage("English");
  for (const char* text : {"print queue", "printer paper network ", "the", "prin", "Networks"}) {
    const LUXQueryTerms terms = LUXQueryTerms::termsOfText(tokenizer, text, {});
    for (const LUXScoredPage& page : LUXScoring(view).bestPages(terms, 10)) {
      require(page.page < view.pageCount());
      require(page.score >= 0 && page.score <= 1);
    }
    for (const auto& phrase : LUXCompletions(view, terms, 10, std::nullopt, {})) {
      require(phrase.phrase < view.phraseCount());
      require(phrase.score >= 0 && phrase.score <= 1);
    }
    for (const auto& phrase : LUXSimilarPhrases(view, terms, 10, {}, 0, {})) {
      require(phrase.phrase < view.phraseCount());
    }
  }
}

}  // namespace

void useModel(const LUXModelView& view) {
  touch(view.language());
  view.options();
  view.checksumsMatch();
  for (const auto kind : {LUXTokenKind::stem, LUXTokenKind::bigram, LUXTokenKind::form,
                          LUXTokenKind::phrase, LUXTokenKind::title}) {
    useTerms(view, kind);
  }
  usePages(view);
  usePhrases(view);
  query(view);
}

}  // namespace tests
