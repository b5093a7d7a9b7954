// The layout of a keyword index in bytes: numbers that the writer and the reader share. The whole
// format is described in docs/formats/keyword-index.md.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace searchkit::format {

static_assert(std::endian::native == std::endian::little,
              "numbers are read in place, and the format is little-endian");

inline constexpr char magic[8] = {'\x89', 'S', 'K', 'I', 'X', '\r', '\n', '\x1a'};
/// Raised when earlier readers cannot read what is written; they refuse it.
inline constexpr uint16_t version = 3;
/// In the second version the entries of the dictionary followed one another; all else was as now.
/// In the first one positions also were whole bytes, and postings had one bit for the weight. Both
/// are still read.
inline constexpr uint16_t secondVersion = 2;
inline constexpr uint16_t firstVersion = 1;
/// Raised when something is added that earlier readers of the version may skip.
inline constexpr uint16_t revision = 0;

inline constexpr size_t headerLength = 64;
inline constexpr size_t sectionEntryLength = 32;
inline constexpr size_t maximumSectionCount = 64;
inline constexpr size_t sectionAlignment = 8;

// Where the header's fields are.
inline constexpr size_t versionAt = 8;
inline constexpr size_t revisionAt = 10;
inline constexpr size_t headerLengthAt = 12;
inline constexpr size_t totalLengthAt = 16;
inline constexpr size_t headerChecksumAt = 24;
inline constexpr size_t sectionCountAt = 28;
inline constexpr size_t documentCountAt = 32;
inline constexpr size_t termCountAt = 36;
inline constexpr size_t wordCountAt = 40;
inline constexpr size_t tokenizerRulesAt = 48;
inline constexpr size_t icuMajorAt = 52;
inline constexpr size_t icuMinorAt = 54;
inline constexpr size_t minimumTermLengthAt = 56;
inline constexpr size_t termsPerBlockAt = 60;

// Where the fields of an entry of the section table are.
inline constexpr size_t sectionIDAt = 0;
inline constexpr size_t sectionChecksumAt = 4;
inline constexpr size_t sectionOffsetAt = 8;
inline constexpr size_t sectionLengthAt = 16;

enum class Section : uint32_t {
  documents = 1,
  documentLengths = 2,
  blockKeys = 3,
  blockOffsets = 4,
  dictionary = 5,
  postings = 6,
  storedText = 7,
  positions = 8,
  mergedLists = 9,
};
inline constexpr uint32_t lastKnownSection = 9;
/// Those from 1 to this are in every index.
inline constexpr uint32_t lastRequiredSection = 8;

/// What the format's description calls a section.
std::string_view sectionName(uint32_t id) noexcept;

/// One entry of the documents section: four 32-bit numbers. The texts follow one another in the
/// stored text; title and abstract have their length plus one, 0 meaning that there is none.
inline constexpr size_t documentEntryLength = 16;
inline constexpr size_t documentTextOffsetAt = 0;
inline constexpr size_t documentPathLengthAt = 4;
inline constexpr size_t documentTitleLengthAt = 8;
inline constexpr size_t documentAbstractLengthAt = 12;

inline constexpr size_t documentLengthLength = 4;
inline constexpr size_t blockKeyLength = 8;

/// One entry of the block offsets: where the block's dictionary entries, postings and positions
/// begin, each within its section.
inline constexpr size_t blockOffsetLength = 12;
inline constexpr size_t blockDictionaryAt = 0;
inline constexpr size_t blockPostingsAt = 4;
inline constexpr size_t blockPositionsAt = 8;

/// What this writer puts into a block; a reader takes the number from the header.
inline constexpr uint32_t termsPerBlock = 16;
inline constexpr uint32_t maximumTermsPerBlock = 4096;

// The first byte of a block of the dictionary: the power of two that is the width of the lengths of
// postings, and whether there are lengths of positions that need more than a byte.
inline constexpr uint32_t postingsWidthMask = 3;
inline constexpr uint32_t hasLongPositions = 4;
inline constexpr uint32_t knownBlockFlags = postingsWidthMask | hasLongPositions;
/// In the place of a length of positions: it is among the longer ones.
inline constexpr uint32_t longPositionsFollow = 0xFF;
/// Of the byte that says how many bytes a term shares with the one before it and how many it adds:
/// each half is such a number, or this, and then the number is before the term's bytes.
inline constexpr uint32_t headBits = 4;
inline constexpr uint32_t headMask = 15;

