#include <algorithm>

#include "SearchKit/SKIndex.h"
#include "SearchKit/Tokenizer.h"

namespace searchkit {

using format::load;
using format::Section;

std::optional<IndexView> IndexView::make(std::span<const uint8_t> bytes) {
  const uint8_t* const header = bytes.data();
  if (bytes.size() < format::headerLength ||
      !std::equal(std::begin(format::magic), std::end(format::magic),
                  reinterpret_cast<const char*>(header)) ||
      load<uint16_t>(header + format::versionAt) < format::firstVersion ||
      load<uint16_t>(header + format::versionAt) > format::version ||
      load<uint32_t>(header + format::tokenizerRulesAt) != searchkit::tokenizerRules) {
    return std::nullopt;
  }
  const auto sectionCount = load<uint32_t>(header + format::sectionCountAt);
  const auto headerLength = load<uint32_t>(header + format::headerLengthAt);
  const auto totalLength = load<uint64_t>(header + format::totalLengthAt);
  if (totalLength > bytes.size() || headerLength > totalLength ||
      sectionCount > format::maximumSectionCount ||
      headerLength < format::headerLength + sectionCount * format::sectionEntryLength) {
    return std::nullopt;
  }
  IndexView view;
  const auto version = load<uint16_t>(header + format::versionAt);
  view._hasPackedPositions = version >= format::secondVersion;
  view._hasBlocksOfFields = version == format::version;
  view._documentCount = load<uint32_t>(header + format::documentCountAt);
  view._termCount = load<uint32_t>(header + format::termCountAt);
  view._wordCount = load<uint64_t>(header + format::wordCountAt);
  view._tokenizerRules = load<uint32_t>(header + format::tokenizerRulesAt);
  view._minimumTermLength = load<uint32_t>(header + format::minimumTermLengthAt);
  view._termsPerBlock = load<uint32_t>(header + format::termsPerBlockAt);
  if (view._termsPerBlock == 0 || view._termsPerBlock > format::maximumTermsPerBlock) {
    return std::nullopt;
  }
  view._blockCount =
      view._termCount / view._termsPerBlock + (view._termCount % view._termsPerBlock != 0 ? 1 : 0);
  if (!view._readSections(bytes.first(static_cast<size_t>(totalLength)), headerLength,
                          sectionCount) ||
      !view._hasSoundTables()) {
    return std::nullopt;
  }
  view._scorer = Scorer(view._documentCount, view._wordCount);
  return view;
}

bool IndexView::_readSections(std::span<const uint8_t> bytes, size_t headerEnd, uint32_t count) {
  bool found[format::lastKnownSection + 1] = {};
  for (uint32_t i = 0; i < count; ++i) {
    const uint8_t* const entry =
        bytes.data() + format::headerLength + i * format::sectionEntryLength;
    const auto id = load<uint32_t>(entry + format::sectionIDAt);
    const auto offset = load<uint64_t>(entry + format::sectionOffsetAt);
    const auto length = load<uint64_t>(entry + format::sectionLengthAt);
    if (offset < headerEnd || offset > bytes.size() || length > bytes.size() - offset) {
      return false;
    }
    if (id == 0 || id > format::lastKnownSection) {
      continue;
    }
    // Offsets into sections are of 32 bits.
    if (found[id] || length > UINT32_MAX) {
      return false;
    }
    found[id] = true;
    _sections[id] = bytes.subspan(static_cast<size_t>(offset), static_cast<size_t>(length));
  }
  return std::all_of(found + 1, found + format::lastRequiredSection + 1,
                     [](bool isThere) { return isThere; });
}

bool IndexView::_hasSoundTables() const noexcept {
  const auto holds = [this](Section id, uint64_t count, size_t entryLength) {
    return section(id).size() == count * entryLength;
  };
  return holds(Section::documents, _documentCount, format::documentEntryLength) &&
         holds(Section::documentLengths, _documentCount, format::documentLengthLength) &&
         holds(Section::blockKeys, _blockCount, format::blockKeyLength) &&
         holds(Section::blockOffsets, _blockCount, format::blockOffsetLength);
}

std::optional<IndexView::Texts> IndexView::documentTexts(uint32_t id) const noexcept {
  if (id >= _documentCount) {
    return std::nullopt;
  }
  const uint8_t* const entry =
      section(Section::documents).data() + size_t{id} * format::documentEntryLength;
  const auto offset = load<uint32_t>(entry + format::documentTextOffsetAt);
  const auto pathLength = load<uint32_t>(entry + format::documentPathLengthAt);
  const auto titleLength = load<uint32_t>(entry + format::documentTitleLengthAt);
  const auto abstractLength = load<uint32_t>(entry + format::documentAbstractLengthAt);
  const std::span<const uint8_t> stored = section(Section::storedText);
  uint64_t at = offset;
  const auto take = [&](uint64_t length) -> std::optional<std::string_view> {
    if (at > stored.size() || length > stored.size() - at) {
      return std::nullopt;
    }
    const std::string_view text(reinterpret_cast<const char*>(stored.data()) + at,
                                static_cast<size_t>(length));
    at += length;
    return text;
  };
  Texts texts;
  const std::optional<std::string_view> path = take(pathLength);
  if (!path) {
    return std::nullopt;
  }
  texts.path = *path;
  if (titleLength > 0 && !(texts.title = take(titleLength - 1))) {
    return std::nullopt;
  }
  if (abstractLength > 0 && !(texts.abstract = take(abstractLength - 1))) {
    return std::nullopt;
  }
  return texts;
}

std::optional<uint32_t> IndexView::documentIDForPath(std::string_view path) const noexcept {
  uint32_t low = 0;
  uint32_t high = _documentCount;
  while (low < high) {
    const uint32_t middle = low + (high - low) / 2;
    const std::optional<Texts> texts = documentTexts(middle);
    if (texts && texts->path == path) {
      return middle;
    }
    if (texts && texts->path < path) {
      low = middle + 1;
    } else {
      high = middle;
    }
  }
  return std::nullopt;
}

}  // namespace searchkit
