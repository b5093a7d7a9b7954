#include "bench/quality/Checks.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <map>
#include <set>
#include <unordered_map>

#include "bench/quality/IndexedBook.h"
#include "bench/quality/Metrics.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXDebugPreferences.h"
#include "host/Luxwell/LUXHit.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXPhraseScore.h"
#include "host/Luxwell/LUXQuery.h"
#include "host/Luxwell/LUXQueryTerms.h"

namespace quality {

namespace {

constexpr size_t suggestionCount = 50;

std::string foldedText(const IndexedBook& book, const std::string& text) {
  std::vector<HelpTokenizer::Word> words;
  book.tokenizer().wordsOfText(text, words);
  std::string result;
  for (const HelpTokenizer::Word& word : words) {
    HelpTokenizer::appendToDisplay(result, word.form);
  }
  return result;
}

std::set<std::string> stemsOf(const IndexedBook& book, const std::string& text) {
  std::set<std::string> stems;
  for (const auto& term : LUXQueryTerms::termsOfText(book.tokenizer(), text, {}).stems) {
    stems.insert(term.token);
  }
  return stems;
}

bool shareStem(const std::set<std::string>& a, const std::set<std::string>& b) {
  return std::any_of(a.begin(), a.end(),
                     [&b](const std::string& stem) { return b.contains(stem); });
}

/// The sum of the vectors of a text's stems, of unit length.
std::vector<float> vectorOf(const IndexedBook& book, const LUXModelView& view,
                            const std::string& text) {
  std::vector<float> sum(view.stride());
  for (const auto& term : LUXQueryTerms::termsOfText(book.tokenizer(), text, {}).stems) {
    const auto number = view.termNumber(LUXTokenKind::stem, term.token);
    const int8_t* vector = number ? view.termVector(*number) : nullptr;
    if (vector != nullptr) {
      const float scale = view.termScale(*number) * std::log2(1 + static_cast<float>(term.count));
      for (size_t i = 0; i < sum.size(); ++i) {
        sum[i] += scale * static_cast<float>(vector[i]);
      }
    }
  }
  float square = 0;
  for (const float value : sum) {
    square += value * value;
  }
  for (float& value : sum) {
    value /= std::sqrt(std::max(square, 1e-20F));
  }
  return sum;
}

/// Where each character of the query's last word ends, when nothing follows that word.
std::vector<size_t> endsInLastWord(const IndexedBook& book, const std::string& query) {
  std::vector<HelpTokenizer::Segment> segments;
  std::string buffer;
  book.tokenizer().segmentsOfText(query, segments, buffer);
  std::vector<size_t> ends;
  if (segments.empty() || !query.ends_with(segments.back().surface)) {
    return ends;
  }
  for (size_t i = query.size() - segments.back().surface.size(); i < query.size(); ++i) {
    const bool endsHere =
        i + 1 == query.size() || (static_cast<unsigned char>(query[i + 1]) & 0xC0U) != 0x80U;
    if (endsHere) {
      ends.push_back(i + 1);
    }
  }
  return ends;
}

}  // namespace

Typed unfinishedQueries(const IndexedBook& book) {
  constexpr size_t fewestLetters = 4;
  const auto engine = luxwellEngine(book);
  Typed result;
  for (const Query& query : book.collection().queries) {
    const std::vector<size_t> ends = endsInLastWord(book, query.text);
    if (ends.size() < fewestLetters) {
      continue;
    }
    const auto gain = [&](size_t length) {
      constexpr size_t depth = 10;
      return metricsOfRanking(engine->search(query.text.substr(0, length), depth),
                              book.collection().answers.at(query.id))
          .ndcg10;
    };
    ++result.count;
    result.whole += gain(query.text.size());
    result.half += gain(ends[(ends.size() + 1) / 2 - 1]);
    result.twoLetters += gain(ends[1]);
  }
  for (double* sum : {&result.whole, &result.half, &result.twoLetters}) {
    *sum /= static_cast<double>(std::max<size_t>(1, result.count));
  }
  return result;
}

Share exactTitles(const IndexedBook& book, std::vector<std::string>* failures) {
  Share share;
  const auto normalized = [&book](const std::string& title) {
    return book.tokenizer().tokenizedStringFromString(title);
  };
  for (const Document& document : book.collection().documents) {
    const std::string wanted = normalized(document.title);
    if (wanted.empty()) {
      continue;
    }
    ++share.total;
    const auto hits = book.hits(document.title, LUXQueryTypeArticles, 1);
    if (!hits.empty() && hits[0]->score() == 1.0F) {
      const size_t found = documentOfBookPageName(hits[0]->path().value());
      if (normalized(book.collection().documents[found].title) == wanted) {
        ++share.count;
        continue;
      }
    }
    if (failures != nullptr) {
      failures->push_back(document.title);
    }
  }
  return share;
}

CutOff cutOff(const IndexedBook& book, const std::vector<std::string>& foreignQueries) {
  const float threshold =
      LUXDebugPreferences::defaultDebugPreferences()->floatForKey(LUXResultCutoffThresholdKey);
  CutOff result;
  for (const std::string& query : foreignQueries) {
    const auto hits = book.hits(query, LUXQueryTypeArticles, 1);
    ++result.foreign.total;
    result.foreign.count += !hits.empty() && hits[0]->score() > threshold ? 1 : 0;
  }
  for (const Query& query : book.collection().queries) {
    const auto& answers = book.collection().answers.at(query.id);
    bool found = false;
    bool kept = false;
    for (const auto& hit : book.hits(query.text, LUXQueryTypeArticles, 10)) {
      if (answers.contains(documentOfBookPageName(hit->path().value()))) {
        found = true;
        kept = kept || hit->score() > threshold;
      }
    }
    ++result.lost.total;
    result.lost.count += found && !kept ? 1 : 0;
  }
  return result;
}

SuggestionRanks completions(const IndexedBook& book) {
  struct Counted {
    uint64_t frequency = 0;
    uint32_t pages = 0;
  };
  std::map<std::string, Counted> phrases;
  LUXTokenCounts counts;
  for (const std::string& key : book.luxIndex()->documentKeys()) {
    counts = book.luxIndex()->tokenCountsForKey(key);
    std::map<std::string, uint64_t> ofPage;
    for (size_t i = 0; i < counts.size(); ++i) {
      const LUXTokenCount token = counts[i];
      if (token.kind == LUXTokenKind::phrase) {
        ofPage[foldedText(book, std::string(token.token))] +=
            uint64_t{token.titleCount} + token.bodyCount;
      }
    }
    for (const auto& [phrase, frequency] : ofPage) {
      phrases[phrase].frequency += frequency;
      ++phrases[phrase].pages;
    }
  }
  // As many as the model has, the most frequent.
  std::vector<uint64_t> frequencies;
  for (const auto& [phrase, counted] : phrases) {
    if (counted.pages >= LUXPhraseMinimumPageCount) {
      frequencies.push_back(counted.frequency);
    }
  }
  std::sort(frequencies.begin(), frequencies.end(), std::greater<>());
  const auto view = book.model()->view();
  const size_t budget = view == nullptr ? 0 : view->phraseCount();
  const uint64_t leastFrequency =
      budget == 0 || budget > frequencies.size() ? 0 : frequencies[budget - 1];
  SuggestionRanks ranks;
  for (const Query& query : book.collection().queries) {
    const std::string wanted = foldedText(book, query.text);
    const auto known = phrases.find(wanted);
    if (known == phrases.end() || known->second.pages < LUXPhraseMinimumPageCount ||
        wanted.size() < 5) {
      continue;
    }
    const std::string typed = wanted.substr(0, 4);
    ++ranks.count;
    size_t rank = 1;
    for (const auto& hit : book.hits(typed, LUXQueryTypeCompletions, suggestionCount)) {
      if (foldedText(book, hit->title().value_or("")) == wanted) {
        ranks.ours += 1.0 / static_cast<double>(rank);
        break;
      }
      ++rank;
    }
    size_t before = 0;
    for (auto other = phrases.lower_bound(typed);
         other != phrases.end() && other->first.starts_with(typed); ++other) {
      before +=
          other->second.pages >= LUXPhraseMinimumPageCount &&
                  (other->second.frequency > known->second.frequency ||
                   (other->second.frequency == known->second.frequency && other->first < wanted))
              ? 1
              : 0;
    }
    if (before < suggestionCount && known->second.frequency >= leastFrequency) {
      ranks.other += 1.0 / static_cast<double>(before + 1);
    }
  }
  const auto total = static_cast<double>(std::max<size_t>(1, ranks.count));
  ranks.ours /= total;
  ranks.other /= total;
  return ranks;
}

SuggestionRanks similarSearches(const IndexedBook& book, bool otherWords) {
  const auto view = book.model()->view();
  SuggestionRanks ranks;
  if (view == nullptr) {
    return ranks;
  }
  struct Phrase {
    std::string text;
    std::set<std::string> stems;
    std::vector<float> vector;
    size_t answer = SIZE_MAX;
    bool asked = false;
  };
  std::vector<Phrase> phrases(view->phraseCount());
  std::unordered_map<std::string, Phrase*> byText;
  for (uint32_t i = 0; i < phrases.size(); ++i) {
    phrases[i].text = view->phraseText(i);
    phrases[i].stems = stemsOf(book, phrases[i].text);
    phrases[i].vector = vectorOf(book, *view, phrases[i].text);
    byText.emplace(phrases[i].text, &phrases[i]);
  }
  const auto finds = [&book](Phrase& phrase, const std::map<size_t, int>& answers) {
    if (!phrase.asked) {
      phrase.asked = true;
      // A blank: the phrase is not being typed any more.
      const auto hits = book.hits(phrase.text + ' ', LUXQueryTypeArticles, 1);
      if (!hits.empty()) {
        phrase.answer = documentOfBookPageName(hits[0]->path().value());
      }
    }
    return answers.contains(phrase.answer);
  };
  for (const Query& query : book.collection().queries) {
    const auto& answers = book.collection().answers.at(query.id);
    const std::set<std::string> stems = stemsOf(book, query.text);
    const auto counts = [&](const Phrase& phrase) {
      return phrase.stems != stems && !(otherWords && shareStem(phrase.stems, stems));
    };
    ++ranks.count;
    size_t rank = 0;
    for (const auto& hit : book.hits(query.text, LUXQueryTypeSimilar, suggestionCount)) {
      const auto phrase = byText.find(hit->title().value_or(""));
      if (phrase == byText.end() || !counts(*phrase->second)) {
        continue;
      }
      ++rank;
      if (finds(*phrase->second, answers)) {
        ranks.ours += 1.0 / static_cast<double>(rank);
        break;
      }
    }
    const std::vector<float> vector = vectorOf(book, *view, query.text);
    std::vector<std::pair<float, Phrase*>> nearest;
    for (Phrase& phrase : phrases) {
      if (counts(phrase)) {
        float product = 0;
        for (size_t i = 0; i < vector.size(); ++i) {
          product += vector[i] * phrase.vector[i];
        }
        nearest.emplace_back(-product, &phrase);
      }
    }
    const size_t kept = std::min(nearest.size(), suggestionCount);
    std::partial_sort(nearest.begin(), nearest.begin() + static_cast<std::ptrdiff_t>(kept),
                      nearest.end());
    for (size_t i = 0; i < kept; ++i) {
      if (finds(*nearest[i].second, answers)) {
        ranks.other += 1.0 / static_cast<double>(i + 1);
        break;
      }
    }
  }
  const auto total = static_cast<double>(std::max<size_t>(1, ranks.count));
  ranks.ours /= total;
  ranks.other /= total;
  return ranks;
}

}  // namespace quality
