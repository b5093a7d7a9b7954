#include "SearchKit/MergedLists.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <utility>

#include "SearchKit/IndexAssembler.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/Scoring.h"

namespace searchkit {
namespace {

static_assert(format::maximumMergedCharacters == 4, "there is one level a length");
static_assert(exactFactor == 4.0F, "frequencies are whole numbers of quarters");
constexpr uint32_t wholeExactFactor = 4;

void appendNumber(std::vector<uint8_t>& bytes, uint32_t number) {
  uint8_t encoded[format::maximumNumberLength];
  bytes.insert(bytes.end(), encoded, format::writeNumber(encoded, number));
}

// The first `characters` characters of a term; empty when it has fewer or they are too many bytes.
std::string_view prefixOf(std::string_view term, size_t characters) {
  size_t at = 0;
  for (; characters > 0; --characters) {
    if (at >= term.size()) {
      return {};
    }
    do {
      ++at;
    } while (at < term.size() && (static_cast<uint8_t>(term[at]) & 0xC0) == 0x80);
  }
  return at <= sizeof(uint64_t) ? term.substr(0, at) : std::string_view();
}

}  // namespace

void MergedListsBuilder::addTerm(std::string_view term, std::span<const Posting> postings,
                                 size_t documentCount) {
  for (size_t i = 0; i < std::size(_levels); ++i) {
    Level& level = _levels[i];
    const std::string_view prefix = prefixOf(term, i + 1);
    if (prefix != level.prefix) {
      _close(level);
      level.prefix = prefix;
      level.frequencies.resize(documentCount);
      level.touched.fit(static_cast<uint32_t>(documentCount));
    }
    if (prefix.empty()) {
      continue;
    }
    const uint32_t factor = term.size() == prefix.size() ? wholeExactFactor : 1;
    level.postingCount += postings.size();
    if (level.postingCount < fewestPostings) {
      for (const Posting& posting : postings) {
        level.few.push_back({posting.document, factor * posting.weight});
      }
      continue;
    }
    for (const Entry& entry : level.few) {
      level.add(entry);
    }
    level.few.clear();
    for (const Posting& posting : postings) {
      level.add({posting.document, factor * posting.weight});
    }
  }
}

void MergedListsBuilder::_close(Level& level) {
  const size_t postingCount = std::exchange(level.postingCount, 0);
  level.few.clear();
  if (postingCount < fewestPostings) {
    level.prefix.clear();
    return;
  }
  uint32_t documentCount = 0;
  uint64_t highest = 0;
  std::vector<uint8_t> entries;
  uint32_t next = 0;
  for (size_t word = 0; word < level.touched.wordCount(); ++word) {
    for (uint64_t bits = level.touched.takeWord(word); bits != 0; bits &= bits - 1) {
      const auto document =
          static_cast<uint32_t>(word * 64) + static_cast<uint32_t>(std::countr_zero(bits));
      const uint64_t frequency = std::exchange(level.frequencies[document], 0);
      // More pages than make a list worth while are only forgotten.
      if (++documentCount * leastGain > postingCount) {
        continue;
      }
      highest = std::max(highest, frequency);
      const auto weight = static_cast<uint32_t>(std::min<uint64_t>(frequency, UINT32_MAX));
      appendNumber(entries, format::postingNumber(document - next, weight));
      if (format::weightFollows(weight)) {
        appendNumber(entries, weight);
      }
      next = document + 1;
    }
  }
  if (documentCount * leastGain <= postingCount && highest < format::mergedFrequencyLimit) {
    List list{format::blockKey(level.prefix),
              static_cast<uint32_t>(std::min<size_t>(postingCount, UINT32_MAX)),
              {}};
    appendNumber(list.bytes, documentCount);
    list.bytes.insert(list.bytes.end(), entries.begin(), entries.end());
    _lists.push_back(std::move(list));
  }
  level.prefix.clear();
}

std::vector<uint8_t> MergedListsBuilder::finish() {
  for (Level& level : _levels) {
    _close(level);
  }
  std::vector<uint8_t> bytes;
  if (_lists.empty()) {
    return bytes;
  }
  std::sort(_lists.begin(), _lists.end(),
            [](const List& a, const List& b) { return a.key < b.key; });
  const size_t tablesLength = format::mergedHeaderLength +
                              _lists.size() * (format::mergedKeyLength + format::mergedEntryLength);
  bytes.resize(tablesLength);
  format::store(bytes.data(), static_cast<uint32_t>(_lists.size()));
  uint8_t* key = bytes.data() + format::mergedHeaderLength;
  uint8_t* entry = key + _lists.size() * format::mergedKeyLength;
  size_t offset = tablesLength;
  for (const List& list : _lists) {
    format::store(key, list.key);
    format::store(entry + format::mergedOffsetAt, static_cast<uint32_t>(offset));
    format::store(entry + format::mergedDocumentSumAt, list.documentSum);
    key += format::mergedKeyLength;
    entry += format::mergedEntryLength;
    offset += list.bytes.size();
  }
  bytes.reserve(offset);
  for (const List& list : _lists) {
    bytes.insert(bytes.end(), list.bytes.begin(), list.bytes.end());
  }
  return bytes;
}

}  // namespace searchkit
