#include "tests/Luxwell/LUXModelWorld.h"

#include <random>
#include <set>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXIndexWriter.h"

namespace tests {

std::vector<LUXTokenCounts> countsOfPages(const std::vector<ModelPage>& pages,
                                          const std::string& language) {
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage(language);
  std::map<std::string, LUXIndexWriter> writers;
  for (size_t i = 0; i < pages.size(); ++i) {
    LUXDocument document;
    document.key = std::to_string(i);
    document.title = pages[i].title;
    document.blocks = {pages[i].body};
    writers.try_emplace(pages[i].book, tokenizer).first->second.addDocument(document);
  }
  std::map<std::string, std::shared_ptr<HelpLUXIndex>> indexes;
  for (auto& [book, writer] : writers) {
    indexes[book] = HelpLUXIndex::initWithVersionedData(writer.finish());
  }
  std::vector<LUXTokenCounts> counts;
  for (size_t i = 0; i < pages.size(); ++i) {
    counts.push_back(indexes[pages[i].book]->tokenCountsForKey(std::to_string(i)));
  }
  return counts;
}

platform::Data modelOfPages(const std::vector<ModelPage>& pages, size_t threadCount,
                            const platform::Value& options, const std::string& language) {
  const std::vector<LUXTokenCounts> counts = countsOfPages(pages, language);
  LUXModelTrainer trainer(language);
  for (size_t i = 0; i < pages.size(); ++i) {
    trainer.addPage(counts[i],
                    pages[i].key.empty() ? std::nullopt : std::optional<std::string>(pages[i].key),
                    std::nullopt, pages[i].book);
  }
  return trainer.finish(options, threadCount);
}

void addPages(HelpLUXModel& model, const std::vector<ModelPage>& pages) {
  const std::vector<LUXTokenCounts> counts = countsOfPages(pages);
  for (size_t i = 0; i < pages.size(); ++i) {
    model.addTokenCounts(
        counts[i], pages[i].key.empty() ? std::nullopt : std::optional<std::string>(pages[i].key),
        std::nullopt, pages[i].book);
  }
}

std::shared_ptr<const LUXModelView> viewOfPages(const std::vector<ModelPage>& pages) {
  return LUXModelView::viewWithData(modelOfPages(pages));
}

std::vector<ModelPage> randomModelPages(size_t count, size_t wordCount, unsigned seed) {
  // NOLINTNEXTLINE(cert-msc32-c,cert-msc51-cpp): the same pages each time.
  std::mt19937 random(seed);
  const auto word = [&random] {
    // Twice the lesser of two makes low numbers frequent. No word is a stop word or bends into
    // another.
    const auto number = std::min(random() % 120, random() % 120);
    return std::string("w") + static_cast<char>('a' + number % 10) +
           static_cast<char>('k' + number / 10) + "x";
  };
  std::vector<ModelPage> pages;
  for (size_t i = 0; i < count; ++i) {
    ModelPage page;
    page.book = random() % 2 == 0 ? "first" : "second";
    page.key = i % 8 == 7 ? std::string() : "pages/" + std::to_string(i) + ".html";
    for (size_t words = random() % 4; words > 0; --words) {
      page.title += (page.title.empty() ? "" : " ") + word();
    }
    for (size_t words = 0; words < wordCount; ++words) {
      page.body += (page.body.empty() ? "" : " ") + word() + (random() % 9 == 0 ? "," : "");
    }
    pages.push_back(std::move(page));
  }
  return pages;
}

std::vector<ModelPage> samplePages() {
  return {
      {"org.zeb.first", "a.html", "Print queue", "The print queue shows what the printer does."},
      {"org.zeb.first", "b.html", "Clear the print queue", "Open the print queue, and clear it."},
      {"org.zeb.second", "c.html", "Printers", "A printer takes paper and a print queue."},
      {"org.zeb.second", "", "", "Paper and ink for every printer."},
      {"org.zeb.first", "d.html", "Networks", "A network joins computers."},
  };
}

}  // namespace tests
