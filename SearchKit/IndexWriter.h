// Makes the bytes of a keyword index.
#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Data.h"

namespace searchkit {

/// One page as the index takes it: plain text in fields, UTF-8.
struct Document {
  /// Path within the book, beginning with a slash, of any length. Unique within an index. Bytes
  /// that are no UTF-8 are kept as they are: a path must lead to its file.
  std::string path;
  /// Shown to the user ("T") and searched, with the most weight. Ill-formed UTF-8 in any text is
  /// repaired.
  std::optional<std::string> title;
  /// Shown to the user ("D"). Not searched by itself: the writer's caller adds it to a field below
  /// where it should be.
  std::optional<std::string> abstract;
  /// Headings, and key words that the author gave the page.
  std::vector<std::string> headings;
  /// Running text, one entry a block; phrases do not reach across entries of either list.
  std::vector<std::string> body;
};

struct IndexWriterOptions {
  /// Terms of fewer characters are left out, except in scripts without blanks between words.
  size_t minimumTermLength = 1;
};

/// Collects documents and writes the index: the same bytes for the same documents, in whatever
/// order they were added. Thread-safety: confined to one thread.
class IndexWriter {
 public:
  explicit IndexWriter(IndexWriterOptions options = {});
  ~IndexWriter();
  IndexWriter(const IndexWriter&) = delete;
  IndexWriter& operator=(const IndexWriter&) = delete;

  /// Throws platform::Exception "InvalidArgumentException" for a path that was added before or
  /// does not begin with a slash.
  void add(const Document& document);

  size_t documentCount() const;

  /// Takes over the documents of a writer with the same options that has absorbed none itself and
  /// is not used afterwards: so several threads can fill a writer each, and the index is the same
  /// as from one. Throws platform::Exception "InvalidArgumentException", and both stay as they
  /// were, when both have a document of the same path.
  void absorb(IndexWriter& other);

  /// Does now, in this thread, what finish() else has to do for these documents alone. Nothing is
  /// added afterwards.
  void sortTerms();

  /// The index of all documents added. May be called once; nothing can be added after that. Throws
  /// platform::Exception "RangeException" for more text than one index can hold (four gigabytes in
  /// any one of its sections).
  platform::Data finish();

 private:
  struct Implementation;

  void _requireNewPath(const std::string& path) const;

  std::unique_ptr<Implementation> _implementation;
  std::vector<std::unique_ptr<Implementation>> _absorbed;
};

}  // namespace searchkit
