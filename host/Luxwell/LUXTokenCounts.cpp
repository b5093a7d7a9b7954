#include "host/Luxwell/LUXTokenCounts.h"

#include <algorithm>
#include <limits>
#include <map>
#include <utility>

#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXTokenSectionWriter.h"
#include "platform/Exception.h"
#include "platform/Strings.h"

using luxnumbers::readUInt32;
using luxnumbers::readVarnumber;

namespace {

constexpr size_t headerLength = 4 * LUXTokenKindCount;

// How much text a section may stand for: damaged sizes must not take all memory.
constexpr uint64_t mostTextPerByte = 64;

const std::shared_ptr<const LUXTokenTable>& emptyTable() {
  static const auto& table =
      *new std::shared_ptr<const LUXTokenTable>(LUXTokenTable::withTokens({}));
  return table;
}

}  // namespace

LUXTokenTable::Token LUXTokenTable::tokenAt(size_t number) const noexcept {
  size_t kind = 0;
  while (kind + 1 < LUXTokenKindCount && number >= _kindStarts[kind + 1]) {
    ++kind;
  }
  return {
      static_cast<LUXTokenKind>(kind),
      std::string_view(_text).substr(_offsets[number], _offsets[number + 1] - _offsets[number])};
}

std::shared_ptr<const LUXTokenTable> LUXTokenTable::withTokens(
    const std::array<std::vector<std::string>, LUXTokenKindCount>& tokens) {
  uint64_t length = 0;
  for (const auto& kind : tokens) {
    for (const std::string& token : kind) {
      length += token.size();
    }
  }
  if (length > std::numeric_limits<uint32_t>::max()) {
    throw platform::Exception(platform::invalidArgumentException, "too much text in tokens");
  }
  std::shared_ptr<LUXTokenTable> table(new LUXTokenTable);
  table->_text.reserve(length);
  table->_offsets.push_back(0);
  for (size_t kind = 0; kind < tokens.size(); ++kind) {
    for (const std::string& token : tokens[kind]) {
      table->_text += token;
      table->_offsets.push_back(static_cast<uint32_t>(table->_text.size()));
    }
    table->_kindStarts[kind + 1] = static_cast<uint32_t>(table->_offsets.size() - 1);
  }
  return table;
}

platform::Data LUXTokenTable::sectionBytes() const {
  LUXTokenSectionWriter writer;
  for (size_t number = 0; number < size(); ++number) {
    const Token token = tokenAt(number);
    writer.add(token.kind, token.token);
  }
  return writer.finish();
}

std::shared_ptr<const LUXTokenTable> LUXTokenTable::withSectionBytes(const platform::Data& bytes) {
  if (bytes.length() < headerLength) {
    return nullptr;
  }
  const uint8_t* at = bytes.bytes();
  const uint8_t* const end = at + bytes.length();
  std::shared_ptr<LUXTokenTable> table(new LUXTokenTable);
  uint64_t total = 0;
  for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
    total += readUInt32(at + 4 * kind);
    if (total > bytes.length()) {
      return nullptr;
    }
    table->_kindStarts[kind + 1] = static_cast<uint32_t>(total);
  }
  at += headerLength;
  const uint64_t mostText =
      std::min<uint64_t>(mostTextPerByte * bytes.length(), std::numeric_limits<uint32_t>::max());
  std::string& text = table->_text;
  table->_offsets.reserve(total + 1);
  table->_offsets.push_back(0);
  for (size_t kind = 0; kind < LUXTokenKindCount; ++kind) {
    size_t before = text.size();
    for (uint32_t number = table->_kindStarts[kind]; number < table->_kindStarts[kind + 1];
         ++number) {
      uint64_t shared = 0;
      uint64_t length = 0;
      const size_t begin = text.size();
      if (!readVarnumber(at, end, shared) || !readVarnumber(at, end, length) ||
          length > static_cast<uint64_t>(end - at) || shared > begin - before ||
          shared + length > maximumTokenLength || begin + shared + length > mostText) {
        return nullptr;
      }
      text.append(text, before, shared);
      text.append(reinterpret_cast<const char*>(at), length);
      at += length;
      const std::string_view token = std::string_view(text).substr(begin);
      const bool isFirst = number == table->_kindStarts[kind];
      if (token.empty() || !platform::isValidUTF8(token) ||
          (!isFirst && token <= std::string_view(text).substr(before, begin - before))) {
        return nullptr;
      }
      before = begin;
      table->_offsets.push_back(static_cast<uint32_t>(text.size()));
    }
  }
  return at == end ? table : nullptr;
}

LUXTokenCounts::LUXTokenCounts() : LUXTokenCounts(emptyTable(), {}) {}

LUXTokenCounts::LUXTokenCounts(std::shared_ptr<const LUXTokenTable> table,
                               std::vector<Entry> entries)
    : _table(std::move(table)),
      _entries(std::make_shared<const std::vector<Entry>>(std::move(entries))) {}

LUXTokenCounts LUXTokenCounts::withCounts(const std::vector<LUXTokenCount>& counts) {
  std::array<std::map<std::string_view, Entry>, LUXTokenKindCount> kinds;
  for (const LUXTokenCount& count : counts) {
    Entry& entry = kinds[static_cast<size_t>(count.kind)][count.token];
    entry.titleCount += count.titleCount;
    entry.bodyCount += count.bodyCount;
    entry.wordsBefore = std::min(entry.wordsBefore, count.wordsBefore);
  }
  std::array<std::vector<std::string>, LUXTokenKindCount> tokens;
  std::vector<Entry> entries;
  for (size_t kind = 0; kind < kinds.size(); ++kind) {
    for (const auto& [token, entry] : kinds[kind]) {
      tokens[kind].emplace_back(token);
      entries.push_back({static_cast<uint32_t>(entries.size()), entry.titleCount, entry.bodyCount,
                         entry.wordsBefore});
    }
  }
  return {LUXTokenTable::withTokens(tokens), std::move(entries)};
}

LUXTokenCount LUXTokenCounts::operator[](size_t i) const noexcept {
  const Entry& entry = (*_entries)[i];
  const LUXTokenTable::Token token = _table->tokenAt(entry.number);
  return {token.token, token.kind, entry.titleCount, entry.bodyCount, entry.wordsBefore};
}
