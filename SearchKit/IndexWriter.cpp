#include "SearchKit/IndexWriter.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <deque>
#include <span>
#include <unordered_set>
#include <utility>

#include "SearchKit/IndexAssembler.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/PackedPositions.h"
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
  // The number of the term's occurrence before this in the document, where there is one.
  uint32_t previous;
};

// Words that are looked up together.
constexpr size_t mostWaitingWords = 32;

// How many terms ahead of the one being closed are fetched from memory.
constexpr size_t entriesAhead = 8;
constexpr size_t streamsAhead = 4;

// A posting as it is kept until the end: the document's number, less that of the term's document
// before it; a byte with the number of bits that the positions have and the weight less one, where
// they fit, else the highest value, and the number follows; then the positions.
constexpr uint32_t bitsOfBitCount = 6;
constexpr uint32_t bitCountFollows = (1 << bitsOfBitCount) - 1;
constexpr uint32_t weightFollows = UINT8_MAX >> bitsOfBitCount;
constexpr size_t maximumHeadLength = 3 * format::maximumNumberLength + 1;

uint8_t* writeHead(uint8_t* at, uint32_t difference, uint32_t weight, uint32_t bitCount) noexcept {
  at = format::writeNumber(at, difference);
  const uint32_t shownWeight = std::min(weight - 1, weightFollows);
  const uint32_t shownCount = std::min(bitCount, bitCountFollows);
  *at++ = static_cast<uint8_t>(shownWeight << bitsOfBitCount | shownCount);
  if (shownWeight == weightFollows) {
    at = format::writeNumber(at, weight);
  }
  if (shownCount == bitCountFollows) {
    at = format::writeNumber(at, bitCount);
  }
  return at;
}

const uint8_t* readHead(const uint8_t* at, const uint8_t* end, uint32_t& difference,
                        Posting& posting) noexcept {
  format::readNumber(at, end, difference);
  const uint32_t shown = *at++;
  posting.weight = (shown >> bitsOfBitCount) + 1;
  posting.positionBits = shown & bitCountFollows;
  if (posting.weight > weightFollows) {
    format::readNumber(at, end, posting.weight);
  }
  if (posting.positionBits == bitCountFollows) {
    format::readNumber(at, end, posting.positionBits);
  }
  return at;
}

