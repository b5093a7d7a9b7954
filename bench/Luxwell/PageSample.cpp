#include "bench/Luxwell/PageSample.h"

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <random>
#include <stdexcept>
#include <utility>

#include "bvmake/FolderWalker.h"
#include "bvmake/PageReader.h"
#include "bvmake/Report.h"

namespace quality {

namespace {

/// Documents with a title and some text, by number.
std::vector<size_t> askablePages(const Collection& pages) {
  std::vector<size_t> numbers;
  for (size_t i = 0; i < pages.documents.size(); ++i) {
    const Document& page = pages.documents[i];
    if (!page.title.empty() && page.title.size() < 80 && page.blocks.size() > 2) {
      numbers.push_back(i);
    }
  }
  if (numbers.empty()) {
    throw std::runtime_error("no pages to ask for");
  }
  return numbers;
}

std::string wordsFrom(const std::string& text, size_t start, size_t count) {
  std::string result;
  size_t position = text.find(' ', start);
  while (count > 0 && position != std::string::npos) {
    const size_t end = text.find(' ', position + 1);
    result += (result.empty() ? "" : " ") + text.substr(position + 1, end - position - 1);
    position = end;
    --count;
  }
  return result;
}

}  // namespace

Collection pageSample(const std::vector<std::string>& roots, size_t count) {
  bvmake::StreamReport report(stderr, "bench", 0);
  std::vector<std::pair<uint64_t, bvmake::FoundPage>> found;
  for (const std::string& root : roots) {
    auto pages = bvmake::findPages(root, report);
    if (!pages) {
      throw std::runtime_error("cannot list " + root);
    }
    for (bvmake::FoundPage& page : *pages) {
      const uint64_t hash = stableHash(page.path);
      found.emplace_back(hash, std::move(page));
    }
  }
  std::sort(found.begin(), found.end(), [](const auto& a, const auto& b) {
    return a.first != b.first ? a.first < b.first : a.second.file < b.second.file;
  });
  Collection sample;
  sample.name = "pages";
  for (const auto& [hash, one] : found) {
    if (sample.documents.size() == count) {
      break;
    }
    std::ifstream stream(one.file, std::ios::binary);
    const std::string bytes{std::istreambuf_iterator<char>(stream), {}};
    const auto page = bvmake::readPage(one.kind, bytes);
    if (!page || page->body.empty()) {
      continue;
    }
    Document document{one.path, page->title, page->headings};
    for (const bvmake::TextBlock& block : page->body) {
      document.blocks.push_back(block.text);
    }
    sample.documents.push_back(std::move(document));
  }
  return sample;
}

std::vector<std::string> sampleQueries(const Collection& pages, size_t count) {
  const std::vector<size_t> numbers = askablePages(pages);
  std::mt19937_64 random(1);
  std::vector<std::string> queries;
  while (queries.size() < count) {
    const Document& page = pages.documents[numbers[random() % numbers.size()]];
    if (queries.size() % 2 == 0) {
      queries.push_back(page.title);
      continue;
    }
    const std::string& block = page.blocks[random() % page.blocks.size()];
    const std::string words = wordsFrom(block, random() % block.size(), 2 + random() % 5);
    if (std::count(words.begin(), words.end(), ' ') > 0) {
      queries.push_back(words);
    }
  }
  return queries;
}

std::vector<std::string> samplePrefixes(const Collection& pages, size_t count) {
  const std::vector<size_t> numbers = askablePages(pages);
  std::mt19937_64 random(2);
  std::vector<std::string> prefixes;
  while (prefixes.size() < count) {
    std::string title = pages.documents[numbers[random() % numbers.size()]].title;
    std::string prefix;
    const size_t length = 3 + random() % 6;
    for (const char c : title) {
      if (prefix.size() == length || (c & 0x80) != 0 || c == ' ') {
        break;
      }
      prefix += static_cast<char>(c >= 'A' && c <= 'Z' ? c + ('a' - 'A') : c);
    }
    const bool isWord =
        std::all_of(prefix.begin(), prefix.end(), [](char c) { return c >= 'a' && c <= 'z'; });
    if (prefix.size() >= 3 && isWord) {
      prefixes.push_back(prefix);
    }
  }
  return prefixes;
}

}  // namespace quality
