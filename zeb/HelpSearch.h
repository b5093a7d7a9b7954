// Searches and anchor look-ups over the books of the catalogue.
#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "zeb/Catalogue.h"

namespace zeb {

/// A page that was found, ready to be shown.
struct FoundPage {
  /// The file's name where the page has no title.
  std::string title;
  std::string bookID;
  std::string bookTitle;
  std::optional<std::string> abstract;
  std::string url;
  /// Orders the pages of one answer, higher first; see HelpSearch::search().
  double relevance = 0;
};

struct Answer {
  /// Best first, no more than were asked for.
  std::vector<FoundPage> pages;
  /// How many there were before that limit.
  size_t count = 0;
};

/// The one place in which the command line meets the search. It opens the indexes in this process
/// and asks the keyword search directly; whoever answers in its place has to fill the same answers.
/// Thread-safety: internally synchronised.
class HelpSearch {
 public:
  /// Opens the indexes of these books. Those that cannot be opened are left out and named in
  /// unreadableBooks().
  explicit HelpSearch(const std::vector<CatalogueEntry>& books);
  ~HelpSearch();
  HelpSearch(const HelpSearch&) = delete;
  HelpSearch& operator=(const HelpSearch&) = delete;

  const std::vector<CatalogueEntry>& unreadableBooks() const;

  /// The pages that match the words, up to `limit`, in the order of zeb::relevances(). Pages of
  /// equal relevance are ordered by book and URL.
  Answer search(std::string_view words, size_t limit) const;

  /// The pages that carry the anchor of exactly this name, each with relevance 1, book by book.
  Answer lookUpAnchor(std::string_view name, size_t limit) const;

 private:
  struct Implementation;
  std::unique_ptr<const Implementation> _implementation;
};

}  // namespace zeb
