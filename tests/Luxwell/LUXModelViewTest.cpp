#include "host/Luxwell/LUXModelView.h"

#include <gtest/gtest.h>

#include <Eigen/Core>
#include <Eigen/SVD>
#include <algorithm>
#include <cmath>
#include <map>
#include <set>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelSections.h"
#include "tests/Luxwell/LUXModelWorld.h"

using tests::ModelPage;

namespace {

constexpr LUXTokenKind termKinds[] = {LUXTokenKind::stem, LUXTokenKind::bigram, LUXTokenKind::form,
                                      LUXTokenKind::title};

/// All that a model says of terms, worked out from the counts one page at a time.
class NaiveModel {
 public:
  struct Posting {
    double tf = 0;
    uint32_t count = 0;
    double early = 0;
  };

  explicit NaiveModel(const std::vector<ModelPage>& all)
      : pages(all), counts(tests::countsOfPages(all)) {}

  double length(LUXTokenKind kind, size_t page, bool ofTitle) const {
    double sum = 0;
    for (size_t i = 0; i < counts[page].size(); ++i) {
      const LUXTokenCount count = counts[page][i];
      if (count.kind == kind) {
        sum += ofTitle ? count.titleCount : count.bodyCount;
      }
    }
    return sum;
  }

  double averageLength(LUXTokenKind kind, bool ofTitle) const {
    double sum = 0;
    for (size_t page = 0; page < pages.size(); ++page) {
      sum += length(kind, page, ofTitle);
    }
    return sum / static_cast<double>(pages.size());
  }

  std::map<std::string, std::map<size_t, Posting>> terms(LUXTokenKind kind) const {
    const auto relative = [](double share, double exponent, double length, double average) {
      return average > 0 ? 1 - share + share * std::pow(length / average, exponent) : 1;
    };
    const double titleAverage = averageLength(kind, true);
    const double bodyAverage = averageLength(kind, false);
    std::map<std::string, std::map<size_t, Posting>> result;
    for (size_t page = 0; page < pages.size(); ++page) {
      const double titleLength = length(kind, page, true);
      const double bodyLength = length(kind, page, false);
      for (size_t i = 0; i < counts[page].size(); ++i) {
        const LUXTokenCount count = counts[page][i];
        if (count.kind != kind) {
          continue;
        }
        Posting& posting = result[std::string(count.token)][page];
        posting.count = count.titleCount + count.bodyCount;
        posting.early = 30.0 / (30 + count.wordsBefore);
        posting.tf = kind == LUXTokenKind::bigram
                         ? posting.count / relative(.9, .55, titleLength + bodyLength,
                                                    titleAverage + bodyAverage)
                         : 4 * count.titleCount / relative(.5, 1, titleLength, titleAverage) +
                               count.bodyCount / relative(.9, .55, bodyLength, bodyAverage);
      }
    }
    return result;
  }

  const std::vector<ModelPage>& pages;
  const std::vector<LUXTokenCounts> counts;
};

/// The number of each page in the model, by its number in the list.
std::map<size_t, uint32_t> numbersOfPages(const LUXModelView& view,
                                          const std::vector<ModelPage>& pages) {
  std::map<std::pair<std::string, std::string>, uint32_t> byKey;
  for (uint32_t page = 0; page < view.pageCount(); ++page) {
    const LUXModelView::Page found = view.page(page);
    byKey[{std::string(view.bookID(found.book)), std::string(found.key)}] = page;
  }
  std::map<size_t, uint32_t> result;
  for (size_t i = 0; i < pages.size(); ++i) {
    if (!pages[i].key.empty()) {
      result[i] = byKey.at({pages[i].book, pages[i].key});
    }
  }
  return result;
}

std::vector<float> vectorOf(const int8_t* steps, float scale, size_t rank) {
  std::vector<float> result;
  for (size_t i = 0; i < rank; ++i) {
    result.push_back(static_cast<float>(steps[i]) * scale);
  }
  return result;
}

}  // namespace

