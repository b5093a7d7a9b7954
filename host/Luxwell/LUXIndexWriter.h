// Makes one book's semantic index data from the text of its pages.
#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"

class HelpTokenizer;

/// What a page says, as far as search by meaning is concerned. Strings are UTF-8.
struct LUXDocument {
  /// The page's path within the book, without a slash before it.
  std::string key;
  /// Shown, and counted as title.
  std::string title;
  /// Shown; counted only where it is also among the blocks.
  std::optional<std::string> description;
  /// The page is to lend the model its words, but never to be found.
  bool excludedFromSearch = false;
  /// Headings, paragraphs and so on; no word group reaches from one into the next.
  std::vector<std::string> blocks;
};

/// The same where it stands.
struct LUXDocumentView {
  std::string_view key;
  std::string_view title;
  std::optional<std::string_view> description;
  bool excludedFromSearch = false;
  std::vector<std::string_view> blocks;
};

/// Collects pages and writes the data that HelpLUXIndex reads, the same bytes for the same pages in
/// whatever order they are added. Thread-safety: confined to one thread.
class LUXIndexWriter {
 public:
  /// The language of the book. `tokenizer` must not be null.
  explicit LUXIndexWriter(std::shared_ptr<const HelpTokenizer> tokenizer);
  ~LUXIndexWriter();
  LUXIndexWriter(const LUXIndexWriter&) = delete;
  LUXIndexWriter& operator=(const LUXIndexWriter&) = delete;

  /// Throws platform::Exception "InvalidArgumentException" for a key that was added before.
  void addDocument(const LUXDocument& document);
  void addDocument(const LUXDocumentView& document);

  /// Takes over the documents of a writer of the same language, which is not used afterwards: so
  /// several threads can fill a writer each, and the bytes are the same as from one. Throws
  /// platform::Exception "InvalidArgumentException", and both stay as they were, when both have a
  /// document of the same key.
  void absorb(LUXIndexWriter& other);

  size_t documentCount() const noexcept;

  /// The bytes, which do not depend on the number of threads that make them. The writer is not used
  /// afterwards. Throws platform::Exception "InvalidArgumentException" for a book whose data would
  /// be too large for the format (4 GiB a section).
  platform::Data finish(size_t threadCount = 1);

 private:
  struct Implementation;
  std::unique_ptr<Implementation> _implementation;
};
