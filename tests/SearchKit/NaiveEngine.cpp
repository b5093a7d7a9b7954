#include "tests/SearchKit/NaiveEngine.h"

#include <algorithm>
#include <cmath>
#include <map>

namespace searchkit::testing {
namespace {

DocumentNumbers common(const DocumentNumbers& a, const DocumentNumbers& b) {
  DocumentNumbers both;
  for (const size_t document : a) {
    if (b.contains(document)) {
      both.insert(document);
    }
  }
  return both;
}

DocumentNumbers without(const DocumentNumbers& a, const DocumentNumbers& b) {
  DocumentNumbers rest;
  for (const size_t document : a) {
    if (!b.contains(document)) {
      rest.insert(document);
    }
  }
  return rest;
}

void addTo(DocumentNumbers& a, const DocumentNumbers& b) { a.insert(b.begin(), b.end()); }

bool hasPhrase(const Words& words, const Words& patterns) {
  for (size_t begin = 0; begin + patterns.size() <= words.size(); ++begin) {
    size_t i = 0;
    while (i < patterns.size() && naiveMatch(patterns[i], words[begin + i])) {
      ++i;
    }
    if (i == patterns.size()) {
      return true;
    }
  }
  return false;
}

bool hasPhrase(const NaiveDocument& document, const Words& patterns) {
  const auto has = [&](const Words& words) { return hasPhrase(words, patterns); };
  return has(document.title) ||
         std::any_of(document.headings.begin(), document.headings.end(), has) ||
         std::any_of(document.body.begin(), document.body.end(), has);
}

std::string join(const Words& words, const std::string& between) {
  std::string text;
  for (const std::string& word : words) {
    text += (text.empty() ? "" : between) + word;
  }
  return text;
}

}  // namespace

bool naiveMatch(std::string_view pattern, std::string_view word) {
  if (pattern.empty()) {
    return word.empty();
  }
  if (pattern[0] == '*') {
    return naiveMatch(pattern.substr(1), word) ||
           (!word.empty() && naiveMatch(pattern, word.substr(1)));
  }
  return !word.empty() && pattern[0] == word[0] && naiveMatch(pattern.substr(1), word.substr(1));
}

DocumentNumbers NaiveEngine::_documentsWith(const Words& patterns) const {
  DocumentNumbers found;
  for (size_t document = 0; document < _documents.size(); ++document) {
    if (hasPhrase(_documents[document], patterns)) {
      found.insert(document);
    }
  }
  return found;
}

DocumentNumbers NaiveEngine::find(const NaiveQuery& query) const {
  const Result result = _evaluate(query);
  return result.hasPositive ? result.found : DocumentNumbers{};
}

NaiveEngine::Result NaiveEngine::_evaluate(const NaiveQuery& query) const {
  Result result;
  if (!query.patterns.empty()) {
    result.hasPositive = true;
    result.found = _documentsWith(query.patterns);
    return result;
  }
  bool hasRequired = false;
  DocumentNumbers required;
  DocumentNumbers optional;
  for (size_t i = 0; i < query.alternatives.size(); ++i) {
    const auto& items = query.alternatives[i];
    bool hasPositive = false;
    DocumentNumbers all;
    DocumentNumbers excluded;
    for (const NaiveQuery::Item& item : items) {
      const Result part = _evaluate(item.query[0]);
      const bool isExcluded = item.sign == NaiveQuery::Sign::minus;
      const DocumentNumbers& set = part.hasPositive ? part.found : part.excluded;
      if (isExcluded == part.hasPositive) {
        addTo(excluded, set);
      } else {
        all = hasPositive ? common(all, set) : set;
        hasPositive = true;
      }
    }
    if (!hasPositive) {
      addTo(result.excluded, excluded);
      continue;
    }
    all = without(all, excluded);
    const bool isBesideBar = (i > 0 && query.separators[i - 1] == '|') ||
                             (i < query.separators.size() && query.separators[i] == '|');
    if (query.alternatives.size() > 1 && items.size() == 1 && !isBesideBar &&
        items[0].sign == NaiveQuery::Sign::plus) {
      required = hasRequired ? common(required, all) : all;
      hasRequired = true;
    } else {
      addTo(optional, all);
    }
    result.hasPositive = true;
  }
  if (result.hasPositive) {
    result.found = without(hasRequired ? required : optional, result.excluded);
    result.excluded.clear();
  }
  return result;
}

double NaiveEngine::score(const std::string& pattern, size_t document) const {
  // The word itself, where stars stand only around it.
  const size_t first = pattern.find_first_not_of('*');
  const std::string literal = pattern.substr(first, pattern.find_last_not_of('*') + 1 - first);
  double totalLength = 0;
  double length = 0;
  double frequency = 0;
  std::map<std::string, DocumentNumbers> documentsOfTerms;
  for (size_t i = 0; i < _documents.size(); ++i) {
    const auto take = [&](const Words& words, double weight) {
      totalLength += static_cast<double>(words.size());
      length += i == document ? static_cast<double>(words.size()) : 0;
      for (const std::string& word : words) {
        if (naiveMatch(pattern, word)) {
          documentsOfTerms[word].insert(i);
          frequency += i == document ? weight * (word == literal ? 1 : 0.25) : 0;
        }
      }
    };
    take(_documents[i].title, 10);
    for (const Words& heading : _documents[i].headings) {
      take(heading, 3);
    }
    for (const Words& block : _documents[i].body) {
      take(block, 1);
    }
  }
  const auto count = static_cast<double>(_documents.size());
  double having = 0;
  for (const auto& [term, documents] : documentsOfTerms) {
    having += static_cast<double>(documents.size());
  }
  having = std::min(having, count);
  const double idf = std::log(1 + (count - having + 0.5) / (having + 0.5));
  const double norm = 1.2 * (1 - 0.5 + 0.5 * length / std::max(1.0, totalLength / count));
  return idf * frequency * 2.2 / (frequency + norm);
}

std::string NaiveQuery::text(std::mt19937& random, bool blankMeansOr) const {
  if (patterns.size() == 1) {
    return random() % 4 == 0 ? "\"" + patterns[0] + "\"" : patterns[0];
  }
  if (!patterns.empty()) {
    return "\"" + join(patterns, random() % 2 == 0 ? " " : ", ") + "\"";
  }
  const auto blank = [&] { return std::string(random() % 3 == 0 ? "  " : " "); };
  std::string result;
  for (size_t i = 0; i < alternatives.size(); ++i) {
    if (i > 0) {
      const std::string bar = random() % 2 == 0 ? "|" : " | ";
      result += separators[i - 1] == '|' ? bar : blank();
    }
    for (size_t k = 0; k < alternatives[i].size(); ++k) {
      const Item& item = alternatives[i][k];
      if (k > 0) {
        result += blankMeansOr || random() % 3 == 0 ? " & " : blank();
      }
      if (item.sign == Sign::plus) {
        result += "+";
      } else if (item.sign == Sign::minus) {
        result += random() % 2 == 0 ? "-" : "!";
      }
      const NaiveQuery& query = item.query[0];
      const std::string inner = query.text(random, blankMeansOr);
      result += query.patterns.empty() ? "(" + inner + ")" : inner;
    }
  }
  return result;
}

}  // namespace searchkit::testing