TEST(LUXModelView, PostingsAreThoseOfEachPageAlone) {
  for (const unsigned seed : {1U, 2U}) {
    const std::vector<ModelPage> pages = tests::randomModelPages(60, 40, seed);
    const NaiveModel naive(pages);
    const auto view = tests::viewOfPages(pages);
    ASSERT_NE(view, nullptr);
    const std::map<size_t, uint32_t> numbers = numbersOfPages(*view, pages);
    for (const LUXTokenKind kind : termKinds) {
      const auto terms = naive.terms(kind);
      ASSERT_FALSE(terms.empty());
      if (kind != LUXTokenKind::stem) {
        ASSERT_EQ(view->termCount(kind), terms.size());
      }
      for (const auto& [token, postings] : terms) {
        const auto number = view->termNumber(kind, token);
        ASSERT_TRUE(number) << token;
        EXPECT_EQ(view->term(kind, *number), token);
        EXPECT_EQ(view->documentFrequency(kind, *number), postings.size());
        std::map<uint32_t, double> expected;
        for (const auto& [page, posting] : postings) {
          if (numbers.contains(page)) {
            expected[numbers.at(page)] =
                (posting.tf / (2.25 + posting.tf) + 0.25 * posting.early) / 1.25;
          }
        }
        std::vector<uint32_t> found;
        for (const uint32_t posting : view->postings(kind, *number)) {
          found.push_back(luxposting::page(posting));
          const double impact =
              kind == LUXTokenKind::title ? 1023 : 1023 * expected.at(found.back());
          EXPECT_NEAR(luxposting::impact(posting), impact, .51) << token;
        }
        std::vector<uint32_t> expectedPages;
        expectedPages.reserve(expected.size());
        for (const auto& [page, tf] : expected) {
          expectedPages.push_back(page);
        }
        EXPECT_EQ(found, expectedPages) << token;
      }
    }
  }
}

TEST(LUXModelView, TermsAreInOrderAndPrefixesAreRanges) {
  const std::vector<ModelPage> pages = tests::randomModelPages(40, 40, 3);
  const auto view = tests::viewOfPages(pages);
  for (const LUXTokenKind kind : {LUXTokenKind::stem, LUXTokenKind::form, LUXTokenKind::title}) {
    std::vector<std::string> terms;
    for (uint32_t number = 0; number < view->termCount(kind); ++number) {
      terms.push_back(view->term(kind, number));
      EXPECT_EQ(view->termNumber(kind, terms.back()), number);
    }
    EXPECT_TRUE(std::is_sorted(terms.begin(), terms.end()));
    std::set<std::string> prefixes{"", "w", "wa", "zz", "a"};
    for (const std::string& term : terms) {
      prefixes.insert(term.substr(0, 3));
      prefixes.insert(term);
      prefixes.insert(term + 'x');
    }
    for (const std::string& prefix : prefixes) {
      const auto [first, end] = view->termRangeWithPrefix(kind, prefix);
      uint32_t expected = 0;
      for (const std::string& term : terms) {
        expected += term.starts_with(prefix) ? 1 : 0;
      }
      EXPECT_EQ(end - first, expected) << prefix;
      for (uint32_t number = first; number < end; ++number) {
        EXPECT_TRUE(terms[number].starts_with(prefix));
      }
    }
  }
}

TEST(LUXModelView, TermsThatDifferBehindTheirFirstBytesAreToldApart) {
  const auto view =
      tests::viewOfPages({{"b", "1", "", "abcdefghij abcdefgh abcdefghi abcdefghzz abcdefg"}});
  for (const char* term : {"abcdefghij", "abcdefgh", "abcdefghi", "abcdefghzz", "abcdefg"}) {
    const auto number = view->termNumber(LUXTokenKind::form, term);
    ASSERT_TRUE(number);
    EXPECT_EQ(view->term(LUXTokenKind::form, *number), term);
  }
  EXPECT_FALSE(view->termNumber(LUXTokenKind::form, "abcdefghz"));
  const auto [first, end] = view->termRangeWithPrefix(LUXTokenKind::form, "abcdefgh");
  EXPECT_EQ(end - first, 4U);
}

