#include "host/Luxwell/LUXModelPhrases.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <set>
#include <sstream>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXSimilar.h"
#include "host/Luxwell/LUXStemsKey.h"
#include "tests/Luxwell/LUXModelWorld.h"

using platform::Value;
using tests::ModelPage;

namespace {

// Groups of up to four words that follow one another without a comma between them, each counted as
// it stands in the text.
std::map<std::string, std::pair<uint32_t, uint32_t>> groupsOfPage(const ModelPage& page) {
  std::map<std::string, std::pair<uint32_t, uint32_t>> groups;
  for (const bool inTitle : {true, false}) {
    std::vector<std::string> chain;
    const auto count = [&] {
      for (size_t first = 0; first < chain.size(); ++first) {
        std::string group;
        for (size_t last = first; last < std::min(first + 4, chain.size()); ++last) {
          group += (last > first ? " " : "") + chain[last];
          auto& counts = groups[group];
          ++(inTitle ? counts.first : counts.second);
        }
      }
      chain.clear();
    };
    std::istringstream text(inTitle ? page.title : page.body);
    for (std::string word; text >> word;) {
      const bool ends = word.back() == ',';
      chain.push_back(ends ? word.substr(0, word.size() - 1) : word);
      if (ends) {
        count();
      }
    }
    count();
  }
  return groups;
}

// Statistics by text, counted one page at a time; of the pages of one book, or of all.
std::map<std::string, LUXPhraseStatistics> countNaively(const std::vector<ModelPage>& pages,
                                                        const std::set<std::string>& known,
                                                        const std::string& book = {}) {
  std::map<std::string, LUXPhraseStatistics> result;
  uint32_t total = 0;
  for (const ModelPage& page : pages) {
    if (!book.empty() && page.book != book) {
      continue;
    }
    ++total;
    for (const auto& [text, counts] : groupsOfPage(page)) {
      if (!known.contains(page.book + '/' + text)) {
        continue;
      }
      LUXPhraseStatistics& statistics = result[text];
      statistics.length = 1 + static_cast<uint32_t>(std::count(text.begin(), text.end(), ' '));
      statistics.frequency += counts.first + counts.second;
      ++statistics.pageCount;
      statistics.titleCount += counts.first > 0 ? 1 : 0;
    }
  }
  for (auto& [text, statistics] : result) {
    statistics.totalPageCount = total;
    for (const auto& [longer, others] : result) {
      if (longer.size() > text.size() &&
          (' ' + longer + ' ').find(' ' + text + ' ') != std::string::npos) {
        ++statistics.longerPhraseCount;
        statistics.longerPhraseFrequency += others.frequency;
      }
    }
  }
  return result;
}

// Books list groups of two words and more from the second page on.
std::set<std::string> knownPhrases(const std::vector<ModelPage>& pages) {
  std::map<std::string, uint32_t> pageCounts;
  for (const ModelPage& page : pages) {
    for (const auto& group : groupsOfPage(page)) {
      ++pageCounts[page.book + '/' + group.first];
    }
  }
  std::set<std::string> known;
  for (const auto& [text, count] : pageCounts) {
    if (count >= 2 || text.find(' ') == std::string::npos) {
      known.insert(text);
    }
  }
  return known;
}

LUXTrainingData dataOfPages(const std::vector<ModelPage>& pages) {
  LUXTrainingData data;
  data.language = "English";
  data.tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  const std::vector<LUXTokenCounts> counts = tests::countsOfPages(pages);
  for (size_t i = 0; i < pages.size(); ++i) {
    LUXTrainingPage page;
    page.key = pages[i].key;
    page.isShown = !page.key.empty();
    const auto book = std::find(data.books.begin(), data.books.end(), pages[i].book);
    page.book = static_cast<uint32_t>(book - data.books.begin());
    if (book == data.books.end()) {
      data.books.push_back(pages[i].book);
    }
    for (size_t j = 0; j < counts[i].size(); ++j) {
      const LUXTokenCount count = counts[i][j];
      if (count.kind == LUXTokenKind::phrase) {
        data.occurrencesOf(count.kind)
            .all.push_back({data.stringsOf(count.kind).numberOf(count.token),
                            static_cast<uint16_t>(count.bodyCount),
                            static_cast<uint8_t>(count.titleCount)});
      }
    }
    for (LUXOccurrences& occurrences : data.occurrences) {
      occurrences.starts.push_back(occurrences.all.size());
    }
    data.pages.push_back(page);
  }
  return data;
}

Value thresholds(const std::string& book, double forPairs, double forTriples) {
  return Value::Dictionary{
      {book, Value::Dictionary{{"BigramThreshold", forPairs}, {"TrigramThreshold", forTriples}}}};
}

std::set<std::string> textsOf(const std::vector<LUXModelPhrases::Phrase>& phrases) {
  std::set<std::string> texts;
  for (const auto& phrase : phrases) {
    texts.insert(phrase.text);
  }
  return texts;
}

std::shared_ptr<const LUXModelView> viewWithOptions(const std::vector<ModelPage>& pages,
                                                    const Value& forBooks) {
  return LUXModelView::viewWithData(
      tests::modelOfPages(pages, 2, Value::Dictionary{{"SuggestionThresholdsPerBook", forBooks}}));
}

}  // namespace

