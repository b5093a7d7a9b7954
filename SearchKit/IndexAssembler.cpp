#include "SearchKit/IndexAssembler.h"

#include <algorithm>
#include <cstring>
#include <iterator>

#include "SearchKit/Checksum.h"
#include "SearchKit/TextFolding.h"
#include "SearchKit/Tokenizer.h"
#include "platform/Exception.h"

namespace searchkit {
namespace {

using format::Section;

template <typename Integer>
void append(std::vector<uint8_t>& bytes, Integer value) {
  const size_t at = bytes.size();
  bytes.resize(at + sizeof value);
  format::store(bytes.data() + at, value);
}

void append(std::vector<uint8_t>& bytes, std::string_view text) {
  bytes.insert(bytes.end(), text.begin(), text.end());
}

void appendNumber(std::vector<uint8_t>& bytes, uint32_t number) {
  uint8_t encoded[format::maximumNumberLength];
  bytes.insert(bytes.end(), encoded, format::writeNumber(encoded, number));
}

uint32_t checkedLength(size_t length) {
  if (length >= UINT32_MAX) {
    throw platform::Exception(platform::rangeException,
                              "the texts are too large for one keyword index");
  }
  return static_cast<uint32_t>(length);
}

size_t aligned(size_t offset) {
  return (offset + format::sectionAlignment - 1) / format::sectionAlignment *
         format::sectionAlignment;
}

// The order of the sections in the bytes: what a search touches first and often stands together,
// positions are last.
constexpr Section order[] = {
    Section::blockKeys, Section::blockOffsets, Section::documentLengths,
    Section::documents, Section::dictionary,   Section::mergedLists,
    Section::postings,  Section::storedText,   Section::positions,
};

}  // namespace

uint32_t IndexAssembler::_offset(Section id) { return checkedLength(_section(id).size()); }

void IndexAssembler::addDocument(const StoredTexts& texts) {
  std::vector<uint8_t>& entries = _section(Section::documents);
  const auto lengthOrNone = [](const std::optional<std::string>& text) {
    return text ? checkedLength(text->size() + 1) : 0;
  };
  append(entries, _offset(Section::storedText));
  append(entries, checkedLength(texts.path.size()));
  append(entries, lengthOrNone(texts.title));
  append(entries, lengthOrNone(texts.abstract));
  std::vector<uint8_t>& stored = _section(Section::storedText);
  append(stored, std::string_view(texts.path));
  append(stored, std::string_view(texts.title ? *texts.title : std::string()));
  append(stored, std::string_view(texts.abstract ? *texts.abstract : std::string()));
  append(_section(Section::documentLengths), texts.wordCount);
  _wordCount += texts.wordCount;
  ++_documentCount;
}

void IndexAssembler::_beginBlock(std::string_view term) {
  append(_section(Section::blockKeys), format::blockKey(term));
  std::vector<uint8_t>& offsets = _section(Section::blockOffsets);
  append(offsets, _offset(Section::dictionary));
  append(offsets, _offset(Section::postings));
  append(offsets, _offset(Section::positions));
  _previousTerm.clear();
}

void IndexAssembler::addTerm(std::string_view term, std::span<const Posting> postings) {
  if (_termCount++ % format::termsPerBlock == 0) {
    _beginBlock(term);
  }
  std::vector<uint8_t>& lists = _section(Section::postings);
  std::vector<uint8_t>& positions = _section(Section::positions);
  const size_t listBegin = lists.size();
  const size_t positionsBegin = positions.size();
  // Room for the longest that the list can become; what is not needed is given back.
  lists.resize(listBegin + (1 + 2 * postings.size()) * format::maximumNumberLength);
  uint8_t* at =
      format::writeNumber(lists.data() + listBegin, static_cast<uint32_t>(postings.size()));
  uint32_t next = 0;
  _positions.clear();
  for (const Posting& posting : postings) {
    at = format::writeNumber(at, format::postingNumber(posting.document - next, posting.weight));
    if (format::weightFollows(posting.weight)) {
      at = format::writeNumber(at, posting.weight);
    }
    next = posting.document + 1;
    _positions.append(posting.positions, posting.positionBits);
  }
  lists.resize(static_cast<size_t>(at - lists.data()));
  const std::span<const uint8_t> packed = _positions.finish();
  positions.insert(positions.end(), packed.begin(), packed.end());
  _mergedLists.addTerm(term, postings, _documentCount);
  const auto shared = static_cast<size_t>(
      std::mismatch(term.begin(), term.end(), _previousTerm.begin(), _previousTerm.end()).first -
      term.begin());
  const size_t added = term.size() - shared;
  const auto shownShared = static_cast<uint32_t>(std::min<size_t>(shared, format::headMask));
  const auto shownAdded = static_cast<uint32_t>(std::min<size_t>(added, format::headMask));
  _heads[_entryCount] = static_cast<uint8_t>(shownAdded << format::headBits | shownShared);
  if (shownShared == format::headMask) {
    _texts.push_back(static_cast<uint8_t>(shared));
  }
  if (shownAdded == format::headMask) {
    _texts.push_back(static_cast<uint8_t>(added));
  }
  append(_texts, term.substr(shared));
  _postingsLengths[_entryCount] = checkedLength(lists.size() - listBegin);
  _positionsLengths[_entryCount] = checkedLength(positions.size() - positionsBegin);
  if (++_entryCount == format::termsPerBlock) {
    _endBlock();
  }
  _previousTerm = term;
}

// What was gathered of the block's entries, field by field.
void IndexAssembler::_endBlock() {
  if (_entryCount == 0) {
    return;
  }
  std::vector<uint8_t>& dictionary = _section(Section::dictionary);
  const std::span<const uint32_t> postings(_postingsLengths, _entryCount);
  const std::span<const uint32_t> positions(_positionsLengths, _entryCount);
  const uint32_t longest = *std::max_element(postings.begin(), postings.end());
  const uint32_t power = longest <= UINT8_MAX ? 0 : longest <= UINT16_MAX ? 1 : 2;
  std::vector<uint8_t> longPositions;
  for (const uint32_t length : positions) {
    if (length >= format::longPositionsFollow) {
      appendNumber(longPositions, length);
    }
  }
  if (longPositions.empty()) {
    append(dictionary, static_cast<uint8_t>(power));
  } else {
    append(dictionary, static_cast<uint8_t>(power | format::hasLongPositions));
    appendNumber(dictionary, static_cast<uint32_t>(longPositions.size()));
  }
  dictionary.insert(dictionary.end(), _heads, _heads + _entryCount);
  for (const uint32_t length : postings) {
    uint8_t bytes[sizeof length];
    format::store(bytes, length);
    dictionary.insert(dictionary.end(), bytes, bytes + (size_t{1} << power));
  }
  for (const uint32_t length : positions) {
    append(dictionary, static_cast<uint8_t>(std::min(length, format::longPositionsFollow)));
  }
  dictionary.insert(dictionary.end(), longPositions.begin(), longPositions.end());
  dictionary.insert(dictionary.end(), _texts.begin(), _texts.end());
  _texts.clear();
  _entryCount = 0;
}

platform::Data IndexAssembler::finish() {
  _endBlock();
  _section(Section::mergedLists) = _mergedLists.finish();
  std::vector<Section> there;
  std::copy_if(std::begin(order), std::end(order), std::back_inserter(there),
               [this](Section id) { return id != Section::mergedLists || !_section(id).empty(); });
  const size_t headerLength = format::headerLength + there.size() * format::sectionEntryLength;
  size_t totalLength = headerLength;
  for (const Section id : there) {
    totalLength = aligned(totalLength) + _offset(id);
  }
  std::vector<uint8_t> bytes(totalLength);
  uint8_t* const header = bytes.data();
  std::memcpy(header, format::magic, sizeof format::magic);
  format::store(header + format::versionAt, format::version);
  format::store(header + format::revisionAt, format::revision);
  format::store(header + format::headerLengthAt, static_cast<uint32_t>(headerLength));
  format::store(header + format::totalLengthAt, static_cast<uint64_t>(totalLength));
  format::store(header + format::sectionCountAt, static_cast<uint32_t>(there.size()));
  format::store(header + format::documentCountAt, _documentCount);
  format::store(header + format::termCountAt, _termCount);
  format::store(header + format::wordCountAt, _wordCount);
  format::store(header + format::tokenizerRulesAt, tokenizerRules);
  const TextLibraryVersion library = textLibraryVersion();
  format::store(header + format::icuMajorAt, library.major);
  format::store(header + format::icuMinorAt, library.minor);
  format::store(header + format::minimumTermLengthAt, _minimumTermLength);
  format::store(header + format::termsPerBlockAt, format::termsPerBlock);

  size_t offset = headerLength;
  uint8_t* entry = header + format::headerLength;
  for (const Section id : there) {
    offset = aligned(offset);
    std::vector<uint8_t>& section = _section(id);
    std::copy(section.begin(), section.end(), bytes.begin() + static_cast<ptrdiff_t>(offset));
    format::store(entry + format::sectionIDAt, static_cast<uint32_t>(id));
    format::store(entry + format::sectionChecksumAt, crc32c(section));
    format::store(entry + format::sectionOffsetAt, static_cast<uint64_t>(offset));
    format::store(entry + format::sectionLengthAt, static_cast<uint64_t>(section.size()));
    offset += section.size();
    entry += format::sectionEntryLength;
    // The copy and its origin need not both stay to the end.
    std::vector<uint8_t>().swap(section);
  }
  format::store(header + format::headerChecksumAt, crc32c({header, headerLength}));
  return platform::Data::adopt(std::move(bytes));
}

}  // namespace searchkit