TEST(LUXModelView, ManyTermsWithTheSameBeginningAreToldApart) {
  for (const uint32_t count : {1U, 2U, 3U, 4U, 5U, 7U, 8U, 9U, 300U}) {
    std::vector<std::string> names{"a", "samehead", "zz"};
    for (uint32_t i = 0; i < count; ++i) {
      names.push_back("samehead" + std::to_string(1000 + 2 * i));
    }
    std::vector<LUXTokenCount> tokens;
    tokens.reserve(names.size());
    for (const std::string& name : names) {
      tokens.push_back({name, LUXTokenKind::stem, 0, 1});
    }
    LUXModelTrainer trainer("English");
    trainer.addPage(LUXTokenCounts::withCounts(tokens), "1", std::nullopt, "book");
    const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
    for (const std::string& name : names) {
      const auto number = view->termNumber(LUXTokenKind::stem, name);
      ASSERT_TRUE(number) << name;
      EXPECT_EQ(view->term(LUXTokenKind::stem, *number), name);
    }
    for (uint32_t i = 0; i <= count; ++i) {
      const std::string between = "samehead" + std::to_string(999 + 2 * i);
      EXPECT_FALSE(view->termNumber(LUXTokenKind::stem, between)) << between;
    }
    const auto [first, end] = view->termRangeWithPrefix(LUXTokenKind::stem, "samehead1");
    EXPECT_EQ(end - first, count);
  }
}

TEST(LUXModelView, PairsAreKnownByBothStems) {
  const auto view = tests::viewOfPages(tests::samplePages());
  const auto pair = view->termNumber(LUXTokenKind::bigram, "print queue");
  ASSERT_TRUE(pair);
  EXPECT_EQ(view->term(LUXTokenKind::bigram, *pair), "print queue");
  EXPECT_EQ(view->documentFrequency(LUXTokenKind::bigram, *pair), 3U);
  EXPECT_FALSE(view->termNumber(LUXTokenKind::bigram, "queue print"));
  EXPECT_FALSE(view->termNumber(LUXTokenKind::bigram, "print"));
  EXPECT_FALSE(view->termNumber(LUXTokenKind::bigram, "print unheard"));
  EXPECT_FALSE(view->termNumber(LUXTokenKind::bigram, " "));
  const uint32_t print = *view->termNumber(LUXTokenKind::stem, "print");
  const uint32_t queue = *view->termNumber(LUXTokenKind::stem, "queue");
  EXPECT_EQ(view->pairNumber(print, queue), pair);
  EXPECT_FALSE(view->pairNumber(queue, print));
  EXPECT_FALSE(view->pairNumber(~uint32_t{0}, queue));
}

TEST(LUXModelView, APairThatIsNoneIsNotCounted) {
  LUXModelTrainer trainer("English");
  trainer.addPage(LUXTokenCounts::withCounts({{"alone", LUXTokenKind::bigram, 0, 1},
                                              {"one two", LUXTokenKind::bigram, 0, 1}}),
                  "page", std::nullopt, "book");
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
  EXPECT_EQ(view->termCount(LUXTokenKind::bigram), 1U);
  EXPECT_TRUE(view->termNumber(LUXTokenKind::bigram, "one two"));
}

TEST(LUXModelView, PagesOfABookFollowOneAnother) {
  const std::vector<ModelPage> pages = tests::randomModelPages(50, 10, 4);
  const auto view = tests::viewOfPages(pages);
  ASSERT_EQ(view->bookCount(), 2U);
  EXPECT_EQ(view->totalPageCount(), 50U);
  uint32_t next = 0;
  for (uint32_t book = 0; book < 2; ++book) {
    const std::string bookID(view->bookID(book));
    EXPECT_EQ(view->bookNumber(bookID), book);
    std::vector<std::string> expected;
    for (const ModelPage& page : pages) {
      if (page.book == bookID && !page.key.empty()) {
        expected.push_back(page.key);
      }
    }
    const auto [first, end] = view->pageRangeOfBook(book);
    EXPECT_EQ(first, next);
    next = end;
    std::vector<std::string> found;
    for (uint32_t page = first; page < end; ++page) {
      EXPECT_EQ(view->page(page).book, book);
      found.emplace_back(view->page(page).key);
    }
    EXPECT_EQ(found, expected);
  }
  EXPECT_EQ(next, view->pageCount());
}

