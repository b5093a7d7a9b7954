// What answers and books look like, for people and for programs.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "zeb/Console.h"
#include "zeb/HelpSearch.h"
#include "zebd/Catalogue.h"
#include "zebd/Models.h"

namespace zeb {

using zebd::CatalogueEntry;
using zebd::ListedModel;

/// Numbered pages with title, book, abstract and URL, and a last line that says how many more there
/// are. Nothing at all for an answer without pages. What comes from books is made single lines.
void printAnswer(const Answer& answer, Console& console);

/// One JSON object: "query", "count", "results" (each with "title", "book", "bookTitle",
/// "abstract" where there is one, "url", "relevance").
void printAnswerAsJSON(std::string_view query, const Answer& answer, Console& console);

/// A page that is found from now on, or no longer is.
enum class PageChange { found, gone };

/// One line: "+" or "-", title, book and URL.
void printPageChange(PageChange change, const FoundPage& page, Console& console);

/// One JSON object on one line: "change" ("found" or "gone") and what a result of a search has.
void printPageChangeAsJSON(PageChange change, const FoundPage& page, Console& console);

/// One suggestion a line.
void printSuggestions(const std::vector<Suggestion>& suggestions, Console& console);

/// One JSON object: "query", "count", "suggestions" (each with "text", "relevance").
void printSuggestionsAsJSON(std::string_view query, const std::vector<Suggestion>& suggestions,
                            Console& console);

/// One line a model: group, language, numbers of books and pages, size, when it was built, and what
/// is to be said of its state.
void printModels(const std::vector<ListedModel>& models, Console& console);

/// One JSON object: "count", "models" (each with "group", "language", "books", "pages", "bytes",
/// "built" in seconds since 1970, "needsBuild", "activity": "building" or "none").
void printModelsAsJSON(const std::vector<ListedModel>& models, Console& console);

/// A book as it is listed.
struct ListedBook {
  CatalogueEntry entry;
  /// The help-index file; absent when there is none yet.
  std::optional<std::string> indexPath;
};

/// One line a book: identifier, language, whether it is indexed, title.
void printBooks(const std::vector<ListedBook>& books, Console& console);

/// One JSON object: "count", "books" (each with "id", "title", "type", "language", "folder",
/// "index" where there is one, "indexed").
void printBooksAsJSON(const std::vector<ListedBook>& books, Console& console);

}  // namespace zeb
