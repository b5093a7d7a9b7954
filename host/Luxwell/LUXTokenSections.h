// The tokens of a book while its data are made, and the sections that they become.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "host/Luxwell/LUXRecords.h"
#include "host/Luxwell/LUXTokenCounts.h"

/// Takes the tokens of each page under numbers that mean something to the caller only, and writes
/// them under numbers in the order of their names. Thread-safety: confined to one thread.
class LUXTokenSections {
 public:
  explicit LUXTokenSections(size_t pageCount) : _pages(pageCount) {}

  /// Adds to the counts of a token in a page.
  void add(size_t page, LUXTokenKind kind, uint32_t token, uint32_t titleCount,
           uint32_t bodyCount) {
    _pages[page][static_cast<size_t>(kind)].push_back({token, titleCount, bodyCount});
  }

  /// The names of a kind's tokens, by the caller's numbers. Names of tokens that no page has are
  /// left out of the table; tokens of one name become one.
  void setNames(LUXTokenKind kind, std::vector<std::string> names) {
    _names[static_cast<size_t>(kind)] = std::move(names);
  }

  /// Puts the tokens in order, when all pages and names are known.
  void finish();

  /// The bytes of the token section; after finish().
  platform::Data tokenBytes() const { return _table->sectionBytes(); }

  /// The records of the counts section; after finish().
  LUXRecordsWriter countRecords() const;

 private:
  using Page = std::array<std::vector<LUXTokenCounts::Entry>, LUXTokenKindCount>;

  std::vector<Page> _pages;
  std::array<std::vector<std::string>, LUXTokenKindCount> _names;
  /// By kind and the caller's number, the number in the table.
  std::array<std::vector<uint32_t>, LUXTokenKindCount> _numbers;
  std::shared_ptr<const LUXTokenTable> _table;
};