TEST(LUXModelView, NumbersThatAreTooHighHaveNothing) {
  const auto view = tests::viewOfPages(tests::samplePages());
  for (const uint32_t number : {uint32_t{1000}, ~uint32_t{0}}) {
    EXPECT_EQ(view->bookID(number), "");
    EXPECT_EQ(view->pageRangeOfBook(number), std::pair(0U, 0U));
    EXPECT_EQ(view->page(number).key, "");
    EXPECT_EQ(view->pageVector(number), nullptr);
    EXPECT_EQ(view->pageScale(number), 0);
    EXPECT_EQ(view->termVector(number), nullptr);
    EXPECT_EQ(view->termScale(number), 0);
    EXPECT_EQ(view->phraseText(number), "");
    EXPECT_EQ(view->phraseFoldedText(number), "");
    EXPECT_EQ(view->phraseStemsKey(number), 0U);
    EXPECT_TRUE(view->pagesOfPhrase(number).empty());
    EXPECT_TRUE(view->phrasesOfPage(number).empty());
    EXPECT_FALSE(view->phraseOccursInBook(number, 0));
    for (const LUXTokenKind kind : termKinds) {
      EXPECT_EQ(view->term(kind, number), "");
      EXPECT_EQ(view->documentFrequency(kind, number), 0U);
      EXPECT_TRUE(view->postings(kind, number).empty());
    }
  }
  EXPECT_EQ(view->termCount(LUXTokenKind::phrase), 0U);
  EXPECT_FALSE(view->termNumber(LUXTokenKind::phrase, "print queue"));
  EXPECT_FALSE(view->bookNumber("nobody"));
}

// The cosines of queries and pages, by a dense decomposition of the weighted matrix.
TEST(LUXModelView, MeaningIsThatOfADenseDecomposition) {
  std::vector<ModelPage> pages = tests::randomModelPages(40, 30, 5);
  const NaiveModel naive(pages);
  const auto view = tests::viewOfPages(pages);
  const std::map<size_t, uint32_t> numbers = numbersOfPages(*view, pages);

  const auto terms = naive.terms(LUXTokenKind::stem);
  std::vector<std::string> columns;
  std::vector<double> weights;
  for (const auto& [token, postings] : terms) {
    if (postings.size() < 2) {
      EXPECT_EQ(view->termVector(*view->termNumber(LUXTokenKind::stem, token)), nullptr);
      continue;
    }
    double all = 0;
    for (const auto& [page, posting] : postings) {
      all += posting.count;
    }
    double entropy = 0;
    for (const auto& [page, posting] : postings) {
      entropy -= posting.count / all * std::log(posting.count / all);
    }
    columns.push_back(token);
    weights.push_back(1 - entropy / std::log(static_cast<double>(pages.size())));
  }
  const auto rows = static_cast<Eigen::Index>(pages.size());
  Eigen::MatrixXd matrix = Eigen::MatrixXd::Zero(rows, static_cast<Eigen::Index>(columns.size()));
  for (size_t column = 0; column < columns.size(); ++column) {
    for (const auto& [page, posting] : terms.at(columns[column])) {
      matrix(static_cast<Eigen::Index>(page), static_cast<Eigen::Index>(column)) =
          std::log2(1.0 + posting.count) * weights[column];
    }
  }
  for (Eigen::Index row = 0; row < rows; ++row) {
    if (matrix.row(row).norm() > 0) {
      matrix.row(row).normalize();
    }
  }
  const Eigen::JacobiSVD<Eigen::MatrixXd> exact(matrix, Eigen::ComputeThinU | Eigen::ComputeThinV);
  // Forty pages have no more than forty dimensions, all of which are kept.
  const auto rank = static_cast<Eigen::Index>(view->rank());
  ASSERT_EQ(rank, rows);
  const Eigen::MatrixXd pageVectors =
      exact.matrixU().leftCols(rank) * exact.singularValues().head(rank).asDiagonal();

  for (size_t query = 0; query + 2 < columns.size(); query += 3) {
    Eigen::VectorXd expected = Eigen::VectorXd::Zero(rank);
    std::vector<float> sum(view->rank());
    for (size_t i = 0; i < 3; ++i) {
      expected += std::log2(1.0 + static_cast<double>(i % 2)) * weights[query + i] *
                  exact.matrixV().row(static_cast<Eigen::Index>(query + i)).head(rank).transpose();
      const uint32_t stem = *view->termNumber(LUXTokenKind::stem, columns[query + i]);
      ASSERT_NE(view->termVector(stem), nullptr);
      const std::vector<float> vector =
          vectorOf(view->termVector(stem), view->termScale(stem), view->rank());
      for (size_t j = 0; j < sum.size(); ++j) {
        sum[j] += std::log2(1.0F + static_cast<float>(i % 2)) * vector[j];
      }
    }
    double squares = 0;
    for (const float value : sum) {
      squares += value * value;
    }
    for (const auto& [page, number] : numbers) {
      const Eigen::VectorXd exactPage = pageVectors.row(static_cast<Eigen::Index>(page));
      const double cosine = expected.dot(exactPage) / expected.norm() / exactPage.norm();
      const std::vector<float> vector =
          vectorOf(view->pageVector(number), view->pageScale(number), view->rank());
      double product = 0;
      double pageSquares = 0;
      for (size_t j = 0; j < vector.size(); ++j) {
        product += vector[j] * sum[j];
        pageSquares += vector[j] * vector[j];
      }
      EXPECT_NEAR(pageSquares, 1, .02);
      EXPECT_NEAR(product / std::sqrt(squares), cosine, .03);
    }
  }
}

