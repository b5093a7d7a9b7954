#include "bench/pipeline/PluginQuality.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdio>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <stdexcept>
#include <utility>

#include "bench/pipeline/PluginWorld.h"
#include "bench/quality/IndexedBook.h"
#include "bench/quality/Metrics.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/LUXHit.h"
#include "host/Luxwell/LUXQuery.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Strings.h"
#include "platform/URL.h"

namespace pipeline {

namespace {

namespace fs = std::filesystem;
using quality::Collection;
using quality::Metrics;
using quality::Ranking;

constexpr size_t rankingDepth = 1000;
/// As many as the plug-in asks for.
constexpr size_t pluginDepth = 50;

std::string shortNumber(double number) {
  std::string text = fmt::format("{:.3f}", number);
  const size_t zero = text.find("0.");
  if (zero == 0 || (zero == 1 && text[0] == '-')) {
    text.erase(zero, 1);
  }
  return text;
}

std::string pathOfResult(const ZEBResult& result) {
  const auto url = platform::URL::URLWithString(
      result.payloadValueForKey(ZEBResultURLKey).stringValue().value_or(""));
  return url ? url->path() : std::string();
}

struct Measured {
  Metrics metrics;
  std::vector<double> perQuery;
};

using Search = std::function<Ranking(const std::string& text)>;

Measured measured(const Collection& collection, const Search& search) {
  std::vector<Ranking> rankings;
  for (const quality::Query& query : collection.queries) {
    rankings.push_back(search(query.text));
  }
  Measured result;
  result.metrics = metricsOfRankings(collection, rankings, &result.perQuery);
  return result;
}

Ranking rankingOfDelivery(const Delivery& delivery) {
  Ranking ranking;
  for (const auto& record : delivery.records) {
    ranking.push_back(
        quality::documentOfBookPageName(fs::path(pathOfResult(*record)).filename().native()));
  }
  return ranking;
}

struct CollectionResult {
  std::string name;
  Measured merged;
  Measured framework;
  /// As far as the plug-in asks it.
  Measured frameworkPart;
  Measured keyword;
};

CollectionResult measuredCollection(const Collection& collection, const fs::path& folder) {
  const quality::IndexedBook indexed(collection, folder / "book");
  // The index lies beside the pages, as in an installed book.
  const Book book{"org.zeb.bench." + collection.name, folder / "book/pages/book.helpindex"};
  fs::copy_file(indexed.indexFile(), book.indexFile);
  const PluginWorld world(folder / "caches", collection.language);
  const PluginHost both({book}, true);
  const PluginHost keywordAlone({book}, false);
  const auto engine = luxwellEngine(indexed);
  CollectionResult result;
  result.name = collection.name;
  const auto through = [](const PluginHost& host) {
    return [&host](const std::string& text) {
      return rankingOfDelivery(host.search(text, {ZEBHelpArticleResult}));
    };
  };
  result.merged = measured(collection, through(both));
  result.keyword = measured(collection, through(keywordAlone));
  const auto framework = [&](size_t depth) {
    return [&engine, depth](const std::string& text) { return engine->search(text, depth); };
  };
  result.framework = measured(collection, framework(rankingDepth));
  result.frameworkPart = measured(collection, framework(pluginDepth));
  return result;
}

std::string rowOfCollection(const CollectionResult& result) {
  const Metrics& merged = result.merged.metrics;
  const Metrics& framework = result.framework.metrics;
  const Metrics& part = result.frameworkPart.metrics;
  const Metrics& keyword = result.keyword.metrics;
  std::string row = fmt::format("| {} ", result.name);
  for (const double value :
       {merged.ndcg10, framework.ndcg10, keyword.ndcg10, merged.ndcg10 - framework.ndcg10,
        quality::randomisationTest(result.merged.perQuery, result.framework.perQuery), merged.mrr,
        framework.mrr, keyword.mrr, merged.map, part.map, framework.map, keyword.map,
        merged.recall100, part.recall100, framework.recall100, keyword.recall100}) {
    row += "| " + shortNumber(value) + " ";
  }
  return row + "|\n";
}

// Known pages.

struct InstalledBook {
  const char* bookID;
  const char* folder;
  /// The language that the package says; pages of programs have names in all of them.
  std::vector<const char*> collections;
};

const std::vector<InstalledBook>& installedBooks() {
  static const std::vector<InstalledBook> books = {
      {"libreoffice",
       "usr/share/libreoffice/help/en-US/text",
       {"libreoffice-titles", "libreoffice-keywords"}},
      {"gimp", "usr/share/gimp/2.0/help/en", {"gimp-titles", "gimp-keywords"}},
      {"gnome", "usr/share/help/C", {"gnome-titles", "gnome-descriptions"}},
      {"python", "usr/share/doc/python3.11/html", {"python-titles"}},
      {"postgresql",
       "usr/share/doc/postgresql-doc-15/html",
       {"postgresql-titles", "postgresql-keywords"}},
      {"apache", "usr/share/doc/apache2-doc/manual/en", {"apache-titles"}},
  };
  return books;
}

struct KnownPages {
  double first = 0;
  double firstTen = 0;
  double reciprocalRank = 0;

