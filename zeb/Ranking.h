// One order for the pages of many books.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace zeb {

/// What the order of a page depends on.
struct RankedPage {
  /// As the keyword search of the page's own book has it; above zero.
  double score = 0;
  /// The number of pages in that book.
  uint64_t bookPageCount = 0;
  /// The words of the title, folded as those of the query are.
  std::vector<std::string> titleTerms;
};

/// A relevance above 0 and up to 1 for each page, comparable across books; half of it comes from
/// the score and half from the title.
///
/// Scores say how rare the words are in a page's own book, and nothing can be rarer than one page
/// in all: the scale grows with the logarithm of the book's size. Dividing by that logarithm takes
/// the size out; dividing by the best quotient of all pages makes it at most 1. What no scaling
/// mends is that in a book about keyboards the word "keyboard" counts for nothing. The title makes
/// up for it: it says what a page is about in any book, so the share of the query's words that
/// begin a word of the title is the other half.
std::vector<double> relevances(const std::vector<RankedPage>& pages,
                               const std::vector<std::string>& queryTerms);

}  // namespace zeb