TEST(LUXModelView, EveryPageIsInTheNeighbourhoodOfItsNearestCentre) {
  EXPECT_EQ(tests::viewOfPages(tests::samplePages())->neighbourhoodCount(), 0U);
  LUXModelTrainer trainer("English");
  const std::vector<ModelPage> some = tests::randomModelPages(200, 20, 7);
  const std::vector<LUXTokenCounts> counts = tests::countsOfPages(some);
  constexpr size_t pageCount = luxmodel::neighbourhoodPageCount;
  for (size_t i = 0; i < pageCount; ++i) {
    // One page has nothing to mean.
    trainer.addPage(i == 77 ? LUXTokenCounts() : counts[i % counts.size()], std::to_string(i),
                    std::nullopt, "book");
  }
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 2));
  const size_t count = view->neighbourhoodCount();
  ASSERT_EQ(count, 23U) << "the root of the number of pages";
  const auto nearness = [&](uint32_t a, uint32_t b) {
    double product = 0;
    for (size_t i = 0; i < view->stride(); ++i) {
      product += view->pageVector(a)[i] * view->pageVector(b)[i];
    }
    return product * view->pageScale(a) * view->pageScale(b);
  };
  std::vector<uint32_t> all;
  for (size_t n = 0; n < view->neighbourhoodCount(); ++n) {
    EXPECT_EQ(view->neighbourhoodCentre(n), n * pageCount / count);
    const auto pages = view->pagesOfNeighbourhood(n);
    EXPECT_TRUE(std::is_sorted(pages.begin(), pages.end()));
    all.insert(all.end(), pages.begin(), pages.end());
    for (size_t i = 0; i < pages.size(); i += 16) {
      for (size_t other = 0; other < view->neighbourhoodCount(); ++other) {
        EXPECT_GE(nearness(pages[i], view->neighbourhoodCentre(n)) + 1e-6,
                  nearness(pages[i], view->neighbourhoodCentre(other)));
      }
    }
  }
  EXPECT_EQ(all.size(), pageCount - 1);
  std::sort(all.begin(), all.end());
  EXPECT_EQ(std::adjacent_find(all.begin(), all.end()), all.end());
  EXPECT_FALSE(std::binary_search(all.begin(), all.end(), 77U));
  EXPECT_TRUE(view->pagesOfNeighbourhood(count).empty());
  EXPECT_EQ(view->neighbourhoodCentre(count), 0U);
}

