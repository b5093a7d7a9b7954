#include "SearchKit/IndexReader.h"

#include "SearchKit/Checksum.h"
#include "SearchKit/Dictionary.h"
#include "SearchKit/PostingsCursor.h"
#include "SearchKit/SKIndex.h"

namespace searchkit {

using format::load;

namespace {

// The header's own checksum is over its bytes with zeros in the checksum's place.
uint32_t headerChecksum(std::span<const uint8_t> header) noexcept {
  constexpr uint8_t zeros[4] = {};
  const uint32_t before = crc32c(header.first(format::headerChecksumAt));
  return crc32c(header.subspan(format::headerChecksumAt + sizeof zeros), crc32c(zeros, before));
}

}  // namespace

IndexSummary indexSummary(const SKIndex& index) {
  const std::span<const uint8_t> bytes = index.data().span();
  const uint8_t* const header = bytes.data();
  const IndexView& view = index.view();
  IndexSummary summary;
  summary.formatVersion = load<uint16_t>(header + format::versionAt);
  summary.formatRevision = load<uint16_t>(header + format::revisionAt);
  summary.tokenizerRules = view.tokenizerRules();
  summary.icuMajor = load<uint16_t>(header + format::icuMajorAt);
  summary.icuMinor = load<uint16_t>(header + format::icuMinorAt);
  summary.minimumTermLength = view.minimumTermLength();
  summary.documentCount = view.documentCount();
  summary.termCount = view.termCount();
  summary.wordCount = view.wordCount();
  summary.byteLength = load<uint64_t>(header + format::totalLengthAt);
  const auto headerLength = load<uint32_t>(header + format::headerLengthAt);
  summary.isIntact = headerChecksum(bytes.first(headerLength)) ==
                     load<uint32_t>(header + format::headerChecksumAt);
  const auto sectionCount = load<uint32_t>(header + format::sectionCountAt);
  for (uint32_t i = 0; i < sectionCount; ++i) {
    const uint8_t* const entry = header + format::headerLength + i * format::sectionEntryLength;
    SectionInfo section;
    section.id = load<uint32_t>(entry + format::sectionIDAt);
    section.name = format::sectionName(section.id);
    section.offset = load<uint64_t>(entry + format::sectionOffsetAt);
    section.length = load<uint64_t>(entry + format::sectionLengthAt);
    section.checksum = load<uint32_t>(entry + format::sectionChecksumAt);
    section.isIntact =
        crc32c(bytes.subspan(static_cast<size_t>(section.offset),
                             static_cast<size_t>(section.length))) == section.checksum;
    summary.isIntact = summary.isIntact && section.isIntact;
    summary.sections.push_back(section);
  }
  return summary;
}

const platform::Data& indexBytes(const SKIndex& index) { return index.data(); }

uint32_t indexDocumentCount(const SKIndex& index) { return index.view().documentCount(); }

std::optional<StoredDocument> indexDocument(const SKIndex& index, SKDocumentID id) {
  const std::optional<IndexView::Texts> texts = index.view().documentTexts(id);
  if (!texts) {
    return std::nullopt;
  }
  return StoredDocument{id, texts->path, texts->title, texts->abstract};
}

std::optional<SKDocumentID> indexDocumentIDForPath(const SKIndex& index, std::string_view path) {
  return index.view().documentIDForPath(path);
}

std::vector<std::string> indexDocumentPaths(const SKIndex& index) {
  std::vector<std::string> paths;
  for (uint32_t id = 0; id < index.view().documentCount(); ++id) {
    if (const std::optional<IndexView::Texts> texts = index.view().documentTexts(id)) {
      paths.emplace_back(texts->path);
    }
  }
  return paths;
}

std::optional<SKTermID> indexTermID(const SKIndex& index, std::string_view term) {
  DictionaryCursor cursor(index.view());
  if (!cursor.seek(term) || cursor.term() != term) {
    return std::nullopt;
  }
  return cursor.number();
}

std::vector<SKDocumentID> indexDocumentsWithTerm(const SKIndex& index, std::string_view term) {
  std::vector<SKDocumentID> documents;
  DictionaryCursor cursor(index.view());
  if (cursor.seek(term) && cursor.term() == term) {
    PostingsCursor postings(index.view(), cursor.postings());
    postings.beginList();
    while (postings.next()) {
      documents.push_back(postings.document());
    }
  }
  return documents;
}

struct TermIterator::Implementation {
  Implementation(const SKIndex& index, std::string_view from)
      : view(index.view()), cursor(view), isBeforeFirst(cursor.seek(from)) {}

  const IndexView& view;
  DictionaryCursor cursor;
  bool isBeforeFirst;
};

TermIterator::TermIterator(const SKIndex& index, std::string_view from)
    : _implementation(std::make_unique<Implementation>(index, from)) {}

TermIterator::~TermIterator() = default;

bool TermIterator::next() {
  if (_implementation->isBeforeFirst) {
    _implementation->isBeforeFirst = false;
    return true;
  }
  return _implementation->cursor.next();
}

std::string_view TermIterator::term() const { return _implementation->cursor.term(); }

SKTermID TermIterator::termID() const { return _implementation->cursor.number(); }

uint32_t TermIterator::documentCount() const {
  PostingsCursor postings(_implementation->view, _implementation->cursor.postings());
  return postings.beginList() ? postings.listDocumentCount() : 0;
}

}  // namespace searchkit
