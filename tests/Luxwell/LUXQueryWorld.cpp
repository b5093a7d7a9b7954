#include "tests/Luxwell/LUXQueryWorld.h"

#include <map>
#include <optional>
#include <random>
#include <stdexcept>
#include <utility>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/LUXIndexWriter.h"
#include "platform/Value.h"

namespace tests {

QueryWorld::QueryWorld(std::vector<QueryPage> pages, const std::string& language)
    : _pages(std::move(pages)), _tokenizer(HelpTokenizer::tokenizerForLanguage(language)) {
  std::vector<std::string> books;
  std::map<std::string, LUXIndexWriter> writers;
  for (const QueryPage& page : _pages) {
    const auto [writer, isNew] = writers.try_emplace(page.book, _tokenizer);
    if (isNew) {
      books.push_back(page.book);
    }
    LUXDocument document;
    document.key = page.key;
    document.title = page.title;
    document.blocks = page.blocks;
    document.excludedFromSearch = page.excludedFromSearch;
    writer->second.addDocument(document);
  }
  _model = HelpLUXModel::initWithDirectoryPath(modelPath(), language);
  _model->reset();
  std::map<std::string, std::shared_ptr<HelpLUXIndex>> indexes;
  for (const std::string& book : books) {
    const auto index = HelpLUXIndex::initWithVersionedData(writers.at(book).finish());
    _model->addHelpbookID(book);
    for (const std::string& key : index->documentKeys()) {
      const bool excluded =
          index->fileProperitesForKey(key)[HelpDocPropertyExcludeFromSearch].boolValue();
      _model->addTokenCounts(index->tokenCountsForKey(key),
                             excluded ? std::nullopt : std::optional<std::string>(key),
                             std::nullopt, book);
    }
    indexes.emplace(book, index);
  }
  for (const QueryPage& page : _pages) {
    _counts.push_back(indexes.at(page.book)->tokenCountsForKey(page.key));
  }
  if (!_model->saveWithOptions(platform::Value::Dictionary{})) {
    throw std::runtime_error("the model could not be saved");
  }
  _view = _model->view();
}

std::string vocabularyWord(size_t number) {
  // Made of syllables, so that no word is the beginning or an inflection of another.
  static constexpr const char* first[] = {"ba", "de", "fo", "gu", "ka", "lo", "mi",
                                          "no", "pu", "ra", "so", "ti", "vu", "za"};
  static constexpr const char* second[] = {"brak", "dron", "flub", "grom", "klop", "mant",
                                           "nork", "plim", "rund", "trok", "vlum", "zond"};
  return std::string(first[number % std::size(first)]) +
         second[number / std::size(first) % std::size(second)] +
         first[number / (std::size(first) * std::size(second)) % std::size(first)] + 'k';
}

std::vector<QueryPage> randomPages(size_t count, unsigned seed) {
  std::mt19937 random(seed);
  // Squaring a number below 1 twice makes small ones frequent.
  const auto word = [&random] {
    const double share = static_cast<double>(random()) / 4294967296.0;
    return vocabularyWord(
        static_cast<size_t>(share * share * share * static_cast<double>(vocabularySize)));
  };
  std::vector<QueryPage> pages;
  for (size_t i = 0; i < count; ++i) {
    QueryPage page;
    page.key = "page" + std::to_string(100000 + i) + ".html";
    page.book = i % 3 == 0 ? "org.zeb.second" : "org.zeb.manual";
    page.excludedFromSearch = i % 17 == 5;
    for (size_t words = 1 + random() % 4; words > 0; --words) {
      page.title += (page.title.empty() ? "" : " ") + word();
    }
    for (size_t blocks = random() % 4; blocks > 0; --blocks) {
      std::string block;
      for (size_t words = 1 + random() % 30; words > 0; --words) {
        block += (block.empty() ? "" : " ") + word();
        if (random() % 8 == 0) {
          block += ',';
        }
      }
      page.blocks.push_back(block + '.');
    }
    pages.push_back(std::move(page));
  }
  return pages;
}

std::vector<QueryPage> officePages() {
  return {
      {"add-printer.html",
       "Add a printer",
       {"Connect the network printer and open the print settings.",
        "Choose the print queue of the network printer. Paper is loaded in the tray."}},
      {"print-queue.html",
       "The print queue",
       {"Documents wait in the print queue until the printer has paper.",
        "A document can be removed from the print queue."}},
      {"paper-jam.html",
       "Clear a paper jam",
       {"Open the tray of the printer and remove the paper.", "Then start the print queue again."}},
      {"wifi.html",
       "Wireless network",
       {"Choose a wireless network and type its password.",
        "The wireless network connects when the password is right."}},
      {"password.html",
       "Change your password",
       {"Open the settings, choose the account and change the password.",
        "A good password is long. The wireless network has a password of its own."}},
      {"soup.html",
       "Cooking tomato soup",
       {"Chop tomatoes, add water and cook for an hour.", "Serve the tomato soup with bread."},
       "org.zeb.kitchen"},
      {"bread.html",
       "Baking bread",
       {"Mix flour with water and bake the bread for an hour.", "Serve with tomato soup."},
       "org.zeb.kitchen"},
      {"hidden.html",
       "Secret recipes",
       {"Tomato soup with secret spices."},
       "org.zeb.kitchen",
       true},
  };
}

}  // namespace tests