TEST(LUXModelPhrases, CountsAreThoseOfTheTextsOnePageAtATime) {
  for (const unsigned seed : {1U, 2U, 3U}) {
    const std::vector<ModelPage> pages = tests::randomModelPages(60, 60, seed);
    const LUXTrainingData data = dataOfPages(pages);
    const std::set<std::string> known = knownPhrases(pages);
    const auto naive = countNaively(pages, known);
    // Texts by book, of the pages that may be found.
    std::map<std::string, std::set<std::string>> shown;
    for (const ModelPage& page : pages) {
      for (const auto& group : groupsOfPage(page)) {
        if (!page.key.empty() && known.contains(page.book + '/' + group.first)) {
          shown[page.book].insert(group.first);
        }
      }
    }
    const auto phrases = LUXModelPhrases(data, 2).phrases({});
    std::set<std::string> expected;
    for (const auto& [text, statistics] : naive) {
      if (statistics.pageCount >= 3 && LUXPhraseScore(statistics) > 0) {
        expected.insert(text);
      }
    }
    EXPECT_EQ(textsOf(phrases), expected);
    ASSERT_GT(phrases.size(), 100U);
    for (const auto& phrase : phrases) {
      const LUXPhraseStatistics& counted = naive.at(phrase.text);
      EXPECT_EQ(phrase.statistics.length, counted.length) << phrase.text;
      EXPECT_EQ(phrase.statistics.frequency, counted.frequency) << phrase.text;
      EXPECT_EQ(phrase.statistics.pageCount, counted.pageCount) << phrase.text;
      EXPECT_EQ(phrase.statistics.totalPageCount, 60U);
      EXPECT_EQ(phrase.statistics.titleCount, counted.titleCount) << phrase.text;
      EXPECT_EQ(phrase.statistics.longerPhraseCount, counted.longerPhraseCount) << phrase.text;
      EXPECT_EQ(phrase.statistics.longerPhraseFrequency, counted.longerPhraseFrequency)
          << phrase.text;
      EXPECT_DOUBLE_EQ(phrase.score, LUXPhraseScore(counted));
      std::vector<uint32_t> books;
      for (uint32_t book = 0; book < data.books.size(); ++book) {
        if (shown[data.books[book]].contains(phrase.text)) {
          books.push_back(book);
        }
      }
      EXPECT_EQ(phrase.books, books) << phrase.text;
    }
  }
}

TEST(LUXModelPhrases, ABooksThresholdsAreComparedWithTheBooksOwnScores) {
  const std::vector<ModelPage> pages = tests::randomModelPages(60, 60, 4);
  const LUXTrainingData data = dataOfPages(pages);
  const auto known = knownPhrases(pages);
  const double forPairs = 4;
  const double forTriples = 2.5;
  Value::Dictionary both;
  std::map<std::string, std::map<std::string, LUXPhraseStatistics>> byBook;
  for (const std::string& book : data.books) {
    both.emplace(book, thresholds(book, forPairs, forTriples)[book]);
    byBook[book] = countNaively(pages, known, book);
  }
  std::set<std::string> expected;
  for (const auto& phrase : LUXModelPhrases(data, 2).phrases({})) {
    for (const uint32_t book : phrase.books) {
      const LUXPhraseStatistics& own = byBook[data.books[book]][phrase.text];
      if (LUXPhraseScore(own) >= (own.length > 2 ? forTriples : forPairs)) {
        expected.insert(phrase.text);
      }
    }
  }
  ASSERT_FALSE(expected.empty());
  EXPECT_EQ(textsOf(LUXModelPhrases(data, 2).phrases(both)), expected);
  EXPECT_LT(expected.size(), LUXModelPhrases(data, 2).phrases({}).size());
}

