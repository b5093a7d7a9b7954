// The bytes of the tokens of a book.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

#include "host/Luxwell/LUXTokenCounts.h"
#include "platform/Data.h"

/// Writes a token section (docs/formats/lux-index.md). Tokens come one kind after the other, each
/// kind in strictly ascending order; none is kept. Thread-safety: confined to one thread.
class LUXTokenSectionWriter {
 public:
  /// Throws platform::Exception "InvalidArgumentException" when all tokens together have 4 GiB of
  /// text.
  void add(LUXTokenKind kind, std::string_view token);

  /// The section. May be called once.
  platform::Data finish();

 private:
  static constexpr size_t countsLength = 4 * LUXTokenKindCount;

  std::array<uint32_t, LUXTokenKindCount> _counts{};
  uint64_t _textLength = 0;
  std::string _before;
  /// Room for the counts, and the tokens.
  std::string _section = std::string(countsLength, '\0');
};
