// Extracts the text of help books once, for benchmarks:
//   bench_corpus OUTPUT NAME=FOLDER …
// The pages come out as the indexing tool would index them.
#include <algorithm>
#include <cstdio>
#include <exception>
#include <fstream>
#include <iterator>
#include <string>

#include "bench/engines/Corpus.h"
#include "bvmake/FolderWalker.h"
#include "bvmake/PageReader.h"
#include "bvmake/Report.h"
#include "bvmake/Summary.h"

namespace engines {

namespace {

searchkit::Document documentFromPage(const std::string& path, bvmake::Page page,
                                     bvmake::Summarizer& summarizer) {
  searchkit::Document document;
  document.path = path;
  document.abstract = page.description.empty() ? summarizer.summary(page) : page.description;
  document.title = std::move(page.title);
  document.headings = std::move(page.headings);
  document.headings.insert(document.headings.end(), page.keywords.begin(), page.keywords.end());
  if (!page.description.empty()) {
    document.body.push_back(std::move(page.description));
  }
  for (bvmake::TextBlock& block : page.body) {
    document.body.push_back(std::move(block.text));
  }
  return document;
}

Book readBook(const std::string& name, const std::string& folder) {
  bvmake::StreamReport report(stderr, "bench_corpus", 0);
  bvmake::Summarizer summarizer;
  Book book;
  book.name = name;
  for (const bvmake::FoundPage& found :
       bvmake::findPages(folder, report).value_or(std::vector<bvmake::FoundPage>())) {
    std::ifstream stream(found.file, std::ios::binary);
    const std::string bytes{std::istreambuf_iterator<char>(stream), {}};
    auto page = bvmake::readPage(found.kind, bytes);
    if (page && page->hasText()) {
      book.pages.push_back(documentFromPage(found.path, std::move(*page), summarizer));
    }
  }
  return book;
}

int run(int count, char** arguments) {
  if (count < 3) {
    std::fputs("usage: bench_corpus OUTPUT NAME=FOLDER …\n", stderr);
    return 2;
  }
  Books books;
  for (int i = 2; i < count; ++i) {
    const std::string argument = arguments[i];
    const size_t sign = argument.find('=');
    if (sign == std::string::npos) {
      std::fprintf(stderr, "bench_corpus: no NAME=FOLDER: %s\n", argument.c_str());
      return 2;
    }
    books.push_back(readBook(argument.substr(0, sign), argument.substr(sign + 1)));
    if (books.back().pages.empty()) {
      std::fprintf(stderr, "bench_corpus: no pages in %s\n", argument.c_str());
      return 1;
    }
  }
  writeBooks(books, arguments[1]);
  return 0;
}

}  // namespace

}  // namespace engines

int main(int count, char** arguments) {
  try {
    return engines::run(count, arguments);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bench_corpus: %s\n", exception.what());
    return 1;
  }
}
