// A collection as a help book, indexed and trained by the system itself.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "bench/quality/Collection.h"
#include "bench/quality/Peers.h"

class HelpLUXIndex;
class HelpLUXModel;
class HelpTokenizer;
class LUXHit;

namespace quality {

/// The semantic data of a help-index file. Throws std::runtime_error when there are none.
std::shared_ptr<HelpLUXIndex> luxIndexOfFile(const std::string& path);

/// A model of one book, trained and saved in a folder. Throws std::runtime_error when that fails.
std::shared_ptr<HelpLUXModel> trainedModel(const HelpLUXIndex& index, const std::string& folder);

/// Pages, help index and model of one collection in a folder of their own.
class IndexedBook {
 public:
  /// Writes the pages, lets the indexing tool make token data of them and trains a model with
  /// these. `collection` must outlive this. Throws std::runtime_error when any of it fails.
  IndexedBook(const Collection& collection, const std::filesystem::path& folder);
  ~IndexedBook();
  IndexedBook(const IndexedBook&) = delete;
  IndexedBook& operator=(const IndexedBook&) = delete;

  const Collection& collection() const noexcept { return _collection; }
  const std::shared_ptr<HelpLUXIndex>& luxIndex() const noexcept { return _luxIndex; }
  const std::shared_ptr<HelpLUXModel>& model() const noexcept { return _model; }
  /// The tokenizer of the language that the indexing tool found.
  const HelpTokenizer& tokenizer() const noexcept { return *_tokenizer; }

  /// Runs a query as the plug-in does.
  std::vector<std::shared_ptr<LUXHit>> hits(const std::string& text, int queryType,
                                            size_t count) const;

  std::string indexFile() const { return (_folder / "book.helpindex").string(); }
  uintmax_t modelBytes() const;
  uintmax_t indexBytes() const noexcept { return _indexBytes; }

 private:
  const Collection& _collection;
  const std::filesystem::path _folder;
  std::shared_ptr<HelpLUXIndex> _luxIndex;
  std::shared_ptr<const HelpTokenizer> _tokenizer;
  std::shared_ptr<HelpLUXModel> _model;
  uintmax_t _indexBytes = 0;
};

/// Type-1 queries. The book must outlive the engine.
std::unique_ptr<Engine> luxwellEngine(const IndexedBook& book);

/// BM25 (k1 1.2, b .75) over the stems that the token data has, titles as part of the text. The
/// book must outlive the engine.
std::unique_ptr<Engine> bm25Engine(const IndexedBook& book);

}  // namespace quality
