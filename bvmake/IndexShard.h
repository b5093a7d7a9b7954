// A part of an index while it is being made: what one worker's pages give.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "bvmake/PreparedFile.h"
#include "host/Luxwell/LUXIndexWriter.h"

namespace bvmake {

/// Which page carries which anchors.
struct PageAnchors {
  std::string path;
  /// Distinct.
  std::vector<std::string> anchors;
};

/// What one file gave, as the run's figures and the anchor table have it.
struct AddedFile {
  std::vector<Message> messages;
  std::vector<PageAnchors> anchors;
  uint64_t inputBytes = 0;
  size_t pageCount = 0;
  size_t skippedCount = 0;
  size_t leftOutCount = 0;
  size_t abstractCount = 0;
};

/// Keyword index and semantic data of some of a book's pages. Shards of the same options, whatever
/// pages are in which, make the same index together. Thread-safety: confined to one thread.
class IndexShard {
 public:
  struct Options {
    size_t minimumTermLength = 1;
    /// Nothing but semantic data is wanted.
    bool semanticOnly = false;
    bool anchors = false;
  };

  /// `tokenizer`, that of the book's language, must not be null.
  IndexShard(const Options& options, std::shared_ptr<const HelpTokenizer> tokenizer);

  /// Throws platform::Exception for pages that are too large for an index.
  AddedFile add(PreparedFile file);

  /// Ahead of absorb(), in a thread of its own.
  void prepareToFinish() { _keywords->sortTerms(); }

  /// Takes over another shard's pages; that one is not used afterwards.
  void absorb(IndexShard& other);

  /// May both be called once, side by side. What the result was made from is gone then.
  platform::Data finishKeywords();
  platform::Data finishSemanticData(size_t threadCount);

 private:
  void _addPage(PreparedPage page, AddedFile& added);

  const Options _options;
  std::unique_ptr<searchkit::IndexWriter> _keywords;
  std::unique_ptr<LUXIndexWriter> _semanticData;
};

}  // namespace bvmake
