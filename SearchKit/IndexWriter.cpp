#include "SearchKit/IndexWriter.h"

#include <algorithm>
#include <deque>
#include <numeric>
#include <unordered_set>
#include <utility>

#include "SearchKit/IndexAssembler.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/Scoring.h"
#include "SearchKit/TermTable.h"
#include "SearchKit/Tokenizer.h"
#include "platform/Exception.h"
#include "platform/Strings.h"

namespace searchkit {
namespace {

// Between the last word of a title, heading or block and the first of the next, so that no phrase
// bridges it. The words of a phrase have every position after one another, unless some were left
// out for their length: then the gap is to be longer than any run of those.
constexpr uint32_t gapBetweenEntries = 1;
constexpr uint32_t gapWhereWordsAreLeftOut = 100;

// Beside a document number's difference there is room for the bits of a weight.
constexpr size_t maximumDocumentCount = UINT32_MAX >> format::weightBits;

struct Occurrence {
  uint32_t position;
  // The number of the term's next occurrence in the document, where there is one.
  uint32_t next;
};

// Numbers one after the other, as the index has them.
class NumberBuffer {
 public:
  void clear() noexcept { _bytes.clear(); }
  void append(uint32_t number) {
    uint8_t bytes[format::maximumNumberLength];
    _bytes.insert(_bytes.end(), bytes, format::writeNumber(bytes, number));
  }
  const uint8_t* data() const noexcept { return _bytes.data(); }
  size_t size() const noexcept { return _bytes.size(); }

 private:
  std::vector<uint8_t> _bytes;
};

std::optional<std::string> repaired(const std::optional<std::string>& text) {
  return text ? std::optional(platform::stringByRepairingUTF8(*text)) : std::nullopt;
}

}  // namespace

// Words go straight into the postings of their terms, so that nothing of a document's text is kept
// after it was added. Those postings number the documents in the order of adding; finish() gives
// them their final numbers.
struct IndexWriter::Implementation {
  explicit Implementation(IndexWriterOptions writerOptions)
      : options(writerOptions), tokenizer(writerOptions.minimumTermLength) {}

  IndexWriterOptions options;
  Tokenizer tokenizer;
  TermTable terms;
  // A deque, so that the paths stay where `paths` sees them.
  std::deque<StoredTexts> documents;
  std::unordered_set<std::string_view> paths;
  bool isFinished = false;

  // Of the document being added.
  uint32_t position = 0;
  std::vector<Occurrence> occurrences;
  std::vector<uint32_t> touchedTerms;
  NumberBuffer postingBytes;
  NumberBuffer positionBytes;