TEST(LUXModelView, PagesThatAreAllAlikeHaveNoMeaning) {
  std::vector<ModelPage> pages;
  pages.reserve(5);
  for (int i = 0; i < 5; ++i) {
    pages.push_back({"book", std::to_string(i), "Same title", "The same words."});
  }
  const auto view = tests::viewOfPages(pages);
  ASSERT_NE(view, nullptr);
  EXPECT_EQ(view->pageCount(), 5U);
  EXPECT_EQ(view->rank(), 0U);
}

TEST(LUXModelView, VectorsAreFilledUpWithZeros) {
  const auto view = tests::viewOfPages(tests::samplePages());
  ASSERT_GT(view->rank(), 0U);
  EXPECT_EQ(view->stride() % 32, 0U);
  ASSERT_EQ(view->pageScales().size(), view->pageCount());
  for (uint32_t page = 0; page < view->pageCount(); ++page) {
    EXPECT_EQ(view->pageVectors() + page * view->stride(), view->pageVector(page));
    EXPECT_EQ(view->pageScales()[page], view->pageScale(page));
    for (size_t i = view->rank(); i < view->stride(); ++i) {
      EXPECT_EQ(view->pageVector(page)[i], 0);
    }
    for (size_t i = 0; i < view->stride(); ++i) {
      EXPECT_GT(view->pageVector(page)[i], -128);
    }
  }
}

TEST(LUXModelView, TheBytesAreTheSameForTheSamePagesWhateverTheNumberOfThreads) {
  const std::vector<ModelPage> pages = tests::randomModelPages(300, 30, 6);
  const platform::Data one = tests::modelOfPages(pages, 1);
  EXPECT_EQ(one, tests::modelOfPages(pages, 1));
  EXPECT_EQ(one, tests::modelOfPages(pages, 4));
  EXPECT_EQ(one, tests::modelOfPages(pages, 7));
}

TEST(LUXModelView, OptionsLanguageAndTokenizerVersionAreKept) {
  const platform::Value options = platform::Value::Dictionary{
      {"SuggestionThresholdsPerBook", platform::Value::Dictionary{}}, {"Other", 7}};
  const auto view =
      LUXModelView::viewWithData(tests::modelOfPages(tests::samplePages(), 1, options));
  EXPECT_EQ(view->options(), options);
  EXPECT_EQ(view->language(), "English");
  EXPECT_EQ(view->tokenizerVersion(), HelpTokenizer::version());
}

TEST(LUXModelView, AModelOfNoPagesHasNothing) {
  const auto view = LUXModelView::viewWithData(LUXModelTrainer("English").finish({}, 2));
  ASSERT_NE(view, nullptr);
  EXPECT_EQ(view->pageCount(), 0U);
  EXPECT_EQ(view->totalPageCount(), 0U);
  EXPECT_EQ(view->bookCount(), 0U);
  EXPECT_EQ(view->rank(), 0U);
  EXPECT_EQ(view->phraseCount(), 0U);
  EXPECT_TRUE(view->checksumsMatch());
  EXPECT_FALSE(view->termNumber(LUXTokenKind::stem, "print"));
  EXPECT_FALSE(view->termNumber(LUXTokenKind::bigram, "print queue"));
  EXPECT_EQ(view->termRangeWithPrefix(LUXTokenKind::form, ""), std::pair(0U, 0U));
  EXPECT_EQ(view->phraseRangeWithPrefix("a"), std::pair(0U, 0U));
}

TEST(LUXModelView, ABookWithoutPagesHasNoPages) {
  LUXModelTrainer trainer("English");
  trainer.addBook("empty");
  trainer.addPage(LUXTokenCounts::withCounts({{"word", LUXTokenKind::stem, 0, 1}}), "page",
                  std::nullopt, "full");
  trainer.addBook("empty too");
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
  ASSERT_EQ(view->bookCount(), 3U);
  EXPECT_EQ(view->pageRangeOfBook(0), std::pair(0U, 0U));
  EXPECT_EQ(view->pageRangeOfBook(1), std::pair(0U, 1U));
  EXPECT_EQ(view->pageRangeOfBook(2), std::pair(0U, 0U));
  EXPECT_EQ(view->page(0).book, 1U);
}

