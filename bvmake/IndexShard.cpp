#include "bvmake/IndexShard.h"

#include <utility>

#include "bvmake/SemanticData.h"

namespace bvmake {

namespace {

searchkit::Document keywordDocument(PreparedPage prepared) {
  Page& page = prepared.page;
  searchkit::Document document;
  document.path = std::move(prepared.path);
  document.title = std::move(prepared.title);
  document.headings = std::move(page.headings);
  document.headings.insert(document.headings.end(), page.keywords.begin(), page.keywords.end());
  if (!page.description.empty()) {
    document.body.push_back(std::move(page.description));
  }
  for (TextBlock& block : page.body) {
    document.body.push_back(std::move(block.text));
  }
  if (!prepared.abstract.empty()) {
    document.abstract = std::move(prepared.abstract);
  }
  return document;
}

}  // namespace

IndexShard::IndexShard(const Options& options, std::shared_ptr<const HelpTokenizer> tokenizer)
    : _options(options),
      _keywords(std::make_unique<searchkit::IndexWriter>(
          searchkit::IndexWriterOptions{options.minimumTermLength})),
      _semanticData(std::make_unique<LUXIndexWriter>(std::move(tokenizer))) {}

AddedFile IndexShard::add(PreparedFile file) {
  AddedFile added;
  added.messages = std::move(file.messages);
  added.inputBytes = file.inputBytes;
  added.skippedCount = file.skippedCount;
  added.leftOutCount = file.emptyCount;
  for (PreparedPage& page : file.pages) {
    _addPage(std::move(page), added);
  }
  return added;
}

void IndexShard::_addPage(PreparedPage page, AddedFile& added) {
  _semanticData->addDocument(semanticDocument(page));
  if (page.page.excludedFromSearch) {
    // Its words are those of the book all the same, and say how the book uses them.
    ++added.leftOutCount;
    return;
  }
  ++added.pageCount;
  added.abstractCount += page.abstract.empty() ? 0 : 1;
  if (_options.semanticOnly) {
    return;
  }
  if (_options.anchors) {
    added.anchors.push_back({page.path, std::move(page.page.anchors)});
  }
  _keywords->add(keywordDocument(std::move(page)));
}

void IndexShard::absorb(IndexShard& other) {
  _keywords->absorb(*other._keywords);
  _semanticData->absorb(*other._semanticData);
}

platform::Data IndexShard::finishKeywords() {
  const std::unique_ptr<searchkit::IndexWriter> writer = std::move(_keywords);
  return writer->finish();
}

platform::Data IndexShard::finishSemanticData(size_t threadCount) {
  const std::unique_ptr<LUXIndexWriter> writer = std::move(_semanticData);
  return writer->finish(threadCount);
}

}  // namespace bvmake
