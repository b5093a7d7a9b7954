// How fast the keyword engine is over made-up pages: 3000 of them, some 12 MB of text whose words
// are as unevenly frequent as those of real text. No peers here; numbers to watch for changes.
#include <benchmark/benchmark.h>

#include <cmath>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "SearchKit/SearchKit.h"
#include "SearchKit/Tokenizer.h"

namespace {

constexpr int pageCount = 3000;
constexpr int wordsPerPage = 600;

class Vocabulary {
 public:
  Vocabulary() : _random(4) {
    static const char* const syllables[] = {"pri", "nt",  "que", "ue", "set", "ting", "net", "work",
                                            "fol", "der", "a",   "in", "er",  "con",  "ta",  "mo"};
    _words.resize(40000);
    for (std::string& word : _words) {
      for (size_t count = _random() % 3 + 2; count > 0; --count) {
        word += syllables[_random() % std::size(syllables)];
      }
    }
  }

  // The n-th most frequent word is about 1/n as frequent as the first.
  const std::string& next() {
    const double uniform = std::uniform_real_distribution<double>(0, 1)(_random);
    const double rank = std::exp(uniform * std::log(static_cast<double>(_words.size())));
    return _words[static_cast<size_t>(rank) - 1];
  }

  const std::string& word(size_t rank) const { return _words[rank]; }

 private:
  std::mt19937 _random;
  std::vector<std::string> _words;
};

Vocabulary& vocabulary() {
  static Vocabulary words;
  return words;
}

const std::vector<searchkit::Document>& pages() {
  static const std::vector<searchkit::Document> all = [] {
    std::vector<searchkit::Document> made;
    for (int i = 0; i < pageCount; ++i) {
      searchkit::Document page;
      page.path = "/page" + std::to_string(i) + ".html";
      page.title = vocabulary().next() + " " + vocabulary().next();
      page.abstract = "About " + *page.title;
      std::string text;
      for (int word = 0; word < wordsPerPage; ++word) {
        text += vocabulary().next() + (word % 12 == 11 ? ". " : " ");
      }
      page.body.push_back(std::move(text));
      made.push_back(std::move(page));
    }
    return made;
  }();
  return all;
}

int64_t textLength() {
  int64_t length = 0;
  for (const searchkit::Document& page : pages()) {
    length += static_cast<int64_t>(page.body[0].size() + page.title->size());
  }
  return length;
}

platform::Data build() {
  searchkit::IndexWriter writer;
  for (const searchkit::Document& page : pages()) {
    writer.add(page);
  }
  return writer.finish();
}

const platform::Data& indexBytes() {
  static const platform::Data data = build();
  return data;
}

void BM_tokenize(benchmark::State& state) {
  searchkit::Tokenizer tokenizer;
  size_t count = 0;
  while (state.KeepRunning()) {
    for (const searchkit::Document& page : pages()) {
      tokenizer.tokenize(page.body[0], [&](std::string_view term, bool) { count += term.size(); });
    }
  }
  benchmark::DoNotOptimize(count);
  state.SetBytesProcessed(state.iterations() * textLength());
}
BENCHMARK(BM_tokenize)->Unit(benchmark::kMillisecond);

void BM_build(benchmark::State& state) {
  pages();
  while (state.KeepRunning()) {
    benchmark::DoNotOptimize(build().length());
  }
  state.SetBytesProcessed(state.iterations() * textLength());
  state.counters["index/text"] =
      static_cast<double>(indexBytes().length()) / static_cast<double>(textLength());
}
BENCHMARK(BM_build)->Unit(benchmark::kMillisecond);

void BM_open(benchmark::State& state) {
  const platform::Data& data = indexBytes();
  while (state.KeepRunning()) {
    benchmark::DoNotOptimize(SKIndexOpenWithData(data));
  }
}
BENCHMARK(BM_open);

void BM_verify(benchmark::State& state) {
  const SKIndexRef index = SKIndexOpenWithData(indexBytes());
  while (state.KeepRunning()) {
    benchmark::DoNotOptimize(SKIndexVerifyChecksums(index));
  }
  state.SetBytesProcessed(state.iterations() * static_cast<int64_t>(indexBytes().length()));
}
BENCHMARK(BM_verify)->Unit(benchmark::kMicrosecond);

void runQuery(benchmark::State& state, const std::string& query, SKSearchOptions options) {
  const SKIndexRef index = SKIndexOpenWithData(indexBytes());
  size_t total = 0;
  while (state.KeepRunning()) {
    total = 0;
    const SKSearchRef search = SKSearchCreate(index, query, options);
    for (bool mayHaveMore = true; mayHaveMore;) {
      SKDocumentID ids[50];
      float scores[50];
      size_t count = 0;
      mayHaveMore = SKSearchFindMatches(*search, 50, ids, scores, 1.0, &count);
      total += count;
    }
  }
  state.counters["hits"] = static_cast<double>(total);
}

void BM_oneWord(benchmark::State& state) {
  runQuery(state, vocabulary().word(40) + "* ", kSKSearchOptionDefault);
}
BENCHMARK(BM_oneWord)->Unit(benchmark::kMicrosecond);

void BM_twoWords(benchmark::State& state) {
  runQuery(state, vocabulary().word(40) + "* " + vocabulary().word(300) + "* ",
           kSKSearchOptionDefault);
}
BENCHMARK(BM_twoWords)->Unit(benchmark::kMicrosecond);

void BM_twoWordsExact(benchmark::State& state) {
  runQuery(state, vocabulary().word(40) + " +" + vocabulary().word(300), kSKSearchOptionDefault);
}
BENCHMARK(BM_twoWordsExact)->Unit(benchmark::kMicrosecond);

void BM_twoWordsOr(benchmark::State& state) {
  runQuery(state, vocabulary().word(40) + "* " + vocabulary().word(300) + "* ",
           kSKSearchOptionSpaceMeansOR);
}
BENCHMARK(BM_twoWordsOr)->Unit(benchmark::kMicrosecond);

void BM_threeLetterPrefixes(benchmark::State& state) {
  runQuery(state, "que* set* ", kSKSearchOptionDefault);
}
BENCHMARK(BM_threeLetterPrefixes)->Unit(benchmark::kMicrosecond);

void BM_oneLetterPrefix(benchmark::State& state) { runQuery(state, "p* ", kSKSearchOptionDefault); }
BENCHMARK(BM_oneLetterPrefix)->Unit(benchmark::kMicrosecond);

void BM_pattern(benchmark::State& state) { runQuery(state, "*work*", kSKSearchOptionDefault); }
BENCHMARK(BM_pattern)->Unit(benchmark::kMicrosecond);

void BM_phrase(benchmark::State& state) {
  runQuery(state, "\"" + vocabulary().word(3) + " " + vocabulary().word(10) + "\"",
           kSKSearchOptionDefault);
}
BENCHMARK(BM_phrase)->Unit(benchmark::kMicrosecond);

}  // namespace
