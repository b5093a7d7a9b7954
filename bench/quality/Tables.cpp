#include "bench/quality/Tables.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <iterator>

namespace quality {

namespace {

constexpr std::array<const char*, 5> engineNames = {ours, xapian, xapianTitles, sqlite, bm25};

/// What nDCG@10 has to reach.
double goalOf(const std::string& name) {
  static const std::map<std::string, double> goals = {
      {"cran", .475},         {"cisi", .415},
      {"cacm", .52},          {"libreoffice-keywords", .67},
      {"gimp-keywords", .81}, {"gnome-titles", .805},
      {"python-titles", .57}, {"gnome-descriptions", .815}};
  const auto goal = goals.find(name);
  return goal == goals.end() ? 0 : goal->second;
}

std::string shortNumber(double number) {
  std::string text = fmt::format("{:.3f}", number);
  if (text.starts_with("0.")) {
    text.erase(0, 1);
  } else if (text.starts_with("-0.")) {
    text.erase(1, 1);
  }
  return text;
}

const Measured& engine(const Result& result, const char* name) { return result.engines.at(name); }

const char* bestPeer(const Result& result) {
  const char* best = xapian;
  for (const char* name : {xapianTitles, sqlite}) {
    if (engine(result, name).metrics.ndcg10 > engine(result, best).metrics.ndcg10) {
      best = name;
    }
  }
  return best;
}

std::string rankingTable(const std::vector<Result>& results) {
  std::string text =
      "| collection | pages | queries | Luxwell | Xapian | Xapian, titles ×4 | SQLite FTS5 | BM25 "
      "| "
      "goal | over best peer | p | over BM25 | p |\n"
      "|---|---:|---:|---:|---:|---:|---:|---:|---:|---:|---:|---:|---:|\n";
  std::map<std::string, double> sums;
  for (const Result& result : results) {
    const Measured& own = engine(result, ours);
    const Measured& peer = engine(result, bestPeer(result));
    const Measured& plain = engine(result, bm25);
    text += fmt::format("| {} | {} | {} ", result.name, result.documentCount, result.queryCount);
    for (const char* name : engineNames) {
      const double value = engine(result, name).metrics.ndcg10;
      sums[name] += value;
      text += fmt::format("| {} ", shortNumber(value));
    }
    const double goal = goalOf(result.name);
    text += fmt::format("| {} | {} | {} | {} | {} |\n", goal > 0 ? shortNumber(goal) : "",
                        shortNumber(own.metrics.ndcg10 - peer.metrics.ndcg10),
                        shortNumber(randomisationTest(own.perQuery, peer.perQuery)),
                        shortNumber(own.metrics.ndcg10 - plain.metrics.ndcg10),
                        shortNumber(randomisationTest(own.perQuery, plain.perQuery)));
  }
  const auto count = static_cast<double>(std::max<size_t>(1, results.size()));
  const double bestMean = std::max({sums[xapian], sums[xapianTitles], sums[sqlite]}) / count;
  text += "| **mean** | | ";
  for (const char* name : engineNames) {
    text += fmt::format("| {} ", shortNumber(sums[name] / count));
  }
  text += fmt::format("| | {} | | {} | |\n", shortNumber(sums[ours] / count - bestMean),
                      shortNumber((sums[ours] - sums[bm25]) / count));
  return text;
}

std::string otherMeasuresTable(const std::vector<Result>& results) {
  std::string text = "| collection ";
  for (const char* measure : {"MAP", "Recall@100", "reciprocal rank"}) {
    for (const char* name : {ours, xapian, sqlite, bm25}) {
      text += fmt::format("| {} {} ", measure, name);
    }
  }
  text += "|\n|---";
  for (int i = 0; i < 12; ++i) {
    text += "|---:";
  }
  text += "|\n";
  for (const Result& result : results) {
    text += fmt::format("| {} ", result.name);
    for (double Metrics::*measure : {&Metrics::map, &Metrics::recall100, &Metrics::mrr}) {
      for (const char* name : {ours, xapian, sqlite, bm25}) {
        text += fmt::format("| {} ", shortNumber(engine(result, name).metrics.*measure));
      }
    }
    text += "|\n";
  }
  return text;
}

std::string checksTable(const std::vector<Result>& results) {
  std::string text =
      "| collection | exact titles first with 1.0 | everyday questions answered | questions on "
      "other "
      "subjects answered | own answers lost |\n|---|---:|---:|---:|---:|\n";
  for (const Result& result : results) {
    text += fmt::format("| {} ", result.name);
    text += result.titles.total == 0
                ? "| "
                : fmt::format("| {} of {} ", result.titles.count, result.titles.total);
    // The foreign questions are English.
    text += result.language == "en"
                ? fmt::format("| {:.1f} % | {:.1f} % ", result.everyday.foreign.percent(),
                              result.foreign.foreign.percent())
                : "| | ";
    text += fmt::format("| {:.1f} % |\n", result.foreign.lost.percent());
  }
  return text;
}

std::string typingTable(const std::vector<Result>& results) {
  std::string text =
      "| collection | queries | whole | half of the last word | two letters of it |\n"
      "|---|---:|---:|---:|---:|\n";
  Typed sum;
  const auto addRow = [&text](const std::string& name, const std::string& count,
                              const Typed& typed) {
    text += fmt::format("| {} | {} | {} | {} | {} |\n", name, count, shortNumber(typed.whole),
                        shortNumber(typed.half), shortNumber(typed.twoLetters));
  };
  for (const Result& result : results) {
    const Typed& typed = result.typed;
    addRow(result.name, std::to_string(typed.count), typed);
    const auto share = 1 / static_cast<double>(results.size());
    sum.whole += share * typed.whole;
    sum.half += share * typed.half;
    sum.twoLetters += share * typed.twoLetters;
  }
  addRow("**mean**", "", sum);
  return text;
}

std::string suggestionsTable(const std::vector<Result>& results) {
  std::string text =
      "| collection | phrases | completed after four letters | by frequency | similar searches | "
      "by "
      "phrase vectors | similar, no word shared | by phrase vectors |\n"
      "|---|---:|---:|---:|---:|---:|---:|---:|\n";
  for (const Result& result : results) {
    const auto completion = [&result](double rank) {
      return result.completions.count == 0 ? std::string() : shortNumber(rank);
    };
    text += fmt::format(
        "| {} | {} | {} | {} | {} | {} | {} | {} |\n", result.name, result.completions.count,
        completion(result.completions.ours), completion(result.completions.other),
        shortNumber(result.similar.ours), shortNumber(result.similar.other),
        shortNumber(result.similarOtherWords.ours), shortNumber(result.similarOtherWords.other));
  }
  return text;
}

std::string originList(const std::vector<Result>& results) {
  std::string text;
  for (const Result& result : results) {
    text += fmt::format("* {}: {}{}\n", result.name,
                        result.origin.empty() ? "given as a folder" : result.origin,
                        result.detectedLanguage == result.language
                            ? ""
                            : fmt::format(" (language taken for {})", result.detectedLanguage));
  }
  return text;
}

}  // namespace

std::string tables(const std::vector<Result>& results, bool withChecks) {
  std::string text = "### nDCG@10\n\n" + rankingTable(results) + "\n### Other measures\n\n" +
                     otherMeasuresTable(results) + "\n### Words still being typed\n\n" +
                     typingTable(results);
  if (withChecks) {
    text += "\n### Titles and foreign questions\n\n" + checksTable(results) +
            "\n### Suggestions\n\n" + suggestionsTable(results);
  }
  return text + "\n### Where the pages come from\n\n" + originList(results);
}

}  // namespace quality