TEST(LUXModelView, APageOfOneWordIsFound) {
  const auto view = tests::viewOfPages({{"book", "page", "", "word"}});
  ASSERT_EQ(view->pageCount(), 1U);
  EXPECT_EQ(view->postings(LUXTokenKind::stem, 0).size(), 1U);
  // Nothing is in two pages.
  EXPECT_EQ(view->rank(), 0U);
  EXPECT_EQ(view->pageVector(0), nullptr);
}

TEST(LUXModelView, PagesOfOneWordEachHaveAMeaning) {
  const auto view = tests::viewOfPages({{"book", "1", "", "word"},
                                        {"book", "2", "", "word"},
                                        {"book", "3", "", "paper"},
                                        {"book", "4", "", "paper"},
                                        {"book", "5", "", "single"}});
  EXPECT_EQ(view->rank(), 2U);
  EXPECT_GT(view->pageScale(0), 0);
  EXPECT_EQ(view->pageScale(4), 0) << "its only word is in one page";
}

TEST(LUXModelView, PagesWithoutTokensArePages) {
  LUXModelTrainer trainer("English");
  trainer.addPage({}, "empty", std::nullopt, "book");
  trainer.addPage({}, std::nullopt, std::nullopt, "book");
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
  EXPECT_EQ(view->pageCount(), 1U);
  EXPECT_EQ(view->totalPageCount(), 2U);
}

TEST(LUXModelView, KeywordsCountAsWordsOfTheTitle) {
  const auto impactOf = [](const std::optional<std::vector<std::string>>& keywords) {
    LUXModelTrainer trainer("English");
    trainer.addPage(LUXTokenCounts::withCounts({{"word", LUXTokenKind::stem, 0, 1}}), "page",
                    keywords, "book");
    const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
    const auto number = view->termNumber(LUXTokenKind::stem, "word");
    return number ? luxposting::impact(view->postings(LUXTokenKind::stem, *number)[0]) : 0;
  };
  EXPECT_GT(impactOf(std::vector<std::string>{"the words", "other"}), impactOf(std::nullopt));
  EXPECT_EQ(impactOf(std::vector<std::string>{}), impactOf(std::nullopt));
}

TEST(LUXModelView, AHundredThousandDistinctTokensAreAllFound) {
  std::vector<LUXTokenCount> tokens;
  std::vector<std::string> names;
  constexpr uint32_t count = 100000;
  names.reserve(count);
  for (uint32_t i = 0; i < count; ++i) {
    names.push_back("t" + std::to_string(i));
    tokens.push_back({names.back(), LUXTokenKind::stem, 0, 1});
  }
  LUXModelTrainer trainer("English");
  trainer.addPage(LUXTokenCounts::withCounts(tokens), "1", std::nullopt, "book");
  trainer.addPage(LUXTokenCounts::withCounts(tokens), "2", std::nullopt, "book");
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 2));
  ASSERT_EQ(view->termCount(LUXTokenKind::stem), count);
  for (uint32_t i = 0; i < count; i += 997) {
    const auto number = view->termNumber(LUXTokenKind::stem, names[i]);
    ASSERT_TRUE(number);
    EXPECT_EQ(view->postings(LUXTokenKind::stem, *number).size(), 2U);
  }
}

TEST(LUXModelView, CountsBeyondWhatIsKeptAreAsManyAsFit) {
  LUXModelTrainer trainer("English");
  trainer.addPage(
      LUXTokenCounts::withCounts({{"word", LUXTokenKind::stem, 4000000000U, 4000000000U, 0}}),
      "page", std::nullopt, "book");
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
  EXPECT_EQ(luxposting::impact(view->postings(LUXTokenKind::stem, 0)[0]), 1023U);
}

