// The inside of an opened index: where its sections are. For the engine alone.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

#include "SearchKit/IndexFormat.h"
#include "SearchKit/Scoring.h"
#include "SearchKit/SearchKit.h"
#include "platform/Data.h"

namespace searchkit {

/// The sections of an index, found and measured but not read. The counts are true to the lengths
/// of the tables that they count (documents, lengths, block keys and offsets), so that an entry
/// below its count can be read without a further check. Nothing else is known to be sound.
/// Thread-safety: immutable.
class IndexView {
 public:
  /// Absent when the bytes are no index that this reader knows.
  static std::optional<IndexView> make(std::span<const uint8_t> bytes);

  uint32_t documentCount() const noexcept { return _documentCount; }
  uint32_t termCount() const noexcept { return _termCount; }
  uint64_t wordCount() const noexcept { return _wordCount; }
  const Scorer& scorer() const noexcept { return _scorer; }
  uint32_t tokenizerRules() const noexcept { return _tokenizerRules; }
  uint32_t minimumTermLength() const noexcept { return _minimumTermLength; }
  uint32_t termsPerBlock() const noexcept { return _termsPerBlock; }
  /// How many bits beside a document's number are for its weight.
  uint32_t weightBits() const noexcept {
    return _hasPackedPositions ? format::weightBits : format::weightBitsOfFirstVersion;
  }
  bool hasPackedPositions() const noexcept { return _hasPackedPositions; }
  /// Whether blocks of the dictionary are laid out field by field (DictionaryBlock.h).
  bool hasBlocksOfFields() const noexcept { return _hasBlocksOfFields; }
  uint32_t blockCount() const noexcept { return _blockCount; }
  /// How many terms a block has; `block` is below the count.
  uint32_t entriesInBlock(uint32_t block) const noexcept {
    const uint32_t before = block * _termsPerBlock;
    return _termCount - before < _termsPerBlock ? _termCount - before : _termsPerBlock;
  }

  std::span<const uint8_t> section(format::Section id) const noexcept {
    return _sections[static_cast<uint32_t>(id)];
  }

  /// Words of a document; `id` is below the count.
  uint32_t documentLength(uint32_t id) const noexcept {
    return format::load<uint32_t>(section(format::Section::documentLengths).data() +
                                  size_t{id} * format::documentLengthLength);
  }

  uint64_t blockKey(uint32_t block) const noexcept {
    return format::load<uint64_t>(section(format::Section::blockKeys).data() +
                                  size_t{block} * format::blockKeyLength);
  }

  /// One of a block's three offsets (format::blockDictionaryAt …).
  uint32_t blockOffset(uint32_t block, size_t field) const noexcept {
    return format::load<uint32_t>(section(format::Section::blockOffsets).data() +
                                  size_t{block} * format::blockOffsetLength + field);
  }

  /// How many prefixes have merged lists; their tables can be read without a further check.
  /// Counted anew at each call: to look at them when an index is opened would be to wait for memory
  /// that most searches do not touch. Without lists, or with a table of them that does not fit,
  /// there are none.
  uint32_t mergedCount() const noexcept {
    const std::span<const uint8_t> merged = section(format::Section::mergedLists);
    if (merged.size() < format::mergedHeaderLength) {
      return 0;
    }
    const auto count = format::load<uint32_t>(merged.data());
    const uint64_t length = uint64_t{count} * (format::mergedKeyLength + format::mergedEntryLength);
    return length <= merged.size() - format::mergedHeaderLength ? count : 0;
  }

  uint64_t mergedKey(uint32_t list) const noexcept {
    return format::load<uint64_t>(section(format::Section::mergedLists).data() +
                                  format::mergedHeaderLength +
                                  size_t{list} * format::mergedKeyLength);
  }

  /// One of the two fields of a list's entry (format::mergedOffsetAt …).
  uint32_t mergedEntry(uint32_t list, size_t field) const noexcept {
    return format::load<uint32_t>(section(format::Section::mergedLists).data() +
                                  format::mergedHeaderLength +
                                  size_t{mergedCount()} * format::mergedKeyLength +
                                  size_t{list} * format::mergedEntryLength + field);
  }

  /// What the index keeps of a document; absent when there is none or its record is broken.
  struct Texts {
    std::string_view path;
    std::optional<std::string_view> title;
    std::optional<std::string_view> abstract;
  };
  std::optional<Texts> documentTexts(uint32_t id) const noexcept;

  /// The document of a path.
  std::optional<uint32_t> documentIDForPath(std::string_view path) const noexcept;

 private:
  bool _readSections(std::span<const uint8_t> bytes, size_t headerEnd, uint32_t count);
  bool _hasSoundTables() const noexcept;

  uint32_t _documentCount = 0;
  uint32_t _termCount = 0;
  uint64_t _wordCount = 0;
  uint32_t _tokenizerRules = 0;
  uint32_t _minimumTermLength = 0;
  uint32_t _termsPerBlock = 0;
  uint32_t _blockCount = 0;
  bool _hasPackedPositions = false;
  bool _hasBlocksOfFields = false;
  Scorer _scorer;
  std::span<const uint8_t> _sections[format::lastKnownSection + 1];
};

}  // namespace searchkit

class SKIndex {
 public:
  SKIndex(platform::Data data, const searchkit::IndexView& view)
      : _data(std::move(data)), _view(view) {}

  const searchkit::IndexView& view() const noexcept { return _view; }
  const platform::Data& data() const noexcept { return _data; }

 private:
  platform::Data _data;
  searchkit::IndexView _view;
};

class SKDocument {
 public:
  explicit SKDocument(std::string path) : _path(std::move(path)) {}

  const std::string& path() const noexcept { return _path; }

 private:
  std::string _path;
};
