#include "bench/quality/HelpCollections.h"

#include <algorithm>
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
Collection gimpKeywords(const fs::path& root) {
  const fs::path book = root / "usr/share/gimp/2.0/help/en";
  const std::string indexName = "gimp-help-index.html";
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

std::string withoutSuffix(const std::string& text, const std::string& suffix) {
  return text.ends_with(suffix) ? text.substr(0, text.size() - suffix.size()) : text;
}

/// Titles are the queries; documents have neither title nor a heading that repeats it.
Collection titlesOfBook(const fs::path& folder, const std::string& titleSuffix,
                        bool withDescription) {
  Collection collection;
  Candidates candidates;
  for (BookPage& page : pagesOfBook(folder)) {
    const std::string title = collapsed(withoutSuffix(page.page.title, titleSuffix));
    Document document = documentOfPage(page);
    document.title.clear();
    std::erase_if(document.blocks,
                  [&title](const std::string& block) { return collapsed(block) == title; });
    if (withDescription && !page.page.description.empty()) {
      document.blocks.insert(document.blocks.begin(), page.page.description);
    }
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

HelpCollectionMaker office(const std::string& name, const std::string& language,
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
  static const fs::path desktop = "usr/share/help/C";
  static const fs::path python = "usr/share/doc/python3.11/html";
  static const std::vector<HelpCollectionMaker> makers = {
      office("libreoffice-keywords", "en", "en-US"),
      {"gimp-keywords", "en", {"gimp-help-en"}, gimpKeywords},
      {"gnome-titles",
       "en",
       {"gnome-user-docs"},
       [](const fs::path& root) { return titlesOfBook(root / desktop, "", false); }},
      {"python-titles",
       "en",
       {"python3.11-doc"},
       [](const fs::path& root) {
         return titlesOfBook(root / python, " — Python 3.11.2 documentation", false);
       }},
      {"gnome-descriptions",
       "en",
       {"gnome-user-docs"},
       [](const fs::path& root) { return descriptionsOfBook(root / desktop); }},
      office("libreoffice-keywords-de", "de", "de"),
      office("libreoffice-keywords-fr", "fr", "fr"),
      office("libreoffice-keywords-ja", "ja", "ja"),
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
