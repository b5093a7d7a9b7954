// What each page of a book has of its tokens, as sections.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

#include "host/Luxwell/LUXRecords.h"
#include "host/Luxwell/LUXTokenCounts.h"

/// Writes the counts and the places of the tokens of pages that follow one another. Nothing is kept
/// of a page but its bytes: books have far more counts than tokens.
/// Thread-safety: confined to one thread.
class LUXTokenSections {
 public:
  /// There are `tokenCount` tokens; those from `firstWithoutPlace` on have no place.
  LUXTokenSections(size_t tokenCount, uint32_t firstWithoutPlace);

  /// Adds an occurrence of a token to the page that is being written. In the body, `wordsBefore` is
  /// its place; of several the least counts.
  void addInTitle(uint32_t token) {
    _page.push_back(static_cast<uint64_t>(token) << shift | title);
  }
  void addInBody(uint32_t token, uint8_t wordsBefore = LUXTokenCount::farDown) {
    _page.push_back(static_cast<uint64_t>(token) << shift | wordsBefore);
  }

  /// Writes what has been added since the last time; what is added from now on to this page has
  /// greater numbers. Without need, but a large page takes less memory in pieces.
  void endKind();

  /// Writes the page to which has been added; the next one begins.
  void endPage();

  /// Adds pages behind those that are there, one part after the other. They are given back one by
  /// one, so that all takes little more room than the parts had.
  void append(std::vector<std::unique_ptr<LUXTokenSections>> parts);

  /// The bytes of the two sections, when all pages are written.
  platform::Data countBytes() { return _records.finish(); }
  platform::Data placeBytes() { return _places.finish(); }

 private:
  /// An occurrence is a token's number, a bit that tells titles, and eight of the place.
  static constexpr unsigned shift = 9;
  static constexpr uint64_t title = 0x100;

  void _sort();

  const unsigned _tokenBits;
  const uint32_t _firstWithoutPlace;
  /// What has been added since the last time.
  std::vector<uint64_t> _page;
  std::vector<uint64_t> _sorted;
  bool _inPage = false;
  /// The least number that the page's next token may have.
  uint32_t _next = 0;
  LUXRecordsWriter _records;
  LUXRecordsWriter _places;
};
