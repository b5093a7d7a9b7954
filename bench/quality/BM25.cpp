#include <algorithm>
#include <cmath>
#include <string>
#include <unordered_map>
#include <vector>

#include "bench/quality/IndexedBook.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/LUXQueryTerms.h"

namespace quality {

namespace {

constexpr double saturation = 1.2;
constexpr double lengthShare = 0.75;

class BM25Engine : public Engine {
 public:
  explicit BM25Engine(const IndexedBook& book)
      : _book(book), _lengths(book.collection().documents.size()) {
    const HelpLUXIndex& index = *book.luxIndex();
    LUXTokenCounts counts;
    double total = 0;
    for (const std::string& key : index.documentKeys()) {
      const size_t document = documentOfBookPageName(key);
      counts = index.tokenCountsForKey(key);
      for (size_t i = 0; i < counts.size(); ++i) {
        const LUXTokenCount token = counts[i];
        if (token.kind == LUXTokenKind::stem) {
          const double count = static_cast<double>(token.titleCount) + token.bodyCount;
          _postings[std::string(token.token)].push_back({document, count});
          _lengths[document] += count;
          total += count;
        }
      }
    }
    _averageLength = total / static_cast<double>(_lengths.size());
  }

  Ranking search(const std::string& query, size_t count) override {
    const LUXQueryTerms terms = LUXQueryTerms::termsOfText(_book.tokenizer(), query, {});
    std::vector<double> scores(_lengths.size());
    Ranking ranking;
    for (const LUXQueryTerms::Term& term : terms.stems) {
      const auto postings = _postings.find(term.token);
      if (postings == _postings.end()) {
        continue;
      }
      const auto frequency = static_cast<double>(postings->second.size());
      const double rest = static_cast<double>(_lengths.size()) - frequency;
      const double weight = term.count * std::log1p((rest + 0.5) / (frequency + 0.5));
      for (const Posting& posting : postings->second) {
        if (scores[posting.document] == 0) {
          ranking.push_back(posting.document);
        }
        const double length =
            1 - lengthShare + lengthShare * _lengths[posting.document] / _averageLength;
        scores[posting.document] += weight * posting.count / (posting.count + saturation * length);
      }
    }
    std::sort(ranking.begin(), ranking.end(), [&scores](size_t a, size_t b) {
      return scores[a] != scores[b] ? scores[a] > scores[b] : a < b;
    });
    ranking.resize(std::min(ranking.size(), count));
    return ranking;
  }

 private:
  struct Posting {
    size_t document;
    double count;
  };

  const IndexedBook& _book;
  std::unordered_map<std::string, std::vector<Posting>> _postings;
  std::vector<double> _lengths;
  double _averageLength = 0;
};

}  // namespace

std::unique_ptr<Engine> bm25Engine(const IndexedBook& book) {
  return std::make_unique<BM25Engine>(book);
}

}  // namespace quality