  void addText(std::string_view text, uint32_t weight);
  void addWord(std::string_view text, uint32_t weight);
  void closeDocument();
  std::vector<uint32_t> sortedDocuments() const;
  static void readPostings(std::span<const uint8_t> bytes, const std::vector<uint32_t>& numbers,
                           std::vector<Posting>& postings);
};

void IndexWriter::Implementation::addText(std::string_view text, uint32_t weight) {
  tokenizer.tokenize(text, [this, weight](std::string_view term, bool isShort) {
    if (!isShort) {
      addWord(term, weight);
    }
    ++position;
  });
  position += options.minimumTermLength > 1 ? gapWhereWordsAreLeftOut : gapBetweenEntries;
}

void IndexWriter::Implementation::addWord(std::string_view text, uint32_t weight) {
  const uint32_t number = terms.find(text);
  TermEntry& term = terms[number];
  const auto occurrence = static_cast<uint32_t>(occurrences.size());
  occurrences.push_back({position, 0});
  if (term.weight == 0) {
    touchedTerms.push_back(number);
    term.firstOccurrence = occurrence;
  } else {
    occurrences[term.lastOccurrence].next = occurrence;
  }
  term.lastOccurrence = occurrence;
  term.weight = std::min(term.weight + weight, format::maximumWeight);
}

void IndexWriter::Implementation::closeDocument() {
  const auto document = static_cast<uint32_t>(documents.size());
  for (const uint32_t number : touchedTerms) {
    TermEntry& term = terms[number];
    positionBytes.clear();
    uint32_t before = 0;
    for (uint32_t at = term.firstOccurrence;; at = occurrences[at].next) {
      positionBytes.append(occurrences[at].position - before);
      before = occurrences[at].position;
      if (at == term.lastOccurrence) {
        break;
      }
    }
    postingBytes.clear();
    postingBytes.append(document - term.lastDocument);
    postingBytes.append(term.weight);
    postingBytes.append(static_cast<uint32_t>(positionBytes.size()));
    term.postings.append(terms.arena(), postingBytes.data(), postingBytes.size());
    term.postings.append(terms.arena(), positionBytes.data(), positionBytes.size());
    term.lastDocument = document;
    term.weight = 0;
  }
  documents.back().wordCount = static_cast<uint32_t>(occurrences.size());
  position = 0;
  occurrences.clear();
  touchedTerms.clear();
}

std::vector<uint32_t> IndexWriter::Implementation::sortedDocuments() const {
  std::vector<uint32_t> order(documents.size());
  std::iota(order.begin(), order.end(), 0U);
  std::sort(order.begin(), order.end(),
            [this](uint32_t a, uint32_t b) { return documents[a].path < documents[b].path; });
  return order;
}

// `numbers` has the final number of the document that was added as the n-th, from 0.
void IndexWriter::Implementation::readPostings(std::span<const uint8_t> bytes,
                                               const std::vector<uint32_t>& numbers,
                                               std::vector<Posting>& postings) {
  postings.clear();
  const uint8_t* at = bytes.data();
  const uint8_t* const end = at + bytes.size();
  uint32_t document = 0;
  uint32_t difference;
  Posting posting;
  uint32_t positionsLength;
  while (format::readNumber(at, end, difference) && format::readNumber(at, end, posting.weight) &&
         format::readNumber(at, end, positionsLength)) {
    document += difference;
    posting.document = numbers[document - 1];
    posting.positions = {at, positionsLength};
    at += positionsLength;
    postings.push_back(posting);
  }
  const auto byDocument = [](const Posting& a, const Posting& b) {
    return a.document < b.document;
  };
  if (!std::is_sorted(postings.begin(), postings.end(), byDocument)) {
    std::sort(postings.begin(), postings.end(), byDocument);
  }
}

IndexWriter::IndexWriter(IndexWriterOptions options)
    : _implementation(std::make_unique<Implementation>(options)) {}

IndexWriter::~IndexWriter() = default;

void IndexWriter::add(Document document) {
  Implementation& self = *_implementation;
  if (self.isFinished) {
    throw platform::Exception(platform::invalidArgumentException, "the index is finished");
  }
  if (!document.path.starts_with('/')) {
    throw platform::Exception(platform::invalidArgumentException,
                              "the path of a document begins with a slash: " + document.path);
  }
  if (self.paths.contains(document.path)) {
    throw platform::Exception(platform::invalidArgumentException,
                              "there is a document already at " + document.path);
  }
  if (self.documents.size() >= maximumDocumentCount) {
    throw platform::Exception(platform::rangeException, "too many documents for one index");
  }
  StoredTexts texts;
  texts.path = std::move(document.path);
  texts.title = repaired(document.title);
  texts.abstract = repaired(document.abstract);
  self.documents.push_back(std::move(texts));
  self.paths.insert(self.documents.back().path);
  if (document.title) {
    self.addText(*document.title, titleWeight);
  }
  for (const std::string& heading : document.headings) {
    self.addText(heading, headingWeight);
  }
  for (const std::string& block : document.body) {
    self.addText(block, bodyWeight);
  }
  self.closeDocument();
}

size_t IndexWriter::documentCount() const { return _implementation->documents.size(); }

platform::Data IndexWriter::finish() {
  Implementation& self = *_implementation;
  if (self.isFinished) {
    throw platform::Exception(platform::invalidArgumentException, "the index is finished");
  }
  self.isFinished = true;
  const size_t longest = std::min<size_t>(self.options.minimumTermLength, UINT32_MAX);
  IndexAssembler assembler(static_cast<uint32_t>(longest));
  const std::vector<uint32_t> order = self.sortedDocuments();
  std::vector<uint32_t> numbers(order.size());
  for (uint32_t number = 0; number < order.size(); ++number) {
    numbers[order[number]] = number;
    assembler.addDocument(self.documents[order[number]]);
  }
  std::vector<uint8_t> bytes;
  std::vector<Posting> postings;
  for (const uint32_t entry : self.terms.sortedEntries()) {
    const TermEntry& term = self.terms[entry];
    bytes.clear();
    term.postings.copyTo(bytes);
    Implementation::readPostings(bytes, numbers, postings);
    assembler.addTerm(term.text, postings);
  }
  return assembler.finish();
}

}  // namespace searchkit