TEST(LUXModelPhrases, AThresholdThatAPhraseJustReachesLetsItPass) {
  const std::vector<ModelPage> pages = {{"book", "1", "", "print queue"},
                                        {"book", "2", "", "print queue"},
                                        {"book", "3", "", "print queue"},
                                        {"book", "4", "", "else"}};
  const LUXTrainingData data = dataOfPages(pages);
  const auto phrases = LUXModelPhrases(data, 1).phrases({});
  const auto pair = std::find_if(phrases.begin(), phrases.end(),
                                 [](const auto& phrase) { return phrase.text == "print queue"; });
  ASSERT_NE(pair, phrases.end());
  const auto textsAt = [&](double threshold) {
    return textsOf(LUXModelPhrases(data, 1).phrases(thresholds("book", threshold, 0)));
  };
  EXPECT_TRUE(textsAt(pair->score).contains("print queue"));
  EXPECT_FALSE(textsAt(std::nextafter(pair->score, 1e9)).contains("print queue"));
}

TEST(LUXModelPhrases, OneThresholdIsForUpToTwoWordsAndTheOtherForMore) {
  std::vector<ModelPage> pages;
  for (const char* text : {"alone", "print queue", "clear print queue", "old slow paper tray"}) {
    for (int i = 0; i < 4; ++i) {
      pages.push_back({"book", text + std::to_string(i), "", text});
    }
  }
  const LUXTrainingData data = dataOfPages(pages);
  const auto textsWith = [&](double forShort, double forLong) {
    return textsOf(LUXModelPhrases(data, 1).phrases(thresholds("book", forShort, forLong)));
  };
  EXPECT_EQ(textsWith(1000, 0),
            (std::set<std::string>{"clear print queue", "old slow paper tray"}));
  for (const std::string& text : textsWith(0, 1000)) {
    EXPECT_LE(std::count(text.begin(), text.end(), ' '), 1) << text;
  }
  EXPECT_TRUE(textsWith(0, 1000).contains("alone"));
  EXPECT_TRUE(textsWith(0, 1000).contains("print queue"));
}

TEST(LUXModelPhrases, OneBookThatIsContentIsEnough) {
  std::vector<ModelPage> pages;
  pages.reserve(6);
  for (int i = 0; i < 6; ++i) {
    pages.push_back({i % 2 == 0 ? "one" : "two", std::to_string(i), "", "print queue"});
  }
  EXPECT_GT(viewWithOptions(pages, thresholds("one", 1000, 1000))->phraseCount(), 0U);
  Value::Dictionary both = *thresholds("one", 1000, 1000).dictionaryIf();
  both.emplace("two", thresholds("two", 1000, 1000)["two"]);
  EXPECT_EQ(viewWithOptions(pages, both)->phraseCount(), 0U);
}

TEST(LUXModelPhrases, PhrasesOfPagesThatAreNotToBeFoundAreNotOffered) {
  std::vector<ModelPage> pages;
  for (int i = 0; i < 4; ++i) {
    pages.push_back({"book", "", "", "secret words"});
    pages.push_back({"book", std::to_string(i), "", "open words"});
  }
  const auto view = tests::viewOfPages(pages);
  EXPECT_EQ(view->phraseRangeWithPrefix("secret").first,
            view->phraseRangeWithPrefix("secret").second);
  const auto [first, end] = view->phraseRangeWithPrefix("open words");
  EXPECT_EQ(end - first, 1U);
}

