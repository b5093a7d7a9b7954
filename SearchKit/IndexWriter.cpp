#include "SearchKit/IndexWriter.h"

#include <algorithm>
#include <deque>
#include <span>
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

// Adds the postings of one part to those that are there already, in the order of the documents'
// final numbers; `numbers` has that of the document that was added as the n-th, from 0.
void readPostings(std::span<const uint8_t> bytes, const std::vector<uint32_t>& numbers,
                  std::vector<Posting>& postings) {
  const auto before = static_cast<std::ptrdiff_t>(postings.size());
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
  const auto middle = postings.begin() + before;
  if (!std::is_sorted(middle, postings.end(), byDocument)) {
    std::sort(middle, postings.end(), byDocument);
  }
  std::inplace_merge(postings.begin(), middle, postings.end(), byDocument);
}

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
  // In the order of their bytes, once no document comes any more.
  std::vector<uint32_t> sortedTerms;
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
  void requireUnfinished() const;
  void sortTerms();

  // The parts of one index are writers whose documents are all different.
  using Parts = std::vector<Implementation*>;
  // By part and order of adding, the final number of each document.
  using Numbers = std::vector<std::vector<uint32_t>>;
  static Numbers addDocuments(const Parts& parts, IndexAssembler& assembler);
  static void addTerms(const Parts& parts, const Numbers& numbers, IndexAssembler& assembler);
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

void IndexWriter::Implementation::requireUnfinished() const {
  if (isFinished) {
    throw platform::Exception(platform::invalidArgumentException, "the index is finished");
  }
}

void IndexWriter::Implementation::sortTerms() {
  if (sortedTerms.size() != terms.size()) {
    sortedTerms = terms.sortedEntries();
  }
}

IndexWriter::Implementation::Numbers IndexWriter::Implementation::addDocuments(
    const Parts& parts, IndexAssembler& assembler) {
  struct Place {
    size_t part;
    size_t document;
  };
  std::vector<Place> order;
  Numbers numbers(parts.size());
  for (size_t part = 0; part < parts.size(); ++part) {
    numbers[part].resize(parts[part]->documents.size());
    for (size_t document = 0; document < numbers[part].size(); ++document) {
      order.push_back({part, document});
    }
  }
  std::sort(order.begin(), order.end(), [&parts](const Place& a, const Place& b) {
    return parts[a.part]->documents[a.document].path < parts[b.part]->documents[b.document].path;
  });
  for (uint32_t number = 0; number < order.size(); ++number) {
    const Place& place = order[number];
    numbers[place.part][place.document] = number;
    assembler.addDocument(parts[place.part]->documents[place.document]);
  }
  return numbers;
}

void IndexWriter::Implementation::addTerms(const Parts& parts, const Numbers& numbers,
                                           IndexAssembler& assembler) {
  // The parts that have terms left, by how far they are.
  struct Source {
    size_t part;
    size_t at;
    size_t firstByte;
  };
  std::vector<Source> sources;
  for (size_t part = 0; part < parts.size(); ++part) {
    parts[part]->sortTerms();
    sources.push_back({part, 0, 0});
  }
  const auto entryOf = [&parts](const Source& source) -> const TermEntry& {
    Implementation& part = *parts[source.part];
    return part.terms[part.sortedTerms[source.at]];
  };
  const auto isAtEnd = [&parts](const Source& source) {
    return source.at == parts[source.part]->sortedTerms.size();
  };
  std::vector<uint8_t> bytes;
  std::vector<Posting> postings;
  std::vector<Source*> having;
  while (true) {
    std::erase_if(sources, isAtEnd);
    if (sources.empty()) {
      return;
    }
    having.clear();
    std::string_view term;
    for (Source& source : sources) {
      const std::string_view text = entryOf(source).text;
      if (having.empty() || text < term) {
        having.clear();
        term = text;
      }
      if (text == term) {
        having.push_back(&source);
      }
    }
    // All bytes first: the postings point into them.
    bytes.clear();
    for (Source* const source : having) {
      source->firstByte = bytes.size();
      entryOf(*source).postings.copyTo(bytes);
    }
    postings.clear();
    for (size_t i = 0; i < having.size(); ++i) {
      const size_t begin = having[i]->firstByte;
      const size_t end = i + 1 < having.size() ? having[i + 1]->firstByte : bytes.size();
      readPostings(std::span(bytes).subspan(begin, end - begin), numbers[having[i]->part],
                   postings);
      ++having[i]->at;
    }
    assembler.addTerm(term, postings);
  }
}

IndexWriter::IndexWriter(IndexWriterOptions options)
    : _implementation(std::make_unique<Implementation>(options)) {}

IndexWriter::~IndexWriter() = default;

void IndexWriter::add(Document document) {
  Implementation& self = *_implementation;
  self.requireUnfinished();
  if (!document.path.starts_with('/')) {
    throw platform::Exception(platform::invalidArgumentException,
                              "the path of a document begins with a slash: " + document.path);
  }
  _requireNewPath(document.path);
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

void IndexWriter::_requireNewPath(const std::string& path) const {
  if (_implementation->paths.contains(path) ||
      std::any_of(_absorbed.begin(), _absorbed.end(),
                  [&](const auto& part) { return part->paths.contains(path); })) {
    throw platform::Exception(platform::invalidArgumentException,
                              "there is a document already at " + path);
  }
}

size_t IndexWriter::documentCount() const {
  size_t count = _implementation->documents.size();
  for (const auto& part : _absorbed) {
    count += part->documents.size();
  }
  return count;
}

void IndexWriter::absorb(IndexWriter& other) {
  _implementation->requireUnfinished();
  other._implementation->requireUnfinished();
  for (const auto& document : other._implementation->documents) {
    _requireNewPath(document.path);
  }
  _absorbed.push_back(std::move(other._implementation));
}

void IndexWriter::sortTerms() { _implementation->sortTerms(); }

platform::Data IndexWriter::finish() {
  _implementation->requireUnfinished();
  _implementation->isFinished = true;
  const size_t shortest = std::min<size_t>(_implementation->options.minimumTermLength, UINT32_MAX);
  IndexAssembler assembler(static_cast<uint32_t>(shortest));
  Implementation::Parts parts{_implementation.get()};
  for (const auto& part : _absorbed) {
    parts.push_back(part.get());
  }
  const Implementation::Numbers numbers = Implementation::addDocuments(parts, assembler);
  Implementation::addTerms(parts, numbers, assembler);
  return assembler.finish();
}

}  // namespace searchkit
