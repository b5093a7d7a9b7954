#include "SearchKit/IndexReader.h"
#include "SearchKit/SearchKit.h"
#include "SearchKit/Tokenizer.h"
#include "bench/engines/Engine.h"

namespace engines {

namespace {

platform::Data dataOfImage(const Image& image) {
  return platform::Data::wrap(image.bytes, image.length, nullptr);
}

class KeywordEngine : public Engine {
 public:
  explicit KeywordEngine(const Images& images) {
    for (const Image& image : images) {
      _indexes.push_back(SKIndexOpenWithData(dataOfImage(image)));
    }
  }

  const char* name() const override { return "SearchKit"; }

  void search(const Question& question, std::vector<Found>& found) override {
    constexpr size_t batchSize = 50;
    found.clear();
    const std::string text = question.text();
    const SKSearchOptions options =
        question.isAny ? kSKSearchOptionSpaceMeansOR : kSKSearchOptionDefault;
    for (uint32_t book = 0; book < _indexes.size(); ++book) {
      const SKSearchRef search = SKSearchCreate(_indexes[book], text, options);
      for (bool mayHaveMore = true; mayHaveMore;) {
        SKDocumentID ids[batchSize];
        float scores[batchSize];
        size_t count = 0;
        mayHaveMore = SKSearchFindMatches(*search, batchSize, ids, scores, 1.0, &count);
        for (size_t i = 0; i < count; ++i) {
          found.push_back({book, ids[i], scores[i]});
        }
      }
    }
  }

  size_t readRecords(const std::vector<Found>& found) override {
    size_t length = 0;
    for (const Found& one : found) {
      const auto document = searchkit::indexDocument(*_indexes[one.book], one.page);
      length += document->path.size() + document->title.value_or("").size() +
                document->abstract.value_or("").size();
    }
    return length;
  }

 private:
  std::vector<SKIndexRef> _indexes;
};

}  // namespace

PageWords wordsOfPage(const searchkit::Document& page) {
  PageWords words;
  searchkit::Tokenizer tokenizer;
  const auto addTo = [](std::string& field) {
    return [&field](std::string_view term, bool) {
      field += term;
      field += ' ';
    };
  };
  tokenizer.tokenize(page.title.value_or(""), addTo(words.title));
  for (const std::string& heading : page.headings) {
    tokenizer.tokenize(heading, addTo(words.headings));
  }
  for (const std::string& block : page.body) {
    tokenizer.tokenize(block, addTo(words.body));
  }
  return words;
}

void buildKeywordIndexes(const Books& books, const std::string& folder) {
  for (size_t book = 0; book < books.size(); ++book) {
    searchkit::IndexWriter writer;
    for (const searchkit::Document& page : books[book].pages) {
      writer.add(page);
    }
    const platform::Data data = writer.finish();
    writeImage(folder, book, data.bytes(), data.length());
  }
}

std::unique_ptr<Engine> openKeywordEngine(const Images& images) {
  return std::make_unique<KeywordEngine>(images);
}

void reopenKeywordIndexes(const Images& images) {
  for (const Image& image : images) {
    SKIndexOpenWithData(dataOfImage(image));
  }
}

size_t lengthWithoutPositions(const Images& images) {
  size_t length = 0;
  for (const Image& image : images) {
    const SKIndexRef index = SKIndexOpenWithData(dataOfImage(image));
    const searchkit::IndexSummary summary = searchkit::indexSummary(*index);
    length += summary.byteLength;
    for (const searchkit::SectionInfo& section : summary.sections) {
      length -= section.name == "positions" ? section.length : 0;
    }
  }
  return length;
}

size_t buildKeywordIndexInMemory(const Book& book) {
  searchkit::IndexWriter writer;
  for (const searchkit::Document& page : book.pages) {
    writer.add(page);
  }
  return writer.finish().length();
}

}  // namespace engines