/// Longer terms are cut, at a character; so every length in the dictionary is one byte.
inline constexpr size_t maximumTermBytes = 255;

/// The lowest bits beside a document's number: its weight less 1, or all ones where the weight
/// follows.
inline constexpr uint32_t weightBits = 2;
inline constexpr uint32_t weightBitsOfFirstVersion = 1;

/// What stands in a list for a document: `difference` is its number less the one that was to be
/// expected.
inline constexpr uint32_t postingNumber(uint32_t difference, uint32_t weight) noexcept {
  constexpr uint32_t mask = (1 << weightBits) - 1;
  return difference << weightBits | (weight > mask ? mask : weight - 1);
}
inline constexpr bool weightFollows(uint32_t weight) noexcept {
  return weight >= uint32_t{1} << weightBits;
}

/// Weighted frequencies above this are written as this.
inline constexpr uint32_t maximumWeight = 0xFFFF;

// The merged lists begin with their number; then the keys of all, then an entry for each.
inline constexpr size_t mergedHeaderLength = 8;
inline constexpr size_t mergedKeyLength = 8;
inline constexpr size_t mergedEntryLength = 8;
inline constexpr size_t mergedOffsetAt = 0;
inline constexpr size_t mergedDocumentSumAt = 4;
/// Prefixes of more characters have no merged lists.
inline constexpr size_t maximumMergedCharacters = 4;
/// Frequencies in merged lists are below this, so that a float has them exactly.
inline constexpr uint32_t mergedFrequencyLimit = 1 << 24;

/// Numbers in the index's bytes have no particular alignment: the bytes may be any slice.
template <typename Integer>
Integer load(const uint8_t* bytes) noexcept {
  Integer value;
  std::memcpy(&value, bytes, sizeof value);
  return value;
}

template <typename Integer>
void store(uint8_t* bytes, Integer value) noexcept {
  std::memcpy(bytes, &value, sizeof value);
}

/// The first eight bytes of a term as one number, so that comparing numbers compares terms.
inline uint64_t blockKey(std::string_view term) noexcept {
  uint64_t key = 0;
  if (!term.empty()) {
    std::memcpy(&key, term.data(), term.size() < sizeof key ? term.size() : sizeof key);
  }
  return __builtin_bswap64(key);
}

/// The key of a prefix among the merged lists: its bytes as those of a block's first term. 0 for
/// prefixes that have no such list in any index.
inline uint64_t mergedKey(std::string_view prefix) noexcept {
  size_t characters = 0;
  for (const char byte : prefix) {
    characters += (static_cast<uint8_t>(byte) & 0xC0) != 0x80 ? 1 : 0;
  }
  return prefix.size() > sizeof(uint64_t) || characters > maximumMergedCharacters
             ? 0
             : blockKey(prefix);
}

/// A number of up to 32 bits, seven bits a byte, the lowest first. False, with `at` anywhere
/// between where it was and `end`, when the bytes end early or the number is too large.
inline bool readNumber(const uint8_t*& at, const uint8_t* end, uint32_t& number) noexcept {
  if (at == end) {
    return false;
  }
  uint32_t byte = *at++;
  if (byte < 0x80) {
    number = byte;
    return true;
  }
  uint32_t value = byte & 0x7F;
  for (unsigned shift = 7; shift < 35; shift += 7) {
    if (at == end) {
      return false;
    }
    byte = *at++;
    if (shift == 28 && byte > 0x0F) {
      return false;
    }
    value |= (byte & 0x7F) << shift;
    if (byte < 0x80) {
      number = value;
      return true;
    }
  }
  return false;
}

inline constexpr size_t maximumNumberLength = 5;

/// Writes what readNumber reads; returns the end. `at` has room for maximumNumberLength bytes.
inline uint8_t* writeNumber(uint8_t* at, uint32_t number) noexcept {
  while (number >= 0x80) {
    *at++ = static_cast<uint8_t>(number | 0x80);
    number >>= 7;
  }
  *at++ = static_cast<uint8_t>(number);
  return at;
}

}  // namespace searchkit::format
