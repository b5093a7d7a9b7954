#include "zebd/BusMessages.h"

#include <algorithm>
#include <chrono>
#include <optional>
#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Strings.h"
#include "zebd/Models.h"

namespace zebd::busmessages {

namespace {

/// Paths are bytes, and a bus that is given what is no text takes the whole message for none.
std::string text(const std::string& bytes) { return platform::stringByRepairingUTF8(bytes); }

}  // namespace

std::string nameOfEnding(SearchEnding ending) {
  switch (ending) {
    case SearchEnding::complete:
      return "complete";
    case SearchEnding::broken:
      return "broken";
    case SearchEnding::cancelled:
      break;
  }
  return "cancelled";
}

Dictionary dictionaryOfItem(const FoundItem& item) {
  Dictionary dictionary = {
      {"kind", nameOfKind(item.kind)}, {"title", text(item.title)}, {"relevance", item.relevance}};
  if (!item.url.empty()) {
    dictionary["url"] = text(item.url);
    dictionary["book"] = text(item.bookID);
    dictionary["bookTitle"] = text(item.bookTitle);
    dictionary["exactMatch"] = item.isExactMatch;
  }
  if (item.abstract) {
    dictionary["abstract"] = text(*item.abstract);
  }
  return dictionary;
}

Dictionary dictionaryOfBook(const BookStatus& book) {
  Dictionary dictionary = {{"id", text(book.bookID)},
                           {"title", text(book.title)},
                           {"language", text(book.language)},
                           {"folder", text(book.folder)},
                           {"type", book.type},
                           {"indexed", book.indexPath.has_value()}};
  if (book.indexPath) {
    dictionary["index"] = text(*book.indexPath);
  }
  return dictionary;
}

Dictionary dictionaryOfModel(const ListedModel& model) {
  Dictionary dictionary = {{"group", model.group},          {"language", model.language},
                           {"books", model.books},          {"pages", model.pageCount},
                           {"bytes", model.bytes},          {"needsBuild", model.needsBuild},
                           {"building", model.isBeingBuilt}};
  if (model.built) {
    dictionary["built"] = static_cast<int64_t>(
        std::chrono::duration_cast<std::chrono::seconds>(model.built->time_since_epoch()).count());
  }
  return dictionary;
}

Failures failuresOf(const std::vector<BookFailure>& failures) {
  Failures answer;
  for (const BookFailure& failure : failures) {
    answer.emplace_back(failure.what, failure.reason);
  }
  return answer;
}

void checkTexts(const Strings& texts) {
  const auto isBad = [](const std::string& text) {
    return text.size() > HelpService::maximumTextLength || !platform::isValidUTF8(text) ||
           text.find('\0') != std::string::npos;
  };
  if (texts.size() > HelpService::maximumBookCount ||
      std::any_of(texts.begin(), texts.end(), isBad)) {
    throw sdbus::Error(badRequest, "a list or a text is too long, or no text");
  }
}

void checkBookIDs(const Strings& bookIDs) {
  checkTexts(bookIDs);
  for (const std::string& bookID : bookIDs) {
    if (!ZEBHelpBook::isValidBookID(bookID)) {
      throw sdbus::Error(badRequest, "\"" + bookID + "\" cannot be a book's identifier");
    }
  }
}

ScanRequest scanWithOptions(const Strings& folders, const Dictionary& options) {
  checkTexts(folders);
  ScanRequest request;
  for (const std::string& folder : folders) {
    if (!folder.starts_with('/')) {
      throw sdbus::Error(badRequest, "the path of a folder has to begin with a slash");
    }
    request.folders.push_back({folder, std::nullopt});
  }
  for (const auto& [name, value] : options) {
    if (name == "books") {
      const auto bookIDs = value.get<Strings>();
      checkBookIDs(bookIDs);
      if (bookIDs.size() != folders.size()) {
        throw sdbus::Error(badRequest, "there has to be one book a folder");
      }
      for (size_t i = 0; i < bookIDs.size(); ++i) {
        request.folders[i].bookID = bookIDs[i];
      }
    } else if (name == "installed") {
      request.installedBooks = value.get<bool>();
    } else if (name == "languages") {
      request.languages = value.get<Strings>();
      checkTexts(request.languages);
    } else if (name == "force") {
      request.allBooksEvenIfUnchanged = value.get<bool>();
    } else if (name == "forceFolders") {
      request.folderBooksEvenIfUnchanged = value.get<bool>();
    } else if (name == "servers") {
      request.asksServers = value.get<bool>();
    } else {
      throw sdbus::Error(badRequest, "there is no option \"" + name + "\"");
    }
  }
  return request;
}

SearchRequest requestWithOptions(std::string text, const Dictionary& options) {
  SearchRequest request;
  request.text = std::move(text);
  Strings kinds = {"pages"};
  for (const auto& [name, value] : options) {
    if (name == "books") {
      request.bookIDs = value.get<Strings>();
    } else if (name == "kinds") {
      kinds = value.get<Strings>();
    } else if (name == "anchor") {
      request.isAnchor = value.get<bool>();
    } else if (name == "limit") {
      request.limit = value.get<uint32_t>();
    } else if (name == "languages") {
      request.languages = value.get<Strings>();
    } else {
      throw sdbus::Error(badRequest, "there is no option \"" + name + "\"");
    }
  }
  for (const std::string& kind : kinds) {
    const std::optional<std::string> known = kindOfName(kind);
    if (!known) {
      throw sdbus::Error(badRequest, "there is no kind of result \"" + kind + "\"");
    }
    request.kinds.push_back(*known);
  }
  return request;
}

SearchRequest requestFor(std::string text, Strings books, const std::string& kind, uint32_t limit) {
  SearchRequest request;
  request.text = std::move(text);
  request.bookIDs = std::move(books);
  request.kinds = {kind};
  request.limit = limit;
  return request;
}

}  // namespace zebd::busmessages
