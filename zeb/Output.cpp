#include "zeb/Output.h"

#include <fmt/chrono.h>
#include <fmt/format.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <ostream>
#include <string>

#include "platform/Strings.h"

namespace zeb {

namespace {

using JSON = nlohmann::ordered_json;

void printJSON(const JSON& object, Console& console) {
  console.out() << object.dump(2, ' ', false, JSON::error_handler_t::replace) << '\n';
}

JSON text(std::string_view bytes) { return platform::stringByRepairingUTF8(bytes); }

void addPage(const FoundPage& page, JSON& object) {
  object["title"] = text(page.title);
  object["book"] = text(page.bookID);
  object["bookTitle"] = text(page.bookTitle);
  if (page.abstract) {
    object["abstract"] = text(*page.abstract);
  }
  object["url"] = text(page.url);
  object["relevance"] = page.relevance;
}

}  // namespace

void printAnswer(const Answer& answer, Console& console) {
  const size_t numberWidth = std::to_string(answer.pages.size()).size();
  const std::string indent(numberWidth + 2, ' ');
  size_t number = 0;
  for (const FoundPage& page : answer.pages) {
    ++number;
    if (number > 1) {
      console.out() << '\n';
    }
    console.out() << fmt::format("{:>{}}. ", number, numberWidth)
                  << console.styled(Style::title, singleLine(page.title)) << "  "
                  << console.styled(Style::book, singleLine(page.bookTitle)) << '\n';
    if (page.abstract && !page.abstract->empty()) {
      console.out() << indent << singleLine(*page.abstract) << '\n';
    }
    console.out() << indent << console.styled(Style::url, singleLine(page.url)) << '\n';
  }
  if (answer.count > answer.pages.size()) {
    const size_t more = answer.count - answer.pages.size();
    console.out() << '\n'
                  << console.styled(Style::label,
                                    fmt::format("{} more {}", more, more == 1 ? "page" : "pages"))
                  << '\n';
  }
}

void printAnswerAsJSON(std::string_view query, const Answer& answer, Console& console) {
  JSON results = JSON::array();
  for (const FoundPage& page : answer.pages) {
    JSON result;
    addPage(page, result);
    results.push_back(std::move(result));
  }
  JSON object;
  object["query"] = text(query);
  object["count"] = answer.count;
  object["results"] = std::move(results);
  printJSON(object, console);
}

void printPageChange(PageChange change, const FoundPage& page, Console& console) {
  console.out() << (change == PageChange::found ? "+ " : "- ")
                << console.styled(Style::title, singleLine(page.title)) << "  "
                << console.styled(Style::book, singleLine(page.bookTitle)) << "  "
                << console.styled(Style::url, singleLine(page.url)) << '\n';
}

void printPageChangeAsJSON(PageChange change, const FoundPage& page, Console& console) {
  JSON object;
  object["change"] = change == PageChange::found ? "found" : "gone";
  addPage(page, object);
  console.out() << object.dump() << '\n';
}

void printSuggestions(const std::vector<Suggestion>& suggestions, Console& console) {
  for (const Suggestion& suggestion : suggestions) {
    console.out() << singleLine(suggestion.text) << '\n';
  }
}

void printSuggestionsAsJSON(std::string_view query, const std::vector<Suggestion>& suggestions,
                            Console& console) {
  JSON list = JSON::array();
  for (const Suggestion& suggestion : suggestions) {
    JSON entry;
    entry["text"] = text(suggestion.text);
    entry["relevance"] = suggestion.relevance;
    list.push_back(std::move(entry));
  }
  JSON object;
  object["query"] = text(query);
  object["count"] = suggestions.size();
  object["suggestions"] = std::move(list);
  printJSON(object, console);
}

void printModels(const std::vector<ListedModel>& models, Console& console) {
  for (const ListedModel& model : models) {
    const std::string built =
        model.built ? fmt::format("{:%Y-%m-%d %H:%M}", fmt::localtime(*model.built)) : "";
    console.out() << console.styled(Style::title, singleLine(model.group)) << "  "
                  << singleLine(model.language)
                  << fmt::format("  {} books  {} pages  {:.1f} MB  {}", model.books.size(),
                                 model.pageCount, static_cast<double>(model.bytes) / 1e6, built);
    if (model.isBeingBuilt) {
      console.out() << "  being built";
    } else if (model.needsBuild) {
      console.out() << "  " << console.styled(Style::error, "needs to be built");
    }
    console.out() << '\n';
  }
}

void printModelsAsJSON(const std::vector<ListedModel>& models, Console& console) {
  JSON list = JSON::array();
  for (const ListedModel& model : models) {
    JSON books = JSON::array();
    for (const std::string& bookID : model.books) {
      books.push_back(text(bookID));
    }
    JSON entry;
    entry["group"] = text(model.group);
    entry["language"] = text(model.language);
    entry["books"] = std::move(books);
    entry["pages"] = model.pageCount;
    entry["bytes"] = model.bytes;
    if (model.built) {
      entry["built"] = std::chrono::system_clock::to_time_t(*model.built);
    }
    entry["needsBuild"] = model.needsBuild;
    entry["activity"] = model.isBeingBuilt ? "building" : "none";
    list.push_back(std::move(entry));
  }
  JSON object;
  object["count"] = models.size();
  object["models"] = std::move(list);
  printJSON(object, console);
}

void printBooks(const std::vector<ListedBook>& books, Console& console) {
  const auto state = [](const ListedBook& book) {
    return std::string_view(book.indexPath ? "indexed" : "not indexed yet");
  };
  size_t idWidth = 0;
  size_t languageWidth = 0;
  size_t stateWidth = 0;
  for (const ListedBook& book : books) {
    idWidth = std::max(idWidth, singleLine(book.entry.bookID).size());
    languageWidth = std::max(languageWidth, singleLine(book.entry.language).size());
    stateWidth = std::max(stateWidth, state(book).size());
  }
  for (const ListedBook& book : books) {
    console.out() << console.styled(Style::book,
                                    fmt::format("{:<{}}", singleLine(book.entry.bookID), idWidth))
                  << fmt::format("  {:<{}}  ", singleLine(book.entry.language), languageWidth)
                  << console.styled(book.indexPath ? Style::label : Style::error,
                                    fmt::format("{:<{}}", state(book), stateWidth))
                  << "  " << console.styled(Style::title, singleLine(book.entry.title)) << '\n';
  }
}

void printBooksAsJSON(const std::vector<ListedBook>& books, Console& console) {
  JSON list = JSON::array();
  for (const ListedBook& book : books) {
    JSON entry;
    entry["id"] = text(book.entry.bookID);
    entry["title"] = text(book.entry.title);
    entry["type"] = book.entry.type;
    entry["language"] = text(book.entry.language);
    entry["folder"] = text(book.entry.folder);
    if (book.indexPath) {
      entry["index"] = text(*book.indexPath);
    }
    entry["indexed"] = book.indexPath.has_value();
    list.push_back(std::move(entry));
  }
  JSON object;
  object["count"] = books.size();
  object["books"] = std::move(list);
  printJSON(object, console);
}

}  // namespace zeb