TEST(LUXModelView, LanguagesOfAllScriptsMayBeInOneModel) {
  std::vector<ModelPage> pages;
  for (int i = 0; i < 4; ++i) {
    const std::string number = std::to_string(i);
    pages.push_back({"zh", "zh" + number, "打印队列", "打印机的打印队列显示打印机在做什么。"});
    pages.push_back({"ar", "ar" + number, "طابور الطباعة", "يعرض طابور الطباعة ما تفعله الطابعة."});
    pages.push_back({"de", "de" + number, "Druckerwarteschlange", "Größe und Straße."});
    pages.push_back({"he", "he" + number, "תור ההדפסה", "תור ההדפסה מציג מה המדפסת עושה"});
  }
  for (const char* language : {"English", "Japanese", "Arabic"}) {
    const platform::Data data = tests::modelOfPages(pages, 2, {}, language);
    const auto view = LUXModelView::viewWithData(data);
    ASSERT_NE(view, nullptr);
    EXPECT_EQ(view->pageCount(), 16U);
    EXPECT_GT(view->rank(), 0U);
    EXPECT_GT(view->phraseCount(), 0U);
    for (uint32_t phrase = 0; phrase < view->phraseCount(); ++phrase) {
      EXPECT_FALSE(view->phraseText(phrase).empty());
    }
  }
}

TEST(LUXModelView, ALanguageThatNobodyKnowsHasAModelAllTheSame) {
  LUXModelTrainer trainer("Volapük");
  for (int page = 0; page < 4; ++page) {
    trainer.addPage(LUXTokenCounts::withCounts({{"vol", LUXTokenKind::stem, 1, 1},
                                                {"vol pük", LUXTokenKind::phrase, 1, 0}}),
                    std::to_string(page), std::vector<std::string>{"keyword"}, "book");
  }
  const auto view = LUXModelView::viewWithData(trainer.finish({}, 1));
  ASSERT_NE(view, nullptr);
  EXPECT_EQ(view->language(), "Volapük");
  ASSERT_EQ(view->phraseCount(), 1U);
  EXPECT_EQ(view->phraseText(0), "vol pük");
}

TEST(LUXModelView, OtherVersionsAndOtherContainersAreNoModels) {
  const platform::Data data = tests::modelOfPages(tests::samplePages());
  ASSERT_NE(LUXModelView::viewWithData(data), nullptr);
  const auto sections = LUXSectionedData::read(data, LUXModelForm);
  ASSERT_TRUE(sections);
  const LUXContainerForm later{LUXModelForm.magic, uint16_t(LUXModelForm.majorVersion + 1), 0};
  EXPECT_EQ(LUXModelView::viewWithData(LUXSectionedData(sections->sections(), later).write()),
            nullptr);
  EXPECT_EQ(LUXModelView::viewWithData(LUXSectionedData(sections->sections()).write()), nullptr)
      << "the container of a book";
  EXPECT_EQ(LUXModelView::viewWithData(LUXSectionedData({}, LUXModelForm).write()), nullptr);
  EXPECT_EQ(LUXModelView::viewWithData({}), nullptr);
}

TEST(LUXModelView, AFurtherSectionAndALaterMinorVersionAreRead) {
  const platform::Data data = tests::modelOfPages(tests::samplePages());
  auto sections = LUXSectionedData::read(data, LUXModelForm)->sections();
  sections.push_back(LUXSection::sectionWithBytes(9999, platform::Data::copy("later")));
  const LUXContainerForm later{LUXModelForm.magic, LUXModelForm.majorVersion, 7};
  EXPECT_NE(LUXModelView::viewWithData(LUXSectionedData(sections, later).write()), nullptr);
}

TEST(LUXModelView, BytesThatLieBadlyAreReadAllTheSame) {
  const platform::Data data = tests::modelOfPages(tests::samplePages());
  const std::string moved = "x" + std::string(data.view());
  const auto view = LUXModelView::viewWithData(platform::Data::copy(moved).slice(1, data.length()));
  ASSERT_NE(view, nullptr);
  EXPECT_TRUE(view->checksumsMatch());
  EXPECT_TRUE(view->termNumber(LUXTokenKind::stem, "queue"));
}
