#include "bench/quality/IndexedBook.h"

#include <cstdio>
#include <stdexcept>
#include <utility>

#include "bvmake/HelpIndexFile.h"
#include "bvmake/Report.h"
#include "bvmake/Run.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXHit.h"
#include "host/Luxwell/LUXQuery.h"

namespace quality {

namespace {

class Answer : public LUXQueryDelegate {
 public:
  void queryDidFinishWithResults(const std::shared_ptr<LUXQuery>& /*query*/,
                                 const std::vector<std::shared_ptr<LUXHit>>& results) override {
    hits = results;
  }

  std::vector<std::shared_ptr<LUXHit>> hits;
};

constexpr const char* bookID = "org.zeb.bench.collection";

std::shared_ptr<const HelpTokenizer> tokenizerOfIndex(const HelpLUXIndex& index) {
  auto tokenizer = HelpTokenizer::tokenizerForLanguage(
      index.attributes()[HelpLUXIndexAttributeLanguageKey].stringValue().value_or(""));
  if (tokenizer == nullptr) {
    throw std::runtime_error("an index has no language");
  }
  return tokenizer;
}

/// What the plug-in saves a model with: the thresholds that the book gives.
platform::Value optionsOfIndex(const HelpLUXIndex& index) {
  platform::Value::Dictionary thresholds;
  for (const auto& [key, attribute] :
       {std::pair{"BigramThreshold", HelpLUXIndexAttributeBigramThresholdKey},
        std::pair{"TrigramThreshold", HelpLUXIndexAttributeTrigramThresholdKey}}) {
    const platform::Value& value = index.attributes()[attribute];
    if (!value.isAbsent()) {
      thresholds.emplace(key, value);
    }
  }
  platform::Value::Dictionary books;
  books.emplace(bookID, std::move(thresholds));
  platform::Value::Dictionary options;
  options.emplace("SuggestionThresholdsPerBook", std::move(books));
  return options;
}

class LuxwellEngine : public Engine {
 public:
  explicit LuxwellEngine(const IndexedBook& book) : _book(book) {}

  Ranking search(const std::string& query, size_t count) override {
    Ranking ranking;
    for (const std::shared_ptr<LUXHit>& hit : _book.hits(query, LUXQueryTypeArticles, count)) {
      ranking.push_back(documentOfBookPageName(hit->path().value()));
    }
    return ranking;
  }

 private:
  const IndexedBook& _book;
};

}  // namespace

std::shared_ptr<HelpLUXIndex> luxIndexOfFile(const std::string& path) {
  const auto file = bvmake::readHelpIndexFile(path);
  const platform::Data* data =
      file ? (*file)[bvmake::helpindexkeys::luxIndexData].dataIf() : nullptr;
  auto index = data == nullptr ? nullptr : HelpLUXIndex::initWithVersionedData(*data);
  if (index == nullptr) {
    throw std::runtime_error("no semantic data in " + path);
  }
  return index;
}

std::shared_ptr<HelpLUXModel> trainedModel(const HelpLUXIndex& index, const std::string& folder) {
  const auto tokenizer = tokenizerOfIndex(index);
  auto model = HelpLUXModel::initWithDirectoryPath(folder, tokenizer->localization());
  model->addHelpbookID(bookID);
  // Held from one page to the next so that the book's table is decoded once.
  LUXTokenCounts counts;
  for (const std::string& key : index.documentKeys()) {
    counts = index.tokenCountsForKey(key);
    model->addTokenCounts(counts, key, std::nullopt, bookID);
  }
  if (!model->saveWithOptions(optionsOfIndex(index))) {
    throw std::runtime_error("cannot save a model in " + folder);
  }
  return model;
}

IndexedBook::IndexedBook(const Collection& collection, const std::filesystem::path& folder)
    : _collection(collection), _folder(folder) {
  writeBook(collection, folder / "pages");
  bvmake::CreateOptions options;
  options.folder = (folder / "pages").string();
  options.outputPath = indexFile();
  options.anchors = true;
  options.generateSummaries = true;
  options.minimumTermLength = 3;
  bvmake::StreamReport report(stderr, "quality", 0);
  const bvmake::Outcome outcome = bvmake::run(options, report);
  if (outcome.exitCode != bvmake::ExitCode::success) {
    throw std::runtime_error("cannot index " + collection.name);
  }
  _indexBytes = outcome.semanticBytes;
  _luxIndex = luxIndexOfFile(indexFile());
  _tokenizer = tokenizerOfIndex(*_luxIndex);
  _model = trainedModel(*_luxIndex, (folder / "model").string());
}

IndexedBook::~IndexedBook() = default;

std::vector<std::shared_ptr<LUXHit>> IndexedBook::hits(const std::string& text, int queryType,
                                                       size_t count) const {
  const auto answer = std::make_shared<Answer>();
  const auto query = LUXQuery::initWithString(text, std::nullopt, count, answer, _model, nullptr);
  query->setQueryType(queryType);
  query->run();
  return std::move(answer->hits);
}

uintmax_t IndexedBook::modelBytes() const {
  uintmax_t bytes = 0;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(_folder / "model")) {
    bytes += entry.is_regular_file() ? entry.file_size() : 0;
  }
  return bytes;
}

std::unique_ptr<Engine> luxwellEngine(const IndexedBook& book) {
  return std::make_unique<LuxwellEngine>(book);
}

}  // namespace quality
