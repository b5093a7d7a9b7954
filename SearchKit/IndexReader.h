// What is in a keyword index: for the tools that show or check one, not for searching.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/SearchKit.h"

namespace searchkit {

/// One section of the index's bytes, as the section table has it.
struct SectionInfo {
  uint32_t id = 0;
  /// What the format's description calls it; "unknown" for an id that this reader does not know.
  std::string_view name;
  /// From the first byte of the index.
  uint64_t offset = 0;
  uint64_t length = 0;
  /// The CRC-32C that the table has, and whether the bytes have it too.
  uint32_t checksum = 0;
  bool isIntact = false;
};

/// The header of an index in numbers.
struct IndexSummary {
  uint16_t formatVersion = 0;
  uint16_t formatRevision = 0;
  /// The rules by which text was split and folded, and the ICU that split the scripts which need a
  /// dictionary.
  uint32_t tokenizerRules = 0;
  uint16_t icuMajor = 0;
  uint16_t icuMinor = 0;
  uint32_t minimumTermLength = 0;
  uint32_t documentCount = 0;
  uint32_t termCount = 0;
  /// All words of all documents, repetitions counted.
  uint64_t wordCount = 0;
  uint64_t byteLength = 0;
  std::vector<SectionInfo> sections;
  /// The header and every section have the checksums that they were written with.
  bool isIntact = false;
};

/// Reads the whole index once, for the checksums. `index` must not be null.
IndexSummary indexSummary(const SKIndex& index);

/// What an index keeps of one document. The views point into the index's bytes and live as long as
/// the index does; in an index from elsewhere they may be any bytes.
struct StoredDocument {
  SKDocumentID id = 0;
  std::string_view path;
  std::optional<std::string_view> title;
  std::optional<std::string_view> abstract;
};

/// The bytes that an index was opened with, for those who want to open it again later without
/// holding the index itself.
const platform::Data& indexBytes(const SKIndex& index);

/// Documents are numbered from 0 in the order of their paths' bytes.
uint32_t indexDocumentCount(const SKIndex& index);

/// The document of a number; absent when there is none or its record is broken.
std::optional<StoredDocument> indexDocument(const SKIndex& index, SKDocumentID id);

/// The number of the document of a path.
std::optional<SKDocumentID> indexDocumentIDForPath(const SKIndex& index, std::string_view path);

/// All paths, in order; those of broken records are left out.
std::vector<std::string> indexDocumentPaths(const SKIndex& index);

/// The number of a term, exactly as the index has it (SKIndexCopyUniqueTerms folds text to terms).
std::optional<SKTermID> indexTermID(const SKIndex& index, std::string_view term);

/// The documents that have a term, in ascending order; empty when there are none.
std::vector<SKDocumentID> indexDocumentsWithTerm(const SKIndex& index, std::string_view term);

/// Walks the terms in the order of their bytes. Thread-safety: confined to one thread.
///
///   for (TermIterator terms(index); terms.next();) use(terms.term());
class TermIterator {
 public:
  /// Starts before the first term that is not below `from`. The index must outlive the iterator.
  explicit TermIterator(const SKIndex& index, std::string_view from = {});
  ~TermIterator();
  TermIterator(const TermIterator&) = delete;
  TermIterator& operator=(const TermIterator&) = delete;

  /// Moves on to the next term; false after the last one, and where the bytes are broken.
  bool next();

  /// The current term; valid until next() is called again.
  std::string_view term() const;
  SKTermID termID() const;
  /// How many documents have it.
  uint32_t documentCount() const;

 private:
  struct Implementation;
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace searchkit
