#include "tests/Luxwell/LUXNaiveScoring.h"

#include <algorithm>
#include <cmath>
#include <optional>

#include "host/Luxwell/LUXScoring.h"

namespace tests {

NaiveScoring::NaiveScoring(const QueryWorld& world) : _view(*world.view()) {
  std::map<std::pair<std::string, std::string>, uint32_t> numbers;
  for (uint32_t i = 0; i < _view.pageCount(); ++i) {
    numbers[{std::string(_view.bookID(_view.page(i).book)), std::string(_view.page(i).key)}] = i;
  }
  for (size_t i = 0; i < world.pages().size(); ++i) {
    const LUXTokenCounts& counts = world.counts()[i];
    if (counts.empty()) {
      continue;
    }
    Page page;
    const auto number = numbers.find({world.pages()[i].book, world.pages()[i].key});
    page.mayBeFound = number != numbers.end();
    page.number = page.mayBeFound ? number->second : 0;
    for (size_t token = 0; token < counts.size(); ++token) {
      const LUXTokenCount count = counts[token];
      page.counts[{count.kind, std::string(count.token)}] = count;
      page.lengths[count.kind].first += count.titleCount;
      page.lengths[count.kind].second += count.bodyCount;
    }
    for (const auto& [kind, lengths] : page.lengths) {
      _averages[kind].first += lengths.first;
      _averages[kind].second += lengths.second;
    }
    _pages.push_back(std::move(page));
  }
  for (auto& [kind, lengths] : _averages) {
    lengths.first /= static_cast<double>(_pages.size());
    lengths.second /= static_cast<double>(_pages.size());
  }
}

double NaiveScoring::_frequency(const Token& token) const {
  return static_cast<double>(std::count_if(
      _pages.begin(), _pages.end(), [&](const Page& page) { return page.counts.contains(token); }));
}

double NaiveScoring::_weightOfFrequency(double frequency) const {
  return std::log(1 + (static_cast<double>(_pages.size()) - frequency + 0.5) / (frequency + 0.5));
}

double NaiveScoring::_weight(const Token& token) const {
  return _weightOfFrequency(_frequency(token));
}

double NaiveScoring::_impact(const Page& page, const Token& token) const {
  const auto counts = page.counts.find(token);
  if (counts == page.counts.end()) {
    return 0;
  }
  const double titleCount = counts->second.titleCount;
  const double bodyCount = counts->second.bodyCount;
  const auto [titleLength, bodyLength] = page.lengths.at(token.first);
  const auto [averageTitle, averageBody] = _averages.at(token.first);
  const auto relative = [](double length, double average, double share, double exponent) {
    return average > 0 ? 1 - share + share * std::pow(length / average, exponent) : 1;
  };
  double count = 0;
  if (token.first == LUXTokenKind::bigram) {
    count = (titleCount + bodyCount) /
            relative(titleLength + bodyLength, averageTitle + averageBody,
                     luxmodel::bodyLengthShare, luxmodel::bodyLengthExponent);
  } else {
    count = luxmodel::titleWeight * titleCount /
                relative(titleLength, averageTitle, luxmodel::titleLengthShare,
                         luxmodel::titleLengthExponent) +
            bodyCount / relative(bodyLength, averageBody, luxmodel::bodyLengthShare,
                                 luxmodel::bodyLengthExponent);
  }
  const double early = 30.0 / (30 + counts->second.wordsBefore);
  return (count / (luxmodel::saturation + count) + 0.25 * early) / 1.25;
}

// The words that a half one may become: those that begin with it and are in no more than half of
// the pages.
std::set<std::string> NaiveScoring::_expansions(const LUXQueryTerms& terms,
                                                const std::string& stem) const {
  std::set<std::string> words;
  const bool isUnfinished = stem == terms.unfinishedStem;
  const std::string& prefix = isUnfinished ? terms.unfinishedForm : stem;
  if (prefix.size() < (isUnfinished ? 2U : 3U) || terms.onlyStopWords ||
      (!isUnfinished && (terms.stems.size() > 32 || _frequency({LUXTokenKind::stem, stem}) > 0))) {
    return words;
  }
  for (const Page& page : _pages) {
    for (const auto& entry : page.counts) {
      const auto& [kind, word] = entry.first;
      if (kind == LUXTokenKind::form && word.starts_with(prefix) &&
          2 * _frequency(entry.first) <= static_cast<double>(_view.totalPageCount())) {
        words.insert(word);
      }
    }
  }
  return words;
}

// The pages that have any of the forms, with the best that they have.
std::map<uint32_t, double> NaiveScoring::_pagesWithAny(const std::set<std::string>& forms) const {
  std::map<uint32_t, double> best;
  for (const Page& page : _pages) {
    for (const std::string& form : forms) {
      const double impact = _impact(page, {LUXTokenKind::form, form});
      if (page.mayBeFound && impact > 0) {
        best[page.number] = std::max(best[page.number], impact);
      }
    }
  }
  return best;
}

std::vector<double> NaiveScoring::_latent(const LUXQueryTerms& terms) const {
  std::vector<double> sum(_view.rank());
  for (const LUXQueryTerms::Term& stem : terms.stems) {
    const auto number = _view.termNumber(LUXTokenKind::stem, stem.token);
    if (const int8_t* vector = number ? _view.termVector(*number) : nullptr) {
      for (size_t i = 0; i < sum.size(); ++i) {
        sum[i] +=
            std::log2(1.0 + stem.count) * static_cast<double>(_view.termScale(*number)) * vector[i];
      }
    }
  }
  return sum;
}

size_t NaiveScoring::pagesWithWords(const LUXQueryTerms& terms) const {
  std::set<std::string> expansions;
  for (const LUXQueryTerms::Term& stem : terms.stems) {
    expansions.merge(_expansions(terms, stem.token));
  }
  return static_cast<size_t>(std::count_if(_pages.begin(), _pages.end(), [&](const Page& page) {
    return page.mayBeFound &&
           (std::any_of(terms.stems.begin(), terms.stems.end(),
                        [&](const auto& stem) {
                          return page.counts.contains({LUXTokenKind::stem, stem.token});
                        }) ||
            std::any_of(terms.forms.begin(), terms.forms.end(),
                        [&](const auto& form) {
                          return page.counts.contains({LUXTokenKind::form, form.token});
                        }) ||
            std::any_of(expansions.begin(), expansions.end(), [&](const auto& form) {
              return page.counts.contains({LUXTokenKind::form, form});
            }));
  }));
}

std::map<uint32_t, double> NaiveScoring::scores(const LUXQueryTerms& terms) const {
  const LUXTokenKind wordKind = terms.onlyStopWords ? LUXTokenKind::form : LUXTokenKind::stem;
  const auto& words = terms.onlyStopWords ? terms.forms : terms.stems;
  double all = 0;
  double known = 0;
  double bound = 0;
  std::map<uint32_t, Scored> scored;
  const auto add = [&](const Token& token, double weight) {
    bound += weight;
    for (const Page& page : _pages) {
      if (page.mayBeFound) {
        scored[page.number].lexical += weight * _impact(page, token);
      }
    }
  };
  for (const LUXQueryTerms::Term& word : words) {
    const Token token{wordKind, word.token};
    const double frequency = _frequency(token);
    std::map<uint32_t, double> longer = _pagesWithAny(_expansions(terms, word.token));
    if (frequency == 0 && !longer.empty()) {
      const double weight = _weightOfFrequency(static_cast<double>(longer.size()));
      all += word.token == terms.unfinishedStem ? weight : _weight(token);
      known += weight;
      bound += word.count * weight;
      for (const auto& [page, impact] : longer) {
        scored[page].lexical += word.count * weight * impact;
      }
      continue;
    }
    const double weight = _weight(token);
    all += weight;
    if (frequency == 0) {
      continue;
    }
    known += weight;
    add(token, word.count * weight);
    for (const Page& page : _pages) {
      if (page.mayBeFound && page.counts.contains(token)) {
        longer.erase(page.number);
      }
    }
    const auto others = static_cast<double>(longer.size());
    for (const auto& [page, impact] : longer) {
      scored[page].lexical +=
          word.count * 0.6 * others / (others + frequency) * _weightOfFrequency(others) * impact;
    }
  }
  if (!terms.onlyStopWords) {
    for (const LUXQueryTerms::Pair& bigram : terms.bigrams) {
      const Token token{LUXTokenKind::bigram,
                        terms.stems[bigram.first].token + ' ' + terms.stems[bigram.second].token};
      if (_frequency(token) > 0) {
        add(token, 0.2 * bigram.count * _weight(token));
      }
    }
    for (const LUXQueryTerms::Term& form : terms.forms) {
      const Token token{LUXTokenKind::form, form.token};
      if (_frequency(token) > 0) {
        add(token, 0.15 * form.count * _weight(token));
      }
    }
  }
  const std::vector<double> latent = terms.onlyStopWords ? std::vector<double>() : _latent(terms);
  double norm = 0;
  for (const double component : latent) {
    norm += component * component;
  }
  const double meaning =
      terms.onlyStopWords ? 0 : 0.2 * (1 - std::exp(-static_cast<double>(words.size()) / 6));
  std::map<uint32_t, double> scores;
  for (const Page& page : _pages) {
    if (!page.mayBeFound) {
      continue;
    }
    double cosine = 0;
    for (size_t i = 0; norm > 0 && i < latent.size(); ++i) {
      cosine += latent[i] / std::sqrt(norm) * _view.pageVector(page.number)[i] *
                static_cast<double>(_view.pageScale(page.number));
    }
    double score = (1 - meaning) * (bound > 0 ? scored[page.number].lexical / bound : 0) +
                   meaning * std::max(0.0, cosine);
    score *= all > 0 ? known / all * known / all : 0;
    if (terms.stems.size() >= 6) {
      score = score < 0.12 ? score / 0.12 * 0.2 : 0.2 + (score - 0.12) / 0.88 * 0.8;
    }
    score = std::min(score, 0.989);
    if (page.counts.contains({LUXTokenKind::title, terms.normalizedTitle})) {
      score = 1;
    }
    scores[page.number] = score;
  }
  return scores;
}

}  // namespace tests