  void add(size_t rank, size_t total) {
    const double share = 1 / static_cast<double>(total);
    first += rank == 1 ? share : 0;
    firstTen += rank >= 1 && rank <= 10 ? share : 0;
    reciprocalRank += rank >= 1 ? share / static_cast<double>(rank) : 0;
  }
  std::string cells() const {
    return fmt::format("| {:.1f} % | {:.1f} % | {} ", first * 100, firstTen * 100,
                       shortNumber(reciprocalRank));
  }
};

/// 0 when the page is not there.
size_t rankOfPage(const std::vector<std::string>& pages, const std::string& wanted) {
  const auto found = std::find(pages.begin(), pages.end(), wanted);
  return found == pages.end() ? 0 : static_cast<size_t>(found - pages.begin()) + 1;
}

class Hits : public LUXQueryDelegate {
 public:
  void queryDidFinishWithResults(const std::shared_ptr<LUXQuery>& /*query*/,
                                 const std::vector<std::shared_ptr<LUXHit>>& results) override {
    hits = results;
  }
  std::vector<std::shared_ptr<LUXHit>> hits;
};

/// Pages by meaning alone, as "book/path".
std::vector<std::string> pagesByMeaning(const std::shared_ptr<HelpLUXModel>& model,
                                        const std::string& text) {
  const auto answer = std::make_shared<Hits>();
  const auto query =
      LUXQuery::initWithString(text, std::nullopt, rankingDepth, answer, model, nullptr);
  query->setQueryType(LUXQueryTypeArticles);
  query->run();
  std::vector<std::string> pages;
  for (const auto& hit : answer->hits) {
    pages.push_back(hit->book() + "/" + hit->path().value());
  }
  return pages;
}

}  // namespace

std::string collectionTables(const std::vector<Collection>& collections, const fs::path& work) {
  std::string text =
      "| collection | nDCG@10 plug-in | framework | keywords | plug-in over framework | p "
      "| RR plug-in | framework | keywords "
      "| MAP plug-in | framework, 50 | framework | keywords "
      "| Recall@100 plug-in | framework, 50 | framework | keywords |\n|---";
  for (int i = 0; i < 16; ++i) {
    text += "|---:";
  }
  text += "|\n";
  for (const Collection& collection : collections) {
    const fs::path folder = work / "collection";
    const CollectionResult result = measuredCollection(collection, folder);
    fs::remove_all(folder);
    text += rowOfCollection(result);
    std::fprintf(stderr, "%s: plug-in %.3f framework %.3f keywords %.3f\n", result.name.c_str(),
                 result.merged.metrics.ndcg10, result.framework.metrics.ndcg10,
                 result.keyword.metrics.ndcg10);
  }
  return text;
}

std::string knownPageTable(const std::vector<Collection>& collections, const fs::path& packages,
                           const fs::path& work) {
  const fs::path folder = work / "installed";
  std::vector<Book> books;
  for (const InstalledBook& installed : installedBooks()) {
    const fs::path index = folder / installed.bookID / "book.helpindex";
    fs::create_directories(index.parent_path());
    makeIndex(packages / installed.folder, index, "en");
    books.push_back({installed.bookID, index});
  }
  const PluginWorld world(folder / "caches", "en");
  const PluginHost both(books, true);
  const PluginHost keywordAlone(books, false);
  const auto model = world.model();

  std::map<std::string, size_t> timesAsked;
  for (const Collection& collection : collections) {
    std::set<std::string> texts;
    for (const quality::Query& query : collection.queries) {
      texts.insert(platform::lowercaseString(query.text));
    }
    for (const std::string& text : texts) {
      ++timesAsked[text];
    }
  }
  const std::string root = folder.string() + "/";
  const auto pagesOf = [&root](const Delivery& delivery) {
    std::vector<std::string> pages;
    for (const auto& record : delivery.records) {
      const std::string path = pathOfResult(*record);
      pages.push_back(path.starts_with(root) ? path.substr(root.size()) : path);
    }
    return pages;
  };
  std::string text =
      "| looked for by | queries | plug-in, all books: first | in the first ten | RR "
      "| its own book: first | in the first ten | RR | framework, all books: first "
      "| in the first ten | RR | keywords, all books: first | in the first ten | RR |\n|---";
  for (int i = 0; i < 13; ++i) {
    text += "|---:";
  }
  text += "|\n";
  for (const InstalledBook& installed : installedBooks()) {
    for (const char* name : installed.collections) {
      const auto collection =
          std::find_if(collections.begin(), collections.end(),
                       [&](const Collection& candidate) { return candidate.name == name; });
      if (collection == collections.end()) {
        continue;
      }
      std::vector<const quality::Query*> queries;
      for (const quality::Query& query : collection->queries) {
        if (timesAsked[platform::lowercaseString(query.text)] == 1) {
          queries.push_back(&query);
        }
      }
      KnownPages merged;
      KnownPages ownBook;
      KnownPages framework;
      KnownPages keyword;
      for (const quality::Query* query : queries) {
        const size_t document = collection->answers.at(query->id).begin()->first;
        const std::string wanted =
            std::string(installed.bookID) + "/" + collection->documents[document].id;
        const std::vector<std::string> articles = {ZEBHelpArticleResult};
        merged.add(rankOfPage(pagesOf(both.search(query->text, articles)), wanted), queries.size());
        ownBook.add(
            rankOfPage(pagesOf(both.search(query->text, articles, {installed.bookID})), wanted),
            queries.size());
        framework.add(rankOfPage(pagesByMeaning(model, query->text), wanted), queries.size());
        keyword.add(rankOfPage(pagesOf(keywordAlone.search(query->text, articles)), wanted),
                    queries.size());
      }
      text += fmt::format("| {} | {} {}{}{}{}|\n", name, queries.size(), merged.cells(),
                          ownBook.cells(), framework.cells(), keyword.cells());
      std::fprintf(stderr, "known pages, %s: plug-in %.3f framework %.3f keywords %.3f\n", name,
                   merged.reciprocalRank, framework.reciprocalRank, keyword.reciprocalRank);
    }
  }
  return text;
}

}  // namespace pipeline