// Adds the postings of one part to those that are there already, in the order of the documents'
// final numbers; `numbers` has that of the document that was added as the n-th, from 0. The
// positions stay where they are.
void readPostings(const uint8_t* at, const uint8_t* end, const std::vector<uint32_t>& numbers,
                  std::vector<Posting>& postings) {
  const auto before = static_cast<std::ptrdiff_t>(postings.size());
  uint32_t document = 0;
  uint32_t difference = 0;
  Posting posting;
  bool isSorted = true;
  while (at < end) {
    at = readHead(at, end, difference, posting);
    document += difference;
    const uint32_t last = posting.document;
    posting.document = numbers[document - 1];
    isSorted = isSorted && (posting.document > last || posting.positions == nullptr);
    posting.positions = at;
    at += (size_t{posting.positionBits} + 7) / 8;
    postings.push_back(posting);
  }
  const auto byDocument = [](const Posting& a, const Posting& b) {
    return a.document < b.document;
  };
  const auto middle = postings.begin() + before;
  if (!isSorted) {
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
  struct Word {
    uint32_t position;
    uint32_t weight;
  };
  // Words of up to eight bytes, which are all in their key.
  struct WaitingWord {
    TermTable::Key key;
    Word word;
  };
  WaitingWord waiting[mostWaitingWords];
  size_t waitingCount = 0;
  uint32_t position = 0;
  std::vector<Occurrence> occurrences;
  std::vector<uint32_t> touchedTerms;
  std::vector<uint32_t> distances;
  BitWriter positionBits;
  // A page had more than the format has room for; said when the index is finished.
  bool isTooLarge = false;

  void addText(std::string_view text, uint32_t weight);
  void addWord(std::string_view text, uint32_t weight);
  void addWaiting();
  void addOccurrence(uint32_t number, const Word& word);
  void closeDocument();
  BitCode positionsOfTerm(const TermEntry& term, uint32_t documentLength);
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
  const TermTable::Key key = TermTable::keyOf(text);
  if (key.length > sizeof key.first) {
    addOccurrence(terms.find(key, text.data()), {position, weight});
    return;
  }
  terms.prefetch(key);
  waiting[waitingCount++] = {key, {position, weight}};
  if (waitingCount == mostWaitingWords) {
    addWaiting();
  }
}

// In two rounds, so that the memory of one word is on its way while others are looked at.
void IndexWriter::Implementation::addWaiting() {
  uint32_t entries[mostWaitingWords];
  for (size_t i = 0; i < waitingCount; ++i) {
    entries[i] = terms.findShort(waiting[i].key);
    __builtin_prefetch(&terms[entries[i]], 1);
  }
  for (size_t i = 0; i < waitingCount; ++i) {
    addOccurrence(entries[i], waiting[i].word);
  }
  waitingCount = 0;
}

void IndexWriter::Implementation::addOccurrence(uint32_t number, const Word& word) {
  TermEntry& term = terms[number];
  if (term.occurrenceCount == 0) {
    touchedTerms.push_back(number);
  }
  const auto occurrence = static_cast<uint32_t>(occurrences.size());
  occurrences.push_back({word.position, term.lastOccurrence});
  term.lastOccurrence = occurrence;
  ++term.occurrenceCount;
  term.weight = std::min(term.weight + word.weight, format::maximumWeight);
}

void IndexWriter::Implementation::closeDocument() {
  addWaiting();
  const auto document = static_cast<uint32_t>(documents.size());
  const auto length = static_cast<uint32_t>(occurrences.size());
  for (size_t i = 0; i < touchedTerms.size(); ++i) {
    if (i + entriesAhead < touchedTerms.size()) {
      __builtin_prefetch(&terms[touchedTerms[i + entriesAhead]], 1);
      terms[touchedTerms[i + streamsAhead]].postings.prefetch();
    }
    TermEntry& term = terms[touchedTerms[i]];
    uint8_t item[maximumHeadLength + sizeof(uint64_t)];
    const BitCode code = positionsOfTerm(term, length);
    const uint32_t difference = document - term.lastDocument;
    if (difference < 0x80 && term.weight <= weightFollows &&
        code.length - 1 < bitCountFollows - 1) {
      // Nearly all are like this: two bytes, and what fits into a number.
      const uint64_t head = difference | ((term.weight - 1) << bitsOfBitCount | code.length)
                                             << CHAR_BIT;
      term.postings.appendShort(terms.arena(), head | code.bits << 2 * CHAR_BIT,
                                code.bits >> (64 - 2 * CHAR_BIT), 2 + (code.length + 7) / 8);
    } else if (code.length > 0) {
      uint8_t* const end = writeHead(item, difference, term.weight, code.length);
      std::memcpy(end, &code.bits, sizeof code.bits);
      term.postings.append(terms.arena(), item,
                           static_cast<size_t>(end - item) + (code.length + 7) / 8);
    } else {
      const auto bitCount = static_cast<uint32_t>(positionBits.bitCount());
      const std::span<const uint8_t> packed = positionBits.finish();
      uint8_t* const end = writeHead(item, difference, term.weight, bitCount);
      term.postings.append(terms.arena(), item, static_cast<size_t>(end - item));
      term.postings.append(terms.arena(), packed.data(), packed.size());
    }
    term.lastDocument = document;
    term.weight = 0;
    term.occurrenceCount = 0;
  }
  documents.back().wordCount = length;
  position = 0;
  occurrences.clear();
  touchedTerms.clear();
}

// The positions of the current document, as the index has them; where they are too long for the
// result, that is empty and they are in the stream.
BitCode IndexWriter::Implementation::positionsOfTerm(const TermEntry& term,
                                                     uint32_t documentLength) {
  const uint32_t count = term.occurrenceCount;
  const uint32_t lowBits = searchkit::positionBits(documentLength, count);
  BitCode all = countCode(count);
  if (count == 1) {
    const BitCode code = distanceCode(occurrences[term.lastOccurrence].position, lowBits);
    all.append(code);
    return all;
  }
  // The chain goes from the last to the first.
  distances.resize(count);
  uint64_t bits = 0;
  uint32_t at = term.lastOccurrence;
  for (uint32_t left = count; left > 0; --left) {
    const Occurrence& occurrence = occurrences[at];
    at = occurrence.previous;
    const uint32_t from = left > 1 ? occurrences[at].position + 1 : 0;
    distances[left - 1] = occurrence.position - from;
    bits += distanceCode(distances[left - 1], lowBits).length;
  }
  if (count < fewestPositionsWithLength && all.length + bits <= 64) {
    for (const uint32_t distance : distances) {
      all.append(distanceCode(distance, lowBits));
    }
    return all;
  }
  positionBits.clear();
  if (count >= uint32_t{1} << maximumCountBits || bits >= uint64_t{1} << maximumCountBits) {
    isTooLarge = true;
    return {};
  }
  positionBits.append(all);
  if (count >= fewestPositionsWithLength) {
    positionBits.appendCount(static_cast<uint32_t>(bits));
  }
  for (const uint32_t distance : distances) {
    positionBits.appendDistance(distance, lowBits);
  }
  return {};
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
  const auto textOf = [&parts](const Source& source) {
    const Implementation& part = *parts[source.part];
    return part.terms.text(part.sortedTerms[source.at]);
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
      const std::string_view text = textOf(source);
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
    const size_t length = bytes.size();
    bytes.resize(length + sizeof(uint64_t));
    postings.clear();
    for (size_t i = 0; i < having.size(); ++i) {
      const size_t begin = having[i]->firstByte;
      const size_t end = i + 1 < having.size() ? having[i + 1]->firstByte : length;
      readPostings(bytes.data() + begin, bytes.data() + end, numbers[having[i]->part], postings);
      ++having[i]->at;
    }
    assembler.addTerm(term, postings);
  }
}

IndexWriter::IndexWriter(IndexWriterOptions options)
    : _implementation(std::make_unique<Implementation>(options)) {}

IndexWriter::~IndexWriter() = default;

void IndexWriter::add(const Document& document) {
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
  texts.path = document.path;
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
  if (std::any_of(parts.begin(), parts.end(), [](const auto* part) { return part->isTooLarge; })) {
    throw platform::Exception(platform::rangeException,
                              "a page is too large for one keyword index");
  }
  const Implementation::Numbers numbers = Implementation::addDocuments(parts, assembler);
  Implementation::addTerms(parts, numbers, assembler);
  return assembler.finish();
}

}  // namespace searchkit