TEST(LUXModelPhrases, APhraseIsShownAsItIsMostOftenWritten) {
  LUXModelTrainer trainer("English");
  const auto add = [&](const char* text, uint32_t count, const char* book) {
    trainer.addPage(LUXTokenCounts::withCounts({{text, LUXTokenKind::phrase, 0, count}}),
                    std::string(text) + book, std::nullopt, book);
  };
  add("Wi-Fi network", 5, "a");
  add("wi-fi network", 2, "b");
  add("WI-FI Network", 1, "c");
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
  ASSERT_EQ(view->phraseCount(), 1U);
  EXPECT_EQ(view->phraseText(0), "Wi-Fi network");
  EXPECT_EQ(view->phraseFoldedText(0), "wi fi network");
  for (uint32_t book = 0; book < 3; ++book) {
    EXPECT_TRUE(view->phraseOccursInBook(0, book));
  }
  EXPECT_FALSE(view->phraseOccursInBook(0, 3));
}

TEST(LUXModelPhrases, PhrasesAreInOrderWithTheirScoresAndTheBestOfEachBlock) {
  const auto view = tests::viewOfPages(tests::randomModelPages(80, 80, 5));
  ASSERT_GT(view->phraseCount(), 2 * LUXModelView::phraseBlockLength);
  ASSERT_EQ(view->phraseScores().size(), view->phraseCount());
  float best = 0;
  for (uint32_t phrase = 0; phrase < view->phraseCount(); ++phrase) {
    const std::string_view folded = view->phraseFoldedText(phrase);
    if (phrase > 0) {
      EXPECT_LT(view->phraseFoldedText(phrase - 1), folded);
    }
    const auto [first, end] = view->phraseRangeWithPrefix(folded);
    EXPECT_EQ(first, phrase);
    EXPECT_GT(end, phrase);
    best = std::max(best, view->phraseScores()[phrase]);
    EXPECT_GT(view->phraseScores()[phrase], 0);
  }
  EXPECT_EQ(best, 1);
  for (size_t block = 0; block < view->phraseBlockMaxima().size(); ++block) {
    const auto scores = view->phraseScores().subspan(block * LUXModelView::phraseBlockLength);
    const auto own = scores.first(std::min(scores.size(), LUXModelView::phraseBlockLength));
    EXPECT_EQ(view->phraseBlockMaxima()[block], *std::max_element(own.begin(), own.end()));
  }
}

TEST(LUXModelPhrases, EachPhraseKnowsTheBestPagesThatItFinds) {
  const auto view = tests::viewOfPages(tests::randomModelPages(60, 60, 6));
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  std::map<uint32_t, std::vector<std::pair<uint32_t, float>>> byPage;
  for (uint32_t phrase = 0; phrase < view->phraseCount(); ++phrase) {
    const std::string text = std::string(view->phraseText(phrase)) + ' ';
    const LUXQueryTerms terms = LUXQueryTerms::termsOfText(*tokenizer, text, {});
    const auto expected = LUXProfile(*view, terms, {}, {});
    const auto found = view->pagesOfPhrase(phrase);
    ASSERT_EQ(found.size(), expected.size()) << text;
    ASSERT_LE(found.size(), 5U);
    for (size_t i = 0; i < found.size(); ++i) {
      EXPECT_EQ(found[i].number, expected[i].page);
      EXPECT_FLOAT_EQ(found[i].weight, expected[i].score);
      byPage[found[i].number].emplace_back(phrase, found[i].weight);
    }
    std::vector<std::string_view> stems;
    for (const auto& term : terms.stems) {
      stems.emplace_back(term.token);
    }
    EXPECT_EQ(view->phraseStemsKey(phrase), LUXStemsKey(stems));
  }
  for (uint32_t page = 0; page < view->pageCount(); ++page) {
    std::vector<std::pair<uint32_t, float>> found;
    for (const auto& share : view->phrasesOfPage(page)) {
      found.emplace_back(share.number, share.weight);
    }
    EXPECT_EQ(found, byPage[page]);
  }
}

TEST(LUXModelPhrases, TheKeyOfStemsDependsOnTheStemsAndNotOnTheirOrder) {
  EXPECT_EQ(LUXStemsKey({"print", "queue"}), LUXStemsKey({"queue", "print"}));
  EXPECT_NE(LUXStemsKey({"print", "queue"}), LUXStemsKey({"printqueue"}));
  EXPECT_NE(LUXStemsKey({"print"}), LUXStemsKey({}));
}
