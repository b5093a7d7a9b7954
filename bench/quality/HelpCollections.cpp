#include "bench/quality/HelpCollections.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <map>
#include <set>
#include <stdexcept>
#include <unordered_map>

#include "bench/quality/MarkupText.h"
#include "bvmake/FolderWalker.h"
#include "bvmake/PageReader.h"
#include "bvmake/Report.h"

namespace quality {

namespace {

namespace fs = std::filesystem;

constexpr size_t maximumQueryCount = 500;

struct BookPage {
  /// Relative to the book's folder, without a leading slash.
  std::string path;
  bvmake::Page page;
};

std::string bytesOfFile(const fs::path& file) {
  std::ifstream stream(file, std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + file.string());
  }
  return {std::istreambuf_iterator<char>(stream), {}};
}

std::vector<BookPage> pagesOfBook(const fs::path& folder) {
  bvmake::StreamReport report(stderr, "quality", 0);
  const auto found = bvmake::findPages(folder.string(), report);
  if (!found) {
    throw std::runtime_error("cannot list " + folder.string());
  }
  std::vector<BookPage> pages;
  for (const bvmake::FoundPage& one : *found) {
    if (auto page = bvmake::readPage(one.kind, bytesOfFile(one.file))) {
      if (!page->excludedFromSearch && page->hasText()) {
        pages.push_back({one.path.substr(1), std::move(*page)});
      }
    }
  }
  return pages;
}

/// The page without what its author said about it: no key words, no description.
Document documentOfPage(const BookPage& page) {
  Document document{page.path, page.page.title, {}};
  for (const std::string& heading : page.page.headings) {
    document.blocks.push_back(heading);
  }
  for (const bvmake::TextBlock& block : page.page.body) {
    document.blocks.push_back(block.text);
  }
  return document;
}

/// Candidates for queries, text to the documents that answer it.
using Candidates = std::map<std::string, std::set<size_t>>;

void chooseQueries(const Candidates& candidates, Collection& collection) {
  std::vector<std::pair<uint64_t, const Candidates::value_type*>> order;
  for (const auto& candidate : candidates) {
    if (candidate.second.size() == 1) {
      order.emplace_back(stableHash(candidate.first), &candidate);
    }
  }
  std::sort(order.begin(), order.end());
  order.resize(std::min(order.size(), maximumQueryCount));
  for (const auto& [hash, candidate] : order) {
    const std::string id = "q" + std::to_string(collection.queries.size() + 1);
    collection.queries.push_back({id, candidate->first});
    collection.answers[id][*candidate->second.begin()] = 1;
  }
}

std::unordered_map<std::string, size_t> numbersOfPaths(const Collection& collection) {
  std::unordered_map<std::string, size_t> numbers;
  for (size_t i = 0; i < collection.documents.size(); ++i) {
    numbers.emplace(collection.documents[i].id, i);
  }
  return numbers;
}

/// The office suite's pages hold their index terms as markup that is no text; the index itself is a
/// script: {url:"LANG/text/PAGE.html?…#…", app:"…", text:"term -- narrower term"},
Collection officeKeywords(const fs::path& root, const std::string& folder) {
  const fs::path book = root / "usr/share/libreoffice/help" / folder;
  Collection collection;
  for (const BookPage& page : pagesOfBook(book / "text")) {
    collection.documents.push_back(documentOfPage(page));
  }
  const auto numbers = numbersOfPaths(collection);
  Candidates candidates;
  std::ifstream lines(book / "bookmarks.js");
  const std::string urlMark = "{url:\"" + folder + "/text/";
  for (std::string line; std::getline(lines, line);) {
    const size_t url = line.find(urlMark);
    const size_t text = line.find("text:\"");
    const size_t end = line.rfind("\"}");
    if (url == std::string::npos || text == std::string::npos || end == std::string::npos) {
      continue;
    }
    const size_t start = url + urlMark.size();
    const auto page = numbers.find(line.substr(start, line.find_first_of("?#\"", start) - start));
    if (page == numbers.end()) {
      continue;
    }
    std::string term = plainText(line.substr(text + 6, end - text - 6));
    for (size_t dash = term.find("--"); dash != std::string::npos; dash = term.find("--")) {
      term.replace(dash, 2, " ");
    }
    candidates[collapsed(term)].insert(page->second);
  }
  chooseQueries(candidates, collection);
  return collection;
}

/// DocBook's index page: nested lists of terms, each with links to the places that it names.
Collection docBookKeywords(const fs::path& book, const std::string& indexName) {
  Collection collection;
  for (const BookPage& page : pagesOfBook(book)) {
    if (page.path != indexName) {
      collection.documents.push_back(documentOfPage(page));
    }
  }
  const auto numbers = numbersOfPaths(collection);
  Candidates candidates;
  for (const IndexTerm& term : termsOfIndexPage(bytesOfFile(book / indexName))) {
    std::set<size_t>& answers = candidates[term.text];
    for (const std::string& link : term.links) {
      const auto page = numbers.find(link.substr(0, link.find('#')));
      if (page != numbers.end()) {
        answers.insert(page->second);
      }
    }
  }
  chooseQueries(candidates, collection);
  return collection;
}

/// Titles begin with the number of the chapter and end with the name of the book in some books.
std::string bareTitle(const std::string& title, const std::string& bookMark) {
  std::string bare = bookMark.empty() ? title : title.substr(0, title.rfind(bookMark));
  size_t end = 0;
  bool hasDigit = false;
  while (end < bare.size() &&
         (std::isalnum(static_cast<unsigned char>(bare[end])) != 0 || bare[end] == '.')) {
    hasDigit = hasDigit || std::isdigit(static_cast<unsigned char>(bare[end])) != 0;
    ++end;
  }
  if (hasDigit && end > 0 && bare[end - 1] == '.') {
    bare.erase(0, end);
    if (bare.starts_with("\xC2\xA0")) {
      bare.erase(0, 2);
    }
  }
  return collapsed(bare);
}

/// Titles are the queries; documents have neither title nor a heading that repeats it.
Collection titlesOfBook(const fs::path& folder, const std::string& bookMark) {
  Collection collection;
  Candidates candidates;
  for (BookPage& page : pagesOfBook(folder)) {
    const std::string title = bareTitle(page.page.title, bookMark);
    const std::string fullTitle = bareTitle(page.page.title, "");
    Document document = documentOfPage(page);
    document.title.clear();
    std::erase_if(document.blocks, [&](const std::string& block) {
      const std::string bare = bareTitle(block, "");
      return bare == title || bare == fullTitle;
    });
    if (document.blocks.empty()) {
      continue;
    }
    if (!title.empty()) {
      candidates[title].insert(collection.documents.size());
    }
    collection.documents.push_back(std::move(document));
  }
  chooseQueries(candidates, collection);
  return collection;
}

Collection descriptionsOfBook(const fs::path& folder) {
  Collection collection;
  Candidates candidates;
  for (const BookPage& page : pagesOfBook(folder)) {
    if (!page.page.description.empty()) {
      candidates[page.page.description].insert(collection.documents.size());
    }
    collection.documents.push_back(documentOfPage(page));
  }
  chooseQueries(candidates, collection);
  return collection;
}

HelpCollectionMaker officeMaker(const std::string& name, const std::string& language,
                                const std::string& folder) {
  std::string package = folder;
  std::transform(package.begin(), package.end(), package.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  return {name, language, {"libreoffice-help-" + package}, [folder](const fs::path& root) {
            return officeKeywords(root, folder);
          }};
}

std::map<std::string, std::string> packageVersions(const fs::path& root) {
  std::map<std::string, std::string> versions;
  std::ifstream lines(root / "versions");
  for (std::string package, version; lines >> package >> version;) {
    versions[package] = version;
  }
  return versions;
}

}  // namespace

const std::vector<HelpCollectionMaker>& helpCollectionMakers() {
  static const fs::path office = "usr/share/libreoffice/help/en-US/text";
  static const fs::path paint = "usr/share/gimp/2.0/help/en";
  static const fs::path desktop = "usr/share/help/C";
  static const fs::path python = "usr/share/doc/python3.11/html";
  static const fs::path database = "usr/share/doc/postgresql-doc-15/html";
  static const fs::path server = "usr/share/doc/apache2-doc/manual/en";
  const auto titles = [](const fs::path& folder, const std::string& bookMark) {
    return [=](const fs::path& root) { return titlesOfBook(root / folder, bookMark); };
  };
  const auto keywords = [](const fs::path& folder, const std::string& indexName) {
    return [=](const fs::path& root) { return docBookKeywords(root / folder, indexName); };
  };
  static const std::vector<HelpCollectionMaker> makers = {
      officeMaker("libreoffice-keywords", "en", "en-US"),
      {"gimp-keywords", "en", {"gimp-help-en"}, keywords(paint, "gimp-help-index.html")},
      {"gnome-titles", "en", {"gnome-user-docs"}, titles(desktop, "")},
      {"python-titles", "en", {"python3.11-doc"}, titles(python, " — Python ")},
      {"gnome-descriptions",
       "en",
       {"gnome-user-docs"},
       [](const fs::path& root) { return descriptionsOfBook(root / desktop); }},
      {"postgresql-keywords", "en", {"postgresql-doc-15"}, keywords(database, "bookindex.html")},
      {"postgresql-titles", "en", {"postgresql-doc-15"}, titles(database, "")},
      {"apache-titles", "en", {"apache2-doc"}, titles(server, " - Apache HTTP Server")},
      {"gimp-titles", "en", {"gimp-help-en"}, titles(paint, "")},
      {"libreoffice-titles", "en", {"libreoffice-help-en-us"}, titles(office, "")},
      officeMaker("libreoffice-keywords-de", "de", "de"),
      officeMaker("libreoffice-keywords-fr", "fr", "fr"),
      officeMaker("libreoffice-keywords-ja", "ja", "ja"),
  };
  return makers;
}

std::vector<Collection> helpCollections(const fs::path& root) {
  const std::map<std::string, std::string> versions = packageVersions(root);
  std::vector<Collection> collections;
  for (const HelpCollectionMaker& maker : helpCollectionMakers()) {
    const bool unpacked =
        std::all_of(maker.packages.begin(), maker.packages.end(),
                    [&](const std::string& package) { return versions.contains(package); });
    if (!unpacked) {
      continue;
    }
    Collection collection = maker.make(root);
    collection.name = maker.name;
    collection.language = maker.language;
    for (const std::string& package : maker.packages) {
      collection.origin +=
          (collection.origin.empty() ? "" : ", ") + package + " " + versions.at(package);
    }
    collections.push_back(std::move(collection));
  }
  return collections;
}

}  // namespace quality
